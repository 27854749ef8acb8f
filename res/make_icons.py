#!/usr/bin/env python3
"""Draws the application icon "Docuvane" at 16, 32, 48, 128 and 256 pixels.

The picture: a purple rounded square holding a white page with a folded
corner, text lines on it, and a magnifying glass over its lower right part.
Everything is drawn from shapes in unit coordinates and supersampled, so
each size gets smooth edges.  Only the standard library is used.

Usage: make_icons.py [output directory]
"""
import math
import os
import struct
import sys
import zlib

PURPLE = (128, 0, 128)
PURPLE_DARK = (84, 0, 96)
PAGE = (255, 255, 255)
FOLD = (214, 200, 226)
LINE = (150, 130, 170)
LENS = (200, 232, 255)
RIM = (40, 40, 60)


def in_round_rect(x, y, x0, y0, x1, y1, r):
    if x < x0 or x > x1 or y < y0 or y > y1:
        return False
    cx = min(max(x, x0 + r), x1 - r)
    cy = min(max(y, y0 + r), y1 - r)
    return (x - cx) ** 2 + (y - cy) ** 2 <= r * r


def sample(x, y):
    """Colour (r, g, b, a) of the point (x, y) in [0, 1] x [0, 1]."""
    colour = None
    if in_round_rect(x, y, 0.04, 0.04, 0.96, 0.96, 0.18):
        # Background, a little darker towards the bottom.
        t = y
        colour = tuple(int(PURPLE[i] * (1 - t) + PURPLE_DARK[i] * t) for i in range(3))
    # The page with its folded upper right corner.
    px0, py0, px1, py1, fold = 0.24, 0.16, 0.70, 0.84, 0.14
    if px0 <= x <= px1 and py0 <= y <= py1 and not (x - (px1 - fold) > y - py0 + 0.0 and x > px1 - fold and y < py0 + fold):
        colour = PAGE
        if x > px1 - fold and y < py0 + fold and (x - (px1 - fold)) + (py0 + fold - y) <= fold:
            colour = FOLD
        for i in range(5):
            ly = 0.34 + i * 0.09
            right = px1 - 0.07 if i % 2 == 0 else px1 - 0.16
            if px0 + 0.07 <= x <= right and ly <= y <= ly + 0.035:
                colour = LINE
    # The magnifying glass: handle, rim, lens.
    gx, gy, gr = 0.64, 0.64, 0.16
    hx, hy = x - gx, y - gy
    along = (hx + hy) / math.sqrt(2)
    across = (hx - hy) / math.sqrt(2)
    if gr + 0.02 <= along <= gr + 0.26 and abs(across) <= 0.05:
        colour = RIM
    d = math.hypot(hx, hy)
    if d <= gr:
        colour = LENS
    elif d <= gr + 0.045:
        colour = RIM
    if colour is None:
        return (0, 0, 0, 0)
    return colour + (255,)


def render(size, ss=4):
    rows = []
    for py in range(size):
        row = bytearray()
        for px in range(size):
            acc = [0, 0, 0, 0]
            for sy in range(ss):
                for sx in range(ss):
                    r, g, b, a = sample((px + (sx + 0.5) / ss) / size, (py + (sy + 0.5) / ss) / size)
                    acc[0] += r * a
                    acc[1] += g * a
                    acc[2] += b * a
                    acc[3] += a
            n = ss * ss
            alpha = acc[3] / n
            if acc[3]:
                row += bytes((int(acc[0] / acc[3] + 0.5), int(acc[1] / acc[3] + 0.5),
                              int(acc[2] / acc[3] + 0.5), int(alpha + 0.5)))
            else:
                row += bytes((0, 0, 0, 0))
        rows.append(bytes(row))
    return rows


def png(size, rows):
    def chunk(kind, data):
        body = kind + data
        return struct.pack(">I", len(data)) + body + struct.pack(">I", zlib.crc32(body) & 0xFFFFFFFF)

    raw = b"".join(b"\x00" + r for r in rows)
    header = struct.pack(">IIBBBBB", size, size, 8, 6, 0, 0, 0)
    return (b"\x89PNG\r\n\x1a\n" + chunk(b"IHDR", header) +
            chunk(b"IDAT", zlib.compress(raw, 9)) + chunk(b"IEND", b""))


def main():
    out = sys.argv[1] if len(sys.argv) > 1 else os.path.dirname(os.path.abspath(__file__))
    for size in (16, 32, 48, 128, 256):
        path = os.path.join(out, "docuvane-%d.png" % size)
        with open(path, "wb") as f:
            f.write(png(size, render(size, 4 if size <= 128 else 3)))
        print(path)


if __name__ == "__main__":
    main()
