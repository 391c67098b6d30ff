#!/usr/bin/env python3
"""Exchanges pictures with other programs.

Files that other programs make are read by `image_tool`, and files that it writes are read by other
programs; the pixels must be those that another reader finds. Those programs are netpbm,
ImageMagick, cjpeg and djpeg, and pngcheck; what needs one that is not installed is skipped, which a
line tells.

Prints one line for each fault and a summary. Exit code: 0 no fault, 1 faults, 2 wrong usage.
"""

import argparse
import pathlib
import random
import shutil
import subprocess
import sys
import tempfile
from dataclasses import dataclass

SEEDS = pathlib.Path(__file__).resolve().parents[2] / "fuzz" / "seeds"
WIDTH, HEIGHT = 37, 21
PROGRAM_NAMES = {"convert": ("convert-im6.q16", "magick", "convert")}


class Skipped(Exception):
    pass


class Fault(Exception):
    pass


@dataclass
class Picture:
    """Red, green, blue and alpha in 0..65535 for each pixel, by rows."""
    width: int
    height: int
    pixels: list

    def difference(self, other):
        if (self.width, self.height) != (other.width, other.height):
            raise Fault(f"{self.width} x {self.height} here, {other.width} x {other.height} there")
        return max(abs(a - b) for p, q in zip(self.pixels, other.pixels) for a, b in zip(p, q))


def run(program, *arguments, data=None):
    path = next(filter(None, map(shutil.which, PROGRAM_NAMES.get(program, (program,)))), None)
    if not path:
        raise Skipped(program)
    done = subprocess.run([path, *map(str, arguments)], input=data, capture_output=True, timeout=60)
    if done.returncode:
        raise Fault(f"{program}: {done.stderr.decode(errors='replace').strip() or done.stdout}")
    return done.stdout


def read_header(data):
    """Width, height, channels, maximum and the place of the pixels of a PAM, PPM, PGM or PBM."""
    if data.startswith(b"P7"):
        end = data.index(b"ENDHDR\n") + 7
        fields = dict(line.split(None, 1) for line in data[3:end].splitlines() if b" " in line)
        numbers = [int(fields[name]) for name in (b"WIDTH", b"HEIGHT", b"DEPTH", b"MAXVAL")]
        return *numbers, end
    count = 2 if data.startswith(b"P4") else 3
    fields = data.split(None, count + 1)[1:count + 1]
    at = 2
    for field in fields:
        at = data.index(field, at) + len(field)
    width, height, top = (*map(int, fields), 1)[:3]
    return width, height, 3 if data.startswith(b"P6") else 1, top, at + 1


def parse(data):
    width, height, channels, top, at = read_header(data)
    if data.startswith(b"P4"):
        row_bytes = (width + 7) // 8
        values = [1 - (data[at + y * row_bytes + x // 8] >> (7 - x % 8) & 1)
                  for y in range(height) for x in range(width)]
    elif top > 255:
        values = [data[i] << 8 | data[i + 1]
                  for i in range(at, at + 2 * width * height * channels, 2)]
    else:
        values = list(data[at:at + width * height * channels])
    # To the nearest, though the maxima of all files here divide 65535.
    values = [(value * 65535 + top // 2) // top for value in values]
    pixels = []
    for i in range(0, len(values), channels):
        pixel = values[i:i + channels]
        alpha = pixel.pop() if channels in (2, 4) else 65535
        pixels.append((*(pixel if len(pixel) == 3 else pixel * 3), alpha))
    return Picture(width, height, pixels)


def pam(channels, top, value):
    """A PAM whose component c at x, y is value(x, y, c)."""
    tuple_type = ("GRAYSCALE", "GRAYSCALE_ALPHA", "RGB", "RGB_ALPHA")[channels - 1]
    size = 2 if top > 255 else 1
    header = (f"P7\nWIDTH {WIDTH}\nHEIGHT {HEIGHT}\nDEPTH {channels}\nMAXVAL {top}\n"
              f"TUPLTYPE {tuple_type}\nENDHDR\n")
    return header.encode() + b"".join(value(x, y, c).to_bytes(size, "big") for y in range(HEIGHT)
                                      for x in range(WIDTH) for c in range(channels))


def noise(channels, top):
    generator = random.Random(top * 8 + channels)
    # Half of it in runs, for the packing formats.
    return pam(channels, top, lambda x, y, c: generator.randint(0, top) if y % 2
               else (x // 9 * 77 + c * 31) % (top + 1))


def smooth(channels):
    return pam(channels, 255, lambda x, y, c: (x * 3 + y * 5 + c * 60) % 256)


def few_colours(count, channels=3):
    generator = random.Random(count)
    colours = [[generator.randint(0, 255) for _ in range(channels)] for _ in range(count)]
    return pam(channels, 255, lambda x, y, c: colours[(x + y * WIDTH) % count][c])


class Exchange:
    def __init__(self, tool, folder):
        self.tool, self.folder = tool, folder
        self.checked = self.faults = 0
        self.skipped = {}

    def check(self, name, action):
        try:
            action()
            self.checked += 1
        except Skipped as program:
            self.skipped.setdefault(str(program), []).append(name)
        except (Fault, subprocess.TimeoutExpired) as fault:
            self.faults += 1
            print(f"FAULT {name}: {fault}")

    def path(self, name, extension):
        return self.folder / f"{name.replace(' ', '_').replace('/', '_')}.{extension}"

    def run_tool(self, *arguments):
        done = subprocess.run([self.tool, *map(str, arguments)], capture_output=True, timeout=60)
        if done.returncode:
            raise Fault(done.stderr.decode(errors="replace").strip() or "image_tool failed")
        return done.stdout

    def read(self, path):
        line, _, data = self.run_tool("--info", path).partition(b"\n")
        return line.decode(), parse(data)

    def compare(self, path, other, kind=None, tolerance=0):
        """The picture here is that of `other`, up to `tolerance` of 255."""
        line, here = self.read(path)
        if kind and line.split(" ", 2)[2] != kind:
            raise Fault(f"read as {line}")
        difference = here.difference(parse(other(path)))
        if difference > tolerance * 257:
            raise Fault(f"differs by {difference / 257:.1f} of 255")


def pngtopam(path):
    return run("pngtopam", "-alphapam", path)


def djpeg(path):
    return run("djpeg", "-pnm", path)


def tgatoppm(path):
    return run("tgatoppm", path)


def imagemagick(path):
    # It takes the order of the rows of a TGA for the way that the camera was held.
    return run("convert", path, "-auto-orient", "-depth", "8", "pam:-")


def save_png(exchange, name, data, *options):
    path = exchange.path(name, "png")
    path.write_bytes(run("pamtopng" if b"_ALPHA" in data[:100] else "pnmtopng", *options,
                         data=data))
    return path


def check_png_reading(exchange):
    cases = [(f"grey {top + 1} levels", noise(1, top), (), "luminance ubyte")
             for top in (1, 3, 15, 255)]
    cases += [("grey 16 bits", noise(1, 65535), (), "luminance ushort"),
              ("colour", noise(3, 255), (), "rgb ubyte"),
              ("colour 16 bits", noise(3, 65535), (), "rgb ushort"),
              ("alpha", noise(4, 255), (), "rgba ubyte"),
              ("alpha 16 bits", noise(4, 65535), (), "rgba ushort"),
              ("grey alpha", noise(2, 255), (), "luminance_alpha ubyte"),
              ("grey alpha 16 bits", noise(2, 65535), (), "luminance_alpha ushort")]
    cases += [(f"palette of {count}", few_colours(count), (), "rgb ubyte")
              for count in (2, 4, 16, 200)]
    for name, data, options, kind in cases:
        for interlace in ((), ("-interlace",)):
            def action():
                path = save_png(exchange, name + "".join(interlace), data, *options, *interlace)
                exchange.compare(path, pngtopam, kind)

            exchange.check(f"png {name}{''.join(interlace)}", action)

    def transparent():
        path = exchange.path("transparent", "png")
        path.write_bytes(run("pnmtopng", "-transparent", "=rgb:00/00/00",
                             data=pam(3, 255, lambda x, y, c: 0 if x < 5 else 17 * (y % 16))))
        exchange.compare(path, pngtopam, "rgba ubyte")

    def translucent_palette():
        path = exchange.path("translucent", "png")
        run("convert", "pam:-", f"PNG8:{path}", data=few_colours(30, 4))
        exchange.compare(path, pngtopam, "rgba ubyte")

    exchange.check("png transparent palette", transparent)
    exchange.check("png translucent palette", translucent_palette)
    for path in sorted((SEEDS / "png").iterdir()):
        exchange.check(f"png seed {path.stem}", lambda: exchange.compare(path, pngtopam))


def check_png_writing(exchange):
    for channels, top in ((1, 255), (2, 255), (3, 255), (4, 255), (1, 65535), (2, 65535),
                          (3, 65535), (4, 65535)):
        for setting in ("interlace=false", "interlace=true", "CompressionLevel=1"):
            def action():
                data = noise(channels, top)
                name = f"{channels} {top} {setting}"
                source = save_png(exchange, name, data)
                target = exchange.path(name + " written", "png")
                exchange.run_tool(source, target, setting)
                if parse(pngtopam(target)).difference(parse(data)):
                    raise Fault("other pixels than were saved")
                run("pngcheck", "-q", target)

            exchange.check(f"write png of {channels} channels up to {top}, {setting}", action)


def check_jpeg_reading(exchange):
    kinds = [("grey", smooth(1), ()), ("progressive", smooth(3), ("-progressive",)),
             ("progressive grey", smooth(1), ("-progressive",)),
             ("rgb", smooth(3), ("-rgb",)), ("restarts", smooth(3), ("-restart", "1"))]
    for sample in ("1x1", "2x1", "1x2", "2x2", "4x1", "2x1,1x2,1x1", "4x2"):
        kinds.append((f"sampling {sample}", smooth(3), ("-sample", sample)))
    for name, data, options in kinds:
        def action():
            path = exchange.path(name, "jpg")
            path.write_bytes(run("cjpeg", *options, data=run("pamtopnm", data=data)))
            exchange.compare(path, djpeg, "luminance ubyte" if "grey" in name else "rgb ubyte")

        exchange.check(f"jpeg {name}", action)

    def cmyk():
        path = exchange.path("cmyk", "jpg")
        run("convert", "pam:-", "-colorspace", "CMYK", path, data=smooth(3))
        # Inks multiply in several ways.
        exchange.compare(path, djpeg, "rgb ubyte", tolerance=2)

    exchange.check("jpeg CMYK", cmyk)
    for path in sorted((SEEDS / "jpeg").iterdir()):
        tolerance = 2 if path.stem == "cmyk" else 0
        exchange.check(f"jpeg seed {path.stem}",
                       lambda: exchange.compare(path, djpeg, tolerance=tolerance))


def check_jpeg_writing(exchange):
    # What the other program writes with the same settings must decode alike.
    for setting, sample in (("CompressionLevel=95", "2x2"), ("jpeg:subsampling=4:4:4", "1x1"),
                            ("jpeg:subsampling=4:2:2", "2x1"), ("jpeg:subsampling=4:1:1", "4x1")):
        for channels in (1, 3):
            def action():
                name = f"{channels} {setting}".replace(":", "-")
                source = save_png(exchange, name, smooth(channels))
                target, other = exchange.path(name, "jpg"), exchange.path(name + " other", "jpg")
                exchange.run_tool(source, target, setting)
                options = ("-sample", sample) if channels == 3 else ()
                other.write_bytes(run("cjpeg", "-quality", "95", "-baseline", *options,
                                      data=run("pamtopnm", data=smooth(channels))))
                if parse(djpeg(target)).difference(parse(djpeg(other))):
                    raise Fault("other pixels than cjpeg gives")

            exchange.check(f"write jpeg of {channels} channels, {setting}", action)


def check_tga_reading(exchange):
    kinds = [("mono", smooth(1), "-mono", "luminance ubyte"),
             ("colour", noise(3, 255), "-rgb", "bgr ubyte"),
             ("alpha", noise(4, 255), "-rgb", "bgra ubyte"),
             ("indexed", few_colours(200), "-cmap", "bgr ubyte")]
    for name, data, option, kind in kinds:
        for packing in ((), ("-norle",)):
            def action():
                path = exchange.path(name + "".join(packing), "tga")
                path.write_bytes(run("pamtotga", option, *packing, data=data))
                exchange.compare(path, imagemagick, kind)
                if parse(data).difference(exchange.read(path)[1]):
                    raise Fault("other pixels than were saved")

            exchange.check(f"tga of netpbm, {name}{''.join(packing)}", action)
    kinds = [("colour", noise(3, 255)), ("alpha", noise(4, 255)), ("grey", noise(1, 255)),
             ("grey alpha", noise(2, 255)), ("indexed", few_colours(99))]
    for name, data in kinds:
        for packing in ("None", "RLE"):
            def action():
                path = exchange.path(name + packing, "tga")
                run("convert", "pam:-", "-compress", packing, path, data=data)
                # Versions disagree in the order of the rows that they write: compared is what the
                # file says.
                exchange.compare(path, imagemagick)

            exchange.check(f"tga of ImageMagick, {name}, {packing}", action)
    for path in sorted((SEEDS / "tga").iterdir()):
        if not path.stem.startswith("grey-16"):  # which the others take for colours
            # 5 bits are truncated on their way to 8 there, and rounded here.
            tolerance = 1 if "-15" in path.stem or "-16" in path.stem else 0
            exchange.check(f"tga seed {path.stem}",
                           lambda: exchange.compare(path, imagemagick, tolerance=tolerance))


def check_tga_writing(exchange):
    for channels in (1, 2, 3, 4):
        for packing in ("none", "rle"):
            for reader in (tgatoppm, imagemagick):
                def action():
                    data = noise(channels, 255)
                    source = save_png(exchange, f"tga {channels}", data)
                    target = exchange.path(f"{channels} {packing}", "tga")
                    exchange.run_tool(source, target, f"Compression={packing}")
                    wanted = parse(data)
                    if reader is tgatoppm:  # which leaves alpha out
                        wanted.pixels = [(*pixel[:3], 65535) for pixel in wanted.pixels]
                    if parse(reader(target)).difference(wanted):
                        raise Fault("other pixels than were saved")

                exchange.check(f"write tga of {channels} channels, {packing}, for "
                               f"{reader.__name__}", action)


def main():
    parser = argparse.ArgumentParser(description=__doc__.splitlines()[0])
    parser.add_argument("tool", help="path of image_tool")
    parser.add_argument("--keep", type=pathlib.Path, help="folder for the files, else temporary")
    parser.add_argument("--strict", action="store_true", help="count what is skipped as a fault")
    arguments = parser.parse_args()
    if not shutil.which(arguments.tool):
        parser.error(f"no program at {arguments.tool}")
    with tempfile.TemporaryDirectory() as temporary:
        folder = arguments.keep or pathlib.Path(temporary)
        folder.mkdir(parents=True, exist_ok=True)
        exchange = Exchange(arguments.tool, folder)
        for check in (check_png_reading, check_png_writing, check_jpeg_reading, check_jpeg_writing,
                      check_tga_reading, check_tga_writing):
            check(exchange)
    for program, names in exchange.skipped.items():
        print(f"skipped {len(names)} checks: {program} is not installed")
    print(f"{exchange.checked} checks passed, {exchange.faults} faults")
    return 1 if exchange.faults or (arguments.strict and exchange.skipped) else 0


if __name__ == "__main__":
    sys.exit(main())
