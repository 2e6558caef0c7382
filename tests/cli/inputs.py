"""Makes the inputs of the cases (run_cases.py), each from one line:

    book NAME [FIELD=VALUE]...     a small book. Fields: title, author, subject, description, id,
                                   producer; cover=WxH for a real picture of that size in place of a few
                                   words, as the cover by=item (if not said), property, guide, page,
                                   spine or nothing; expanded=yes for a folder;
                                   damage=container|opf|metadata|no-container|no-opf|zip for one
                                   that is broken there;
                                   store='{JSON}' for its store metadata file
    pdf NAME [FIELD=VALUE]...      a small PDF document. Fields: author, subject, pages (1), turned;
                                   damage=cut for half of one, locked=yes for one with a password
    file NAME TEXT                 a file with that text and a line end
    json NAME JSON                 the same, checked to be JSON
    plist NAME [binary] JSON       a property list
    folder NAME
    link NAME TARGET
    pipe NAME
    mountpoint NAME                a folder over which "unshare -rm" can mount
    attribute NAME KEY VALUE       the extended attribute KEY of the library
    many NUMBER NAME               copies of one book, %d in NAME counting from 1

%XX in a NAME stands for that byte, so that names need not be UTF-8.
"""

import errno
import json
import os
import plistlib
import shlex
import shutil
import struct
import subprocess
import urllib.parse
import zipfile
import zlib
from xml.sax.saxutils import escape

CONTAINER = """<?xml version="1.0"?>
<container version="1.0" xmlns="urn:oasis:names:tc:opendocument:xmlns:container"><rootfiles>
<rootfile full-path="OPS/book.opf" media-type="application/oebps-package+xml"/>
</rootfiles></container>
"""
OPF = """<?xml version="1.0"?>
<package xmlns="http://www.idpf.org/2007/opf" version="2.0" unique-identifier="uid">
<metadata xmlns:dc="http://purl.org/dc/elements/1.1/">
{fields}</metadata>
<manifest>{manifest}</manifest>{behind}</package>
"""
# What names the cover, in the manifest and behind it.
NAMED = {"item": ('<item id="cover" href="cover.png" media-type="image/png"/>', ""),
         "property": ('<item id="c" href="cover.png" properties="svg cover-image"/>', ""),
         "guide": ("", '<guide><reference type="cover" href="cover.png"/></guide>'),
         "page": ('<item id="cover" href="page.xhtml"/>', ""),
         "spine": ('<item id="p" href="page.xhtml"/>', '<spine><itemref idref="p"/></spine>'),
         "nothing": ("", "")}
PAGE = '<html xmlns="http://www.w3.org/1999/xhtml"><body><img src="cover.png"/></body></html>'
ELEMENTS = {"title": ("dc:title", ""), "author": ("dc:creator", ""), "subject": ("dc:subject", ""),
            "description": ("dc:description", ""), "id": ("dc:identifier", ' id="uid"'),
            "producer": ("dc:contributor", ' id="pvp"')}


class Unsupported(Exception):
    """The file system has no such thing."""


def place(directory, name):
    path = os.path.join(os.fsencode(directory), urllib.parse.unquote_to_bytes(name))
    os.makedirs(os.path.dirname(path), exist_ok=True)
    return path


def opf_of(fields):
    lines = "".join(f"<{tag}{attributes}>{escape(fields[name])}</{tag}>\n"
                    for name, (tag, attributes) in ELEMENTS.items() if name in fields)
    manifest, behind = NAMED[fields.get("by", "item")]
    text = OPF.format(fields=lines, manifest=manifest, behind=behind)
    if fields.get("damage") == "opf":
        return text[:120]
    if fields.get("damage") == "metadata":
        return text.replace("metadata", "something")
    return text


def picture(size):
    """A PNG file in one colour."""
    width, height = map(int, size.split("x"))
    rows = (b"\0" + b"\x33\x66\xcc" * width) * height
    chunks = [(b"IHDR", struct.pack(">IIBBBBB", width, height, 8, 2, 0, 0, 0)),
              (b"IDAT", zlib.compress(rows)), (b"IEND", b"")]
    return b"\x89PNG\r\n\x1a\n" + b"".join(
        struct.pack(">I", len(content)) + kind + content +
        struct.pack(">I", zlib.crc32(kind + content)) for kind, content in chunks)


def members_of(fields):
    damage = fields.get("damage")
    members = {"mimetype": "application/epub+zip"}
    if damage != "no-container":
        members["META-INF/container.xml"] = "<broken" if damage == "container" else CONTAINER
    if damage != "no-opf":
        members["OPS/book.opf"] = opf_of(fields)
    members["OPS/cover.png"] = picture(fields["cover"]) if "cover" in fields else "no real picture"
    if fields.get("by") in ("page", "spine"):
        members["OPS/page.xhtml"] = PAGE
    if "store" in fields:
        members["BazaarMetadata.plist"] = plistlib.dumps(json.loads(fields["store"])).decode()
    return members


def book(path, fields):
    if fields.get("damage") == "zip":
        write(path, "no zip archive")
    elif fields.get("expanded") == "yes":
        for name, text in members_of(fields).items():
            member = os.path.join(path, name.encode())
            os.makedirs(os.path.dirname(member), exist_ok=True)
            write(member, text)
    else:
        with zipfile.ZipFile(os.fsdecode(path), "w") as archive:
            for name, text in members_of(fields).items():
                archive.writestr(zipfile.ZipInfo(name), text)


def pdf_bytes(fields):
    pages = int(fields.get("pages", "1"))
    kids = " ".join(f"{number} 0 R" for number in range(4, 4 + pages))
    info = "".join(f"/{key.title()}({fields[key]})" for key in ("author", "subject") if key in fields)
    turned = f"/Rotate {fields['turned']}" if "turned" in fields else ""
    objects = ["<</Type/Catalog/Pages 2 0 R>>", f"<</Type/Pages/Kids[{kids}]/Count {pages}>>",
               f"<<{info}>>"]
    objects += [f"<</Type/Page/Parent 2 0 R/MediaBox[0 0 612 792]{turned}>>"] * pages
    text, places = "%PDF-1.6\n", []
    for number, content in enumerate(objects, 1):
        places.append(len(text))
        text += f"{number} 0 obj\n{content}\nendobj\n"
    table = "0000000000 65535 f \n" + "".join(f"{at:010} 00000 n \n" for at in places)
    lock = ""
    if fields.get("locked") == "yes":
        lock = "/Encrypt<</Filter/Standard/V 2/R 3/Length 128/P -4/O<%s>/U<%s>>>/ID[<01><01>]" % (
            "5a" * 32, "5b" * 32)
    end = len(text)
    text += (f"xref\n0 {len(objects) + 1}\n{table}trailer\n<</Size {len(objects) + 1}/Root 1 0 R"
             f"/Info 3 0 R{lock}>>\nstartxref\n{end}\n%%EOF\n")
    return text[:len(text) // 2] if fields.get("damage") == "cut" else text


def write(path, text):
    with open(path, "wb") as file:
        file.write(text if isinstance(text, bytes) else text.encode())


def attribute(path, key, value):
    try:
        os.setxattr(path, "user.com.kestrel.Folium." + key, value.encode())
    except OSError as error:
        if error.errno in (errno.ENOTSUP, errno.EPERM):
            raise Unsupported("the file system keeps no extended attributes") from error
        raise


def mountpoint(path):
    os.makedirs(path)
    tried = subprocess.run(["unshare", "-rm", "mount", "-t", "ramfs", "none", path],
                           capture_output=True, check=False)
    if tried.returncode != 0:
        raise Unsupported("no file system can be mounted")


def make(directory, line):
    kind, name, *rest = shlex.split(line)
    if kind == "many":
        first = place(directory, rest[0] % 1)
        book(first, {"title": "One of many", "author": "Somebody"})
        for number in range(2, int(name) + 1):
            shutil.copy(first, place(directory, rest[0] % number))
        return
    path = place(directory, name)
    if kind == "book":
        book(path, dict(field.split("=", 1) for field in rest))
    elif kind == "pdf":
        write(path, pdf_bytes(dict(field.split("=", 1) for field in rest)))
    elif kind == "file":
        write(path, "".join(rest) + "\n")
    elif kind == "json":
        write(path, json.dumps(json.loads(rest[0])) + "\n")
    elif kind == "plist":
        form = plistlib.FMT_BINARY if rest[0] == "binary" else plistlib.FMT_XML
        write(path, plistlib.dumps(json.loads(rest[-1]), fmt=form))
    elif kind == "folder":
        os.makedirs(path)
    elif kind == "link":
        os.symlink(rest[0], path)
    elif kind == "pipe":
        os.mkfifo(path)
    elif kind == "mountpoint":
        mountpoint(path)
    elif kind == "attribute":
        attribute(path, rest[0], rest[1])
    else:
        raise ValueError("no such input: " + line)
