#!/usr/bin/env python3
"""Makes the files that the bench reads, out of a folder of books.

usage: make_workload.py --books DIR --into DIR --parvel PROGRAM [--share F]

Writes, always the same ones: zipped books of 20 KB to 8 MB (a third with a store file, two thirds
with attributes, one in a hundred with 3,000 entries), expanded packages and the same ones zipped,
PDFs with a stored identity and one of 200 MB without, tagged audio files and six of over 100 MB
with `moov` first or last, one of 170 MB to copy, and shelves of empty PDFs with their records.
`--share 0.1` makes a tenth of the numbers. Each kind's files are listed in NAME.list. A kind that
the folder has no files of is made from nothing.
"""

import argparse
import itertools
import json
import plistlib
import random
import struct
import subprocess
import sys
import zipfile
from pathlib import Path
from xml.etree import ElementTree

import made_files

BOOKS, PACKAGES, PDFS, AUDIOBOOKS = 2000, 300, 300, 300
SMALLEST, LARGEST = 20 << 10, 8 << 20
MANY_ENTRIES = 3000
LARGE_PDF = 200 << 20
LARGE_AUDIO = 110 << 20
COPIED = 170 << 20
RECORDS = (1_000, 10_000, 100_000)
MADE = 12  # files made from nothing
EXPANDED = 40  # books to expand, one of them with many entries
CONTAINER = "{urn:oasis:names:tc:opendocument:xmlns:container}"
OPF = "{http://www.idpf.org/2007/opf}"
DC = "{http://purl.org/dc/elements/1.1/}"
STORE_FILE = "BazaarMetadata.plist"
FILLER = random.Random(1).randbytes(LARGEST)
PICTURE = 120 << 10
CHAPTERS = [made_files.made_chapter(number) for number in range(8)]


def share_of(number, share):
    return max(10, round(number * share))


def is_sound(entries):
    """Whether every contender can read the book: documents in UTF-8, a manifest and a spine."""
    contents = dict(entries)
    container = ElementTree.fromstring(contents["META-INF/container.xml"].decode())
    package = contents[container.find(f".//{CONTAINER}rootfile").get("full-path")]
    root = ElementTree.fromstring(package.decode())
    return (b"version='1.1'" not in package[:40]
            and root.find(f"{OPF}spine/{OPF}itemref") is not None
            and root.find(f"{OPF}manifest/{OPF}item") is not None
            and root.find(f"{OPF}metadata/{DC}title") is not None)


def is_told(path, parvel):
    """Whether the program tells metadata of the file."""
    told = subprocess.run([parvel, "inspect", "--json", path], stdout=subprocess.PIPE,
                          stderr=subprocess.DEVNULL, check=False)
    result = json.loads(told.stdout)[0] if told.stdout else {}
    return bool(result.get("record")) and not result.get("error")


def readable_books(folder, parvel):
    """The sound zipped books of a folder, as lists of name and bytes, without their store files."""
    for path in sorted(folder.rglob("*.epub")):
        try:
            if not path.is_file() or not is_told(path, parvel):
                continue
            with zipfile.ZipFile(path) as archive:
                entries = [(name, archive.read(name)) for name in archive.namelist()
                           if not name.endswith("/") and name != STORE_FILE]
            if is_sound(entries) and sum(len(content) for _, content in entries) < LARGEST:
                yield entries
        except Exception:  # whatever is wrong with it, it is no book to measure with
            continue


def readable_files(folder, pattern, parvel):
    """The bytes of the files of which the program tells metadata."""
    for path in sorted(folder.rglob(pattern)):
        if path.is_file() and path.stat().st_size < LARGEST and is_told(path, parvel):
            yield path.read_bytes()


def store_file(number):
    return plistlib.dumps({"itemName": f"Book {number}", "artistName": "An Author",
                           "itemId": 900000 + number, "genre": "Fiction"})


def fill(archive, size):
    """Adds pictures, which no longer shrink, and chapters until the file is that large."""
    for number in itertools.count():
        missing = size - archive.fp.tell()
        if missing <= 0:
            return
        start = number * PICTURE % (LARGEST - PICTURE)
        archive.writestr(f"OEBPS/images/plate-{number:04}.jpg",
                         FILLER[start:start + min(missing, PICTURE)], zipfile.ZIP_STORED)
        archive.writestr(f"OEBPS/text/part-{number:04}.xhtml", CHAPTERS[number % len(CHAPTERS)])


def write_book(path, entries, number, chance):
    size = int(SMALLEST * (LARGEST / SMALLEST) ** chance.random())
    with zipfile.ZipFile(path, "w", zipfile.ZIP_DEFLATED, compresslevel=1) as archive:
        names = set()
        for name, content in entries:
            if name not in names:
                names.add(name)
                method = zipfile.ZIP_STORED if name == "mimetype" else zipfile.ZIP_DEFLATED
                archive.writestr(name, content, method)
        if number % 3 == 0:
            archive.writestr(STORE_FILE, store_file(number))
        if number % 100 == 50:
            for index in range(MANY_ENTRIES - len(names)):
                archive.writestr(f"OEBPS/pages/{index:05}.xhtml", b"<p/>", zipfile.ZIP_STORED)
        fill(archive, size)


def write_package(folder, zipped, entries):
    """The entries as a folder and as a zip file."""
    contents = {name: content for name, content in entries
                if ".." not in Path(name).parts and not Path(name).is_absolute()}
    with zipfile.ZipFile(zipped, "w", zipfile.ZIP_DEFLATED) as archive:
        for name, content in contents.items():
            archive.writestr(name, content)
            path = folder / name
            path.parent.mkdir(parents=True, exist_ok=True)
            path.write_bytes(content)


def write_large_pdf(path):
    """One page, and an object of random bytes that no page uses."""
    objects = [b"<</Type/Catalog/Pages 2 0 R>>", b"<</Type/Pages/Kids[3 0 R]/Count 1>>",
               b"<</Type/Page/Parent 2 0 R/MediaBox[0 0 612 792]>>",
               b"<</Author(An Author)/CreationDate(D:20200101120000Z)>>"]
    offsets = []
    with open(path, "wb") as file:
        file.write(b"%PDF-1.4\n")
        for number, content in enumerate(objects, 1):
            offsets.append(file.tell())
            file.write(b"%d 0 obj\n%s\nendobj\n" % (number, content))
        offsets.append(file.tell())
        file.write(b"5 0 obj\n<</Length %d>>\nstream\n" % LARGE_PDF)
        for _ in range(LARGE_PDF // len(FILLER)):
            file.write(FILLER)
        file.write(b"\nendstream\nendobj\n")
        table = file.tell()
        file.write(b"xref\n0 6\n0000000000 65535 f \n")
        for offset in offsets:
            file.write(b"%010d 00000 n \n" % offset)
        file.write(b"trailer\n<</Size 6/Root 1 0 R/Info 4 0 R>>\nstartxref\n%d\n%%%%EOF\n" % table)


def atoms_of(content):
    at = 0
    while at + 8 <= len(content):
        size = struct.unpack(">I", content[at:at + 4])[0]
        if size < 8 or at + size > len(content):
            return
        yield content[at + 4:at + 8], content[at:at + size]
        at += size


def write_large_audio(path, content, moov_first):
    """The file with a hole of 110 MB before or behind its `moov`."""
    atoms = list(atoms_of(content))
    hole = struct.pack(">I4s", LARGE_AUDIO, b"free")
    with open(path, "wb") as file:
        for name, atom in atoms:
            if name == b"ftyp":
                file.write(atom)
        for is_moov in (True, False) if moov_first else (False, True):
            if is_moov:
                file.writelines(atom for name, atom in atoms if name == b"moov")
            else:
                start = file.tell()
                file.write(hole)
                file.truncate(start + LARGE_AUDIO)
                file.seek(start + LARGE_AUDIO)


def has_first_level(content, wanted):
    return wanted in [name for name, _ in atoms_of(content)]


def write_copied(path, audio):
    """An audio file of 170 MB with no hole in it, and with attributes."""
    with open(path, "wb") as file:
        file.write(audio)
        while file.tell() < COPIED:
            file.write(FILLER[:COPIED - file.tell()])


def write_shelf(into, number):
    """Folders of empty PDFs, and the records of all of them."""
    shelf = into / f"shelf-{number}"
    records = []
    for index in range(number):
        folder = shelf / f"{index // 1000:03}"
        if index % 1000 == 0:
            folder.mkdir(parents=True)
        path = folder / f"{index:06}.pdf"
        path.touch()
        records.append({"path": str(path), "PVGeneratedItemId": f"{index:032X}",
                        "itemName": f"Book {index}", "artistName": "An Author"})
    (into / f"records-{number}.json").write_text(json.dumps(records))


def write_list(into, name, paths):
    (into / f"{name}.list").write_text("".join(f"{path}\n" for path in paths))


def write_attributes(into, name, parvel):
    subprocess.run([parvel, "attributes", "--write", "--files-from", into / f"{name}.list"],
                   stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL, check=False)


def write_books(into, sources, count, parvel):
    chance = random.Random(20260101)
    books = [into / "books" / f"{number:05}.epub" for number in range(count)]
    for number, path in enumerate(books):
        write_book(path, sources[number % len(sources)], number, chance)
    write_list(into, "books", books)
    # The first asset is taken off with the start: the smallest, for what comes of the others is
    # told beside what comes of all.
    expanded = {*books[50:51], *(books[number * 97 % count] for number in range(EXPANDED - 1))}
    write_list(into, "expanded-books", sorted(expanded, key=lambda path: path.stat().st_size))
    write_list(into, "attributed", [path for number, path in enumerate(books) if number % 3])
    write_attributes(into, "attributed", parvel)


def write_packages(into, sources, count):
    packages = [into / "packages" / f"{number:05}.epub" for number in range(count)]
    zipped = [into / "packages-zipped" / path.name for path in packages]
    for folder, file, entries in zip(packages, zipped, itertools.cycle(sources)):
        write_package(folder, file, entries)
    write_list(into, "packages", packages)
    write_list(into, "packages-zipped", zipped)


def write_copies(into, name, contents, count, suffix):
    paths = [into / name / f"{number:05}.{suffix}" for number in range(count)]
    for path, content in zip(paths, itertools.cycle(contents)):
        path.write_bytes(content)
    write_list(into, name, paths)


def write_large(into, audio, parvel):
    large = into / "large"
    write_large_pdf(large / "large.pdf")
    write_list(into, "large-pdf", [large / "large.pdf"])
    files = [large / f"{number}.m4a" for number in range(6)]
    for number, path in enumerate(files):
        write_large_audio(path, audio[number % len(audio)], number % 2 == 0)
    write_list(into, "large-audiobooks", files)
    write_copied(large / "copied.m4a", audio[0])
    write_list(into, "copied", [large / "copied.m4a"])
    write_attributes(into, "copied", parvel)


def main():
    parser = argparse.ArgumentParser(description=__doc__.split("\n")[0])
    parser.add_argument("--books", type=Path, required=True)
    parser.add_argument("--into", type=Path, required=True)
    parser.add_argument("--parvel", required=True)
    parser.add_argument("--share", type=float, default=1.0)
    options = parser.parse_args()
    into, parvel = options.into.resolve(), options.parvel
    share = lambda number: share_of(number, options.share)

    sources = list(readable_books(options.books, parvel))
    if not sources:
        sys.exit(f"{options.books} holds no zipped book")
    # Deriving an encrypted document's key costs every contender as much as forty documents.
    pdfs = [content for content in readable_files(options.books, "*.pdf", parvel)
            if b"/Encrypt" not in content] or \
        [made_files.made_pdf(number) for number in range(MADE)]
    audio = [content for content in readable_files(options.books, "*.m4a", parvel)
             if has_first_level(content, b"moov") and has_first_level(content, b"ftyp")] or \
        [made_files.made_audio(number) for number in range(MADE)]

    for name in ("books", "packages", "packages-zipped", "pdfs", "audiobooks", "large"):
        (into / name).mkdir(parents=True, exist_ok=True)
    write_books(into, sources, share(BOOKS), parvel)
    write_packages(into, sources, share(PACKAGES))
    write_copies(into, "pdfs", pdfs, share(PDFS), "pdf")
    write_attributes(into, "pdfs", parvel)
    write_copies(into, "audiobooks", audio, share(AUDIOBOOKS), "m4a")
    write_large(into, audio, parvel)
    for number in RECORDS:
        write_shelf(into, share(number))


if __name__ == "__main__":
    main()
