#!/usr/bin/env python3
"""Draws the splash picture as an 8-bit .bmp file image (placeholder: a calm gradient)."""
import struct
import sys

W, H = 480, 300
palette = b"".join(struct.pack("<BBBB", 90 + i // 3, 40 + i // 2, 20 + i // 4, 0) for i in range(256))
rows = b"".join(bytes([(y * 255) // (H - 1)] * W) for y in range(H))
info = struct.pack("<IiiHHIIiiII", 40, W, H, 1, 8, 0, len(rows), 2835, 2835, 256, 0)
off = 14 + 40 + 1024
data = struct.pack("<2sIHHI", b"BM", off + len(rows), 0, 0, off) + info + palette + rows
open(sys.argv[1], "wb").write(data)
