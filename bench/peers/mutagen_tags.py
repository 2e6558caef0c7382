#!/usr/bin/env python3
"""mutagen: the tags of each audio file in the list."""

import sys
from pathlib import Path

from mutagen.mp4 import MP4

paths = Path(sys.argv[1]).read_text().splitlines()
succeeded = 0
for path in paths:
    try:
        succeeded += bool(MP4(path).tags)
    except Exception:  # whatever it can't read
        pass
print(f"{succeeded} of {len(paths)}")
