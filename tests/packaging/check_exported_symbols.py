#!/usr/bin/env python3
"""Holds the symbols that the shared library exports to the kept list exported_symbols.txt.

usage: check_exported_symbols.py LIBRARY [--update]

A name that leaves the list breaks the programs that use it; a new one becomes a promise.
"""

import re
import subprocess
import sys
from pathlib import Path

KEPT = Path(__file__).with_name("exported_symbols.txt")


def exported(library):
    listing = subprocess.run(["nm", "--dynamic", "--defined-only", "--demangle", library],
                             check=True, capture_output=True, text=True).stdout
    # Address, kind, name. Constructors and destructors come once for each of their variants.
    return sorted({re.sub(r"^[0-9a-f]* *[A-Za-z] ", "", line) for line in listing.splitlines()})


def main():
    symbols = exported(sys.argv[1])
    if sys.argv[2:] == ["--update"]:
        KEPT.write_text("".join(symbol + "\n" for symbol in symbols))
        return 0
    kept = KEPT.read_text().splitlines()
    for symbol in sorted(set(symbols) - set(kept)):
        print("exported, not in the list:", symbol)
    for symbol in sorted(set(kept) - set(symbols)):
        print("in the list, not exported:", symbol)
    return 0 if symbols == kept else 1


if __name__ == "__main__":
    sys.exit(main())
