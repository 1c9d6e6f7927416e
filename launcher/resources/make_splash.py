#!/usr/bin/env python3
"""Draws the launcher's splash picture: an 8-bit .bmp file image with its full 256-entry colour table.

Usage: make_splash.py OUTPUT.bmp

Everything is drawn here from numbers, with no fonts or pictures from elsewhere: a calm night-blue
background that brightens softly behind a lens emblem, the emblem itself (rings, reticle ticks and a
bright pupil), the product name "QZ-Lumiscope" in a hand-made stroke font with the model "QZ-57" in
amber beneath it, and a thin rule. Strokes are anti-aliased by their exact distance to each pixel.

The colour table is designed, not searched for: 64 background shades (the background is dithered
over them with an 8x8 ordered pattern, so the gradient shows no bands) and, for each of the three
ink colours, 16 coverage steps over 4 background shades. Ink pixels take the nearest table colour.
The output is the same byte for byte on every run.
"""
import math
import struct
import sys

W, H = 480, 300

# ---- Colours (R, G, B).
BG_RAMP = [(8, 18, 33), (14, 37, 60), (23, 66, 92), (44, 108, 134)]  # t = 0, 1/3, 2/3, 1
INK_WHITE = (240, 245, 250)
INK_AMBER = (242, 170, 56)
INK_CYAN = (132, 214, 238)
BG_LEVELS = 64


def lerp(a, b, f):
    return tuple(a[i] + (b[i] - a[i]) * f for i in range(3))


def background_colour(t):
    t = min(max(t, 0.0), 1.0) * (len(BG_RAMP) - 1)
    i = min(int(t), len(BG_RAMP) - 2)
    return lerp(BG_RAMP[i], BG_RAMP[i + 1], t - i)


# ---- Background brightness field: a gentle vertical gradient, a glow behind the emblem, a vignette.
EMBLEM_X, EMBLEM_Y = 240.0, 88.0


def background_t(x, y):
    vertical = 0.12 + 0.30 * (y / (H - 1))
    d2 = ((x - EMBLEM_X) / 150.0) ** 2 + ((y - EMBLEM_Y) / 110.0) ** 2
    glow = 0.50 * math.exp(-d2 * 2.2)
    cx, cy = (x - W / 2) / (W / 2), (y - H / 2) / (H / 2)
    vignette = 0.10 * (cx * cx + cy * cy)
    return vertical + glow - vignette


# ---- Stroke font. Units: cap height 1, baseline 0, y upwards. A glyph is (advance, strokes); a
# stroke is a polyline; a single point is a round dot.
def arc(cx, cy, rx, ry, a0, a1, steps=None):
    if steps is None:
        steps = max(6, int(abs(a1 - a0) / 10))
    return [(cx + rx * math.cos(math.radians(a0 + (a1 - a0) * k / steps)),
             cy + ry * math.sin(math.radians(a0 + (a1 - a0) * k / steps))) for k in range(steps + 1)]


XH = 0.68  # x-height
GLYPHS = {
    "Q": (0.86, [arc(0.38, 0.5, 0.34, 0.5, 0, 360, 48), [(0.50, 0.22), (0.80, -0.06)]]),
    "Z": (0.74, [[(0.06, 1.0), (0.66, 1.0), (0.06, 0.0), (0.68, 0.0)]]),
    "-": (0.52, [[(0.09, 0.42), (0.43, 0.42)]]),
    "L": (0.64, [[(0.08, 1.0), (0.08, 0.0), (0.58, 0.0)]]),
    "u": (0.64, [[(0.08, XH)] + arc(0.30, 0.24, 0.22, 0.24, 180, 360) + [(0.52, XH)], [(0.52, XH), (0.52, 0.0)]]),
    "m": (0.88, [[(0.08, 0.0), (0.08, XH)],
                 [(0.08, 0.0), (0.08, 0.47)] + arc(0.255, 0.47, 0.175, 0.21, 180, 0) + [(0.43, 0.0)],
                 [(0.43, 0.47)] + arc(0.605, 0.47, 0.175, 0.21, 180, 0) + [(0.78, 0.0)]]),
    "i": (0.24, [[(0.10, 0.0), (0.10, XH)], [(0.10, 0.92)]]),
    "s": (0.56, [arc(0.27, 0.51, 0.20, 0.17, 25, 270) + arc(0.27, 0.17, 0.21, 0.17, 90, -155)]),
    "c": (0.64, [arc(0.34, 0.34, 0.29, 0.34, 40, 320, 28)]),
    "o": (0.72, [arc(0.35, 0.34, 0.29, 0.34, 0, 360, 40)]),
    "p": (0.70, [[(0.08, XH), (0.08, -0.30)], arc(0.34, 0.34, 0.26, 0.34, 0, 360, 40)]),
    "e": (0.68, [[(0.05, 0.35), (0.60, 0.35)] + arc(0.33, 0.34, 0.28, 0.34, 2, 315, 30)]),
    "5": (0.68, [[(0.60, 1.0), (0.14, 1.0), (0.10, 0.58)] + arc(0.33, 0.33, 0.29, 0.33, 128, -140, 28)]),
    "7": (0.64, [[(0.06, 1.0), (0.60, 1.0), (0.22, 0.0)]]),
    " ": (0.36, []),
}
TRACKING = 0.07


def text_width(text):
    return sum(GLYPHS[ch][0] for ch in text) + TRACKING * (len(text) - 1)


def text_segments(text, left, baseline, cap):
    """Pixel-space segments of `text` set at `left`, `baseline` with the given cap height."""
    segments = []
    x = left
    for ch in text:
        advance, strokes = GLYPHS[ch]
        for stroke in strokes:
            points = [(x + px * cap, baseline - py * cap) for px, py in stroke]
            if len(points) == 1:
                points = points * 2
            segments.extend(zip(points, points[1:]))
        x += (advance + TRACKING) * cap
    return segments


# ---- Coverage layers: one float per pixel per ink, the union of anti-aliased strokes.
def new_layer():
    return [[0.0] * W for _ in range(H)]


def stroke_segment(layer, p, q, half_width, strength=1.0):
    (x0, y0), (x1, y1) = p, q
    pad = half_width + 1.5
    dx, dy = x1 - x0, y1 - y0
    length2 = dx * dx + dy * dy
    for y in range(max(0, int(min(y0, y1) - pad)), min(H, int(max(y0, y1) + pad) + 1)):
        py = y + 0.5
        row = layer[y]
        for x in range(max(0, int(min(x0, x1) - pad)), min(W, int(max(x0, x1) + pad) + 1)):
            px = x + 0.5
            f = 0.0 if length2 == 0 else max(0.0, min(1.0, ((px - x0) * dx + (py - y0) * dy) / length2))
            d = math.hypot(px - (x0 + f * dx), py - (y0 + f * dy))
            cover = min(1.0, max(0.0, half_width + 0.5 - d)) * strength
            if cover > row[x]:
                row[x] = cover


def stroke_ring(layer, cx, cy, r, half_width, strength=1.0):
    pad = r + half_width + 1.5
    for y in range(max(0, int(cy - pad)), min(H, int(cy + pad) + 1)):
        for x in range(max(0, int(cx - pad)), min(W, int(cx + pad) + 1)):
            d = abs(math.hypot(x + 0.5 - cx, y + 0.5 - cy) - r)
            cover = min(1.0, max(0.0, half_width + 0.5 - d)) * strength
            if cover > layer[y][x]:
                layer[y][x] = cover


def fill_disc(layer, cx, cy, r, strength=1.0):
    stroke_ring(layer, cx, cy, r / 2.0, r / 2.0, strength)


def draw():
    white, amber, cyan = new_layer(), new_layer(), new_layer()

    # Emblem: an outer reticle ring with ticks, a lens ring, and the bright pupil with a highlight.
    stroke_ring(cyan, EMBLEM_X, EMBLEM_Y, 46, 0.8, 0.75)
    for k in range(24):
        angle = math.radians(k * 15)
        inner = 49 if k % 6 else 47
        outer = 53 if k % 6 else 58
        c, s = math.cos(angle), math.sin(angle)
        stroke_segment(cyan, (EMBLEM_X + inner * c, EMBLEM_Y + inner * s),
                       (EMBLEM_X + outer * c, EMBLEM_Y + outer * s), 0.7 if k % 6 else 1.0, 0.8)
    stroke_ring(cyan, EMBLEM_X, EMBLEM_Y, 31, 2.6)
    stroke_ring(cyan, EMBLEM_X, EMBLEM_Y, 20, 0.8, 0.55)
    fill_disc(white, EMBLEM_X, EMBLEM_Y, 11)
    fill_disc(cyan, EMBLEM_X + 5.5, EMBLEM_Y - 5.5, 3.2, 0.9)

    # The name: "QZ-Lumiscope" large and white, "QZ-57" in amber beneath, both centred.
    cap = 40.0
    name = "QZ-Lumiscope"
    left = (W - text_width(name) * cap) / 2
    for p, q in text_segments(name, left, 205.0, cap):
        stroke_segment(white, p, q, 2.2)
    cap2 = 24.0
    model = "QZ-57"
    left2 = (W - text_width(model) * cap2) / 2
    for p, q in text_segments(model, left2, 250.0, cap2):
        stroke_segment(amber, p, q, 1.7)

    # A thin rule on each side of the model, fading outwards.
    for side in (-1, 1):
        for k in range(60):
            x0 = W / 2 + side * (62 + k * 1.5)
            stroke_segment(cyan, (x0, 240.0), (x0 + side * 1.5, 240.0), 0.5, 0.6 * (1 - k / 60.0))
    return white, amber, cyan


# ---- Colour table.
def build_palette():
    palette = [background_colour(i / (BG_LEVELS - 1)) for i in range(BG_LEVELS)]
    for ink, anchors in ((INK_WHITE, (0.25, 0.40, 0.55, 0.75)),
                         (INK_AMBER, (0.22, 0.32, 0.42, 0.52)),
                         (INK_CYAN, (0.45, 0.62, 0.80, 1.0))):
        for t in anchors:
            base = background_colour(t)
            for step in range(16):
                palette.append(lerp(base, ink, (step + 1) / 16.0))
    assert len(palette) == 256
    return [tuple(int(round(c)) for c in colour) for colour in palette]


BAYER8 = [[0, 32, 8, 40, 2, 34, 10, 42], [48, 16, 56, 24, 50, 18, 58, 26],
          [12, 44, 4, 36, 14, 46, 6, 38], [60, 28, 52, 20, 62, 30, 54, 22],
          [3, 35, 11, 43, 1, 33, 9, 41], [51, 19, 59, 27, 49, 17, 57, 25],
          [15, 47, 7, 39, 13, 45, 5, 37], [63, 31, 55, 23, 61, 29, 53, 21]]


def render():
    white, amber, cyan = draw()
    palette = build_palette()
    cache = {}

    def nearest(rgb):
        key = tuple(int(c) >> 1 for c in rgb)
        if key not in cache:
            cache[key] = min(range(256), key=lambda i: sum((palette[i][k] - rgb[k]) ** 2 for k in range(3)))
        return cache[key]

    rows = []  # top row first
    for y in range(H):
        row = bytearray(W)
        for x in range(W):
            t = background_t(x, y)
            a_w, a_a, a_c = white[y][x], amber[y][x], cyan[y][x]
            if a_w == 0 and a_a == 0 and a_c == 0:
                level = t * (BG_LEVELS - 1) + (BAYER8[y % 8][x % 8] + 0.5) / 64.0 - 0.5
                row[x] = min(BG_LEVELS - 1, max(0, int(round(level))))
                continue
            colour = background_colour(t)
            for ink, a in ((INK_CYAN, a_c), (INK_AMBER, a_a), (INK_WHITE, a_w)):
                if a > 0:
                    colour = lerp(colour, ink, a)
            row[x] = nearest(colour)
        rows.append(bytes(row))
    return palette, rows


def bitmap_file(palette, rows):
    pixels = b"".join(reversed(rows))  # stored bottom-up; 480 bytes a row needs no padding
    table = b"".join(struct.pack("<BBBB", b, g, r, 0) for r, g, b in palette)
    info = struct.pack("<IiiHHIIiiII", 40, W, H, 1, 8, 0, len(pixels), 2835, 2835, 256, 256)
    offset = 14 + len(info) + len(table)
    header = struct.pack("<2sIHHI", b"BM", offset + len(pixels), 0, 0, offset)
    return header + info + table + pixels


def main():
    if len(sys.argv) != 2:
        sys.exit("usage: make_splash.py OUTPUT.bmp")
    palette, rows = render()
    with open(sys.argv[1], "wb") as out:
        out.write(bitmap_file(palette, rows))


if __name__ == "__main__":
    main()
