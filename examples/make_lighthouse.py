#!/usr/bin/env python3
"""Writes lighthouse.dae, a small island with a lighthouse as a COLLADA document, and its pictures.

Uses what real content uses: a deep tree of named nodes, meshes that many nodes share, polygons of
three, four and many corners (concave ones too), normals, texture coordinates and colours at the
vertices. Most surfaces are white paint under these colours; a few have materials with more to them:
maps, gloss, transparency, light of their own. The beams of the lamp turn, the boat rides on the
swell, and a flag on a chain of joints waves.

    make_lighthouse.py [FOLDER]

writes FOLDER/lighthouse.dae and FOLDER/textures/*.png, where FOLDER is that of the script unless
given. The output depends on nothing but this script and the compressor of zlib.
"""

import math
import pathlib
import random
import struct
import sys
import zlib

# sRGB, as a painter would pick them.
PALETTE = {
    "bark": 0x6B4A32,
    "brass": 0xC9A24A,
    "brick": 0xB4543F,
    "cliff": 0xA3988A,
    "cliff_dark": 0x5B554E,
    "cream": 0xF3EAD7,
    "door": 0x2F5D62,
    "glass": 0x355C7D,
    "grass": 0x9AC060,
    "hull": 0x2E5E8C,
    "iron": 0x3D4248,
    "lamp": 0xFFE08A,
    "leaf": 0x5E9146,
    "leaf_light": 0x93BC58,
    "path": 0xCFC3A8,
    "pine": 0x397257,
    "pine_light": 0x74AC7C,
    "red": 0xC8352E,
    "roof": 0xB5402F,
    "rock": 0x8A8A8C,
    "rock_light": 0xA9A7A2,
    "sail": 0xFBF7EC,
    "sand": 0xF2E2B6,
    "sand_wet": 0xD6C290,
    "sea_deep": 0x2F7FAA,
    "sea_edge": 0x1F5C86,
    "sea_mid": 0x45ADC4,
    "sea_shore": 0xA4E4D8,
    "slate": 0x77736C,
    "slate_light": 0x9B958A,
    "white": 0xF7F4EE,
    "wood": 0x9A7550,
    "wood_light": 0xB8946A,
}


def colour(name, shade=1.0):
    """A colour of the palette as linear light, which is what glTF expects at vertices."""

    def linear(byte):
        value = byte / 255
        return value / 12.92 if value <= 0.04045 else ((value + 0.055) / 1.055) ** 2.4

    code = PALETTE[name]
    return tuple(min(1.0, shade * linear(code >> shift & 255)) for shift in (16, 8, 0))


def mix(a, b, t):
    return tuple(x + (y - x) * t for x, y in zip(a, b))


# Vectors.


def sub(a, b):
    return tuple(x - y for x, y in zip(a, b))


def cross(a, b):
    return (a[1] * b[2] - a[2] * b[1], a[2] * b[0] - a[0] * b[2], a[0] * b[1] - a[1] * b[0])


def normalise(a):
    length = math.hypot(*a)
    return tuple(x / length for x in a)


def polygon_normal(points):
    total = (0.0, 0.0, 0.0)
    for i in range(1, len(points) - 1):
        part = cross(sub(points[i], points[0]), sub(points[i + 1], points[0]))
        total = tuple(x + y for x, y in zip(total, part))
    return normalise(total)


def ring(corners, radius, y, turn=0.0):
    """Corners on a circle round the Y axis, counter-clockwise seen from above."""
    result = []
    for i in range(corners):
        angle = math.tau * (i + turn) / corners
        result.append((radius * math.cos(angle), y, -radius * math.sin(angle)))
    return result


def scaled(points, factor, y):
    return [(x * factor, y, z * factor) for x, _, z in points]


# Pictures.


class Picture:
    """Eight bits a channel, from a function of column and row that gives a tuple from 0 to 1. The
    number of channels tells the kind: 1 grey, 3 RGB, 4 RGBA."""

    def __init__(self, name, width, height, pixel):
        self.name = name
        self.width, self.height = width, height
        self.rows = [[pixel(x, y) for x in range(width)] for y in range(height)]

    def encoded(self):
        """The bytes of a PNG file."""

        def chunk(kind, data):
            check = zlib.crc32(kind + data)
            return struct.pack(">I", len(data)) + kind + data + struct.pack(">I", check)

        kind = {1: 0, 3: 2, 4: 6}[len(self.rows[0][0])]
        header = struct.pack(">IIBBBBB", self.width, self.height, 8, kind, 0, 0, 0)
        data = bytearray()
        for row in self.rows:
            data.append(0)  # the row is not filtered
            data += bytes(round(255 * min(max(v, 0.0), 1.0)) for pixel in row for v in pixel)
        return (b"\x89PNG\r\n\x1a\n" + chunk(b"IHDR", header) +
                chunk(b"IDAT", zlib.compress(bytes(data), 9)) + chunk(b"IEND", b""))


def srgb(name, shade=1.0):
    """A colour of the palette as it stands in a picture."""
    return tuple(shade * (PALETTE[name] >> shift & 255) / 255 for shift in (16, 8, 0))


STRIPES = 7
COURSES = 4  # of blocks, in each stripe
BLOCK = (16, 8)  # in pixels, with half of the joints round it
BLOCKS_ROUND = 12
TOWER_PIXELS = (BLOCK[0] * BLOCKS_ROUND, BLOCK[1] * COURSES * STRIPES)


def masonry(x, y):
    """The block at a pixel, as column and course from below, and its distance to a joint."""
    width, height = BLOCK
    course = (TOWER_PIXELS[1] - 1 - y) // height
    x = (x + width // 2 * (course % 2)) % TOWER_PIXELS[0]
    inset = min(x % width, width - 1 - x % width, y % height, height - 1 - y % height)
    return x // width, course, inset


def tower_paint():
    rng = random.Random(17)
    shades = [[1 - 0.07 * rng.random() for _ in range(BLOCKS_ROUND)]
              for _ in range(COURSES * STRIPES)]

    def pixel(x, y):
        column, course, inset = masonry(x, y)
        name = "red" if course // COURSES % 2 else "white"
        return srgb(name, shades[course][column] * (0.86 if inset == 0 else 1))

    return Picture("tower", *TOWER_PIXELS, pixel)


def tower_relief():
    """Heights: joints are deep, blocks round at their edges."""
    return Picture("tower_relief", *TOWER_PIXELS,
                   lambda x, y: ((0.5, 0.62, 0.65)[min(masonry(x, y)[2], 2)],))


def tower_shadow():
    """How much light of the sky comes to the wall: less at the foot and under the gallery."""
    size = 64

    def pixel(_, y):
        foot, top = (size - 0.5 - y) / size, (y + 0.5) / size
        return (1 - 0.7 * math.exp(-14 * foot) - 0.8 * math.exp(-18 * top),)

    return Picture("tower_shadow", 4, size, pixel)


def ripples():
    """Heights of water: waves that fit the borders of the picture, so that it can be tiled."""
    size = 64
    rng = random.Random(8)
    waves = [(rng.randint(-7, 7), rng.randint(-7, 7), rng.random()) for _ in range(9)]

    def pixel(x, y):
        heights = (math.sin(math.tau * ((a * x + b * y) / size + phase)) for a, b, phase in waves)
        return (0.5 + 0.025 * sum(heights),)

    return Picture("ripples", size, size, pixel)


GLYPHS = {  # rows of five pixels, from above
    "A": (0x0E, 0x11, 0x11, 0x1F, 0x11, 0x11, 0x11),
    "B": (0x1E, 0x11, 0x11, 0x1E, 0x11, 0x11, 0x1E),
    "H": (0x11, 0x11, 0x11, 0x1F, 0x11, 0x11, 0x11),
    "O": (0x0E, 0x11, 0x11, 0x11, 0x11, 0x11, 0x0E),
    "R": (0x1E, 0x11, 0x11, 0x1E, 0x14, 0x12, 0x11),
    "U": (0x11, 0x11, 0x11, 0x11, 0x11, 0x11, 0x0E),
}


def signboard():
    """A board whose shape is cut out by alpha: oblique corners, and two holes for ropes."""
    width, height, text, size = 128, 48, "HARBOUR", 2

    def is_letter(x, y):
        column = (x - (width - (6 * len(text) - 1) * size) // 2) // size
        row = (y - (height - 7 * size) // 2) // size
        if not (0 <= column < 6 * len(text) and 0 <= row < 7 and column % 6 < 5):
            return False
        return GLYPHS[text[column // 6]][row] >> 4 - column % 6 & 1 == 1

    def pixel(x, y):
        side, edge = min(x, width - 1 - x), min(y, height - 1 - y)
        rim = min(side, edge, (side + edge - 12) / math.sqrt(2))
        hole = math.hypot(side - 11, y - height / 2 + 0.5) - 3
        paint = srgb("cream" if is_letter(x, y) or 4 <= rim < 6 else "hull")
        return (*paint, min(1, rim + 0.5, hole + 0.5))

    return Picture("signboard", width, height, pixel)


def pictures():
    return [make() for make in (tower_paint, tower_relief, tower_shadow, ripples, signboard)]


# Materials.


class Material:
    """White and matte if not told otherwise. Maps are names of pictures."""

    def __init__(self, name, emission=None, shininess=None, opacity=1.0, colour_map=None,
                 cut_out=False, bump_map=None, occlusion_map=None):
        self.name = name
        self.emission = emission
        self.shininess = shininess  # the exponent of Phong's highlight
        self.opacity = opacity
        self.colour_map = colour_map
        self.cut_out = cut_out  # whether the alpha of the colour map counts
        self.bump_map = bump_map
        self.occlusion_map = occlusion_map

    def maps(self):
        return [m for m in (self.occlusion_map, self.colour_map, self.bump_map) if m]


MATERIALS = {material.name: material for material in (
    Material("Paint"),
    Material("Masonry", colour_map="tower", bump_map="tower_relief", occlusion_map="tower_shadow"),
    Material("Water", shininess=120, bump_map="ripples"),
    Material("Glass", shininess=400, opacity=0.3),
    Material("Light", emission=colour("lamp")),
    Material("Beam", emission=colour("lamp", 0.6), opacity=0.25),
    Material("Metal", shininess=30),
    Material("Signboard", colour_map="signboard", cut_out=True),
)}


# Meshes.


class Mesh:
    """Polygons of one material, with a normal and a colour at each corner, and with texture
    coordinates if the material has maps."""

    def __init__(self, name, material="Paint"):
        self.name = name
        self.material = material
        self.textured = bool(MATERIALS[material].maps())
        self.skeleton = None  # a Skeleton, if the mesh follows joints
        self.polygons = []
        self.pools = {"position": {}, "normal": {}, "uv": {}, "colour": {}}

    def index(self, pool, values, digits):
        key = tuple(f"{value:.{digits}f}".rstrip("0").rstrip(".") for value in values)
        key = tuple("0" if text == "-0" else text for text in key)
        return self.pools[pool].setdefault(key, len(self.pools[pool]))

    def face(self, points, colours, uvs=None, normals=None):
        """Adds a polygon, counter-clockwise seen from outside. One colour serves all corners;
        without normals it is flat."""
        if not isinstance(colours, list):
            colours = [colours] * len(points)
        normals = normals or [polygon_normal(points)] * len(points)
        corners = []
        for i, point in enumerate(points):
            corner = [self.index("position", point, 4), self.index("normal", normals[i], 4)]
            if self.textured:
                corner.append(self.index("uv", uvs[i], 4))
            corners.append((*corner, self.index("colour", colours[i], 3)))
        self.polygons.append(corners)

    def band(self, lower, upper, low, high, smooth=False, turns=1, v=(0.0, 1.0)):
        """Quads between two rings of the same number of corners, with a colour for each ring. A
        texture goes round `turns` times."""
        n = len(lower)
        rise = polygon_normal([lower[0], lower[1], upper[1], upper[0]])[1]
        flat = math.sqrt(1 - rise * rise)

        def outward(point):
            length = math.hypot(point[0], point[2])
            return (flat * point[0] / length, rise, flat * point[2] / length)

        for i in range(n):
            k = (i + 1) % n
            points = [lower[i], lower[k], upper[k], upper[i]]
            u = (turns * i / n, turns * (i + 1) / n)
            uvs = [(u[0], v[0]), (u[1], v[0]), (u[1], v[1]), (u[0], v[1])]
            normals = [outward(p) for p in points] if smooth else None
            self.face(points, [low, low, high, high], uvs, normals)

    def cone(self, base, tip, low, high):
        for i in range(len(base)):
            self.face([base[i], base[(i + 1) % len(base)], tip], [low, low, high])

    def cap(self, points, paint, size=1.0):
        """A polygon of any number of corners, its texture, of this size, laid on from above."""
        self.face(points, paint, [(x / size, -z / size) for x, _, z in points])

    def box(self, low, high, paint, top=None):
        (x0, y0, z0), (x1, y1, z1) = low, high
        c = [(x, y, z) for y in (y0, y1) for x, z in ((x0, z1), (x1, z1), (x1, z0), (x0, z0))]
        for k in ((0, 1, 5, 4), (1, 2, 6, 5), (2, 3, 7, 6), (3, 0, 4, 7), (3, 2, 1, 0)):
            self.face([c[i] for i in k], paint)
        self.face([c[i] for i in (4, 5, 6, 7)], top or paint)

    def prism(self, outline, y0, y1, side, top, bottom=None):
        """An upright prism over an outline; its bottom is left open unless it has a colour."""
        lower, upper = scaled(outline, 1, y0), scaled(outline, 1, y1)
        self.band(lower, upper, mix(side, (0, 0, 0), 0.25), side)
        self.cap(upper, top)
        if bottom:
            self.cap(lower[::-1], bottom)


def icosphere(levels):
    """Points on the unit sphere and triangles between them."""
    t = (1 + math.sqrt(5)) / 2
    points = [normalise(p) for p in (
        (-1, t, 0), (1, t, 0), (-1, -t, 0), (1, -t, 0), (0, -1, t), (0, 1, t),
        (0, -1, -t), (0, 1, -t), (t, 0, -1), (t, 0, 1), (-t, 0, -1), (-t, 0, 1))]
    triangles = [
        (0, 11, 5), (0, 5, 1), (0, 1, 7), (0, 7, 10), (0, 10, 11), (1, 5, 9), (5, 11, 4),
        (11, 10, 2), (10, 7, 6), (7, 1, 8), (3, 9, 4), (3, 4, 2), (3, 2, 6), (3, 6, 8),
        (3, 8, 9), (4, 9, 5), (2, 4, 11), (6, 2, 10), (8, 6, 7), (9, 8, 1)]
    for _ in range(levels):
        middles = {}

        def middle(a, b):
            key = (min(a, b), max(a, b))
            if key not in middles:
                middles[key] = len(points)
                points.append(normalise(tuple(x + y for x, y in zip(points[a], points[b]))))
            return middles[key]

        finer = []
        for a, b, c in triangles:
            ab, bc, ca = middle(a, b), middle(b, c), middle(c, a)
            finer += [(a, ab, ca), (b, bc, ab), (c, ca, bc), (ab, bc, ca)]
        triangles = finer
    return points, triangles


def lump(name, levels, radii, roughness, seed, low, high):
    """A rough ball of flat triangles, darker below."""
    rng = random.Random(seed)
    points, triangles = icosphere(levels)
    factors = [1 + roughness * (rng.random() * 2 - 1) for _ in points]
    points = [tuple(x * r * f for x, r in zip(p, radii)) for p, f in zip(points, factors)]
    mesh = Mesh(name)
    for triangle in triangles:
        corners = [points[i] for i in triangle]
        mesh.face(corners, [mix(low, high, (y / radii[1] + 1) / 2) for _, y, _ in corners])
    return mesh


# The parts of the scene.

TOWER_SEGMENTS = 24
TOWER_HEIGHT = 9.6
TOWER_RADII = (1.75, 1.1)
GROUND = 1.3  # height of the meadow above the sea


def tower_radius(y):
    """The tower is a little slimmer than a straight cone."""
    t = y / TOWER_HEIGHT
    return TOWER_RADII[0] + (TOWER_RADII[1] - TOWER_RADII[0]) * (1.35 * t - 0.35 * t * t)


def shore_outline(corners, radius, seed):
    """A concave coast: bulges, and a bay towards the viewer's right."""
    rng = random.Random(seed)
    outline = []
    for i in range(corners):
        angle = math.tau * i / corners
        bay = math.exp(-(((angle - 5.35) / 0.33) ** 2))
        r = radius * (1 + 0.07 * math.sin(3 * angle + 1) + 0.05 * (rng.random() - 0.5))
        r *= 1 - 0.42 * bay
        outline.append((r * math.cos(angle), 0.0, -r * math.sin(angle)))
    return outline


def sea():
    mesh = Mesh("sea", material="Water")
    n, radii = 48, (6.5, 10.8, 12.6, 14.6)
    paints = [colour(c) for c in ("sea_shore", "sea_shore", "sea_mid", "sea_deep")]
    rings = [ring(n, r, 0) for r in radii]
    mesh.cap(rings[0], paints[0], 8)
    for k in range(3):
        for i in range(n):
            j = (i + 1) % n
            points = [rings[k][i], rings[k + 1][i], rings[k + 1][j], rings[k][j]]
            shades = [paints[k], paints[k + 1], paints[k + 1], paints[k]]
            mesh.face(points, shades, [(x / 8, -z / 8) for x, _, z in points])
    bottom = ring(n, 13.8, -1.4)
    mesh.band(bottom, rings[3], colour("sea_edge"), colour("sea_deep"), smooth=True,
              turns=11, v=(0.0, 0.2))
    mesh.cap(bottom[::-1], colour("sea_edge"), 8)
    return mesh


def beach():
    mesh = Mesh("beach")
    outline = shore_outline(40, 10.2, 11)
    mesh.band(scaled(outline, 1.13, -0.25), scaled(outline, 1, 0.32), colour("sand_wet"),
              colour("sand"))
    mesh.cap(scaled(outline, 1, 0.32), colour("sand"))
    return mesh


def meadow():
    mesh = Mesh("meadow")
    outline = shore_outline(32, 8.3, 5)
    foot, edge = scaled(outline, 1.06, 0.2), scaled(outline, 1, GROUND - 0.18)
    mesh.band(foot, edge, colour("cliff_dark"), colour("cliff"))
    mesh.band(edge, scaled(outline, 0.985, GROUND), colour("grass", 0.7), colour("grass"))
    mesh.cap(scaled(outline, 0.985, GROUND), colour("grass"))
    return mesh


def gear_base():
    """Sixteen teeth round a disc: one concave polygon of 64 corners on top."""
    outline = []
    for tooth in range(16):
        for step, radius in ((0.0, 2.45), (0.18, 2.75), (0.5, 2.75), (0.68, 2.45)):
            angle = math.tau * (tooth + step) / 16
            outline.append((radius * math.cos(angle), 0.0, -radius * math.sin(angle)))
    mesh = Mesh("gear_base")
    mesh.prism(outline, -0.1, 0.35, colour("slate"), colour("slate_light"))
    mesh.prism(ring(8, 2.25, 0, 0.5), 0.35, 0.7, colour("slate"), colour("slate_light"))
    return mesh


def tower_shaft():
    """A ring at each stripe of its picture; the colours only darken the foot."""
    mesh = Mesh("tower_shaft", material="Masonry")
    heights = [TOWER_HEIGHT * k / STRIPES for k in range(STRIPES + 1)]
    rings = [ring(TOWER_SEGMENTS, tower_radius(height), height) for height in heights]
    for i in range(STRIPES):
        mesh.band(rings[i], rings[i + 1], (0.88, 0.88, 0.88) if i == 0 else (1, 1, 1), (1, 1, 1),
                  smooth=True, v=(i / STRIPES, (i + 1) / STRIPES))
    return mesh


def gallery_floor():
    mesh = Mesh("gallery_floor")
    top = TOWER_RADII[1]
    mesh.band(ring(TOWER_SEGMENTS, top, -0.5), ring(TOWER_SEGMENTS, top + 0.42, 0),
              colour("slate_light"), colour("white"), smooth=True)
    mesh.cap(ring(8, 1.8, 0, 0.5)[::-1], colour("slate"))
    mesh.band(ring(8, 1.8, 0, 0.5), ring(8, 1.8, 0.16, 0.5), colour("white"), colour("white"))
    mesh.cap(ring(8, 1.8, 0.16, 0.5), colour("slate_light"))
    return mesh


def gallery_rail():
    """A bar along one side of the octagon, centred on its middle."""
    mesh = Mesh("gallery_rail", material="Metal")
    half = 1.7 * math.sin(math.pi / 8)
    for y in (0.42, 0.85):
        mesh.box((-half, y, -0.03), (half, y + 0.06, 0.03), colour("iron"))
    return mesh


def lantern_wall():
    mesh = Mesh("lantern_wall")
    mesh.band(ring(8, 0.95, 0, 0.5), ring(8, 0.95, 0.5, 0.5), colour("red", 0.8), colour("red"))
    mesh.cap(ring(8, 0.95, 0.5, 0.5), colour("slate"))
    return mesh


def lantern_glass():
    """Panes between the mullions."""
    mesh = Mesh("lantern_glass", material="Glass")
    mesh.band(ring(8, 0.86, 0.5, 0.5), ring(8, 0.86, 1.5, 0.5), colour("sea_shore"),
              colour("white"))
    return mesh


def lamp():
    """A smooth ball of light."""
    mesh = Mesh("lamp", material="Light")
    points, triangles = icosphere(1)
    for triangle in triangles:
        corners = [points[i] for i in triangle]
        paints = [colour("lamp", 1.02 + 0.18 * y) for _, y, _ in corners]
        mesh.face([tuple(0.42 * x for x in p) for p in corners], paints, normals=corners)
    return mesh


def beam():
    """A widening beam along +X."""
    mesh = Mesh("beam", material="Beam")
    near, far = ([(x, y, z) for y, _, z in ring(10, radius, 0)]
                 for x, radius in ((0.45, 0.12), (6, 0.75)))
    for i in range(10):
        k = (i + 1) % 10
        mesh.face([near[k], near[i], far[i], far[k]], colour("lamp"))
    return mesh


class Skeleton:
    """A chain of joints along +X, evenly spaced; between two of them both pull at the vertices."""

    def __init__(self, root, count, spacing):
        self.joints = [f"{root}_{k + 1}" for k in range(count)]
        self.spacing = spacing

    def weights(self, x):
        """Pairs of a joint's number and its weight."""
        place = min(max(x / self.spacing, 0), len(self.joints) - 1)
        first = int(place)
        pairs = [(first, 1 - (place - first)), (first + 1, place - first)]
        return [(joint, weight) for joint, weight in pairs if weight > 0]


def flag():
    """Ten stripes from the pole at the origin along +X; two sides, a little apart."""
    mesh = Mesh("flag")
    mesh.skeleton = Skeleton("Flag_Joint", 5, 0.35)
    for k in range(10):
        x0, x1 = 0.17 * k, 0.17 * (k + 1)
        paint = colour("red" if k % 4 < 2 else "white")
        mesh.face([(x0, 0, 0.01), (x1, 0, 0.01), (x1, 0.7, 0.01), (x0, 0.7, 0.01)], paint)
        mesh.face([(x1, 0, -0.01), (x0, 0, -0.01), (x0, 0.7, -0.01), (x1, 0.7, -0.01)], paint)
    return mesh


def lantern_roof():
    mesh = Mesh("lantern_roof")
    eaves = ring(8, 1.22, 0, 0.5)
    mesh.cap(eaves[::-1], colour("roof", 0.5))
    mesh.band(eaves, ring(8, 1.22, 0.1, 0.5), colour("roof", 0.8), colour("roof", 0.8))
    mesh.band(ring(8, 1.22, 0.1, 0.5), ring(8, 0.55, 0.72, 0.5), colour("roof", 0.85),
              colour("roof"))
    mesh.cone(ring(8, 0.55, 0.72, 0.5), (0, 1.3, 0), colour("roof"), colour("roof", 1.25))
    return mesh


def finial():
    mesh = Mesh("finial", material="Metal")
    rings = [ring(6, r, y) for r, y in ((0.05, 0), (0.05, 0.25), (0.17, 0.38), (0.03, 0.55))]
    for lower, upper in zip(rings, rings[1:]):
        mesh.band(lower, upper, colour("brass"), colour("brass", 1.2))
    mesh.cone(rings[-1], (0, 1.1, 0), colour("brass"), colour("brass"))
    return mesh


def window():
    """Looks along +Z, its back on the XY plane; 0.6 wide, 0.9 high, round at the top."""
    mesh = Mesh("window")

    def arch(width, height):
        half = width / 2
        top = [(half * math.cos(a), height - half + half * math.sin(a))
               for a in (math.pi * k / 8 for k in range(9))]
        return [(-half, 0.0), (half, 0.0), *top]

    outer = [(x, y - 0.05) for x, y in arch(0.6, 0.95)]
    inner = [(x, y + 0.02) for x, y in arch(0.42, 0.78)]
    n = len(outer)
    frame, glass = colour("cream"), colour("glass")
    for i in range(n):
        k = (i + 1) % n
        (ax, ay), (bx, by) = outer[i], outer[k]
        (cx, cy), (dx, dy) = inner[k], inner[i]
        mesh.face([(ax, ay, -0.12), (bx, by, -0.12), (bx, by, 0.1), (ax, ay, 0.1)], frame)
        mesh.face([(ax, ay, 0.1), (bx, by, 0.1), (cx, cy, 0.1), (dx, dy, 0.1)], frame)
        mesh.face([(dx, dy, 0.1), (cx, cy, 0.1), (cx, cy, 0.04), (dx, dy, 0.04)], frame)
    mesh.face([(x, y, 0.04) for x, y in inner],
              [mix(glass, colour("sea_shore"), 0.6 * y) for _, y in inner])
    mesh.box((-0.02, 0.04, 0.04), (0.02, 0.76, 0.07), frame)
    mesh.box((-0.2, 0.36, 0.04), (0.2, 0.4, 0.07), frame)
    return mesh


def door():
    mesh = Mesh("door")
    half = 0.42
    arch = [(-half, 0.0), (half, 0.0)]
    arch += [(half * math.cos(a), 1.25 + half * math.sin(a))
             for a in (math.pi * k / 10 for k in range(11))]
    n = len(arch)
    for grow, front, paint in ((1.22, 0.1, "slate_light"), (1.0, 0.14, "door")):
        rim = [(x * grow, y * (1 + (grow - 1) / 3)) for x, y in arch]
        for i in range(n):
            (ax, ay), (bx, by) = rim[i], rim[(i + 1) % n]
            mesh.face([(ax, ay, -0.35), (bx, by, -0.35), (bx, by, front), (ax, ay, front)],
                      colour(paint, 0.8))
        mesh.face([(x, y, front) for x, y in rim], colour(paint))
    mesh.box((0.22, 0.7, 0.14), (0.3, 0.78, 0.2), colour("brass"))
    return mesh


def cottage_walls():
    mesh = Mesh("cottage_walls")
    paint, foot = colour("cream"), colour("cream", 0.75)
    for sign in (1, -1):
        x, z = 1.7 * sign, 1.2 * sign
        side = [(-x, 0, z), (x, 0, z), (x, 1.6, z), (-x, 1.6, z)]
        mesh.face(side, [foot, foot, paint, paint])
        gable = [(x, 0, z), (x, 0, -z), (x, 1.6, -z), (x, 2.75, 0), (x, 1.6, z)]
        mesh.face(gable, [foot, foot, paint, paint, paint])
    return mesh


def cottage_roof():
    """Two thick slabs; their ends together are one concave polygon."""
    mesh = Mesh("cottage_roof")
    end = [(-1.5, 1.35), (-1.5, 1.2), (0, 2.65), (1.5, 1.2), (1.5, 1.35), (0, 2.95)]
    paints = ["wood", "wood", "wood", "wood", "roof", "roof"]
    n = len(end)
    for i in range(n):
        (az, ay), (bz, by) = end[i], end[(i + 1) % n]
        mesh.face([(-2.0, ay, az), (2.0, ay, az), (2.0, by, bz), (-2.0, by, bz)],
                  colour(paints[i]))
    for x, points in ((2.0, end[::-1]), (-2.0, end)):
        mesh.face([(x, y, z) for z, y in points], colour("wood"))
    return mesh


def chimney():
    mesh = Mesh("chimney")
    mesh.box((-0.25, 0, -0.25), (0.25, 1.3, 0.25), colour("brick"))
    mesh.box((-0.32, 1.3, -0.32), (0.32, 1.45, 0.32), colour("slate_light"), colour("iron"))
    return mesh


def pine():
    mesh = Mesh("pine")
    trunk = colour("bark")
    mesh.band(ring(6, 0.16, -0.1), ring(6, 0.12, 0.7), mix(trunk, (0, 0, 0), 0.4), trunk)
    tiers = ((0.95, 0.6, 1.1), (0.74, 1.2, 1.0), (0.5, 1.75, 1.05))
    for k, (radius, y, height) in enumerate(tiers):
        base = ring(8, radius, y, 0.5 * (k % 2))
        mesh.cap(base[::-1], colour("pine", 0.6))
        mesh.cone(base, (0, y + height, 0), colour("pine"), colour("pine_light"))
    return mesh


def trunk():
    mesh = Mesh("trunk")
    mesh.band(ring(6, 0.17, -0.1), ring(6, 0.11, 1.3), colour("bark", 0.6), colour("bark"))
    return mesh


def fence_post():
    mesh = Mesh("fence_post")
    lower, upper = ring(4, 0.08, -0.1, 0.5), ring(4, 0.08, 0.85, 0.5)
    mesh.band(lower, upper, colour("white", 0.7), colour("white"))
    mesh.cone(upper, (0, 0.97, 0), colour("white"), colour("white"))
    return mesh


def fence_rail():
    mesh = Mesh("fence_rail")
    for y in (0.3, 0.6):
        mesh.box((0, y, -0.025), (1, y + 0.1, 0.025), colour("white", 0.92))
    return mesh


def stepping_stone():
    mesh = Mesh("stepping_stone")
    mesh.prism(ring(6, 0.36, 0), -0.05, 0.06, colour("path", 0.8), colour("path"))
    return mesh


def sign_board():
    """Two sides, each with the whole picture; looks along +Z."""
    mesh = Mesh("sign_board", material="Signboard")
    front = [(-0.8, 0, 0.02), (0.8, 0, 0.02), (0.8, 0.6, 0.02), (-0.8, 0.6, 0.02)]
    for side in (front, [(-x, y, -z) for x, y, z in front]):
        mesh.face(side, (1, 1, 1), [(0, 0), (1, 0), (1, 1), (0, 1)])
    return mesh


def pier():
    mesh = Mesh("pier")
    for k in range(9):
        z = 0.5 * k
        mesh.box((-0.55, 0.4, z), (0.55, 0.48, z + 0.42), colour("wood", 0.85),
                 colour("wood_light", 0.9 + 0.15 * (k % 2)))
    for x in (-0.4, 0.4):
        mesh.box((x - 0.06, 0.3, 0), (x + 0.06, 0.4, 4.4), colour("wood", 0.7))
    return mesh


def pile():
    mesh = Mesh("pile")
    mesh.prism(ring(8, 0.1, 0), -0.6, 0.85, colour("wood", 0.8), colour("wood_light"))
    return mesh


def boat_hull():
    mesh = Mesh("boat_hull")
    deck = [(1.6, 0.5, 0), (0.7, 0.42, -0.5), (-0.6, 0.4, -0.52), (-1.3, 0.45, -0.38),
            (-1.3, 0.45, 0.38), (-0.6, 0.4, 0.52), (0.7, 0.42, 0.5)]
    keel = [(1.15, -0.1, 0), (0.5, -0.15, -0.28), (-0.5, -0.15, -0.3), (-1.1, -0.1, -0.22),
            (-1.1, -0.1, 0.22), (-0.5, -0.15, 0.3), (0.5, -0.15, 0.28)]
    rim = [(x * 0.97, y + 0.1, z * 0.97) for x, y, z in deck]
    floor = [(x * 0.86, 0.36, z * 0.84) for x, _, z in deck]
    mesh.band(keel, deck, colour("white"), colour("hull"))
    mesh.band(deck, rim, colour("cream"), colour("cream"))
    mesh.band(rim, floor, colour("wood_light"), colour("wood"))
    mesh.cap(floor, colour("wood_light"))
    mesh.cap(keel[::-1], colour("white"))
    return mesh


def boat_rig():
    """A mast with a boom and two sails; the sails have two sides, a little apart."""
    mesh = Mesh("boat_rig")
    mesh.band(ring(6, 0.05, 0.3), ring(6, 0.03, 3.2), colour("wood"), colour("wood_light"))
    mesh.cone(ring(6, 0.03, 3.2), (0, 3.3, 0), colour("wood_light"), colour("red"))
    mesh.box((-1.25, 0.72, -0.03), (0, 0.78, 0.03), colour("wood"))
    for sail in ([(-0.06, 0.85, 0), (-0.06, 3.1, 0), (-1.2, 0.85, 0.12)],
                 [(0.06, 2.8, 0), (0.06, 0.8, 0), (1.35, 0.65, 0.1)]):
        mesh.face(sail, colour("sail"))
        mesh.face([(x, y, z - 0.02) for x, y, z in sail[::-1]], colour("sail", 0.9))
    return mesh


# The node tree.


class Node:
    """`turn` is an angle about Y, `motion` the keys of that angle or, where `lifts` is set, of the
    place along Y, evenly spread over the time of the whole movement."""

    def __init__(self, name, move=None, turn=0.0, scale=None, mesh=None, matrix=None, motion=None,
                 lifts=False, joint=False):
        self.name = name
        self.move, self.turn, self.scale, self.mesh = move, turn, scale, mesh
        self.matrix = matrix
        self.motion, self.lifts, self.joint = motion, lifts, joint
        self.children = []

    def add(self, *arguments, **options):
        child = Node(*arguments, **options)
        self.children.append(child)
        return child


def polar(radius, degrees, y=0.0):
    angle = math.radians(degrees)
    return (radius * math.cos(angle), y, -radius * math.sin(angle))


def add_lantern(gallery):
    lantern = gallery.add("Lantern", (0, 0.16, 0))
    lantern.add("Lantern_Wall", mesh="lantern_wall")
    lantern.add("Lantern_Glass", mesh="lantern_glass")
    lantern.add("Lamp", (0, 1.0, 0), mesh="lamp")
    beams = lantern.add("Beams", (0, 1.0, 0), motion=[22.5 * k for k in range(17)])
    for k in range(2):
        beams.add(f"Beam_{k + 1}", turn=180 * k, mesh="beam")
    mullions = lantern.add("Mullions", (0, 0.5, 0))
    for k in range(8):
        mullions.add(f"Mullion_{k + 1}", polar(0.87, 45 * k + 22.5), 45 * k + 22.5,
                     (0.8, 1.22, 0.8), "fence_post")
    roof = lantern.add("Lantern_Roof", (0, 1.5, 0), mesh="lantern_roof")
    joint = roof.add("Finial", (0, 1.22, 0), mesh="finial").add("Flag", (0, 0.35, 0), 40,
                                                                mesh="flag")
    for k in range(5):
        # Each follows the one before it; the wave returns four times.
        swing = [(4 + 5 * k) * math.sin(math.tau * (n / 16 - 0.22 * k)) for n in range(65)]
        joint = joint.add(f"Flag_Joint_{k + 1}", (0.35 if k else 0, 0, 0), motion=swing,
                          joint=True)


def add_lighthouse(island):
    lighthouse = island.add("Lighthouse", (-1.6, GROUND, -1.2), 8)
    lighthouse.add("Base", mesh="gear_base")
    tower = lighthouse.add("Tower", (0, 0.7, 0))
    tower.add("Shaft", mesh="tower_shaft")
    tower.add("Tower_Door", polar(tower_radius(0.6) - 0.02, -62), 28, mesh="door")
    windows = tower.add("Tower_Windows")
    for k, (y, angle) in enumerate(((3.0, -35), (4.6, -85), (6.4, -50), (7.7, -110), (5.2, 120))):
        windows.add(f"Tower_Window_{k + 1}", polar(tower_radius(y + 0.4), angle, y), angle + 90,
                    mesh="window")
    gallery = tower.add("Gallery", (0, TOWER_HEIGHT + 0.1, 0))
    gallery.add("Gallery_Floor", mesh="gallery_floor")
    railing = gallery.add("Railing", (0, 0.16, 0))
    for k in range(8):
        railing.add(f"Railing_Post_{k + 1}", polar(1.68, 45 * k + 22.5), 45 * k + 22.5,
                    mesh="fence_post")
        railing.add(f"Railing_Bar_{k + 1}", polar(1.68 * math.cos(math.pi / 8), 45 * k),
                    45 * k + 90, mesh="gallery_rail")
    add_lantern(gallery)


def add_cottage(island):
    cottage = island.add("Cottage", (3.2, GROUND, -1.9), -18)
    cottage.add("Walls", mesh="cottage_walls")
    cottage.add("Roof", mesh="cottage_roof")
    cottage.add("Chimney", (-1.1, 1.95, -0.45), mesh="chimney")
    cottage.add("Cottage_Door", (0, 0, 1.2), scale=(0.85, 0.75, 1), mesh="door")
    windows = cottage.add("Cottage_Windows")
    places = ((-1.1, 0.42, 1.2, 0), (1.1, 0.42, 1.2, 0), (1.7, 0.7, 0, 90), (-1.7, 0.7, 0, -90),
              (-0.8, 0.42, -1.2, 180), (0.8, 0.42, -1.2, 180))
    for k, (x, y, z, turn) in enumerate(places):
        windows.add(f"Cottage_Window_{k + 1}", (x, y, z), turn, mesh="window")


def add_plants(island):
    trees = island.add("Trees", (0, GROUND, 0))
    pines = trees.add("Pines")
    places = ((-5.4, -1.6, 1.25), (-6.3, 0.3, 1.0), (-4.6, -3.9, 1.45), (-2.6, -5.6, 1.2),
              (-0.4, -6.1, 1.5), (1.4, -5.1, 1.1), (-6.1, -2.9, 0.85), (6.2, -2.3, 1.15),
              (5.6, -3.9, 1.4))
    for k, (x, z, size) in enumerate(places):
        pines.add(f"Pine_{k + 1}", (x, 0, z), 37 * k % 360, (size, size * 1.05, size), "pine")
    leafy = trees.add("Leafy_Trees")
    for k, (x, z, size) in enumerate(((3.0, -4.9, 1.1), (0.9, -3.5, 0.9), (-4.9, 1.9, 1.0))):
        tree = leafy.add(f"Leafy_Tree_{k + 1}", (x, 0, z), 50 * k, (size, size, size))
        tree.add(f"Leafy_Trunk_{k + 1}", mesh="trunk")
        tree.add(f"Crown_{k + 1}", (0, 1.85, 0), mesh="crown")
        tree.add(f"Crown_Low_{k + 1}", (0.45, 1.35, 0.3), 110, (0.6, 0.55, 0.6), "crown")
    bushes = trees.add("Bushes")
    places = ((1.5, -0.9, 0.45), (5.1, -0.4, 0.5), (-3.9, 1.0, 0.4), (-4.4, 3.5, 0.55),
              (4.6, -3.2, 0.5), (-2.4, 5.2, 0.45))
    for k, (x, z, size) in enumerate(places):
        bushes.add(f"Bush_{k + 1}", (x, 0.6 * size, z), 70 * k, (size, size * 0.9, size), "crown")


def add_rocks(island):
    rocks = island.add("Rocks")
    rng = random.Random(3)
    shore = shore_outline(40, 10.2, 11)
    for k, corner in enumerate((1, 3, 8, 11, 14, 15, 19, 22, 25, 26, 29, 37)):
        x, _, z = shore[corner]
        size = 0.45 + 0.6 * rng.random()
        out = 1.02 + 0.1 * rng.random()
        rocks.add(f"Rock_{k + 1}", (x * out, 0.1 * size, z * out), round(360 * rng.random()),
                  (size, size * (0.8 + 0.4 * rng.random()), size),
                  "rock_round" if k % 3 else "rock_sharp")


def add_fence_and_path(island):
    path = island.add("Path", (0, GROUND, 0))
    stones = ((-0.1, 1.25), (0.1, 2.05), (0.75, 2.7), (1.5, 3.05), (2.1, 2.4), (2.5, 1.55),
              (2.7, 0.65), (2.0, 3.75))
    for k, (x, z) in enumerate(stones):
        path.add(f"Stepping_Stone_{k + 1}", (x, 0, z), 23 * k, (1, 1, 0.85), "stepping_stone")
    fence = island.add("Fence", (0, GROUND, 0))
    line = [(-6.3, 2.1), (-5.9, 3.2), (-5.2, 4.2), (-4.3, 5.1), (-3.2, 5.8), (-2.0, 6.2),
            (-0.8, 6.1), (0.3, 5.7), (1.1, 4.9)]
    for k, (x, z) in enumerate(line):
        post = fence.add(f"Fence_Post_{k + 1}", (x, 0, z), mesh="fence_post")
        if k + 1 < len(line):
            dx, dz = line[k + 1][0] - x, line[k + 1][1] - z
            post.add(f"Fence_Rail_{k + 1}", turn=math.degrees(math.atan2(-dz, dx)),
                     scale=(math.hypot(dx, dz), 1, 1), mesh="fence_rail")


def add_sign(island):
    sign = island.add("Sign", (4.3, GROUND, 2.7), 45)
    for k, x in enumerate((-0.6, 0.6)):
        sign.add(f"Sign_Post_{k + 1}", (x, 0, 0), scale=(1, 1.2, 1), mesh="fence_post")
    sign.add("Sign_Board", (0, 0.45, 0.08), mesh="sign_board")


def add_harbour(root):
    harbour = root.add("Harbour", polar(4.9, -53), 37)
    harbour.add("Pier", mesh="pier")
    for k, (x, z) in enumerate(((-0.5, 0.3), (0.5, 0.3), (-0.5, 2.2), (0.5, 2.2), (-0.5, 4.2),
                                (0.5, 4.2))):
        harbour.add(f"Pile_{k + 1}", (x, 0, z), mesh="pile")
    # Heels a little: turned by -25 degrees round Y, then by 5 degrees round X.
    a, b = math.radians(-25), math.radians(5)
    swell = harbour.add("Swell", (0, 0, 0), lifts=True,
                        motion=[0.1 * math.sin(math.tau * n / 16) for n in range(33)])
    boat = swell.add("Boat", matrix=(
        math.cos(a), 0, math.sin(a), 2.5,
        math.sin(b) * math.sin(a), math.cos(b), -math.sin(b) * math.cos(a), 0.05,
        -math.cos(b) * math.sin(a), math.sin(b), math.cos(b) * math.cos(a), 4.9,
        0, 0, 0, 1))
    boat.add("Hull", mesh="boat_hull")
    boat.add("Rig", (0.2, 0, 0), mesh="boat_rig")


def scene():
    root = Node("Diorama")
    root.add("Sea", mesh="sea")
    island = root.add("Island")
    island.add("Beach", mesh="beach")
    island.add("Meadow", mesh="meadow")
    add_lighthouse(island)
    add_cottage(island)
    add_plants(island)
    add_rocks(island)
    add_fence_and_path(island)
    add_sign(island)
    add_harbour(root)
    return root


def meshes():
    makers = (sea, beach, meadow, gear_base, tower_shaft, gallery_floor, gallery_rail,
              lantern_wall, lantern_glass, lamp, beam, flag, lantern_roof, finial, window, door, cottage_walls,
              cottage_roof, chimney, pine, trunk, fence_post, fence_rail, stepping_stone,
              sign_board, pier, pile, boat_hull, boat_rig)
    result = [make() for make in makers]
    result.append(lump("crown", 1, (0.95, 0.85, 0.95), 0.12, 21, colour("leaf"),
                       colour("leaf_light")))
    result.append(lump("rock_round", 1, (1.0, 0.75, 0.9), 0.16, 4, colour("rock", 0.7),
                       colour("rock_light")))
    result.append(lump("rock_sharp", 0, (0.8, 1.1, 0.9), 0.3, 9, colour("rock", 0.6),
                       colour("rock_light")))
    return result


# Writing COLLADA.


def number(value):
    text = f"{value:.4f}".rstrip("0").rstrip(".")
    return "0" if text == "-0" else text


def write_image(picture):
    yield f'    <image id="{picture.name}" name="{picture.name}">'
    yield f"      <init_from>textures/{picture.name}.png</init_from>"
    yield "    </image>"


def write_effect(material):
    def colour_element(name, values):
        return f"            <{name}><color>{' '.join(map(number, values))} 1</color></{name}>"

    def map_element(name, picture, attributes=""):
        return (f'            <{name}{attributes}><texture texture="{picture}-sampler"'
                f' texcoord="UV"/></{name}>')

    def float_element(name, value):
        return f"            <{name}><float>{number(value)}</float></{name}>"

    yield f'    <effect id="{material.name}-effect">'
    yield "      <profile_COMMON>"
    for picture in material.maps():
        yield (f'        <newparam sid="{picture}-surface"><surface type="2D"><init_from>{picture}'
               "</init_from></surface></newparam>")
        yield (f'        <newparam sid="{picture}-sampler"><sampler2D><source>{picture}-surface'
               "</source></sampler2D></newparam>")
    yield '        <technique sid="common">'
    model = "phong" if material.shininess else "lambert"
    yield f"          <{model}>"
    if material.emission:
        yield colour_element("emission", material.emission)
    if material.occlusion_map:
        yield map_element("ambient", material.occlusion_map)
    if material.colour_map:
        yield map_element("diffuse", material.colour_map)
    else:
        yield colour_element("diffuse", (1, 1, 1))
    if material.shininess:
        yield colour_element("specular", (0.5, 0.5, 0.5))
        yield float_element("shininess", material.shininess)
    if material.cut_out:
        yield map_element("transparent", material.colour_map, ' opaque="A_ONE"')
    elif material.opacity < 1:
        yield '            <transparent opaque="A_ONE"><color>1 1 1 1</color></transparent>'
        yield float_element("transparency", material.opacity)
    yield f"          </{model}>"
    if material.bump_map:
        # COLLADA has no place for it; this one is known to many programs.
        yield '          <extra><technique profile="FCOLLADA">'
        yield map_element("bump", material.bump_map)
        yield "          </technique></extra>"
    yield "        </technique>"
    yield "      </profile_COMMON>"
    yield "    </effect>"


def write_material(material):
    yield f'    <material id="{material.name}" name="{material.name}">'
    yield f'      <instance_effect url="#{material.name}-effect"/>'
    yield "    </material>"


def write_source(mesh, kind, params):
    values = list(mesh.pools[kind])
    floats = " ".join(" ".join(value) for value in values)
    identifier = f"{mesh.name}-{kind}"
    yield f'        <source id="{identifier}">'
    yield (f'          <float_array id="{identifier}-array" count="{len(values) * len(params)}">'
           f"{floats}</float_array>")
    yield "          <technique_common>"
    yield (f'            <accessor source="#{identifier}-array" count="{len(values)}"'
           f' stride="{len(params)}">')
    for param in params:
        yield f'              <param name="{param}" type="float"/>'
    yield "            </accessor>"
    yield "          </technique_common>"
    yield "        </source>"


def write_mesh(mesh):
    """One geometry. All triangles: a <triangles> element, otherwise a <polylist>."""
    yield f'    <geometry id="{mesh.name}" name="{mesh.name}">'
    yield "      <mesh>"
    sources = [("VERTEX", "vertices", None), ("NORMAL", "normal", "XYZ")]
    if mesh.textured:
        sources.append(("TEXCOORD", "uv", "ST"))
    sources.append(("COLOR", "colour", "RGB"))
    yield from write_source(mesh, "position", "XYZ")
    for _, kind, params in sources[1:]:
        yield from write_source(mesh, kind, params)
    yield f'        <vertices id="{mesh.name}-vertices">'
    yield f'          <input semantic="POSITION" source="#{mesh.name}-position"/>'
    yield "        </vertices>"
    sizes = [len(polygon) for polygon in mesh.polygons]
    element = "triangles" if max(sizes) == 3 else "polylist"
    yield f'        <{element} material="surface" count="{len(sizes)}">'
    for offset, (semantic, kind, _) in enumerate(sources):
        count = ' set="0"' if semantic in ("TEXCOORD", "COLOR") else ""
        yield (f'          <input semantic="{semantic}" source="#{mesh.name}-{kind}"'
               f' offset="{offset}"{count}/>')
    if element == "polylist":
        yield f"          <vcount>{' '.join(map(str, sizes))}</vcount>"
    indices = (str(index) for polygon in mesh.polygons for corner in polygon for index in corner)
    yield f"          <p>{' '.join(indices)}</p>"
    yield f"        </{element}>"
    yield "      </mesh>"
    yield "    </geometry>"


def write_instance(mesh, pad):
    kind = "controller" if mesh.skeleton else "geometry"
    suffix = "-skin" if mesh.skeleton else ""
    yield f'{pad}<instance_{kind} url="#{mesh.name}{suffix}">'
    if mesh.skeleton:
        yield f"{pad}  <skeleton>#{mesh.skeleton.joints[0]}</skeleton>"
    end = "/>"
    if mesh.textured:
        end = ('><bind_vertex_input semantic="UV" input_semantic="TEXCOORD" input_set="0"/>'
               "</instance_material>")
    yield (f"{pad}  <bind_material><technique_common>"
           f'<instance_material symbol="surface" target="#{mesh.material}"{end}'
           "</technique_common></bind_material>")
    yield f"{pad}</instance_{kind}>"


def write_array(pad, identifier, element, values, stride, params):
    yield f'{pad}<source id="{identifier}">'
    yield (f'{pad}  <{element} id="{identifier}-array" count="{len(values)}">'
           f"{' '.join(values)}</{element}>")
    yield f"{pad}  <technique_common>"
    yield (f'{pad}    <accessor source="#{identifier}-array" count="{len(values) // stride}"'
           f' stride="{stride}">')
    for name, kind in params:
        yield f'{pad}      <param name="{name}" type="{kind}"/>'
    yield f"{pad}    </accessor>"
    yield f"{pad}  </technique_common>"
    yield f"{pad}</source>"


def write_skin(mesh):
    skeleton, skin = mesh.skeleton, f"{mesh.name}-skin"
    influences = [skeleton.weights(float(position[0])) for position in mesh.pools["position"]]
    inverses = [f"1 0 0 {number(-skeleton.spacing * k)} 0 1 0 0 0 0 1 0 0 0 0 1".split()
                for k in range(len(skeleton.joints))]
    pad = " " * 8
    yield f'    <controller id="{skin}" name="{skin}">'
    yield f'      <skin source="#{mesh.name}">'
    yield f"{pad}<bind_shape_matrix>1 0 0 0 0 1 0 0 0 0 1 0 0 0 0 1</bind_shape_matrix>"
    yield from write_array(pad, f"{skin}-joints", "Name_array", skeleton.joints, 1,
                           [("JOINT", "name")])
    yield from write_array(pad, f"{skin}-inverses", "float_array", sum(inverses, []), 16,
                           [("TRANSFORM", "float4x4")])
    weights = [number(weight) for pairs in influences for _, weight in pairs]
    yield from write_array(pad, f"{skin}-weights", "float_array", weights, 1,
                           [("WEIGHT", "float")])
    yield f"{pad}<joints>"
    yield f'{pad}  <input semantic="JOINT" source="#{skin}-joints"/>'
    yield f'{pad}  <input semantic="INV_BIND_MATRIX" source="#{skin}-inverses"/>'
    yield f"{pad}</joints>"
    yield f'{pad}<vertex_weights count="{len(influences)}">'
    yield f'{pad}  <input semantic="JOINT" source="#{skin}-joints" offset="0"/>'
    yield f'{pad}  <input semantic="WEIGHT" source="#{skin}-weights" offset="1"/>'
    yield f"{pad}  <vcount>{' '.join(str(len(pairs)) for pairs in influences)}</vcount>"
    joints = [joint for pairs in influences for joint, _ in pairs]
    yield f"{pad}  <v>{' '.join(f'{joint} {i}' for i, joint in enumerate(joints))}</v>"
    yield f"{pad}</vertex_weights>"
    yield "      </skin>"
    yield "    </controller>"


SECONDS = 8  # of the whole movement


def moving_nodes(node):
    if node.motion:
        yield node
    for child in node.children:
        yield from moving_nodes(child)


def write_animation(node):
    identifier, count, pad = f"{node.name}-motion", len(node.motion), " " * 6
    times = [number(SECONDS * k / (count - 1)) for k in range(count)]
    target = "place.Y" if node.lifts else "turn.ANGLE"
    yield f'    <animation id="{identifier}">'
    yield from write_array(pad, f"{identifier}-input", "float_array", times, 1,
                           [("TIME", "float")])
    yield from write_array(pad, f"{identifier}-output", "float_array",
                           [number(value) for value in node.motion], 1,
                           [(target.partition(".")[2], "float")])
    yield from write_array(pad, f"{identifier}-interpolation", "Name_array", ["LINEAR"] * count, 1,
                           [("INTERPOLATION", "name")])
    yield f'      <sampler id="{identifier}-sampler">'
    for semantic in ("INPUT", "OUTPUT", "INTERPOLATION"):
        yield f'        <input semantic="{semantic}" source="#{identifier}-{semantic.lower()}"/>'
    yield "      </sampler>"
    yield f'      <channel source="#{identifier}-sampler" target="{node.name}/{target}"/>'
    yield "    </animation>"


def write_node(node, mesh_named, indent):
    pad = " " * indent
    kind = f'sid="{node.name}" type="JOINT"' if node.joint else 'type="NODE"'
    yield f'{pad}<node id="{node.name}" name="{node.name}" {kind}>'
    if node.matrix:
        yield f"{pad}  <matrix>{' '.join(map(number, node.matrix))}</matrix>"
    if node.move:
        place = ' sid="place"' if node.lifts else ""
        yield f"{pad}  <translate{place}>{' '.join(map(number, node.move))}</translate>"
    if node.motion and not node.lifts:
        yield f'{pad}  <rotate sid="turn">0 1 0 {number(node.motion[0])}</rotate>'
    elif node.turn:
        yield f"{pad}  <rotate>0 1 0 {number(node.turn)}</rotate>"
    if node.scale:
        yield f"{pad}  <scale>{' '.join(map(number, node.scale))}</scale>"
    if node.mesh:
        yield from write_instance(mesh_named[node.mesh], pad + "  ")
    for child in node.children:
        yield from write_node(child, mesh_named, indent + 2)
    yield f"{pad}</node>"


def write_library(kind, items, write_item):
    yield f"  <library_{kind}>"
    for item in items:
        yield from write_item(item)
    yield f"  </library_{kind}>"


def write_document(images):
    parts = meshes()
    yield '<?xml version="1.0" encoding="utf-8"?>'
    yield '<COLLADA xmlns="http://www.collada.org/2005/11/COLLADASchema" version="1.4.1">'
    yield "  <asset>"
    yield "    <contributor><authoring_tool>make_lighthouse.py</authoring_tool></contributor>"
    yield "    <created>2000-01-01T00:00:00Z</created>"
    yield "    <modified>2000-01-01T00:00:00Z</modified>"
    yield '    <unit name="meter" meter="1"/>'
    yield "    <up_axis>Y_UP</up_axis>"
    yield "  </asset>"
    yield from write_library("images", images, write_image)
    yield from write_library("effects", MATERIALS.values(), write_effect)
    yield from write_library("materials", MATERIALS.values(), write_material)
    yield from write_library("geometries", parts, write_mesh)
    yield from write_library("controllers", [mesh for mesh in parts if mesh.skeleton], write_skin)
    root = scene()
    yield from write_library("animations", moving_nodes(root), write_animation)
    yield "  <library_visual_scenes>"
    yield '    <visual_scene id="Scene" name="Scene">'
    yield from write_node(root, {mesh.name: mesh for mesh in parts}, 6)
    yield "    </visual_scene>"
    yield "  </library_visual_scenes>"
    yield '  <scene><instance_visual_scene url="#Scene"/></scene>'
    yield "</COLLADA>"


def main(arguments):
    if len(arguments) > 1:
        sys.exit("usage: make_lighthouse.py [FOLDER]")
    folder = pathlib.Path(arguments[0]) if arguments else pathlib.Path(__file__).parent
    (folder / "textures").mkdir(parents=True, exist_ok=True)
    images = pictures()
    for picture in images:
        (folder / "textures" / f"{picture.name}.png").write_bytes(picture.encoded())
    text = "".join(f"{line}\n" for line in write_document(images))
    (folder / "lighthouse.dae").write_bytes(text.encode())


if __name__ == "__main__":
    main(sys.argv[1:])
