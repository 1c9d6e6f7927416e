#!/usr/bin/env python3
"""Draws the launcher's icon (a bright lens ring on a deep blue tile) and its document type's icon
(a sheet with the ring on it). Our own design, computed pixel by pixel, 32-bit with alpha.

    make_icon.py OUT.ico                    the Windows icon: the program's, at 32 and 16 pixels
    make_icon.py --png DIR SIZE...          DIR/app-SIZE.png and DIR/document-SIZE.png (the icon theme)
"""
import math
import os
import struct
import sys
import zlib


def clamp(v):
    return max(0, min(255, int(round(v))))


def ring(x, y, c, size, radius, width):
    return 1 - min(1, abs(math.hypot(x - c, y - c) - size * radius) / (size * width))


def app_pixel(x, y, size):
    c = (size - 1) / 2.0
    # rounded square tile
    dx = max(abs(x - c) - size * 0.30, 0)
    dy = max(abs(y - c) - size * 0.30, 0)
    alpha = clamp(255 * (0.5 - (math.hypot(dx, dy) - size * 0.17)))
    t = 1 - y / (size - 1)
    r, g, b = 18 + 20 * t, 36 + 40 * t, 92 + 70 * t
    # lens ring
    k = ring(x, y, c, size, 0.28, 0.07)
    r, g, b = r + (120 - r) * k, g + (230 - g) * k, b + (255 - b) * k
    # highlight
    h = max(0, 1 - math.hypot(x - c + size * 0.1, y - c + size * 0.1) / (size * 0.12))
    r, g, b = r + (255 - r) * h, g + (255 - g) * h, b + (255 - b) * h
    return clamp(r), clamp(g), clamp(b), alpha


def document_pixel(x, y, size):
    # A sheet with a folded top-right corner, a thin outline, and the lens ring in the middle.
    left, right, top, bottom, fold = size * 0.16, size * 0.84, size * 0.06, size * 0.94, size * 0.22
    inside = left <= x + 0.5 <= right and top <= y + 0.5 <= bottom and (x + 0.5 - (right - fold)) + (top + fold - y - 0.5) <= fold
    if not inside:
        return 0, 0, 0, 0
    edge = min(x + 0.5 - left, right - x - 0.5, y + 0.5 - top, bottom - y - 0.5,
               (fold - ((x + 0.5 - (right - fold)) + (top + fold - y - 0.5))) / math.sqrt(2))
    r = g = b = 250.0
    if edge < max(1.0, size / 48):
        r, g, b = 96, 110, 140
    c = (size - 1) / 2.0
    k = ring(x, y - size * 0.06, c, size, 0.2, 0.06)
    r, g, b = r + (40 - r) * k, g + (110 - g) * k, b + (200 - b) * k
    return clamp(r), clamp(g), clamp(b), 255


def draw(pixel, size):
    """Rows top to bottom of (r, g, b, a)."""
    return [[pixel(x, y, size) for x in range(size)] for y in range(size)]


def ico_image(rows):
    size = len(rows)
    pixels = b"".join(bytes(v for r, g, b, a in row for v in (b, g, r, a)) for row in reversed(rows))  # bottom-up BGRA
    mask_row = ((size + 31) // 32) * 4
    header = struct.pack("<IiiHHIIiiII", 40, size, size * 2, 1, 32, 0, len(pixels) + mask_row * size, 0, 0, 0, 0)
    return header + pixels + b"\0" * (mask_row * size)


def write_ico(path, sizes):
    images = [ico_image(draw(app_pixel, s)) for s in sizes]
    out = struct.pack("<HHH", 0, 1, len(images))
    offset = 6 + 16 * len(images)
    for s, img in zip(sizes, images):
        out += struct.pack("<BBBBHHII", s, s, 0, 0, 1, 32, len(img), offset)
        offset += len(img)
    with open(path, "wb") as f:
        f.write(out + b"".join(images))


def write_png(path, rows):
    size = len(rows)

    def chunk(kind, data):
        return struct.pack(">I", len(data)) + kind + data + struct.pack(">I", zlib.crc32(kind + data) & 0xFFFFFFFF)

    raw = b"".join(b"\0" + bytes(v for px in row for v in px) for row in rows)
    with open(path, "wb") as f:
        f.write(b"\x89PNG\r\n\x1a\n" + chunk(b"IHDR", struct.pack(">IIBBBBB", size, size, 8, 6, 0, 0, 0)) +
                chunk(b"IDAT", zlib.compress(raw, 9)) + chunk(b"IEND", b""))


def main(argv):
    if argv[:1] == ["--png"]:
        folder, sizes = argv[1], [int(s) for s in argv[2:]]
        os.makedirs(folder, exist_ok=True)
        for s in sizes:
            write_png(os.path.join(folder, f"app-{s}.png"), draw(app_pixel, s))
            write_png(os.path.join(folder, f"document-{s}.png"), draw(document_pixel, s))
    else:
        write_ico(argv[0], [32, 16])


if __name__ == "__main__":
    main(sys.argv[1:])
