#!/usr/bin/env python3
"""Writes the decoder test images with encoders other than the ones the
library links: PNG with Python's zlib and struct (every colour type and bit
depth, every row filter, Adam7 interlacing), JPEG with libjpeg-turbo's cjpeg.
Next to each PNG, <name>.expected holds the bytes the decoder must produce
(palette of 256 R, G, B entries then indices; gray 8 bits; gray with alpha as
RGBA; 16-bit samples by their high byte; gray below 8 bits scaled to 0..255).
JPEGs are checked against the .ppm / .pgm they were made from.

Run from this folder: python3 make_images.py
"""
import struct
import subprocess
import zlib

WIDTH, HEIGHT = 7, 5
ADAM7 = [(0, 0, 8, 8), (4, 0, 8, 8), (0, 4, 4, 8), (2, 0, 4, 4), (0, 2, 2, 4), (1, 0, 2, 2), (0, 1, 1, 2)]
CHANNELS = {0: 1, 2: 3, 3: 1, 4: 2, 6: 4}


def chunk(kind, body):
    return struct.pack(">I", len(body)) + kind + body + struct.pack(">I", zlib.crc32(kind + body) & 0xFFFFFFFF)


def sample(x, y, c, depth):
    """A value of depth bits that differs per pixel and channel."""
    top = (1 << depth) - 1
    return (x * 37 + y * 91 + c * 53 + x * y * 7) % (top + 1)


def pack_row(values, depth):
    if depth == 8:
        return bytes(values)
    if depth == 16:
        return b"".join(struct.pack(">H", v) for v in values)
    out, acc, bits = bytearray(), 0, 0
    for v in values:
        acc = (acc << depth) | v
        bits += depth
        if bits == 8:
            out.append(acc)
            acc, bits = 0, 0
    if bits:
        out.append(acc << (8 - bits))
    return bytes(out)


def paeth(a, b, c):
    p = a + b - c
    pa, pb, pc = abs(p - a), abs(p - b), abs(p - c)
    if pa <= pb and pa <= pc:
        return a
    return b if pb <= pc else c


def filter_rows(rows, bpp):
    """Each row gets the next of the five filters in turn."""
    out, previous = bytearray(), None
    for index, row in enumerate(rows):
        kind = index % 5
        prior = previous if previous is not None else bytes(len(row))
        filtered = bytearray()
        for i, value in enumerate(row):
            left = row[i - bpp] if i >= bpp else 0
            up = prior[i]
            corner = prior[i - bpp] if i >= bpp else 0
            predictor = [0, left, up, (left + up) // 2, paeth(left, up, corner)][kind]
            filtered.append((value - predictor) & 0xFF)
        out.append(kind)
        out += filtered
        previous = row
    return bytes(out)


def encode(colour_type, depth, pixels, interlaced, palette=None):
    channels = CHANNELS[colour_type]
    bpp = max(1, channels * depth // 8)

    def rows_of(xs, ys):
        return [pack_row([v for x in xs for v in pixels[y][x]], depth) for y in ys]

    if interlaced:
        data = b""
        for x0, y0, dx, dy in ADAM7:
            xs, ys = range(x0, WIDTH, dx), range(y0, HEIGHT, dy)
            if len(xs) and len(ys):
                data += filter_rows(rows_of(xs, ys), bpp)
    else:
        data = filter_rows(rows_of(range(WIDTH), range(HEIGHT)), bpp)
    png = b"\x89PNG\r\n\x1a\n"
    png += chunk(b"IHDR", struct.pack(">IIBBBBB", WIDTH, HEIGHT, depth, colour_type, 0, 0, int(interlaced)))
    if palette is not None:
        png += chunk(b"PLTE", b"".join(bytes(entry) for entry in palette))
    png += chunk(b"IDAT", zlib.compress(data, 9))
    png += chunk(b"IEND", b"")
    return png


def expected(colour_type, depth, pixels, palette):
    def to8(v):
        if depth == 16:
            return v >> 8
        return v * 255 // ((1 << depth) - 1)

    out = bytearray()
    if colour_type == 3:
        table = bytearray(768)
        for i, entry in enumerate(palette):
            table[3 * i:3 * i + 3] = bytes(entry)
        out += table
    for row in pixels:
        for p in row:
            if colour_type == 3:
                out.append(p[0])
            elif colour_type == 4:
                gray, alpha = to8(p[0]), to8(p[1])
                out += bytes([gray, gray, gray, alpha])
            else:
                out += bytes(to8(v) for v in p)
    return bytes(out)


def make_png(name, colour_type, depth, interlaced=False):
    channels = CHANNELS[colour_type]
    palette = None
    if colour_type == 3:
        # Fewer entries than the depth allows: indices past the end must read
        # as black, so the pixels use every index value.
        count = max(1, (1 << depth) - 2) if depth < 8 else 200
        palette = [((i * 71) % 256, (i * 23 + 5) % 256, (255 - i * 3) % 256) for i in range(count)]
    pixels = [[[sample(x, y, c, depth) for c in range(channels)] for x in range(WIDTH)] for y in range(HEIGHT)]
    with open(name + ".png", "wb") as f:
        f.write(encode(colour_type, depth, pixels, interlaced, palette))
    with open(name + ".expected", "wb") as f:
        f.write(expected(colour_type, depth, pixels, palette))


def make_square_palette():
    """8 × 4 pixels of 8-bit indices into a four-colour palette: a texture
    whose sides are powers of two, uploaded in the paletted format."""
    palette = [(255, 0, 0), (0, 255, 0), (0, 0, 255), (255, 255, 0)]
    rows = [bytes((x // 2 + y) % 4 for x in range(8)) for y in range(4)]
    png = b"\x89PNG\r\n\x1a\n"
    png += chunk(b"IHDR", struct.pack(">IIBBBBB", 8, 4, 8, 3, 0, 0, 0))
    png += chunk(b"PLTE", b"".join(bytes(entry) for entry in palette))
    png += chunk(b"IDAT", zlib.compress(filter_rows(rows, 1), 9))
    png += chunk(b"IEND", b"")
    with open("palette-square.png", "wb") as f:
        f.write(png)


def make_jpegs():
    w, h = 24, 16
    rgb = bytearray()
    gray = bytearray()
    for y in range(h):
        for x in range(w):
            rgb += bytes([40 + x * 7, 60 + y * 9, 200 - x * 3 - y * 2])
            gray.append(30 + x * 5 + y * 4)
    with open("gradient.ppm", "wb") as f:
        f.write(b"P6\n%d %d\n255\n" % (w, h) + rgb)
    with open("gradient.pgm", "wb") as f:
        f.write(b"P5\n%d %d\n255\n" % (w, h) + gray)
    runs = [
        ("baseline.jpg", ["-quality", "95", "-sample", "1x1"], "gradient.ppm"),
        ("progressive.jpg", ["-quality", "95", "-sample", "1x1", "-progressive"], "gradient.ppm"),
        ("subsampled-restart.jpg", ["-quality", "95", "-restart", "1", "-optimize"], "gradient.ppm"),
        ("gray.jpg", ["-quality", "95", "-grayscale"], "gradient.pgm"),
    ]
    for output, options, source in runs:
        subprocess.run(["cjpeg"] + options + ["-outfile", output, source], check=True)


for depth in (1, 2, 4, 8, 16):
    make_png("gray%d" % depth, 0, depth)
for depth in (1, 2, 4, 8):
    make_png("palette%d" % depth, 3, depth)
for depth in (8, 16):
    make_png("rgb%d" % depth, 2, depth)
    make_png("grayalpha%d" % depth, 4, depth)
    make_png("rgba%d" % depth, 6, depth)
make_png("rgb8-interlaced", 2, 8, True)
make_png("palette2-interlaced", 3, 2, True)
make_png("gray16-interlaced", 0, 16, True)
make_png("grayalpha8-interlaced", 4, 8, True)
make_square_palette()
make_jpegs()
