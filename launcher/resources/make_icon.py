#!/usr/bin/env python3
"""Draws the launcher's icon (a bright lens ring on a deep blue tile) as a .ico with 32 and
16 pixel images, 32-bit with alpha. Our own design, computed pixel by pixel."""
import math
import struct
import sys


def clamp(v):
    return max(0, min(255, int(round(v))))


def draw(size):
    rows = []
    c = (size - 1) / 2.0
    for y in range(size - 1, -1, -1):  # bottom-up rows
        row = bytearray()
        for x in range(size):
            # rounded square tile
            dx = max(abs(x - c) - size * 0.30, 0)
            dy = max(abs(y - c) - size * 0.30, 0)
            corner = math.hypot(dx, dy) - size * 0.17
            alpha = clamp(255 * (0.5 - corner))
            t = y / (size - 1)
            r, g, b = 18 + 20 * t, 36 + 40 * t, 92 + 70 * t
            # lens ring
            d = math.hypot(x - c, y - c)
            ring = 1 - min(1, abs(d - size * 0.28) / (size * 0.07))
            r, g, b = r + (120 - r) * ring, g + (230 - g) * ring, b + (255 - b) * ring
            # highlight
            h = max(0, 1 - math.hypot(x - c + size * 0.1, y - c - size * 0.1) / (size * 0.12))
            r, g, b = r + (255 - r) * h, g + (255 - g) * h, b + (255 - b) * h
            row += bytes((clamp(b), clamp(g), clamp(r), alpha))
        rows.append(bytes(row))
    pixels = b"".join(rows)
    mask_row = ((size + 31) // 32) * 4
    header = struct.pack("<IiiHHIIiiII", 40, size, size * 2, 1, 32, 0, len(pixels) + mask_row * size, 0, 0, 0, 0)
    return header + pixels + b"\0" * (mask_row * size)


def main():
    sizes = [32, 16]
    images = [draw(s) for s in sizes]
    out = struct.pack("<HHH", 0, 1, len(images))
    offset = 6 + 16 * len(images)
    for s, img in zip(sizes, images):
        out += struct.pack("<BBBBHHII", s, s, 0, 0, 1, 32, len(img), offset)
        offset += len(img)
    out += b"".join(images)
    with open(sys.argv[1], "wb") as f:
        f.write(out)


if __name__ == "__main__":
    main()
