#!/usr/bin/env python3
"""Writes expected.json: what inspecting each asset of the corpus must give.

usage: make_expectations.py CORPUS [OUTPUT]

An independent reading of the files' own bytes: nothing here calls the library, and nothing is taken
from its output. PDFs are read with pikepdf (another engine than the library's), all else with the
standard library alone. In expected.json "@" stands for the folder that holds the assets, a long
text or bytes are {"$md5": ..., "length": bytes}, a date is {"$date": ISO text, UTC}, a drawn image
is {"$png": [width, height]}.

    file        the asset, relative to the corpus
    type        0 no asset, 1 EPUB, 2 the application's own package variant, 3 PDF, 4 audiobook
    record      the record without cover, every key
    error       {"domain", "code", "url"} with url true where the error names the asset; null: none.
                Beside a record: the error where the file itself keeps no identity
    withCover   the entries that a record read with its cover has besides, or has otherwise
    either      true where PDF readers disagree on a damaged file: a record, or the general error
"""
import datetime
import hashlib
import json
import os
import plistlib
import sys
import zipfile
import xml.etree.ElementTree as ElementTree

sys.dont_write_bytecode = True
import expected_m4a as m4a  # noqa: E402  (beside this file)
import expected_pdf as pdf  # noqa: E402

FOLDERS = ('epub', 'expanded', 'malformed', 'store', 'made-zip', 'pdf', 'made-pdf', 'm4a',
           'm4a-tagged', 'made-m4a')
TYPES = {'.epub': 1, '.folium': 2, '.pdf': 3, '.m4a': 4}
CORRUPT = {'domain': 'PVFileErrorDomain', 'code': 259, 'url': True}
NO_KIND = {'domain': 'PVParvelFoundationErrorDomain', 'code': -1001, 'url': True}
NO_IDENTITY = {'domain': 'PVParvelFoundationErrorDomain', 'code': -1003, 'url': True}
LONG_TEXT = 160

CONTAINER = '{urn:oasis:names:tc:opendocument:xmlns:container}'
OPF = '{http://www.idpf.org/2007/opf}'
DC = '{http://purl.org/dc/elements/1.1/}'

# Package documents whose encoding expat can't work out, though their bytes leave no doubt; looked at
# with xxd and xmllint.
ENCODINGS = {
    # A UTF-16 byte-order mark before a declaration that says UTF-8.
    'epub/epubcheck__03-resources_xml-encoding-utf16-BOM-and-utf8-declaration-warning.epub':
        'utf-16',
    # UTF-32, big-endian, with neither mark nor declaration: 00 00 00 3C.
    'epub/epubcheck__03-resources_xml-encoding-utf32-BOM-error.epub': 'utf-32-be',
}


class Failure(Exception):
    """No record. With `corrupt`, the general "corrupt" error that names the book; else no error."""

    def __init__(self, corrupt):
        super().__init__()
        self.corrupt = corrupt


# -- packages

class Archive:
    def __init__(self, path):
        try:
            self.zip = zipfile.ZipFile(path)
        except zipfile.BadZipFile:
            raise Failure(corrupt=True)

    def read(self, name):
        """The first entry of exactly this name."""
        for info in self.zip.infolist():
            stored = info.orig_filename.encode('utf-8' if info.flag_bits & 0x800 else 'cp437')
            if stored == name.encode():
                try:
                    return self.zip.read(info)
                except (zipfile.BadZipFile, NotImplementedError, RuntimeError):
                    return None
        return None


class Folder:
    def __init__(self, path):
        self.path = os.path.realpath(path)

    def read(self, name):
        path = os.path.realpath(os.path.join(self.path, name.lstrip('/')))
        if not path.startswith(self.path + os.sep) or not os.path.isfile(path):
            return None
        with open(path, 'rb') as file:
            return file.read()


def parse_xml(data):
    try:
        return ElementTree.fromstring(data)
    except ElementTree.ParseError:
        raise Failure(corrupt=True)


def opf_path(container):
    """The full-path of the first rootfile of the first rootfiles."""
    if container.tag != CONTAINER + 'container':
        raise Failure(corrupt=False)
    files = container.find(CONTAINER + 'rootfiles')
    first = files.find(CONTAINER + 'rootfile') if files is not None else None
    path = first.get('full-path') if first is not None else None
    if path is None:
        raise Failure(corrupt=False)
    return path


# -- the package document

def text_of(parent, tag, **attributes):
    for element in parent.findall(tag):
        if all(element.get(name) == value for name, value in attributes.items()):
            return ''.join(element.itertext())
    return None


def validated_identifier(package, metadata):
    name = package.get('unique-identifier')
    assert "'" not in (name or ''), 'it breaks out of its expression: decide by hand'
    text = text_of(metadata, DC + 'identifier', **({'id': name} if name else {}))
    if text is None or not 1 <= len(text.encode('utf-16-le')) // 2 <= 64 or set(text) & set('/:'):
        return None
    return text


def cover_path(package, metadata, path):
    metas = [meta for meta in metadata.findall(OPF + 'meta') if meta.get('name') == 'cover']
    cover = (metas[0].get('content') if metas else None) or 'cover'
    assert '"' not in cover, 'it breaks out of its expression: decide by hand'
    manifest = package.find(OPF + 'manifest')
    items = [] if manifest is None else manifest.findall(OPF + 'item')
    items = [item for item in items if item.get('id') == cover]
    href = items[0].get('href') if items else None
    if href is None:
        return None
    folder = path.rpartition('/')[0]
    return folder.rstrip('/') + '/' + href.lstrip('/') if folder else href


def is_own_tool(kind, producer):
    return kind == 1 and isinstance(producer, str) and producer.startswith('Folium Author')


def opf_record(data, path, kind, codec):
    """The record's own entries and, apart, the cover path."""
    if codec:
        text = data.decode(codec).lstrip('\ufeff')
        data = text[text.index('?>') + 2:] if text.startswith('<?xml') else text
    package = parse_xml(data)
    metadata = package.find(OPF + 'metadata') if package.tag == OPF + 'package' else None
    if metadata is None:
        raise Failure(corrupt=False)
    producer = text_of(metadata, DC + 'contributor', id='pvp')
    record = {
        'PVBookProducer': producer,
        'artistName': text_of(metadata, DC + 'creator'),
        'itemName': text_of(metadata, DC + 'title'),
        'genre': text_of(metadata, DC + 'subject'),
        'bookDescription': text_of(metadata, DC + 'description'),
        # Only in no namespace: a meta of the package's own is not looked for.
        'PVBooksFormat': text_of(metadata, 'meta', property='folium:format'),
    }
    if kind == 2 or is_own_tool(kind, producer):
        record['PVGeneratedItemId'] = validated_identifier(package, metadata)
    record = {key: value for key, value in record.items() if value is not None}
    return record, cover_path(package, metadata, path)


# -- the store metadata file

def is_number(value):
    return isinstance(value, (bool, int, float))


def decimal(number):
    if isinstance(number, bool):
        return str(int(number))
    if isinstance(number, float) and number.is_integer() and abs(number) < 1e15:
        return str(int(number))
    return repr(number) if isinstance(number, float) else str(number)


def int_reading(text):
    """The 64-bit reading of leading decimal digits; 0 for none."""
    if not isinstance(text, str):
        return 0
    text = text.lstrip(' \t\n\v\f\r')
    sign, rest = (text[:1], text[1:]) if text[:1] in ('-', '+') else ('', text)
    digits = rest[:len(rest) - len(rest.lstrip('0123456789'))]
    return max(-2 ** 63, min(2 ** 63 - 1, int(sign + digits))) if digits else 0


def bool_reading(value):
    return bool(value) if is_number(value) else False


def store_record(data):
    """The file's dictionary with its store ID made sound; {} for one that is no dictionary."""
    if not data:
        return None
    try:
        top = plistlib.loads(data)
    except Exception:  # plistlib raises whatever its parsers do
        return None
    record = dict(top) if isinstance(top, dict) else {}
    ident = record.get('itemId')
    if is_number(ident):
        if int_reading(decimal(ident)) < 1:
            del record['itemId']
        else:
            record['itemId'] = decimal(ident)
    return record


def book_info(record):
    info = record.get('book-info')
    return dict(info) if isinstance(info, dict) else {}


# -- the whole

def asset_id(record):
    ident = record.get('itemId')
    if isinstance(ident, str):
        return ident
    return decimal(ident) if is_number(ident) else record.get('PVGeneratedItemId')


def inspect(root, name, kind, with_cover):
    path = os.path.join(root, name)
    folder = os.path.isdir(path)
    package = Folder(path) if folder else Archive(path)

    container = package.read('META-INF/container.xml')
    if container is None:
        assert not folder, 'no such folder so far: its error is the host\'s'
        raise Failure(corrupt=False)
    opf_name = opf_path(parse_xml(container))
    opf_bytes = package.read(opf_name)
    if opf_bytes is None:
        assert not folder, 'no such folder so far: its error is the host\'s'
        raise Failure(corrupt=True)
    store = store_record(package.read('BazaarMetadata.plist'))
    record, opf_cover = opf_record(opf_bytes, opf_name, kind, ENCODINGS.get(name))

    store_cover = book_info(store or {}).get('cover-image-path')
    if with_cover and store_cover is None and opf_cover is not None:
        record['book-info'] = {'cover-image-path': opf_cover}
    preview = bool_reading((store or {}).get('isPreview'))
    if store and not preview:
        record.update(store)

    info = book_info(record)
    if not info.get('package-file-hash'):
        info['package-file-hash'] = hashlib.md5(opf_bytes).hexdigest().upper()
    record['book-info'] = info
    if int_reading(record.get('itemId')):
        record.pop('PVGeneratedItemId', None)
    else:
        own = kind == 2 or is_own_tool(kind, record.get('PVBookProducer')) or preview
        if not own or not record.get('PVGeneratedItemId'):
            record['PVGeneratedItemId'] = info['package-file-hash']
        record['isPreview'] = preview

    if with_cover:
        wanted = store_cover if store_cover is not None else opf_cover
        cover = package.read(wanted) if wanted is not None else None
        if cover is not None:
            record['PVCoverImageData'] = cover

    record.update(attribute_record(name))
    return record


def attribute_record(name):
    """What an asset without attributes has all the same, and goes over its content: a store file's
    own path, shown name, count and explicit mark never survive it."""
    stem, extension = os.path.splitext('@/' + name)
    return {
        'path': stem + extension.lower(),
        'sourcePath': '@/' + name,
        'PVDisplayName': os.path.basename(name),
        'PVGenerationCount': 1,
        'explicit': False,
    }


def to_json(value):
    if isinstance(value, dict):
        return {key: to_json(value[key]) for key in sorted(value)}
    if isinstance(value, list):
        return [to_json(item) for item in value]
    if isinstance(value, datetime.datetime):
        return {'$date': value.strftime('%Y-%m-%dT%H:%M:%SZ')}
    if isinstance(value, str) and len(value.encode()) > LONG_TEXT:
        value = value.encode()
        return {'$md5': hashlib.md5(value).hexdigest(), 'length': len(value)}
    if isinstance(value, bytes):
        return {'$md5': hashlib.md5(value).hexdigest(), 'length': len(value), '$data': True}
    return value


def book_row(root, name, kind):
    try:
        plain = inspect(root, name, kind, with_cover=False)
        covered = inspect(root, name, kind, with_cover=True)
    except Failure as failure:
        return {'error': CORRUPT if failure.corrupt else None}
    if not asset_id(plain):
        return {'error': NO_IDENTITY}
    return {'record': plain, 'withCover': {key: value for key, value in covered.items()
                                           if plain.get(key) != value}}


def expectation(root, name):
    kind = TYPES.get(os.path.splitext(name)[1].lower(), 0)
    if kind == 3:
        row = pdf.row(root, name, attribute_record(name))
    elif kind == 4:
        row = m4a.row(root, name, attribute_record(name))
    else:
        row = book_row(root, name, kind) if kind else {'error': NO_KIND}
    content = {key: to_json(row[key]) for key in ('record', 'withCover') if key in row}
    return {'file': name, 'type': kind, **row, **content}


def assets(root):
    for folder in FOLDERS:
        for name in sorted(os.listdir(os.path.join(root, folder))):
            yield folder + '/' + name


def main():
    if len(sys.argv) not in (2, 3):
        sys.exit(__doc__)
    root = sys.argv[1]
    output = sys.argv[2] if len(sys.argv) == 3 else os.path.join(
        os.path.dirname(os.path.abspath(__file__)), 'expected.json')
    rows = [expectation(root, name) for name in assets(root)]
    with open(output, 'w', encoding='utf-8') as file:
        lines = (json.dumps(row, ensure_ascii=False, separators=(',', ':')) for row in rows)
        file.write('[\n' + ',\n'.join(lines) + '\n]\n')
    print('%d assets, %d with a record' % (len(rows), sum('record' in row for row in rows)))


if __name__ == '__main__':
    main()
