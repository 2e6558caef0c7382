"""What an audio file of the corpus must give (make_expectations.py), read atom by atom."""
import os
import struct

NO_IDENTITY = {'domain': 'PVParvelFoundationErrorDomain', 'code': -1003, 'url': True}
FIRST_ATOMS = (b'ftyp', b'moov', b'mdat', b'free', b'skip', b'wide')
SONG_ID, ARTIST, TITLE, COVER = b'cnID', b'\xa9ART', b'\xa9nam', b'covr'
IMPLICIT = 0
ENCODINGS = {1: 'utf-8', 2: 'utf-16-be'}
INTEGERS = {21: True, 22: False, 65: True, 66: True, 67: True, 74: True, 75: False, 76: False,
            77: False, 78: False}  # whether signed


def atoms(data):
    """(name, content) of each whole atom."""
    at = 0
    while at + 8 <= len(data):
        size, name = struct.unpack('>I4s', data[at:at + 8])
        head = 8
        if size == 1 and at + 16 <= len(data):
            size, head = struct.unpack('>Q', data[at + 8:at + 16])[0], 16
        elif size == 0:
            size = len(data) - at
        if size < head or at + size > len(data):
            return
        yield name, data[at + head:at + size]
        at += size


def child(data, name):
    return next((content for kind, content in atoms(data) if kind == name), None)


def tag_list(movie):
    for holder in (child(movie, b'udta'), movie):
        meta = child(holder, b'meta') if holder is not None else None
        if meta is None:
            continue
        # With or without version and flags before the first atom.
        found = child(meta[4:], b'ilst') if child(meta, b'hdlr') is None else child(meta, b'ilst')
        if found is not None:
            return found
    return b''


def first_value(tags, name):
    """(type, bytes) of the first value of the first item."""
    item = child(tags, name)
    data = child(item, b'data') if item is not None else None
    return (struct.unpack('>I', data[:4])[0], data[8:]) if data is not None else (None, None)


def text_value(tags, name):
    kind, data = first_value(tags, name)
    if kind in ENCODINGS:
        try:
            return data.decode(ENCODINGS[kind])
        except UnicodeDecodeError:
            return None
    if kind in INTEGERS or (kind == IMPLICIT and name == SONG_ID):
        # Up to four bytes are unsigned, whatever the type says: store IDs go beyond 2^31.
        return str(int.from_bytes(data, 'big', signed=len(data) == 8))
    return None


def row(root, name, attribute_record):
    with open(os.path.join(root, name), 'rb') as file:
        data = file.read()
    if data[4:8] not in FIRST_ATOMS:
        return {'error': NO_IDENTITY}
    tags = tag_list(child(data, b'moov') or b'')
    entries = {'itemId': text_value(tags, SONG_ID), 'artistName': text_value(tags, ARTIST),
               'itemName': text_value(tags, TITLE), **attribute_record}
    kind, cover = first_value(tags, COVER)
    has_cover = cover is not None and kind not in ENCODINGS
    result = {'record': {key: value for key, value in entries.items() if value is not None},
              'withCover': {'PVCoverImageData': cover} if has_cover else {}}
    return result if entries['itemId'] else {'error': NO_IDENTITY, **result}
