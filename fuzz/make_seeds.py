#!/usr/bin/env python3
"""Makes the seeds of the fuzz targets: a tiny file of each kind that a reader knows.

TGA and PNG are written here; JPEG needs `cjpeg` (libjpeg-turbo-progs) and ImageMagick.
"""

import pathlib
import shutil
import struct
import subprocess
import zlib

SEEDS = pathlib.Path(__file__).parent / "seeds"


def save(kind, name, data):
    folder = SEEDS / kind
    folder.mkdir(parents=True, exist_ok=True)
    (folder / f"{name}.{kind}").write_bytes(data)


def tga(kind, depth, descriptor, pixels, palette_bits=0, palette=b"", size=(3, 2)):
    count = len(palette) // ((palette_bits + 7) // 8) if palette else 0
    return struct.pack("<BBBHHBHHHHBB", 2, bool(palette), kind, 0, count, palette_bits, 0, 0,
                       *size, depth, descriptor) + b"id" + palette + pixels


def make_tga():
    ramp = bytes(range(1, 65))
    for depth in (15, 16, 24, 32):
        pixel_bytes = (depth + 7) // 8
        for descriptor in (0x00, 0x30):
            descriptor |= {16: 1, 32: 8}.get(depth, 0)
            name = f"colour-{depth}-{descriptor:02x}"
            save("tga", name, tga(2, depth, descriptor, ramp[:6 * pixel_bytes]))
            packets = b"\x83" + ramp[:pixel_bytes] + b"\x01" + ramp[:2 * pixel_bytes]
            save("tga", name + "-rle", tga(10, depth, descriptor, packets))
        palette = ramp[:4 * pixel_bytes]
        save("tga", f"indexed-{depth}", tga(1, 8, 0, b"\0\1\2\3\2\1", depth, palette))
        save("tga", f"indexed-{depth}-rle", tga(9, 8, 0, b"\x82\1\x02\0\1\2", depth, palette))
    save("tga", "grey-8", tga(3, 8, 0, ramp[:6]))
    save("tga", "grey-8-rle", tga(11, 8, 0, b"\x85\7"))
    save("tga", "grey-16", tga(3, 16, 8, ramp[:12]))
    save("tga", "grey-16-rle", tga(11, 16, 8, b"\x85\7\x09"))


def chunk(name, data):
    body = name + data
    return struct.pack(">I", len(data)) + body + struct.pack(">I", zlib.crc32(body))


CHANNELS = {0: 1, 2: 3, 3: 1, 4: 2, 6: 4}


def passes(size, interlaced):
    if not interlaced:
        return [(size, size)]
    steps = ((0, 0, 8, 8), (4, 0, 8, 8), (0, 4, 4, 8), (2, 0, 4, 4), (0, 2, 2, 4), (1, 0, 2, 2),
             (0, 1, 1, 2))
    sizes = [((size - x + dx - 1) // dx, (size - y + dy - 1) // dy) for x, y, dx, dy in steps]
    return [(w, h) for w, h in sizes if w and h]


def png(colour, depth, interlaced=False, extra=()):
    size = 5
    rows = b""
    for width, height in passes(size, interlaced):
        row_bytes = (width * depth * CHANNELS[colour] + 7) // 8
        for y in range(height):
            # Two-entry palettes have no index beyond 1, whatever the depth.
            values = bytes([y % 2] * row_bytes) if colour == 3 else bytes(
                (17 * y + 29 * x) % 256 for x in range(row_bytes))
            rows += bytes([y % 5 if colour != 3 else 0]) + values
    header = struct.pack(">IIBBBBB", size, size, depth, colour, 0, 0, interlaced)
    chunks = [chunk(b"IHDR", header)] + [chunk(*entry) for entry in extra]
    chunks += [chunk(b"IDAT", zlib.compress(rows, 9)), chunk(b"IEND", b"")]
    return b"\x89PNG\r\n\x1a\n" + b"".join(chunks)


def make_png():
    palette = (b"PLTE", bytes(range(6)))
    for colour, depths in ((0, (1, 2, 4, 8, 16)), (2, (8, 16)), (3, (1, 2, 4, 8)), (4, (8, 16)),
                           (6, (8, 16))):
        needed = [palette] if colour == 3 else []
        for depth in depths:
            for interlaced in (False, True):
                name = f"colour-{colour}-{depth}" + ("-adam7" if interlaced else "")
                save("png", name, png(colour, depth, interlaced, needed))
    save("png", "transparent-0", png(0, 8, extra=[(b"tRNS", b"\0\x1d")]))
    save("png", "transparent-2", png(2, 16, extra=[(b"tRNS", bytes(6))]))
    save("png", "transparent-3", png(3, 2, extra=[palette, (b"tRNS", b"\x80")]))
    profile = b"name\0\0" + zlib.compress(bytes(132))
    save("png", "chunks", png(2, 8, extra=[
        (b"gAMA", struct.pack(">I", 45455)),
        (b"cHRM", struct.pack(">8I", *range(1000, 9000, 1000))), (b"iCCP", profile),
        (b"pHYs", struct.pack(">IIB", 300, 300, 1)),
        (b"tIME", bytes([7, 0xD9, 1, 2, 3, 4, 5])), (b"tEXt", b"Author\0somebody"),
        (b"zTXt", b"Comment\0\0" + zlib.compress(b"a comment")), (b"oFFs", bytes(9)),
        (b"iTXt", b"Title\0\0\0en\0\0a title"), (b"bKGD", bytes(6))]))
    save("png", "srgb", png(2, 8, extra=[(b"sRGB", b"\0")]))


def make_jpeg():
    def run(*command, data):
        return subprocess.run(command, input=data, stdout=subprocess.PIPE, check=True).stdout

    colour = b"P6 9 9 255\n" + bytes((x * 37) % 256 for x in range(9 * 9 * 3))
    grey = b"P5 9 9 255\n" + bytes((x * 37) % 256 for x in range(9 * 9))
    kinds = {"grey": (grey,), "restart": (colour, "-restart", "1B"),
             "arithmetic": (colour, "-arithmetic"), "progressive": (colour, "-progressive"),
             "rgb": (colour, "-rgb")}
    for sample in ("1x1", "2x1", "2x2", "4x1", "1x2"):
        kinds["sample-" + sample] = (colour, "-sample", sample)
    for name, (data, *options) in kinds.items():
        save("jpeg", name, run("cjpeg", "-quality", "30", *options, data=data))
    convert = shutil.which("convert-im6.q16") or shutil.which("convert")
    save("jpeg", "cmyk", run(convert, "ppm:-", "-colorspace", "CMYK", "-quality", "30", "jpg:-",
                             data=colour))
    plain = (SEEDS / "jpeg" / "grey.jpeg").read_bytes()

    def marker(code, data):
        return bytes([0xFF, code]) + struct.pack(">H", len(data) + 2) + data

    parts = [b"ICC_PROFILE\0" + bytes([n, 2]) + bytes(70) for n in (1, 2)]
    save("jpeg", "markers", plain[:2] + marker(0xFE, b"a comment\0") +
         b"".join(marker(0xE2, part) for part in parts) + plain[2:])


if __name__ == "__main__":
    make_tga()
    make_png()
    make_jpeg()
