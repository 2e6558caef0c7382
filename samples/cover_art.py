"""Draws cover pictures with the standard library alone: a canvas of smooth shapes, a stroke
alphabet, and a PNG writer. The same calls always give the same bytes."""

import math
import struct
import zlib


def mix(a, b, t):
    return tuple(x + (y - x) * t for x, y in zip(a, b))


def rgb(text):
    return tuple(int(text[i:i + 2], 16) for i in (0, 2, 4))


class Canvas:
    """Pixels in floating point; colours are triples from 0 to 255. Edges are smoothed."""

    def __init__(self, width=600, height=900):
        self.width, self.height = width, height
        self.rows = [[(0.0, 0.0, 0.0)] * width for _ in range(height)]

    def _blend(self, x, y, color, alpha):
        if alpha > 0:
            self.rows[y][x] = mix(self.rows[y][x], color, min(alpha, 1))

    def _box(self, x0, y0, x1, y1):
        for y in range(max(0, math.floor(y0)), min(self.height, math.ceil(y1) + 1)):
            for x in range(max(0, math.floor(x0)), min(self.width, math.ceil(x1) + 1)):
                yield x, y

    def gradient(self, stops):
        """Fills the canvas; stops are (height from 0 to 1, colour)."""
        for y in range(self.height):
            t = y / (self.height - 1)
            for (t0, c0), (t1, c1) in zip(stops, stops[1:]):
                if t0 <= t <= t1:
                    self.rows[y] = [mix(c0, c1, (t - t0) / (t1 - t0))] * self.width

    def disc(self, cx, cy, radius, color, alpha=1.0, soft=1.0):
        """A disc; a large soft makes a glow that fades over that many pixels."""
        reach = radius + soft
        for x, y in self._box(cx - reach, cy - reach, cx + reach, cy + reach):
            t = (radius + soft / 2 - math.hypot(x - cx, y - cy)) / soft
            if t > 0:
                t = min(t, 1)
                self._blend(x, y, color, alpha * (t if soft <= 2 else t * t))

    def ring(self, cx, cy, radius, thickness, color, alpha=1.0):
        reach = radius + thickness
        for x, y in self._box(cx - reach, cy - reach, cx + reach, cy + reach):
            distance = abs(math.hypot(x - cx, y - cy) - radius)
            self._blend(x, y, color, alpha * min(1, thickness / 2 + 0.5 - distance))

    def petal(self, cx, cy, angle, inner, outer, half_width, color, alpha=1.0):
        """A leaf from one distance of the middle to another, pointing along the angle."""
        ux, uy = math.cos(angle), math.sin(angle)
        for x, y in self._box(cx - outer, cy - outer, cx + outer, cy + outer):
            along = (x - cx) * ux + (y - cy) * uy
            if not inner < along < outer:
                continue
            across = abs(-(x - cx) * uy + (y - cy) * ux)
            edge = half_width * math.sin(math.pi * (along - inner) / (outer - inner)) ** 0.8
            self._blend(x, y, color, alpha * (edge + 0.5 - across))

    def below(self, height_at, color, bottom=None):
        """Fills from the curve down; bottom is the colour at the canvas's lower edge."""
        for x in range(self.width):
            top = height_at(x)
            for y in range(max(0, math.floor(top)), self.height):
                fill = mix(color, bottom, y / self.height) if bottom else color
                self._blend(x, y, fill, y + 1 - top)

    def rectangle(self, x0, y0, x1, y1, color, alpha=1.0):
        for x, y in self._box(x0, y0, x1 - 1, y1 - 1):
            self._blend(x, y, color, alpha)

    def strokes(self, shapes, thickness, color, alpha=1.0):
        """Lines (x0, y0, x1, y1) and arcs (cx, cy, r, from, to) as one figure of even weight."""
        reach = thickness / 2 + 1
        boxes = [_bounds(shape) for shape in shapes]
        x0, y0 = min(b[0] for b in boxes) - reach, min(b[1] for b in boxes) - reach
        x1, y1 = max(b[2] for b in boxes) + reach, max(b[3] for b in boxes) + reach
        for x, y in self._box(x0, y0, x1, y1):
            distance = min(_distance(shape, x, y) for shape in shapes)
            self._blend(x, y, color, alpha * min(1, thickness / 2 + 0.5 - distance))

    def text(self, words, cx, top, size, color, weight=0.09, tracking=0.3):
        """One line of capitals, its middle at cx, in the stroke alphabet below."""
        advance = [0.3 + tracking if c == " " else ALPHABET[c][0] + tracking for c in words]
        left = cx - (sum(advance) - tracking) * size / 2
        for letter, width in zip(words, advance):
            if letter != " ":
                self.strokes([_placed(shape, left, top, size) for shape in ALPHABET[letter][1]],
                             weight * size, color)
            left += width * size

    def png(self, step=1):
        """Shades a step apart make a smaller file; gradients want every one."""
        filtered = {kind: bytearray() for kind in ("none", "least")}
        previous = bytes(self.width * 3)
        for row in self.rows:
            line = bytes(min(255, round(c / step) * step) for pixel in row for c in pixel)
            up = bytes((a - b) & 255 for a, b in zip(line, previous))
            left = line[:3] + bytes((a - b) & 255 for a, b in zip(line[3:], line))
            cost = [sum(min(b, 256 - b) for b in difference) for difference in (left, up)]
            filtered["least"] += b"\1" + left if cost[0] <= cost[1] else b"\2" + up
            filtered["none"] += b"\0" + line
            previous = line
        header = struct.pack(">IIBBBBB", self.width, self.height, 8, 2, 0, 0, 0)
        data = min((zlib.compress(bytes(raw), 9) for raw in filtered.values()), key=len)
        return (b"\x89PNG\r\n\x1a\n" + _chunk(b"IHDR", header) + _chunk(b"IDAT", data)
                + _chunk(b"IEND", b""))

    def halved(self):
        """The same picture at half the size."""
        half = Canvas(self.width // 2, self.height // 2)
        for y in range(half.height):
            for x in range(half.width):
                four = [self.rows[2 * y + j][2 * x + i] for j in (0, 1) for i in (0, 1)]
                half.rows[y][x] = tuple(sum(c) / 4 for c in zip(*four))
        return half


def _chunk(kind, data):
    return struct.pack(">I", len(data)) + kind + data + struct.pack(">I", zlib.crc32(kind + data))


def _bounds(shape):
    if len(shape) == 4:
        x0, y0, x1, y1 = shape
        return min(x0, x1), min(y0, y1), max(x0, x1), max(y0, y1)
    cx, cy, r = shape[:3]
    return cx - r, cy - r, cx + r, cy + r


def _distance(shape, x, y):
    if len(shape) == 4:
        x0, y0, x1, y1 = shape
        dx, dy = x1 - x0, y1 - y0
        t = ((x - x0) * dx + (y - y0) * dy) / (dx * dx + dy * dy)
        t = min(1, max(0, t))
        return math.hypot(x - x0 - t * dx, y - y0 - t * dy)
    cx, cy, r, start, end = shape
    angle = (math.degrees(math.atan2(y - cy, x - cx)) - start) % 360
    if angle <= end - start:
        return abs(math.hypot(x - cx, y - cy) - r)
    ends = [(cx + r * math.cos(math.radians(a)), cy + r * math.sin(math.radians(a)))
            for a in (start, end)]
    return min(math.hypot(x - ex, y - ey) for ex, ey in ends)


def _placed(shape, left, top, size):
    if len(shape) == 4:
        x0, y0, x1, y1 = shape
        return left + x0 * size, top + y0 * size, left + x1 * size, top + y1 * size
    cx, cy, r, start, end = shape
    return left + cx * size, top + cy * size, r * size, start, end


def _path(*points):
    return [a + b for a, b in zip(points, points[1:])]


# Width and strokes of each letter, the height of a capital being 1. Angles go clockwise from the
# right.
_STEM = (0, 0, 0, 1)
_BOWL = [_STEM, (0, 0, .28, 0), (.28, .28, .28, -90, 90), (.28, .56, 0, .56)]
ALPHABET = {
    "A": (.84, _path((0, 1), (.42, 0), (.84, 1)) + [(.15, .66, .69, .66)]),
    "B": (.58, [_STEM, (0, 0, .3, 0), (.3, .24, .24, -90, 90), (.32, .48, 0, .48),
                (.32, .74, .26, -90, 90), (.32, 1, 0, 1)]),
    "C": (.85, [(.5, .5, .5, 45, 315)]),
    "D": (.75, [_STEM, (0, 0, .25, 0), (.25, .5, .5, -90, 90), (.25, 1, 0, 1)]),
    "E": (.5, [_STEM, (0, 0, .5, 0), (0, .48, .44, .48), (0, 1, .5, 1)]),
    "F": (.48, [_STEM, (0, 0, .48, 0), (0, .48, .42, .48)]),
    "G": (1, [(.5, .5, .5, 0, 315), (1, .5, .6, .5)]),
    "H": (.68, [_STEM, (.68, 0, .68, 1), (0, .48, .68, .48)]),
    "I": (0, [_STEM]),
    "K": (.62, [_STEM, (.58, 0, 0, .6), (.2, .43, .62, 1)]),
    "L": (.48, [_STEM, (0, 1, .48, 1)]),
    "M": (.9, _path((0, 1), (0, 0), (.45, .75), (.9, 0), (.9, 1))),
    "N": (.7, _path((0, 1), (0, 0), (.7, 1), (.7, 0))),
    "O": (1, [(.5, .5, .5, 0, 360)]),
    "P": (.56, _BOWL),
    "R": (.58, _BOWL + [(.25, .56, .58, 1)]),
    "S": (.53, [(.27, .255, .255, 90, 320), (.27, .755, .245, -90, 140)]),
    "T": (.64, [(.32, 0, .32, 1), (0, 0, .64, 0)]),
    "U": (.66, [(0, 0, 0, .67), (.33, .67, .33, 0, 180), (.66, .67, .66, 0)]),
    "V": (.8, _path((0, 0), (.4, 1), (.8, 0))),
    "W": (1.2, _path((0, 0), (.3, 1), (.6, .1), (.9, 1), (1.2, 0))),
    "Y": (.68, _path((0, 0), (.34, .5), (.68, 0)) + [(.34, .5, .34, 1)]),
    "'": (0, [(0, 0, -.04, .2)]),
}
