#!/usr/bin/env python3
"""Holds every include of the library and the programs to the table of what each layer may see.

usage: check_includes.py ROOT
"""

import re
import sys
from pathlib import Path

# Each layer may include itself and these. Layers look down only.
LOWER = {
    "parvel/foundation": {"parvel/platform"},
    "parvel/platform": {"parvel/foundation"},
    "parvel/platform/linux": {"parvel/foundation", "parvel/platform"},
    "parvel/platform/linux/cloud": {"parvel/foundation", "parvel/platform",
                                    "parvel/platform/linux"},
    "parvel/metadata": {"parvel/foundation", "parvel/platform"},
    "parvel/xattr": {"parvel/metadata", "parvel/foundation", "parvel/platform"},
    "parvel/inspection": {"parvel/xattr", "parvel/metadata", "parvel/foundation",
                          "parvel/platform"},
    "parvel/iotasks": {"parvel/inspection", "parvel/xattr", "parvel/metadata",
                       "parvel/foundation", "parvel/platform"},
    "parvel/filemanager": {"parvel/iotasks", "parvel/inspection", "parvel/xattr",
                           "parvel/metadata", "parvel/foundation", "parvel/platform"},
    "cli": set(),  # and the library's public headers
    "reader": {"reader/images", "parvel/platform", "parvel/platform/linux"},
    "reader/images": {"parvel/platform"},
}

# Ties that run back up, from source files alone: a task calls the manager that made it, and staging
# asks where synchronised storage begins.
BACK = {
    ("parvel/platform/linux", "parvel/platform/linux/cloud/SyncedPlace.h"),
    ("parvel/iotasks", "parvel/filemanager/PVAssetMetadataFileManager.h"),
}

# Only these layers may include headers of the system and of other libraries.
HOSTED = {"parvel/platform/linux", "parvel/platform/linux/cloud", "cli", "reader", "reader/images"}

INCLUDE = re.compile(r'^\s*#\s*include\s*(["<])([^">]+)[">]', re.MULTILINE)
# C++'s own headers have no extension; C's come under their C++ names.
STANDARD = re.compile(r"^[a-z_]+$")


def public_headers(root):
    """The headers that parvel/CMakeLists.txt lists for installation."""
    text = (root / "parvel/CMakeLists.txt").read_text()
    listed = re.search(r"target_sources\(ParvelFoundation PUBLIC FILE_SET HEADERS.*?FILES(.*?)\)",
                       text, re.DOTALL)
    return {"parvel/" + name for name in listed.group(1).split()}


def faults_of(root, source, public):
    """What is wrong with the includes of one file, a sentence each."""
    name = str(source.relative_to(root))
    layer = str(Path(name).parent)
    layer = layer if not layer.startswith("cli") else "cli"
    if layer not in LOWER:
        yield f"{name} stands in no layer of the table"
        return
    for mark, target in INCLUDE.findall(source.read_text()):
        if mark == "<":
            if layer not in HOSTED and not STANDARD.match(target):
                yield f"{name} includes <{target}>, of the system or another library"
            continue
        if not (root / target).is_file():
            yield f"{name} includes \"{target}\", not written from the root"
            continue
        below = str(Path(target).parent)
        if name in public and target.startswith("parvel/") and target not in public:
            yield f"{name} is public and includes {target}, which is not"
        if layer == "cli":
            if target.startswith("parvel/") and target not in public:
                yield f"{name} includes {target}, which is not public"
            continue
        if below == layer or below in LOWER[layer]:
            continue
        if source.suffix == ".cpp" and (layer, target) in BACK:
            continue
        yield f"{name} includes {target}: {layer} may not see {below}"


def main():
    root = Path(sys.argv[1])
    sources = sorted(path for folder in ("parvel", "reader", "cli")
                     for path in (root / folder).rglob("*") if path.suffix in (".h", ".cpp"))
    public = public_headers(root)
    faults = [f"{name} is listed as public but absent" for name in sorted(public)
              if not (root / name).is_file()]
    for source in sources:
        faults += faults_of(root, source, public)
    for fault in faults:
        print(fault)
    print(f"{len(sources)} files, {len(faults)} faults")
    return 1 if faults or not sources else 0


if __name__ == "__main__":
    sys.exit(main())
