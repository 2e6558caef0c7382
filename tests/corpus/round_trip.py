#!/usr/bin/env python3
"""Brings every packaged book of the corpus through the program: installed, edited (title, author,
cover), inflated, packed again and inspected.

usage: round_trip.py PROGRAM

The corpus is the folder that PARVEL_CORPUS names; without one the test is skipped (exit 77). What
the record of the packed book says must be what that of the source said, but for what was edited,
also where only the book's own files speak, without its attributes; and every file of the source
must be in the packed book. A book that the program refuses to expand must be one that can't be
expanded whole. The last line printed is "N passed, N failed".
"""

import json
import os
import shutil
import subprocess
import sys
import tempfile
import zipfile
from pathlib import Path

SKIPPED = 77
TITLE, AUTHOR, COVER = "A title of one's own: “Ünïcode”", "Ann Other", b"\x89PNG a new cover"
# What says where a copy stands and what became of it, not what the book is.
OF_THE_COPY = {"path", "sourcePath", "PVItemPreviousPath", "PVDisplayName", "PVGenerationCount",
               "PVAllocatedSize", "PVInsertionDate", "PVPercentComplete", "isPreview"}
ADDED = {"mimetype", "BazaarMetadata.plist", "BazaarMetadata-original.plist", "BazaarArtwork",
         "BazaarArtwork-original"}


class Trip:
    def __init__(self, program, folder):
        self.program, self.folder = program, Path(folder)
        for name in ("source", "library", "packed", "bare"):
            (self.folder / name).mkdir()
        self.faults = {}  # name of a book: what is wrong

    def fault(self, name, text):
        self.faults.setdefault(name, []).append(text)

    def run(self, *arguments):
        """Each result that the program gives, by its book's name."""
        done = subprocess.run([self.program, arguments[0], "--json", *arguments[1:]],
                              cwd=self.folder, capture_output=True)
        results = json.loads(done.stdout or b"[]")
        return {Path(each["path"]).name: each for each in results}

    def names(self, below):
        return sorted(each.name for each in (self.folder / below).iterdir())

    def paths(self, below):
        return [f"{below}/{name}" for name in self.names(below)]

    def records(self, below):
        """Each book's record, with its identity beside it."""
        results = self.run("inspect", *self.paths(below))
        return {name: dict(each["record"], assetID=each["assetID"])
                for name, each in results.items() if each["record"]}


def contents(path):
    """Each file of a zipped book, or of a package folder, by its name; none for a broken archive."""
    if path.is_dir():
        return {str(file.relative_to(path)): file.read_bytes()
                for file in path.rglob("*") if file.is_file()}
    try:
        with zipfile.ZipFile(path) as archive:
            names = [each.filename for each in archive.infolist() if not each.is_dir()]
            if len(set(names)) < len(names):
                return None
            return {name: archive.read(name) for name in names}
    except (zipfile.BadZipFile, NotImplementedError, RuntimeError, EOFError, OSError):
        return None


def essence(record):
    """What a record says of its book."""
    return {key: value for key, value in record.items() if key not in OF_THE_COPY}


def expected(record, has_attributes):
    wanted = dict(essence(record), itemName=TITLE, artistName=AUTHOR)
    if has_attributes:  # where the identity is kept as the generated one
        wanted["PVGeneratedItemId"] = record["assetID"]
    return wanted


def differences(found, wanted):
    for key in sorted(found.keys() | wanted.keys()):
        if found.get(key) != wanted.get(key):
            yield f"{key}: {found.get(key)!r}; expected {wanted.get(key)!r}"


def collect(corpus, source):
    """Copies the corpus's packaged books, each under a name of its own."""
    books = sorted(path for path in corpus.rglob("*")
                   if path.suffix.lower() in (".epub", ".folium")
                   and not any(above.suffix.lower() in (".epub", ".folium")
                               for above in path.relative_to(corpus).parents))
    for number, book in enumerate(books):
        copy = source / f"{number:03}-{book.stem}{book.suffix.lower()}"
        if book.is_dir():
            shutil.copytree(book, copy, symlinks=True)
        else:
            shutil.copyfile(book, copy)


def keeps_attributes(folder):
    try:
        os.setxattr(folder, "user.parvel", b"")
    except OSError:
        return False
    return True


def install(trip):
    """The records of the books that can be installed, as they were before."""
    before = trip.records("source")
    results = trip.run("install", *(f"source/{name}" for name in before), "--into", "library")
    for name in before:
        whole = contents(trip.folder / "source" / name) is not None
        if (results[name]["record"] is not None) != whole:
            trip.fault(name, f"installed: {not whole}, but it can be expanded: {whole}")
    return {name: before[name] for name in trip.names("library")}


def edit_and_pack(trip):
    (trip.folder / "cover.png").write_bytes(COVER)
    books = trip.paths("library")
    for step in (["edit", "--set", f"title={TITLE}", "--set", f"author={AUTHOR}", "--cover",
                  "cover.png", "--inflate"], ["inflate"]):
        for name, result in trip.run(*step, *books).items():
            if not result["record"] or result["error"]:
                trip.fault(name, f"{step[0]}: {result['error']}")
    for book in books:
        name = Path(book).name
        trip.run("pack", book, "-o", f"packed/{name}")
        if (trip.folder / "packed" / name).is_file():
            shutil.copyfile(trip.folder / "packed" / name, trip.folder / "bare" / name)
        else:
            trip.fault(name, "is not packed")


def judge(trip, before):
    for below in ("packed", "bare"):
        after = trip.records(below)
        for name, record in before.items():
            if name in after:
                for line in differences(essence(after[name]),
                                        expected(record, below == "packed")):
                    trip.fault(name, f"{below}: {line}")
            else:
                trip.fault(name, f"{below}: no record")
    for name in before:
        packed = contents(trip.folder / "packed" / name) or {}
        if packed.get("BazaarArtwork") != COVER:
            trip.fault(name, "the cover is not the new one")
        for member, content in contents(trip.folder / "source" / name).items():
            if member not in ADDED and packed.get(member) != content:
                trip.fault(name, f"{member} is not as it was")


def main():
    if len(sys.argv) != 2:
        sys.exit(__doc__)
    corpus = os.environ.get("PARVEL_CORPUS")
    if not corpus:
        print("PARVEL_CORPUS names no folder of books")
        return SKIPPED
    with tempfile.TemporaryDirectory(prefix="parvel-trip-") as folder:
        if not keeps_attributes(folder):
            print("no extended attributes here")
            return SKIPPED
        trip = Trip(os.path.abspath(sys.argv[1]), folder)
        collect(Path(corpus), trip.folder / "source")
        before = install(trip)
        edit_and_pack(trip)
        judge(trip, before)
    for name, faults in sorted(trip.faults.items()):
        print(f"FAILED {name}")
        print("".join(f"    {fault}\n" for fault in faults[:10]), end="")
    print(f"{len(before.keys() - trip.faults.keys())} passed, {len(trip.faults)} failed")
    return 1 if trip.faults or not before else 0


if __name__ == "__main__":
    sys.exit(main())
