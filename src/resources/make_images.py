#!/usr/bin/env python3
"""Draws the module's icons and the searching animation.

Usage: make_images.py OUTPUT_DIR

Icons (16, 32 and 48 px, 32-bit with alpha): calvex.ico and brennor.ico show a GNSS
receiver (a survey antenna dome on a pole) in each brand's colour, file.ico a logged data
file, noitem.ico an empty slot, module.ico the antenna with both colours. searching.avi is
an uncompressed 8-bit clip of a satellite circling the antenna, the format the animation
control plays without a codec.
"""
import math
import os
import struct
import sys

CALVEX = (0x1F, 0x5F, 0xBF)    # blue
BRENNOR = (0x1F, 0x8F, 0x3F)   # green
DARK = (0x30, 0x30, 0x30)
WHITE = (0xFF, 0xFF, 0xFF)
PAPER = (0xF4, 0xF4, 0xEC)
GREY = (0x90, 0x90, 0x90)
ORANGE = (0xE0, 0x80, 0x10)


class Canvas:
    """RGBA canvas with coordinates in a 0..1 square, so each size draws the same picture."""

    def __init__(self, size):
        self.size = size
        self.px = [[(0, 0, 0, 0)] * size for _ in range(size)]

    def _fill(self, inside, colour, alpha=255):
        n = self.size
        for y in range(n):
            for x in range(n):
                # 4x4 supersampling gives smooth edges at 16 px
                hits = sum(inside((x + (i + 0.5) / 4) / n, (y + (j + 0.5) / 4) / n)
                           for i in range(4) for j in range(4))
                if hits:
                    a = alpha * hits // 16
                    self._blend(x, y, colour, a)

    def _blend(self, x, y, colour, a):
        r0, g0, b0, a0 = self.px[y][x]
        out_a = a + a0 * (255 - a) // 255
        if out_a == 0:
            return
        mix = [(c * a + c0 * a0 * (255 - a) // 255) // out_a for c, c0 in zip(colour, (r0, g0, b0))]
        self.px[y][x] = (mix[0], mix[1], mix[2], out_a)

    def rect(self, x0, y0, x1, y1, colour):
        self._fill(lambda x, y: x0 <= x <= x1 and y0 <= y <= y1, colour)

    def ellipse(self, cx, cy, rx, ry, colour, upper_half=False):
        def inside(x, y):
            if upper_half and y > cy:
                return False
            return ((x - cx) / rx) ** 2 + ((y - cy) / ry) ** 2 <= 1
        self._fill(inside, colour)

    def polygon(self, points, colour):
        def inside(x, y):
            hit = False
            j = len(points) - 1
            for i, (xi, yi) in enumerate(points):
                xj, yj = points[j]
                if (yi > y) != (yj > y) and x < (xj - xi) * (y - yi) / (yj - yi) + xi:
                    hit = not hit
                j = i
            return hit
        self._fill(inside, colour)


def draw_receiver(c, colour, second=None):
    c.rect(0.45, 0.45, 0.55, 0.86, DARK)                       # pole
    c.polygon([(0.25, 0.95), (0.5, 0.80), (0.75, 0.95)], DARK)  # tripod foot
    c.ellipse(0.5, 0.47, 0.40, 0.10, DARK)                      # ground plane rim
    c.ellipse(0.5, 0.45, 0.38, 0.34, colour, upper_half=True)   # radome
    if second:
        c.polygon([(0.5, 0.11), (0.88, 0.45), (0.5, 0.45)], second)
    c.ellipse(0.36, 0.30, 0.07, 0.05, WHITE)                    # highlight


def draw_file(c):
    c.polygon([(0.18, 0.04), (0.62, 0.04), (0.84, 0.26), (0.84, 0.96), (0.18, 0.96)], DARK)
    c.polygon([(0.23, 0.09), (0.59, 0.09), (0.79, 0.29), (0.79, 0.91), (0.23, 0.91)], PAPER)
    c.polygon([(0.59, 0.09), (0.79, 0.29), (0.59, 0.29)], GREY)
    for i, width in enumerate((0.40, 0.30, 0.44, 0.24)):
        y = 0.42 + i * 0.12
        c.rect(0.31, y, 0.31 + width, y + 0.05, CALVEX if i % 2 == 0 else ORANGE)


def draw_noitem(c):
    c.ellipse(0.5, 0.5, 0.42, 0.42, GREY)
    c.ellipse(0.5, 0.5, 0.32, 0.32, (0, 0, 0))
    c.px = [[(r, g, b, 0) if (r, g, b) == (0, 0, 0) else (r, g, b, a) for (r, g, b, a) in row]
            for row in c.px]
    c.polygon([(0.22, 0.28), (0.28, 0.22), (0.78, 0.72), (0.72, 0.78)], GREY)


def icon_image(draw, size):
    c = Canvas(size)
    draw(c)
    rows = []
    for y in reversed(range(size)):  # DIBs are stored bottom-up
        rows.append(b"".join(struct.pack("BBBB", b, g, r, a) for (r, g, b, a) in c.px[y]))
    xor = b"".join(rows)
    mask_stride = ((size + 31) // 32) * 4
    and_mask = bytes(mask_stride * size)  # the alpha channel decides; the mask stays clear
    header = struct.pack("<IiiHHIIiiII", 40, size, size * 2, 1, 32, 0, len(xor) + len(and_mask), 0, 0, 0, 0)
    return header + xor + and_mask


def write_ico(path, draw, sizes=(16, 32, 48)):
    images = [icon_image(draw, s) for s in sizes]
    out = struct.pack("<HHH", 0, 1, len(images))
    offset = 6 + 16 * len(images)
    for size, data in zip(sizes, images):
        out += struct.pack("<BBBBHHII", size % 256, size % 256, 0, 0, 1, 32, len(data), offset)
        offset += len(data)
    with open(path, "wb") as f:
        f.write(out + b"".join(images))


def chunk(tag, data):
    pad = b"\0" if len(data) % 2 else b""
    return tag + struct.pack("<I", len(data)) + data + pad


def lst(tag, *chunks):
    body = tag + b"".join(chunks)
    return b"LIST" + struct.pack("<I", len(body)) + body


def write_avi(path, frames=12, size=32):
    palette = [(0, 0, 0), (0xFF, 0xFF, 0xFF), CALVEX, DARK, ORANGE, GREY] + [(0, 0, 0)] * 250
    index = {colour: i for i, colour in reversed(list(enumerate(palette)))}
    stride = (size + 3) // 4 * 4
    images = []
    for f in range(frames):
        c = Canvas(size)
        c.rect(0, 0, 1, 1, WHITE)
        c.ellipse(0.5, 0.5, 0.36, 0.36, GREY)
        c.ellipse(0.5, 0.5, 0.33, 0.33, WHITE)
        c.rect(0.46, 0.55, 0.54, 0.8, DARK)
        c.ellipse(0.5, 0.57, 0.18, 0.16, CALVEX, upper_half=True)
        angle = 2 * math.pi * f / frames
        sx, sy = 0.5 + 0.35 * math.cos(angle), 0.5 + 0.35 * math.sin(angle)
        c.rect(sx - 0.07, sy - 0.05, sx + 0.07, sy + 0.05, ORANGE)
        raw = bytearray()
        for y in reversed(range(size)):
            for x in range(size):
                r, g, b, _ = c.px[y][x]
                nearest = min(index, key=lambda col: sum((p - q) ** 2 for p, q in zip(col, (r, g, b))))
                raw.append(index[nearest])
            raw.extend(bytes(stride - size))
        images.append(bytes(raw))
    frame_bytes = len(images[0])
    usec = 100000
    avih = struct.pack("<IIIIIIIIII4I", usec, frame_bytes * 10, 0, 0x10, frames, 0, 1, frame_bytes,
                       size, size, 0, 0, 0, 0)
    strh = struct.pack("<4s4sIHHIIIIIIIIhhhh", b"vids", b"DIB ", 0, 0, 0, 0, 1, 10, 0, frames,
                       frame_bytes, 0xFFFFFFFF, 0, 0, 0, size, size)
    bih = struct.pack("<IiiHHIIiiII", 40, size, size, 1, 8, 0, frame_bytes, 0, 0, 256, 0)
    pal = b"".join(struct.pack("BBBB", b, g, r, 0) for (r, g, b) in palette)
    hdrl = lst(b"hdrl", chunk(b"avih", avih), lst(b"strl", chunk(b"strh", strh), chunk(b"strf", bih + pal)))
    movi_chunks = [chunk(b"00db", img) for img in images]
    movi = lst(b"movi", *movi_chunks)
    idx = b""
    offset = 4
    for img in images:
        idx += struct.pack("<4sIII", b"00db", 0x10, offset, len(img))
        offset += 8 + len(img) + (len(img) % 2)
    body = b"AVI " + hdrl + movi + chunk(b"idx1", idx)
    with open(path, "wb") as f:
        f.write(b"RIFF" + struct.pack("<I", len(body)) + body)


def main():
    out = sys.argv[1]
    os.makedirs(out, exist_ok=True)
    write_ico(os.path.join(out, "calvex.ico"), lambda c: draw_receiver(c, CALVEX))
    write_ico(os.path.join(out, "brennor.ico"), lambda c: draw_receiver(c, BRENNOR))
    write_ico(os.path.join(out, "noitem.ico"), draw_noitem)
    write_ico(os.path.join(out, "file.ico"), draw_file)
    write_ico(os.path.join(out, "module.ico"), lambda c: draw_receiver(c, CALVEX, BRENNOR))
    write_avi(os.path.join(out, "searching.avi"))


if __name__ == "__main__":
    main()
