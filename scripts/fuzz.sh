#!/usr/bin/env bash
# Builds the fuzz targets with clang, libFuzzer and the address and undefined-behaviour
# sanitizers, and runs each for the given number of seconds (default 60) from a corpus kept in
# build/fuzz/corpus, seeded with the examples. A crash or a sanitizer report fails the run and
# leaves the input that caused it in build/fuzz/crashes.
set -euo pipefail
cd "$(dirname "$0")/.."
seconds=${1:-60}

cmake --preset fuzz >/dev/null
cmake --build --preset fuzz

corpus=build/fuzz/corpus/composition
mkdir -p "$corpus" build/fuzz/crashes
cp examples/*/*.json "$corpus"/
build/fuzz/fuzz/composition_fuzzer "$corpus" -dict=fuzz/composition.dict \
    -max_total_time="$seconds" -timeout=10 -rss_limit_mb=4096 -print_final_stats=1 -print_funcs=0 \
    -artifact_prefix=build/fuzz/crashes/
