#!/usr/bin/env python3
"""Writes the bitmap file images of every kind the splash reads, as fuzz seeds: make_variants.py OUTPUT_DIR [W H]

The drawable ones are 300 x 200 and split into quadrants of four plain colours (top left red, top
right green, bottom left blue, bottom right yellow; the 1-bit one has only two: red above, blue
below), so a test can tell where the picture landed and which way up. The palette pictures carry
their colours at the end of a full table, and bfOffBits is 0: the splash must find the pixels
behind the full table by itself. A smaller W x H gives seeds for the fuzz target.
"""
import os
import struct
import sys

W, H = (int(sys.argv[2]), int(sys.argv[3])) if len(sys.argv) == 4 else (300, 200)
RED, GREEN, BLUE, YELLOW = (192, 48, 48), (48, 192, 48), (48, 48, 192), (192, 192, 48)
MAGENTA = (255, 0, 255)  # what a 16- or 32-bit picture would show if it were drawn


def quadrant(x, y):
    if y < H // 2:
        return 0 if x < W // 2 else 1
    return 2 if x < W // 2 else 3


def bitmap(bits, rows, table=b"", height=H, width=W):
    """rows: byte strings, top row first (stored bottom-up unless height is negative)."""
    stride = ((width * bits + 31) // 32) * 4
    padded = [r + bytes(stride - len(r)) for r in rows]
    pixels = b"".join(padded if height < 0 else list(reversed(padded)))
    info = struct.pack("<IiiHHIIiiII", 40, width, height, 1, bits, 0, len(pixels), 2835, 2835, 0, 0)
    size = 14 + len(info) + len(table) + len(pixels)
    return struct.pack("<2sIHHI", b"BM", size, 0, 0, 0) + info + table + pixels


def table(colours, entries):
    """A full table of `entries` colours: grey filler, with `colours` at its end."""
    filler = [(128, 128, 128)] * (entries - len(colours))
    return b"".join(struct.pack("<BBBB", b, g, r, 0) for r, g, b in filler + list(colours)), entries - len(colours)


def pack_indices(indices, bits):
    out = bytearray()
    per_byte = 8 // bits
    for i in range(0, len(indices), per_byte):
        byte = 0
        for k, value in enumerate(indices[i:i + per_byte]):
            byte |= value << (8 - bits * (k + 1))
        out.append(byte)
    return bytes(out)


def bgr(rgb):
    return bytes((rgb[2], rgb[1], rgb[0]))


def make_all():
    colours = (RED, GREEN, BLUE, YELLOW)
    out = {}
    rows24 = [b"".join(bgr(colours[quadrant(x, y)]) for x in range(W)) for y in range(H)]
    out["v24.bmp"] = bitmap(24, rows24)
    out["v24_topdown.bmp"] = bitmap(24, rows24, height=-H)

    t8, base8 = table(colours, 256)
    out["v8.bmp"] = bitmap(8, [bytes(base8 + quadrant(x, y) for x in range(W)) for y in range(H)], t8)
    t4, base4 = table(colours, 16)
    out["v4.bmp"] = bitmap(4, [pack_indices([base4 + quadrant(x, y) for x in range(W)], 4) for y in range(H)], t4)
    t1, _ = table((RED, BLUE), 2)
    out["v1.bmp"] = bitmap(1, [pack_indices([0 if y < H // 2 else 1] * W, 1) for y in range(H)], t1)

    r, g, b = MAGENTA
    px16 = struct.pack("<H", (r >> 3) << 10 | (g >> 3) << 5 | (b >> 3))
    out["v16.bmp"] = bitmap(16, [px16 * W] * H)
    out["v32.bmp"] = bitmap(32, [(bgr(MAGENTA) + b"\0") * W] * H)
    # Larger than any test screen, headers only: centring divides a negative number.
    out["v16_huge.bmp"] = bitmap(16, [], height=1301, width=2601)[:54]

    out["not_bm.bmp"] = b"XM" + out["v24.bmp"][2:]
    whole8 = out["v8.bmp"]
    out["truncated.bmp"] = whole8[:-(H // 2) * W]  # about half of the rows are missing
    return out


def main():
    if len(sys.argv) not in (2, 4):
        sys.exit("usage: make_variants.py OUTPUT_DIR [WIDTH HEIGHT]")
    os.makedirs(sys.argv[1], exist_ok=True)
    for name, data in make_all().items():
        with open(os.path.join(sys.argv[1], name), "wb") as f:
            f.write(data)


if __name__ == "__main__":
    main()
