#!/usr/bin/env python3
"""Draws the two card images of this example as 256 × 256 RGBA PNG files beside this script."""
import math
import struct
import zlib
from pathlib import Path

SIZE = 256


def write_png(path, pixel):
    def chunk(kind, data):
        crc = zlib.crc32(kind + data) & 0xFFFFFFFF
        return struct.pack(">I", len(data)) + kind + data + struct.pack(">I", crc)

    # Each row starts with filter type 0; pixels are 8-bit red, green, blue, alpha (straight).
    rows = b"".join(
        b"\x00" + bytes(c for x in range(SIZE) for c in pixel(x, y)) for y in range(SIZE))
    header = struct.pack(">IIBBBBB", SIZE, SIZE, 8, 6, 0, 0, 0)
    path.write_bytes(b"\x89PNG\r\n\x1a\n" + chunk(b"IHDR", header) +
                     chunk(b"IDAT", zlib.compress(rows, 9)) + chunk(b"IEND", b""))


def grid(x, y):
    """An opaque checkerboard inside a white border."""
    if min(x, y) < 8 or max(x, y) >= SIZE - 8:
        return (255, 255, 255, 255)
    dark = (x // 30 + y // 30) % 2
    return (40, 90, 200, 255) if dark else (240, 200, 60, 255)


def disc(x, y):
    """A disc of hues around its centre with a soft edge, clear outside."""
    dx, dy = x + 0.5 - SIZE / 2, y + 0.5 - SIZE / 2
    radius = math.hypot(dx, dy) / (SIZE / 2)
    alpha = max(0.0, min(1.0, (1.0 - radius) * 16))
    angle = math.atan2(dy, dx)
    red, green, blue = (round(127.5 + 127.5 * math.cos(angle - k * 2 * math.pi / 3)) for k in range(3))
    return (red, green, blue, round(alpha * 255))


if __name__ == "__main__":
    here = Path(__file__).resolve().parent
    write_png(here / "grid.png", grid)
    write_png(here / "disc.png", disc)
