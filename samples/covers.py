"""The four sample covers."""

import math

from cover_art import Canvas, mix, rgb


def lamplighter():
    """Roofs at dusk, and one lamp."""
    art = Canvas()
    art.gradient([(0, rgb("141b3c")), (.38, rgb("3d3566")), (.62, rgb("a8557a")),
                  (.78, rgb("f0a07a")), (1, rgb("fbd9a5"))])
    for i in range(46):
        x, y = (i * 197 + 41) % 600, (i * i * 53 + i * 29) % 330
        art.disc(x, y, .7 + (i * 7 % 4) * .3, rgb("fff4dc"), .35 + (i % 5) * .12)

    def roofs(base, step, rise, seed):
        def height_at(x):
            house, at = divmod(x + seed * 37, step)
            wall = base - (house * 61 + seed * 17) % 70
            return wall - rise * (1 - abs(2 * at / step - 1))
        return height_at

    art.below(roofs(690, 96, 44, 2), rgb("7a4470"), rgb("8a4a6c"))
    art.below(roofs(752, 128, 56, 5), rgb("46305c"), rgb("3c2a55"))
    art.below(roofs(828, 168, 66, 3), rgb("221f42"), rgb("181735"))
    for i in range(15):
        x, y = 14 + i * 41, 812 + (i * 59) % 66
        if i % 3:
            art.rectangle(x, y, x + 9, y + 14, rgb("ffcf7a"), .55 + (i % 4) * .12)

    ink = rgb("12122b")
    art.disc(430, 505, 8, rgb("ffd98a"), .62, soft=330)
    art.disc(430, 505, 4, rgb("fff0c4"), .8, soft=90)
    art.strokes([(430, 548, 430, 900)], 7, ink)
    art.strokes([(406, 472, 416, 546), (454, 472, 444, 546), (416, 546, 444, 546),
                 (400, 470, 460, 470), (400, 470, 430, 446), (460, 470, 430, 446),
                 (430, 446, 430, 434)], 4.5, ink)
    art.disc(430, 512, 9, rgb("fffbe8"), soft=8)
    art.strokes([(396, 590, 464, 590)], 4, ink)

    paper = rgb("fdeccb")
    art.text("THE", 300, 84, 26, paper, tracking=.5)
    art.text("LAMPLIGHTER", 300, 136, 53, paper, weight=.085, tracking=.22)
    art.text("OF VEY", 300, 222, 54, paper, weight=.085, tracking=.34)
    art.text("INES CALLOWAY", 210, 400, 17, paper, tracking=.5)
    return art


def salt_and_starlight():
    """A moon over the sea, and its path on the water."""
    art = Canvas()
    art.gradient([(0, rgb("06142b")), (.45, rgb("123a5c")), (.60, rgb("3f7f92")),
                  (.61, rgb("0e3048")), (1, rgb("041321"))])
    horizon = 546
    for i in range(90):
        x, y = (i * 131 + i * i * 17) % 600, (i * 89 + i * i * 7) % 480
        art.disc(x, y, .6 + (i % 4) * .32, rgb("eaf6ff"), .3 + (i % 6) * .11)
    for radius, alpha in ((210, .05), (160, .07), (118, .10)):
        art.disc(300, 372, radius, rgb("bfe3ea"), alpha, soft=2)
    art.disc(300, 372, 82, rgb("f7f1dc"))
    art.disc(276, 350, 17, rgb("e6dcc0"), .6, soft=3)
    art.disc(326, 396, 24, rgb("e6dcc0"), .5, soft=4)
    art.disc(318, 338, 9, rgb("e6dcc0"), .5, soft=3)
    for i in range(34):
        y = horizon + 8 + i * 10 + i * i * .02
        reach = 20 + 86 * abs(math.sin(i * 1.7 + .4)) * (.35 + i / 34)
        shift = 14 * math.sin(i * 2.3)
        art.strokes([(300 + shift - reach, y, 300 + shift + reach, y)], 2.2 + i * .05,
                    mix(rgb("f7f1dc"), rgb("4f9bab"), i / 34), .85 - i * .018)
    for i, (base, swing) in enumerate(((720, 12), (778, 17), (838, 22))):
        color = mix(rgb("0d3a54"), rgb("061826"), i / 2)
        art.below(lambda x, b=base, s=swing, n=i:
                  b + s * math.sin(x / (58 + 14 * n) + n * 2.1) + 5 * math.sin(x / 23 + n), color)

    foam = rgb("f3ecd6")
    art.text("SALT", 300, 74, 62, foam, weight=.075, tracking=.5)
    art.text("AND", 300, 166, 18, foam, tracking=.8)
    art.text("STARLIGHT", 300, 208, 44, foam, weight=.08, tracking=.42)
    art.text("POEMS", 300, 800, 15, foam, tracking=.9)
    art.text("TOBIAS WREN", 300, 840, 20, foam, tracking=.5)
    return art


def clouds():
    """Banks of cloud, the nearest the whitest."""
    art = Canvas()
    art.gradient([(0, rgb("2f7fb8")), (.5, rgb("8cc4e0")), (1, rgb("e9f3ee"))])
    art.disc(452, 330, 66, rgb("fff3c9"), .5, soft=150)
    art.disc(452, 330, 56, rgb("ffe9a3"))

    def bank(base, color, seed, size):
        puffs = [((i * 83 + seed * 47) % 760 - 80, base + (i * 37 + seed * 11) % 46,
                  size * (.62 + (i * 29 + seed * 13) % 40 / 62)) for i in range(12)]

        def top(x):
            edge = base + size * .8
            for cx, cy, r in puffs:
                if abs(x - cx) < r:
                    edge = min(edge, cy - math.sqrt(r * r - (x - cx) ** 2))
            return edge
        art.below(top, color)

    bank(500, rgb("a9d0e4"), 2, 78)
    bank(592, rgb("c5e0ec"), 5, 88)
    bank(690, rgb("deeef3"), 9, 96)
    bank(800, rgb("fbfdfb"), 4, 104)
    bird = rgb("1d3f5c")
    for x, y, s in ((128, 388, 15), (176, 420, 11), (90, 432, 9)):
        art.strokes([(x - s, y, s, 215, 325), (x + s, y, s, 215, 325)], 2.6, bird)

    art.text("A FIELD GUIDE TO", 300, 92, 22, rgb("ffffff"), tracking=.5)
    art.text("CLOUDS", 300, 148, 76, rgb("ffffff"), weight=.085, tracking=.3)
    art.text("MARGUERITE OAKE", 300, 838, 19, rgb("1d4f78"), tracking=.5)
    return art


def clockmakers_garden():
    """A dial that has come into flower."""
    art = Canvas()
    art.rectangle(0, 0, art.width, art.height, rgb("12332c"))
    cx, cy = 300, 520
    gold, pale = rgb("d9b45f"), rgb("f4e6bd")
    for i in range(24):
        angle = math.radians(i * 15 + 7.5)
        art.petal(cx, cy, angle, 150, 262, 17, rgb("24614c" if i % 2 else "1d5142"))
    for i in range(12):
        angle = math.radians(i * 30)
        art.petal(cx, cy, angle, 78, 232, 27, rgb("c9574f" if i % 3 else "e08a55"))
        art.petal(cx, cy, angle, 100, 210, 8, rgb("eda676"))
    art.disc(cx, cy, 104, rgb("0f2a25"))
    art.disc(cx, cy, 98, pale)
    art.ring(cx, cy, 98, 5, gold)
    art.ring(cx, cy, 262, 2, gold, .8)
    art.ring(cx, cy, 272, 1, gold, .5)
    ink = rgb("1b3a33")
    for i in range(60):
        angle = math.radians(i * 6)
        inner, weight = (78, 3) if i % 5 == 0 else (86, 1.3)
        ux, uy = math.cos(angle), math.sin(angle)
        art.strokes([(cx + inner * ux, cy + inner * uy, cx + 90 * ux, cy + 90 * uy)], weight, ink)
        if i % 5 == 0:
            art.disc(cx + 267 * ux, cy + 267 * uy, 5, gold)
    for degrees, length, weight in ((-130, 46, 6), (-48, 68, 4)):
        ux, uy = math.cos(math.radians(degrees)), math.sin(math.radians(degrees))
        art.strokes([(cx - 12 * ux, cy - 12 * uy, cx + length * ux, cy + length * uy)], weight, ink)
    art.disc(cx, cy, 7, gold)

    art.text("THE", 300, 66, 20, gold, tracking=.7)
    art.text("CLOCKMAKER'S", 300, 106, 46, pale, weight=.085, tracking=.22)
    art.text("GARDEN", 300, 182, 46, pale, weight=.085, tracking=.5)
    art.text("RUBEN HALE", 300, 838, 20, gold, tracking=.5)
    return art
