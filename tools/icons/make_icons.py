#!/usr/bin/env python3
"""Draws the module's icons and writes them as .ico files (standard library only).

Every picture is a list of filled shapes in a unit square, rasterised per size
with exact horizontal and supersampled vertical coverage for anti-aliasing.
Each .ico holds nine images: 32/16 at 4 bits, 48/32/16 at 8 bits, and
256 (PNG), 48, 32, 16 at 32 bits.

Usage: make_icons.py [output dir] [--preview preview.png]
"""
import math
import os
import struct
import sys
import zlib

SUBROWS = 6

# ---------------------------------------------------------------- geometry


def rounded_rect(x0, y0, x1, y1, r, seg=8):
    r = max(0.0, min(r, (x1 - x0) / 2, (y1 - y0) / 2))
    if r == 0:
        return [(x0, y0), (x1, y0), (x1, y1), (x0, y1)]
    pts = []
    for cx, cy, a0 in ((x1 - r, y0 + r, -90), (x1 - r, y1 - r, 0),
                       (x0 + r, y1 - r, 90), (x0 + r, y0 + r, 180)):
        for i in range(seg + 1):
            a = math.radians(a0 + 90 * i / seg)
            pts.append((cx + r * math.cos(a), cy + r * math.sin(a)))
    return pts


def circle(cx, cy, r, seg=40):
    return [(cx + r * math.cos(2 * math.pi * i / seg),
             cy + r * math.sin(2 * math.pi * i / seg)) for i in range(seg)]


def thick_line(p0, p1, w):
    dx, dy = p1[0] - p0[0], p1[1] - p0[1]
    n = math.hypot(dx, dy) or 1.0
    ox, oy = -dy / n * w / 2, dx / n * w / 2
    return [(p0[0] + ox, p0[1] + oy), (p1[0] + ox, p1[1] + oy),
            (p1[0] - ox, p1[1] - oy), (p0[0] - ox, p0[1] - oy)]


def transform(pts, scale, dx, dy):
    return [(x * scale + dx, y * scale + dy) for x, y in pts]

# ---------------------------------------------------------------- raster


class Canvas:
    """Premultiplied RGBA in floats, row-major, top-down."""

    def __init__(self, size):
        self.size = size
        self.px = [[0.0, 0.0, 0.0, 0.0] for _ in range(size * size)]

    def fill(self, pts, rgb, alpha=1.0):
        size = self.size
        poly = [(x * size, y * size) for x, y in pts]
        ys = [p[1] for p in poly]
        top, bottom = max(0, int(math.floor(min(ys)))), min(size, int(math.ceil(max(ys))))
        edges = list(zip(poly, poly[1:] + poly[:1]))
        for py in range(top, bottom):
            cov = {}
            for k in range(SUBROWS):
                sy = py + (k + 0.5) / SUBROWS
                xs = []
                for (ax, ay), (bx, by) in edges:
                    if (ay <= sy < by) or (by <= sy < ay):
                        xs.append(ax + (sy - ay) * (bx - ax) / (by - ay))
                xs.sort()
                for i in range(0, len(xs) - 1, 2):
                    xa, xb = max(0.0, xs[i]), min(float(size), xs[i + 1])
                    if xb <= xa:
                        continue
                    for pxl in range(int(xa), min(size, int(math.ceil(xb)))):
                        part = min(xb, pxl + 1) - max(xa, pxl)
                        if part > 0:
                            cov[pxl] = cov.get(pxl, 0.0) + part / SUBROWS
            r, g, b = rgb
            for pxl, c in cov.items():
                a = min(1.0, c) * alpha
                d = self.px[py * size + pxl]
                d[0] = r * a + d[0] * (1 - a)
                d[1] = g * a + d[1] * (1 - a)
                d[2] = b * a + d[2] * (1 - a)
                d[3] = a + d[3] * (1 - a)

    def rgba8(self):
        """Straight (not premultiplied) 8-bit RGBA tuples."""
        out = []
        for r, g, b, a in self.px:
            if a <= 0.0:
                out.append((0, 0, 0, 0))
                continue
            out.append((int(round(min(1.0, r / a) * 255)), int(round(min(1.0, g / a) * 255)),
                        int(round(min(1.0, b / a) * 255)), int(round(min(1.0, a) * 255))))
        return out


def hexrgb(h):
    return tuple(int(h[i:i + 2], 16) / 255.0 for i in (1, 3, 5))

# ---------------------------------------------------------------- pictures

OUTLINE = hexrgb('#2B2B2B')


def outlined(c, pts_outer, pts_inner, fill):
    c.fill(pts_outer, OUTLINE)
    c.fill(pts_inner, fill)


def draw_level(c, s, scale=1.0, dx=0.0, dy=0.0):
    """A digital level on a tripod. `s` is the outline width in units."""
    T = lambda pts: transform(pts, scale, dx, dy)
    wood, wood_dark = hexrgb('#C98A2E'), hexrgb('#8A5A17')
    # Below 20 pixels dark outlines and small parts turn to mud: fewer, lighter strokes.
    small = c.size * scale < 20
    line = hexrgb('#6A5410') if small else OUTLINE
    head = (0.5, 0.56)
    # Tripod legs: the middle one sits behind, darker.
    for foot, col in (((0.50, 0.97), wood_dark), ((0.16, 0.97), wood), ((0.84, 0.97), wood)):
        if small:
            c.fill(T(thick_line(head, foot, 0.13)), col)
        else:
            c.fill(T(thick_line(head, foot, 0.085 + 2 * s)), OUTLINE)
            c.fill(T(thick_line(head, foot, 0.085)), col)
    if not small:
        outlined(c, T(rounded_rect(0.26, 0.52, 0.74, 0.60, 0.02)),
                 T(rounded_rect(0.26 + s, 0.52 + s, 0.74 - s, 0.60 - s, 0.01)), hexrgb('#6E6E6E'))
    # Instrument body with its display.
    c.fill(T(rounded_rect(0.24, 0.30, 0.76, 0.55 if small else 0.53, 0.05)), line)
    c.fill(T(rounded_rect(0.24 + s, 0.30 + s, 0.76 - s, (0.55 if small else 0.53) - s, 0.04)), hexrgb('#F3C623'))
    if small:
        c.fill(T(rounded_rect(0.32, 0.38, 0.58, 0.46, 0.0)), hexrgb('#2F6FA8'))
    else:
        c.fill(T(rounded_rect(0.31, 0.36, 0.56, 0.47, 0.015)), hexrgb('#1F3B57'))
        c.fill(T(rounded_rect(0.33, 0.38, 0.54, 0.41, 0.0)), hexrgb('#7FD3F0'))
        c.fill(T(circle(0.65, 0.42, 0.035)), hexrgb('#2B2B2B'))
    # Telescope with objective and eyepiece.
    tube_line = hexrgb('#707070') if small else OUTLINE
    c.fill(T(rounded_rect(0.10, 0.13, 0.84, 0.31, 0.05)), tube_line)
    c.fill(T(rounded_rect(0.10 + s, 0.13 + s, 0.84 - s, 0.31 - s, 0.04)), hexrgb('#E8E8E8'))
    c.fill(T(rounded_rect(0.10 + s, 0.13 + s, 0.84 - s, 0.19, 0.03)), hexrgb('#FFFFFF'))
    if small:
        c.fill(T(rounded_rect(0.80, 0.10, 0.93, 0.34, 0.03)), hexrgb('#3C6FB0'))
    else:
        outlined(c, T(rounded_rect(0.80, 0.10, 0.93, 0.34, 0.03)),
                 T(rounded_rect(0.80 + s, 0.10 + s, 0.93 - s, 0.34 - s, 0.02)), hexrgb('#3C6FB0'))
        c.fill(T(rounded_rect(0.05, 0.16, 0.12, 0.28, 0.02)), OUTLINE)


def draw_plus_badge(c, s, cx, cy, r):
    c.fill(circle(cx, cy, r + s), hexrgb('#1B5E20'))
    c.fill(circle(cx, cy, r), hexrgb('#3DAA47'))
    arm, thick = r * 0.62, r * 0.34
    white = hexrgb('#FFFFFF')
    c.fill(rounded_rect(cx - arm, cy - thick / 2, cx + arm, cy + thick / 2, thick * 0.2), white)
    c.fill(rounded_rect(cx - thick / 2, cy - arm, cx + thick / 2, cy + arm, thick * 0.2), white)


def draw_add(c, s):
    draw_level(c, s / 0.72, scale=0.72, dx=0.0, dy=0.0)
    draw_plus_badge(c, s, 0.70, 0.70, 0.27)


def draw_job_file(c, s):
    page = [(0.16, 0.04), (0.64, 0.04), (0.86, 0.26), (0.86, 0.96), (0.16, 0.96)]
    inner = [(0.16 + s, 0.04 + s), (0.64 - s * 0.4, 0.04 + s), (0.86 - s, 0.26 + s * 0.4),
             (0.86 - s, 0.96 - s), (0.16 + s, 0.96 - s)]
    c.fill(page, hexrgb('#5A5A5A'))
    c.fill(inner, hexrgb('#FFFFFF'))
    c.fill([(0.64, 0.04), (0.64, 0.26), (0.86, 0.26)], hexrgb('#5A5A5A'))
    c.fill([(0.64 + s, 0.04 + 2.4 * s), (0.64 + s, 0.26 - s), (0.86 - 2.4 * s, 0.26 - s)],
           hexrgb('#D6D6D6'))
    grey = hexrgb('#9A9A9A')
    for y, x1 in ((0.14, 0.56), (0.22, 0.56), (0.30, 0.76)):
        c.fill(rounded_rect(0.25, y - 0.022, x1, y + 0.022, 0.0), grey)
    # A surveyed traverse: legs in blue, stations as red marks.
    stations = [(0.28, 0.84), (0.40, 0.56), (0.60, 0.68), (0.74, 0.44)]
    blue, red = hexrgb('#1E63C4'), hexrgb('#D32F2F')
    for a, b in zip(stations, stations[1:]):
        c.fill(thick_line(a, b, 0.055), blue)
    for x, y in stations:
        c.fill([(x, y - 0.075), (x + 0.07, y + 0.05), (x - 0.07, y + 0.05)], red)


PICTURES = {
    'level.ico': draw_level,
    'add_level.ico': draw_add,
    'job_file.ico': draw_job_file,
}


def render(draw, size):
    c = Canvas(size)
    # A full pixel of outline drowns a 16-pixel picture; there it is kept lighter.
    draw(c, max((0.7 if size < 32 else 1.0) / size, 0.02))
    return c.rgba8()

# ---------------------------------------------------------------- palettes


def median_cut(colors, n):
    """colors: {rgb: count}. Returns up to n palette colours."""
    boxes = [list(colors.items())]
    while len(boxes) < n:
        best, best_range, best_ch = None, -1, 0
        for i, box in enumerate(boxes):
            if len(box) < 2:
                continue
            for ch in range(3):
                vals = [c[ch] for c, _ in box]
                rng = max(vals) - min(vals)
                if rng > best_range:
                    best, best_range, best_ch = i, rng, ch
        if best is None or best_range == 0:
            break
        box = sorted(boxes.pop(best), key=lambda e: e[0][best_ch])
        total, acc, cut = sum(k for _, k in box), 0, 1
        for j, (_, k) in enumerate(box):
            acc += k
            if acc * 2 >= total:
                cut = max(1, min(len(box) - 1, j + 1))
                break
        boxes += [box[:cut], box[cut:]]
    pal = []
    for box in boxes:
        total = sum(k for _, k in box)
        pal.append(tuple(int(round(sum(c[ch] * k for c, k in box) / total)) for ch in range(3)))
    return pal


def quantise(rgba, ncolors):
    """Index 0 is black, used under transparent pixels. Returns (palette, indexes, mask)."""
    counts = {}
    for r, g, b, a in rgba:
        if a >= 128:
            counts[(r, g, b)] = counts.get((r, g, b), 0) + 1
    pal = [(0, 0, 0)] + median_cut(counts, ncolors - 1)
    pal += [(0, 0, 0)] * (ncolors - len(pal))
    cache, idx, mask = {}, [], []
    for r, g, b, a in rgba:
        if a < 128:
            idx.append(0)
            mask.append(1)
            continue
        key = (r, g, b)
        if key not in cache:
            cache[key] = min(range(len(pal)), key=lambda i: (pal[i][0] - r) ** 2 +
                             (pal[i][1] - g) ** 2 + (pal[i][2] - b) ** 2)
        idx.append(cache[key])
        mask.append(0)
    return pal, idx, mask

# ---------------------------------------------------------------- files


def pack_bits(values, bpp, width):
    """One bottom-up-ready row: values packed MSB first, padded to 32 bits."""
    out, acc, nbits = bytearray(), 0, 0
    for v in values:
        acc = (acc << bpp) | v
        nbits += bpp
        if nbits == 8:
            out.append(acc)
            acc, nbits = 0, 0
    if nbits:
        out.append(acc << (8 - nbits))
    while len(out) % 4:
        out.append(0)
    return bytes(out)


def bmp_entry(size, bpp, rgba):
    rows_xor, rows_and = [], []
    if bpp == 32:
        mask = [1 if a == 0 else 0 for _, _, _, a in rgba]
        for y in range(size):
            rows_xor.append(b''.join(struct.pack('BBBB', b, g, r, a)
                                     for r, g, b, a in rgba[y * size:(y + 1) * size]))
        palette = b''
    else:
        pal, idx, mask = quantise(rgba, 1 << bpp)
        palette = b''.join(struct.pack('BBBB', b, g, r, 0) for r, g, b in pal)
        for y in range(size):
            rows_xor.append(pack_bits(idx[y * size:(y + 1) * size], bpp, size))
    for y in range(size):
        rows_and.append(pack_bits(mask[y * size:(y + 1) * size], 1, size))
    body = b''.join(reversed(rows_xor)) + b''.join(reversed(rows_and))
    header = struct.pack('<IiiHHIIiiII', 40, size, size * 2, 1, bpp, 0, len(body), 0, 0, 0, 0)
    return header + palette + body


def png(size, rgba):
    def chunk(kind, data):
        return (struct.pack('>I', len(data)) + kind + data +
                struct.pack('>I', zlib.crc32(kind + data) & 0xFFFFFFFF))
    raw = b''.join(b'\0' + bytes(v for p in rgba[y * size:(y + 1) * size] for v in p)
                   for y in range(size))
    return (b'\x89PNG\r\n\x1a\n' +
            chunk(b'IHDR', struct.pack('>IIBBBBB', size, size, 8, 6, 0, 0, 0)) +
            chunk(b'IDAT', zlib.compress(raw, 9)) + chunk(b'IEND', b''))


LAYOUT = [(32, 4), (16, 4), (48, 8), (32, 8), (16, 8), (256, 32), (48, 32), (32, 32), (16, 32)]


def make_ico(draw):
    renders = {s: render(draw, s) for s in sorted({s for s, _ in LAYOUT})}
    images = []
    for size, bpp in LAYOUT:
        data = png(size, renders[size]) if size == 256 else bmp_entry(size, bpp, renders[size])
        images.append((size, bpp, data))
    out = struct.pack('<HHH', 0, 1, len(images))
    offset = 6 + 16 * len(images)
    for size, bpp, data in images:
        out += struct.pack('<BBBBHHII', size % 256, size % 256, 16 if bpp == 4 else 0, 0,
                           1, bpp, len(data), offset)
        offset += len(data)
    return out + b''.join(d for _, _, d in images), renders

# ---------------------------------------------------------------- preview


def preview(sheets, path):
    """Each picture in a row at every size, scaled up, over a light background,
    then its 8-bit and 4-bit quantisations at 32."""
    cells = [(256, 1), (48, 4), (32, 6), (16, 12)]
    cell = 256
    width = cell * (len(cells) + 2) + 10 * (len(cells) + 3)
    height = (cell + 10) * len(sheets) + 10
    img = [[(236, 236, 236, 255)] * width for _ in range(height)]

    def blit(rgba, size, scale, ox, oy):
        for y in range(size * scale):
            for x in range(size * scale):
                r, g, b, a = rgba[(y // scale) * size + x // scale]
                br, bg, bb, _ = img[oy + y][ox + x]
                img[oy + y][ox + x] = (
                    (r * a + br * (255 - a)) // 255, (g * a + bg * (255 - a)) // 255,
                    (b * a + bb * (255 - a)) // 255, 255)

    for row, renders in enumerate(sheets):
        oy = 10 + row * (cell + 10)
        ox = 10
        for size, scale in cells:
            blit(renders[size], size, scale, ox, oy)
            ox += cell + 10
        for bits in (8, 4):
            pal, idx, mask = quantise(renders[32], 1 << bits)
            q = [(0, 0, 0, 0) if m else pal[i] + (255,) for i, m in zip(idx, mask)]
            blit(q, 32, 8, ox, oy)
            ox += cell + 10
    flat = [p for r in img for p in r]
    with open(path, 'wb') as f:
        f.write(png_wh(width, height, flat))


def png_wh(w, h, rgba):
    def chunk(kind, data):
        return (struct.pack('>I', len(data)) + kind + data +
                struct.pack('>I', zlib.crc32(kind + data) & 0xFFFFFFFF))
    raw = b''.join(b'\0' + bytes(v for p in rgba[y * w:(y + 1) * w] for v in p) for y in range(h))
    return (b'\x89PNG\r\n\x1a\n' + chunk(b'IHDR', struct.pack('>IIBBBBB', w, h, 8, 6, 0, 0, 0)) +
            chunk(b'IDAT', zlib.compress(raw, 6)) + chunk(b'IEND', b''))


def main(argv):
    out_dir = os.path.join(os.path.dirname(os.path.abspath(__file__)), '..', '..', 'server', 'icons')
    preview_path = None
    args = list(argv)
    if '--preview' in args:
        i = args.index('--preview')
        preview_path = args[i + 1]
        del args[i:i + 2]
    if args:
        out_dir = args[0]
    os.makedirs(out_dir, exist_ok=True)
    sheets = []
    for name, draw in PICTURES.items():
        data, renders = make_ico(draw)
        with open(os.path.join(out_dir, name), 'wb') as f:
            f.write(data)
        sheets.append(renders)
    if preview_path:
        preview(sheets, preview_path)


if __name__ == '__main__':
    main(sys.argv[1:])
