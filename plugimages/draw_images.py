#!/usr/bin/env python3
"""Draws the plugin's toolbar and transport button images: simple light
symbols on a transparent background, an orange variant for the pressed state.
Writes the PNG files next to this script; run it again after changing a
symbol. Only the standard library is used."""

import os
import struct
import zlib

HERE = os.path.dirname(os.path.abspath(__file__))
SAMPLES = 4  # sub-pixel samples per axis, for smooth edges

UP = (236, 236, 240)
DOWN = (255, 160, 48)


def inside_polygon(x, y, points):
    crossings = False
    for (x1, y1), (x2, y2) in zip(points, points[1:] + points[:1]):
        if (y1 > y) != (y2 > y) and x < x1 + (y - y1) * (x2 - x1) / (y2 - y1):
            crossings = not crossings
    return crossings


def triangle(left, top, right, bottom, pointing_right=True):
    mid = (top + bottom) / 2
    if pointing_right:
        return lambda x, y: inside_polygon(x, y, [(left, top), (right, mid), (left, bottom)])
    return lambda x, y: inside_polygon(x, y, [(right, top), (left, mid), (right, bottom)])


def box(left, top, right, bottom):
    return lambda x, y: left <= x <= right and top <= y <= bottom


def frame(left, top, right, bottom, width):
    outer = box(left, top, right, bottom)
    inner = box(left + width, top + width, right - width, bottom - width)
    return lambda x, y: outer(x, y) and not inner(x, y)


def union(*shapes):
    return lambda x, y: any(shape(x, y) for shape in shapes)


# Symbols on a 30 x 30 grid (the toolbar image scales them to 32 x 32).
SYMBOLS = {
    "play": triangle(9, 6, 24, 24),
    "pause": union(box(8, 6, 12.5, 24), box(17.5, 6, 22, 24)),
    "stop": box(8, 8, 22, 22),
    "reverse": union(triangle(3, 8, 15, 22, False), triangle(15, 8, 27, 22, False)),
    "forward": union(triangle(3, 8, 15, 22), triangle(15, 8, 27, 22)),
    # Hand over to the file player: a sheet with a play mark on it.
    "sw": union(frame(6, 3, 24, 27, 2), triangle(11, 10, 20, 20)),
}

# The toolbar's disk playback: a disk drive with a play mark, in colours that
# stand out on a light toolbar (a light symbol there looks disabled).
TOOLBAR = [
    (box(2, 5, 28, 25), (28, 72, 150)),
    (triangle(10, 8.5, 21, 21.5), (255, 170, 40)),
]


def render(shape, size, colour):
    scale = 30.0 / size
    rows = []
    for py in range(size):
        row = bytearray([0])  # filter type: none
        for px in range(size):
            hits = 0
            for sy in range(SAMPLES):
                for sx in range(SAMPLES):
                    x = (px + (sx + 0.5) / SAMPLES) * scale
                    y = (py + (sy + 0.5) / SAMPLES) * scale
                    hits += shape(x, y)
            alpha = round(255 * hits / (SAMPLES * SAMPLES))
            row += bytes(colour) + bytes([alpha])
        rows.append(bytes(row))
    return b"".join(rows)


def render_layers(layers, size):
    """Shapes painted one over the other, each in its own colour."""
    scale = 30.0 / size
    rows = []
    for py in range(size):
        row = bytearray([0])
        for px in range(size):
            colour, alpha = (0, 0, 0), 0
            for shape, layer_colour in layers:
                hits = sum(shape((px + (sx + 0.5) / SAMPLES) * scale, (py + (sy + 0.5) / SAMPLES) * scale)
                           for sy in range(SAMPLES) for sx in range(SAMPLES))
                if hits:
                    cover = hits / (SAMPLES * SAMPLES)
                    colour = tuple(round(c * (1 - cover) + l * cover) if alpha else l
                                   for c, l in zip(colour, layer_colour))
                    alpha = max(alpha, round(255 * cover))
            row += bytes(colour) + bytes([alpha])
        rows.append(bytes(row))
    return b"".join(rows)


def png(path, size, pixels):
    def chunk(kind, data):
        body = kind + data
        return struct.pack(">I", len(data)) + body + struct.pack(">I", zlib.crc32(body) & 0xFFFFFFFF)

    header = struct.pack(">IIBBBBB", size, size, 8, 6, 0, 0, 0)  # 8-bit RGBA
    with open(path, "wb") as out:
        out.write(b"\x89PNG\r\n\x1a\n")
        out.write(chunk(b"IHDR", header))
        out.write(chunk(b"IDAT", zlib.compress(pixels, 9)))
        out.write(chunk(b"IEND", b""))


def main():
    for name in ("play", "pause", "stop", "reverse", "forward", "sw"):
        png(os.path.join(HERE, name + "_up.png"), 30, render(SYMBOLS[name], 30, UP))
        png(os.path.join(HERE, name + "_dn.png"), 30, render(SYMBOLS[name], 30, DOWN))
    png(os.path.join(HERE, "remoteplay.png"), 32, render_layers(TOOLBAR, 32))


if __name__ == "__main__":
    main()
