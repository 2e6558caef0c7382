#!/usr/bin/env python3
"""Makes the sample books beside it, the same bytes each time.

usage: make_samples.py [FOLDER]

Texts and pictures were made for these samples. Between them the four books show each source that a
book's metadata can come from: an EPUB 2 and an EPUB 3 in a zip file, an EPUB 3 kept as a directory,
and a package bought at a store, whose store metadata file and artwork lie inside it.
"""

import hashlib
import plistlib
import shutil
import sys
import zipfile
from datetime import datetime
from pathlib import Path
from xml.sax.saxutils import escape

import covers
from texts import CLOUDS, GARDEN, LAMPLIGHTER, SALT

CONTAINER = """<?xml version="1.0" encoding="UTF-8"?>
<container version="1.0" xmlns="urn:oasis:names:tc:opendocument:xmlns:container">
  <rootfiles>
    <rootfile full-path="OPS/package.opf" media-type="application/oebps-package+xml"/>
  </rootfiles>
</container>
"""
STYLE = """body { margin: 8%; line-height: 1.5; font-family: serif; }
h1, h2 { font-weight: normal; letter-spacing: 0.04em; }
p { margin: 0; text-indent: 1.4em; }
h1 + p, h2 + p { text-indent: 0; }
.verse p { margin: 0 0 1em 0; text-indent: 0; }
img { max-width: 100%; max-height: 100%; }
"""
XML = '<?xml version="1.0" encoding="UTF-8"?>\n'
DOCTYPES = {
    2: ('<!DOCTYPE html PUBLIC "-//W3C//DTD XHTML 1.1//EN" '
        '"http://www.w3.org/TR/xhtml11/DTD/xhtml11.dtd">\n'),
    3: "<!DOCTYPE html>\n",
}


def page(version, title, body, style=True):
    link = '<link rel="stylesheet" type="text/css" href="style.css"/>' if style else ""
    return (f'{XML}{DOCTYPES[version]}<html xmlns="http://www.w3.org/1999/xhtml" xml:lang="en">\n'
            f"<head><title>{escape(title)}</title>{link}</head>\n"
            f"<body>\n{body}\n</body>\n</html>\n")


def chapter_body(heading, text, verse):
    """Blank lines part paragraphs, or stanzas whose lines are kept."""
    blocks = [escape(block.strip()) for block in text.strip().split("\n\n")]
    if verse:
        blocks = [block.replace("\n", "<br/>\n") for block in blocks]
    paragraphs = "\n".join(f"<p>{block}</p>" for block in blocks)
    kind = ' class="verse"' if verse else ""
    return f"<div{kind}>\n<h2>{escape(heading)}</h2>\n{paragraphs}\n</div>"


def package(book, version):
    """The package document."""
    metas = {
        2: '    <meta name="cover" content="cover"/>',
        3: ('    <meta property="dcterms:modified">2024-03-01T00:00:00Z</meta>\n'
            '    <meta name="cover" content="cover"/>'),
    }
    chapters = [f"chapter{i + 1}" for i in range(len(book["chapters"]))]
    items = {
        2: '    <item id="toc" href="toc.ncx" media-type="application/x-dtbncx+xml"/>',
        3: ('    <item id="nav" href="nav.xhtml" media-type="application/xhtml+xml" '
            'properties="nav"/>'),
    }[version]
    items += "".join(f'\n    <item id="{c}" href="{c}.xhtml" media-type="application/xhtml+xml"/>'
                     for c in ["front"] + chapters)
    cover_property = ' properties="cover-image"' if version == 3 else ""
    spine = "".join(f'    <itemref idref="{c}"/>\n' for c in ["front"] + chapters)
    role = ' opf:role="aut"' if version == 2 else ""
    language = ' xml:lang="en"' if version == 3 else ""
    return f"""{XML}<package xmlns="http://www.idpf.org/2007/opf" version="{version}.0" \
unique-identifier="id"{language}>
  <metadata xmlns:dc="http://purl.org/dc/elements/1.1/" xmlns:opf="http://www.idpf.org/2007/opf">
    <dc:identifier id="id">{book["identifier"]}</dc:identifier>
    <dc:title>{escape(book["title"])}</dc:title>
    <dc:creator{role}>{escape(book["author"])}</dc:creator>
    <dc:language>en</dc:language>
    <dc:subject>{escape(book["subject"])}</dc:subject>
    <dc:description>{escape(book["description"])}</dc:description>
    <dc:date>2024-03-01</dc:date>
{metas[version]}
  </metadata>
  <manifest>
{items}
    <item id="style" href="style.css" media-type="text/css"/>
    <item id="cover" href="images/cover.png" media-type="image/png"{cover_property}/>
  </manifest>
  <spine{' toc="toc"' if version == 2 else ''}>
{spine}  </spine>
</package>
"""


def contents(book, version):
    """The table of contents, as its version wants it."""
    names = [heading for heading, _ in book["chapters"]]
    if version == 3:
        entries = "\n".join(f'<li><a href="chapter{i + 1}.xhtml">{escape(name)}</a></li>'
                            for i, name in enumerate(names))
        body = (f'<nav xmlns:epub="http://www.idpf.org/2007/ops" epub:type="toc">\n'
                f"<h1>Contents</h1>\n<ol>\n{entries}\n</ol>\n</nav>")
        return page(3, "Contents", body, style=False)
    points = "\n".join(
        f'    <navPoint id="point{i + 1}" playOrder="{i + 1}">'
        f"<navLabel><text>{escape(name)}</text></navLabel>"
        f'<content src="chapter{i + 1}.xhtml"/></navPoint>' for i, name in enumerate(names))
    return f"""{XML}<ncx xmlns="http://www.daisy.org/z3986/2005/ncx/" version="2005-1">
  <head><meta name="dtb:uid" content="{book["identifier"]}"/></head>
  <docTitle><text>{escape(book["title"])}</text></docTitle>
  <navMap>
{points}
  </navMap>
</ncx>
"""


def members(book, version, cover):
    """The files of a package: name to bytes, in the order of the zip file."""
    alt = escape(book["title"])
    front = page(version, book["title"], '<div><img src="images/cover.png" alt="%s"/></div>' % alt)
    files = {
        "mimetype": b"application/epub+zip",
        "META-INF/container.xml": CONTAINER,
        "OPS/package.opf": package(book, version),
        "OPS/toc.ncx" if version == 2 else "OPS/nav.xhtml": contents(book, version),
        "OPS/style.css": STYLE,
        "OPS/images/cover.png": cover,
        "OPS/front.xhtml": front,
    }
    for i, (heading, text) in enumerate(book["chapters"]):
        body = chapter_body(heading, text, book.get("verse", False))
        files[f"OPS/chapter{i + 1}.xhtml"] = page(version, heading, body)
    return {name: data if isinstance(data, bytes) else data.encode()
            for name, data in files.items()}


def store_file(book, files):
    """What the store knows of a book that it sold, by the keys of the library's records."""
    return plistlib.dumps({
        "itemId": book["store_id"],
        "itemName": book["title"],
        "artistName": book["author"],
        "sort-name": "Clockmaker’s Garden, The",
        "sort-artist": "Hale, Ruben",
        "genre": "Short Stories",
        "bookDescription": book["description"],
        "comments": "With the maker’s notes.",
        "explicit": False,
        "isPreview": False,
        "pageCount": 24,
        "rating": 5,
        "releaseDate": datetime(2024, 3, 1),
        "versionNumber": "1.2",
        "year": "2024",
        "book-info": {
            "package-file-hash": hashlib.md5(files["OPS/package.opf"]).hexdigest().upper(),
            "cover-image-path": "OPS/images/cover.png",
            "mime-type": "application/epub+zip",
        },
    })


def write_zip(path, files):
    with zipfile.ZipFile(path, "w") as archive:
        for name, data in files.items():
            entry = zipfile.ZipInfo(name)  # dated 1980-01-01
            entry.create_system = 3
            entry.external_attr = 0o100644 << 16
            packed = name != "mimetype" and not data.startswith(b"\x89PNG")
            entry.compress_type = zipfile.ZIP_DEFLATED if packed else zipfile.ZIP_STORED
            archive.writestr(entry, data, compresslevel=9)


def write_directory(path, files):
    shutil.rmtree(path, ignore_errors=True)
    for name, data in files.items():
        (path / name).parent.mkdir(parents=True, exist_ok=True)
        (path / name).write_bytes(data)


def main():
    folder = Path(sys.argv[1]) if len(sys.argv) > 1 else Path(__file__).parent
    write_zip(folder / "the-lamplighter-of-vey.epub",
              members(LAMPLIGHTER, 2, covers.lamplighter().png()))
    write_zip(folder / "salt-and-starlight.epub",
              members(SALT, 3, covers.salt_and_starlight().png()))
    write_directory(folder / "a-field-guide-to-clouds.epub",
                    members(CLOUDS, 3, covers.clouds().png()))
    dial = covers.clockmakers_garden()
    files = members(GARDEN, 3, dial.png(step=8))
    files["BazaarMetadata.plist"] = store_file(GARDEN, files)
    files["BazaarArtwork"] = dial.halved().png(step=8)
    write_zip(folder / "the-clockmakers-garden.folium", files)


if __name__ == "__main__":
    main()
