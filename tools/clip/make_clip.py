#!/usr/bin/env python3
"""Draws the clip a view plays while it enumerates, and writes it as an AVI file.

A digital level on its tripod turns its telescope round, as a surveyor sweeps it
from one staff to the next. 80 by 50 pixels, 29 frames at 166,666 microseconds
each, 8 bits a pixel compressed with RLE8 (the encoding the animation control
reads), every frame a key frame. The top-left pixel is the background, which the
control paints transparent. Standard library only.

Usage: make_clip.py [output.avi]   (default server/clip/enum_clip.avi)
"""
import math
import os
import struct
import sys

WIDTH, HEIGHT = 80, 50
FRAMES = 29
MICROSECONDS_PER_FRAME = 166666

# Palette index: colour (blue, green, red).
BACK, OUTLINE, BODY, SHADE, WOOD, METAL, GLASS, BEAM = range(8)
PALETTE = [
    (255, 255, 255),  # background
    (40, 40, 40),     # outlines
    (30, 200, 250),   # yellow housing
    (20, 140, 190),   # its shadow side
    (40, 90, 150),    # wooden legs
    (150, 150, 150),  # metal parts
    (120, 60, 20),    # lens
    (40, 40, 220),    # the line of sight
]


def frame(index):
    px = [[BACK] * WIDTH for _ in range(HEIGHT)]

    def rect(x0, y0, x1, y1, colour):
        for y in range(max(0, y0), min(HEIGHT, y1)):
            for x in range(max(0, x0), min(WIDTH, x1)):
                px[y][x] = colour

    def line(x0, y0, x1, y1, colour, dash=0):
        steps = max(abs(x1 - x0), abs(y1 - y0), 1)
        for i in range(steps + 1):
            if dash and (i // dash) % 2:
                continue
            x = round(x0 + (x1 - x0) * i / steps)
            y = round(y0 + (y1 - y0) * i / steps)
            if 0 <= x < WIDTH and 0 <= y < HEIGHT:
                px[y][x] = colour

    # Tripod: three legs from the head down to the ground.
    for foot in (24, 40, 56):
        line(40, 31, foot, 49, WOOD)
        line(41 if foot > 40 else 39, 31, foot + (1 if foot > 40 else -1 if foot < 40 else 0), 49, WOOD)
    rect(30, 29, 51, 32, METAL)
    # Housing with its shadow side, on the head.
    rect(32, 20, 49, 29, BODY)
    rect(44, 20, 49, 29, SHADE)
    rect(38, 23, 43, 27, OUTLINE)  # the display
    # Telescope: turns once round the vertical axis over the clip.
    angle = 2 * math.pi * index / FRAMES
    reach = math.cos(angle) * 20
    towards = math.sin(angle)
    x0, x1 = round(40 - reach * 0.6), round(40 + reach)
    lo, hi = min(x0, x1), max(x0, x1)
    rect(lo, 13, hi + 1, 19, METAL)
    if abs(reach) < 3:
        # Seen end on: the lens, or the eyepiece from behind.
        rect(36, 12, 45, 20, GLASS if towards > 0 else OUTLINE)
    else:
        lens = x1
        rect(lens - 1, 12, lens + 2, 20, GLASS)
        # The line of sight, out to the edge of the picture.
        edge = WIDTH - 1 if reach > 0 else 0
        line(lens + (2 if reach > 0 else -2), 16, edge, 16, BEAM, dash=3)
    line(lo, 12, hi, 12, OUTLINE)
    return px


def rle8(px):
    """Bottom-up rows of (count, colour) runs, each row ended, the bitmap ended."""
    out = bytearray()
    for row in reversed(px):
        x = 0
        while x < WIDTH:
            colour, run = row[x], 1
            while x + run < WIDTH and row[x + run] == colour and run < 255:
                run += 1
            out += bytes((run, colour))
            x += run
        out += b"\x00\x00"
    out[-2:] = b"\x00\x01"
    return bytes(out)


def chunk(fourcc, data):
    pad = b"\x00" if len(data) % 2 else b""
    return fourcc + struct.pack("<I", len(data)) + data + pad


def riff_list(kind, fourcc, data):
    return kind + struct.pack("<I", len(data) + 4) + fourcc + data


def avi(frames):
    largest = max(len(f) for f in frames)
    avih = struct.pack("<10I4I", MICROSECONDS_PER_FRAME, largest * 6, 0, 0x10, len(frames), 0, 1,
                       largest, WIDTH, HEIGHT, 0, 0, 0, 0)
    strh = struct.pack("<4s4sIHHIIIIIIiI4h", b"vids", b"mrle", 0, 0, 0, 0, MICROSECONDS_PER_FRAME, 1000000,
                       0, len(frames), largest, -1, 0, 0, 0, WIDTH, HEIGHT)
    bih = struct.pack("<IiiHHIIiiII", 40, WIDTH, HEIGHT, 1, 8, 1, WIDTH * HEIGHT, 0, 0,
                      len(PALETTE), len(PALETTE))
    palette = b"".join(struct.pack("<4B", b, g, r, 0) for b, g, r in PALETTE)
    strl = riff_list(b"LIST", b"strl", chunk(b"strh", strh) + chunk(b"strf", bih + palette))
    hdrl = riff_list(b"LIST", b"hdrl", chunk(b"avih", avih) + strl)
    movi_data = bytearray()
    index = bytearray()
    for f in frames:
        # Offsets count from the "movi" fourcc.
        index += struct.pack("<4sIII", b"00dc", 0x10, 4 + len(movi_data), len(f))
        movi_data += chunk(b"00dc", f)
    movi = riff_list(b"LIST", b"movi", bytes(movi_data))
    return riff_list(b"RIFF", b"AVI ", hdrl + movi + chunk(b"idx1", bytes(index)))


def main():
    root = os.path.dirname(os.path.dirname(os.path.dirname(os.path.abspath(__file__))))
    target = sys.argv[1] if len(sys.argv) > 1 else os.path.join(root, "server", "clip", "enum_clip.avi")
    data = avi([rle8(frame(i)) for i in range(FRAMES)])
    with open(target, "wb") as f:
        f.write(data)
    print(f"{target}: {len(data)} bytes, {FRAMES} frames")


if __name__ == "__main__":
    main()
