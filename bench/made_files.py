"""Chapters, PDFs and tagged audio files made from nothing."""

import random
import struct
import zlib

WORDS = "the lamp of a garden in winter stood over every road that led away from town".split()


def text_of(chance, words):
    return " ".join(chance.choice(WORDS) for _ in range(words))


def made_chapter(number):
    """40 KB of text."""
    chance = random.Random(number)
    paragraphs = "".join(f"<p>{text_of(chance, 80)}</p>\n" for _ in range(110))
    return f"<html><body>{paragraphs}</body></html>".encode()


def page_content(chance):
    lines = "".join(f"({text_of(chance, 12)}) Tj T*\n" for _ in range(45))
    shapes = "".join(f"{chance.random():.2f} 0.4 0.6 rg {chance.randint(0, 500)} "
                     f"{chance.randint(0, 700)} 60 40 re f\n" for _ in range(8))
    return zlib.compress(f"{shapes}0 g BT /F1 11 Tf 14 TL 72 740 Td\n{lines}ET\n".encode())


def made_pdf(number):
    """A document of 1 to 120 pages of text."""
    chance = random.Random(number)
    pages = 1 + number * number % 120
    objects = [b"<</Type/Catalog/Pages 2 0 R>>",
               b"<</Type/Pages/Kids[%s]/Count %d>>" % (
                   b" ".join(b"%d 0 R" % (5 + 2 * page) for page in range(pages)), pages),
               b"<</Author(An Author)/Subject(Fiction)/CreationDate(D:20200101120000Z)>>",
               b"<</Type/Font/Subtype/Type1/BaseFont/Helvetica>>"]
    for page in range(pages):
        content = page_content(chance)
        objects.append(b"<</Type/Page/Parent 2 0 R/MediaBox[0 0 612 792]/Contents %d 0 R"
                       b"/Resources<</Font<</F1 4 0 R>>>>>>" % (6 + 2 * page))
        objects.append(b"<</Length %d/Filter/FlateDecode>>\nstream\n%s\nendstream"
                       % (len(content), content))
    file, offsets = bytearray(b"%PDF-1.4\n"), []
    for index, content in enumerate(objects, 1):
        offsets.append(len(file))
        file += b"%d 0 obj\n%s\nendobj\n" % (index, content)
    table = len(file)
    file += b"xref\n0 %d\n0000000000 65535 f \n" % (len(objects) + 1)
    file += b"".join(b"%010d 00000 n \n" % offset for offset in offsets)
    file += b"trailer\n<</Size %d/Root 1 0 R/Info 3 0 R>>\n" % (len(objects) + 1)
    return bytes(file) + b"startxref\n%d\n%%%%EOF\n" % table


def atom(name, content):
    return struct.pack(">I4s", 8 + len(content), name) + content


def tag(name, kind, content):
    return atom(name, atom(b"data", struct.pack(">II", kind, 0) + content))


def made_audio(number):
    """Tags with a song ID and a cover of 50 KB, and half a megabyte of sound."""
    chance = random.Random(number)
    tags = b"".join((tag(b"\xa9nam", 1, text_of(chance, 4).encode()),
                     tag(b"\xa9ART", 1, b"An Author"), tag(b"\xa9alb", 1, b"A Book"),
                     tag(b"cnID", 21, struct.pack(">I", 900000 + number)),
                     tag(b"covr", 13, b"\xff\xd8\xff" + chance.randbytes(50 << 10))))
    handler = atom(b"hdlr", bytes(8) + b"mdirappl" + bytes(10))
    header = atom(b"mvhd", struct.pack(">IIIII", 0, 0, 0, 1000, 600000) + bytes(80))
    meta = atom(b"meta", bytes(4) + handler + atom(b"ilst", tags))
    return (atom(b"ftyp", b"M4A \0\0\0\0M4A mp42isom") + atom(b"moov", header + atom(b"udta", meta))
            + atom(b"mdat", chance.randbytes(512 << 10)))
