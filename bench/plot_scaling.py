#!/usr/bin/env python3
"""Plots the curves of the scaling benchmark on log-log axes, one panel per curve, each with
its least-squares fit time ∝ amountᵏ; the curves of an earlier run (another build, say), when
given, are drawn beside them for comparison.

usage: build/default/bench/scaling --benchmark_repetitions=3 \\
           --benchmark_out=scaling.json --benchmark_out_format=json
       /usr/bin/python3 bench/plot_scaling.py scaling.json docs/scaling.png [earlier.json]
(Debian's python3 with python3-matplotlib.)
"""
import collections
import json
import math
import statistics
import sys

import matplotlib

matplotlib.use("Agg")
import matplotlib.pyplot as plt  # noqa: E402
import matplotlib.ticker  # noqa: E402

AMOUNT = {
    "layers": "layers",
    "depth_draft": "crossing cards (draft)",
    "depth_best": "crossing cards (best)",
    "resolution": "pixels in the frame",
    "lights": "point lights",
    "samples": "motion samples",
}


def curves(path):
    """Median CPU seconds per amount, per curve, from the runs (not the aggregates)."""
    times = collections.defaultdict(lambda: collections.defaultdict(list))
    scale = {"ns": 1e-9, "us": 1e-6, "ms": 1e-3, "s": 1.0}
    for run in json.load(open(path))["benchmarks"]:
        if run.get("run_type", "iteration") != "iteration":
            continue
        curve, amount = run["run_name"].rsplit("/", 1)
        times[curve][float(amount)].append(run["cpu_time"] * scale[run["time_unit"]])
    return {c: sorted((a, statistics.median(t)) for a, t in p.items()) for c, p in times.items()}


def exponent(points):
    xs = [math.log(a) for a, _ in points]
    ys = [math.log(t) for _, t in points]
    mx, my = statistics.fmean(xs), statistics.fmean(ys)
    k = sum((x - mx) * (y - my) for x, y in zip(xs, ys)) / sum((x - mx) ** 2 for x in xs)
    return k, math.exp(my - k * mx)


def label(amount):
    for size, suffix in ((1e6, "M"), (1e3, "k")):
        if amount >= size:
            return f"{amount / size:g}{suffix}"
    return f"{amount:g}"


def main(source, target, earlier=None):
    data = curves(source)
    before = curves(earlier) if earlier else {}
    names = [c for c in AMOUNT if c in data]
    columns = 3
    rows = (len(names) + columns - 1) // columns
    figure, axes = plt.subplots(rows, columns, figsize=(4.2 * columns, 3.4 * rows))
    for ax in axes.flat[len(names):]:
        ax.remove()
    for ax, name in zip(axes.flat, names):
        for points, mark, color, what in (
            (before.get(name), "x", "grey", "earlier"),
            (data[name], "o", "C0", "now"),
        ):
            if not points:
                continue
            k, c = exponent(points)
            amounts = [a for a, _ in points]
            ax.loglog(amounts, [t for _, t in points], mark, color=color, label=f"{what}: k = {k:.2f}")
            ax.loglog(amounts, [c * a**k for a in amounts], "--", color=color)
        amounts = [a for a, _ in data[name]]
        ax.set_xticks(amounts, [label(a) for a in amounts])
        ax.xaxis.set_minor_locator(matplotlib.ticker.NullLocator())
        ax.set_title(f"{name}: time ∝ amount^k")
        ax.set_xlabel(AMOUNT[name])
        ax.set_ylabel("CPU seconds per frame")
        ax.grid(True, alpha=0.3)
        ax.legend(fontsize="small")
    figure.tight_layout()
    figure.savefig(target, dpi=90)
    for name in names:
        earlier_k = f"  (earlier {exponent(before[name])[0]:.2f})" if name in before else ""
        print(f"{name:12s} k = {exponent(data[name])[0]:.2f}{earlier_k}")


if __name__ == "__main__":
    main(*sys.argv[1:4])
