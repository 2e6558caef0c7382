#!/usr/bin/env python3
"""Makes hostile books, PDFs and audio files, and manifest.json that lists them.

usage: make_hostile.py FOLDER --canary FOLDER2

Each row of the manifest has name, path, kind, group, expect and why; `expect` is what an inspection
must end in: record, error or either. FOLDER2 stands for "outside": its secret.txt may be found in no
record and no cover. Nobody may crash, hang, hold much memory or touch anything over any of them.
"""
import json
import os
import plistlib
import socket
import struct
import sys
import zlib

sys.dont_write_bytecode = True
import hostile_media  # noqa: E402  (beside this file)

SECRET = 'kept-to-itself-7731'
CONTAINER = '''<?xml version="1.0"?>
<container version="1.0" xmlns="urn:oasis:names:tc:opendocument:xmlns:container">
<rootfiles><rootfile full-path="%s" media-type="application/oebps-package+xml"/></rootfiles>
</container>'''
OPF = '''<?xml version="1.0"?>
%(dtd)s<package xmlns="http://www.idpf.org/2007/opf" version="2.0" unique-identifier="%(uid)s">
<metadata xmlns:dc="http://purl.org/dc/elements/1.1/"><dc:identifier id="n">open-9</dc:identifier>
<dc:title>%(title)s</dc:title><dc:creator>Someone</dc:creator>%(more)s
<meta name="cover" content="%(cover)s"/></metadata>
<manifest><item id="pic" href="%(href)s" media-type="image/gif"/></manifest></package>'''
COVER = b'GIF89a\1\0\1\0\0\0\0;'
PLIST = '<?xml version="1.0" encoding="UTF-8"?><plist version="1.0">%s</plist>'

FOLDER = CANARY = ''
ROWS = []


def opf(dtd='', uid='n', title='Open', more='', cover='pic', href='front.gif'):
    return (OPF % dict(dtd=dtd, uid=uid, title=title, more=more, cover=cover, href=href)).encode()


def put(name, data, expect, why, kind='epub', attributes=()):
    path = os.path.join(FOLDER, name + '.' + kind)
    if callable(data):
        data(path)
    else:
        with open(path, 'wb') as file:
            file.write(data)
    for key, value in attributes:
        try:
            os.setxattr(path, 'user.com.kestrel.Folium.' + key, value)
        except OSError:
            why += ' (not every attribute could be set here)'
    ROWS.append({'name': name, 'path': name + '.' + kind, 'kind': kind, 'expect': expect,
                 'group': name.split('-')[0], 'why': why})


# -- archives

class Zip:
    """An archive written field by field, so that any field can lie."""

    def __init__(self):
        self.body = bytearray()
        self.entries = []

    def add(self, name, data, method=8, **lies):
        name = name if isinstance(name, bytes) else name.encode()
        packed = data
        if method == 8 and 'packed' not in lies:
            deflate = zlib.compressobj(9, zlib.DEFLATED, -15)
            packed = deflate.compress(data) + deflate.flush()
        packed = lies.get('packed', packed)
        entry = dict(name=name, flags=0, method=method, crc=zlib.crc32(data), packed=len(packed),
                     size=len(data), offset=len(self.body), mode=0o100644, extra=b'',
                     name_length=None, extra_length=None, local_name=name)
        entry.update({key: value for key, value in lies.items() if key != 'packed'})
        entry['packed'] = lies.get('packed_size', entry['packed'])
        local = entry['local_name']
        self.body += struct.pack('<IHHHHHIIIHH', 0x04034b50, 20, entry['flags'], entry['method'], 0,
                                 0x5821, entry['crc'], entry['packed'] & 0xffffffff,
                                 entry['size'] & 0xffffffff, len(local), 0) + local + packed
        self.entries.append(entry)
        return self

    def directory(self):
        out = bytearray()
        for e in self.entries:
            out += struct.pack(
                '<IHHHHHHIIIHHHHHII', 0x02014b50, 0x0314, 20, e['flags'], e['method'], 0, 0x5821,
                e['crc'], e['packed'] & 0xffffffff, e['size'] & 0xffffffff,
                len(e['name']) if e['name_length'] is None else e['name_length'],
                len(e['extra']) if e['extra_length'] is None else e['extra_length'], 0, 0, 0,
                (e['mode'] << 16) & 0xffffffff, e['offset'] & 0xffffffff) + e['name'] + e['extra']
        return bytes(out)

    def end(self, directory, **lies):
        count = len(self.entries)
        f = dict(disk=0, start_disk=0, here=count, count=count, size=len(directory),
                 offset=len(self.body), comment=b'', comment_length=None)
        f.update(lies)
        length = len(f['comment']) if f['comment_length'] is None else f['comment_length']
        return struct.pack('<IHHHHIIH', 0x06054b50, f['disk'], f['start_disk'], f['here'] & 0xffff,
                           f['count'] & 0xffff, f['size'] & 0xffffffff, f['offset'] & 0xffffffff,
                           length) + f['comment']

    def bytes(self, **lies):
        directory = self.directory()
        return bytes(self.body) + directory + self.end(directory, **lies)


def book(package=None, container=None, drop=(), extra=()):
    archive = Zip()
    for name, data in (('mimetype', b'application/epub+zip'),
                       ('META-INF/container.xml', container or (CONTAINER % 'in/book.opf').encode()),
                       ('in/book.opf', opf() if package is None else package), ('in/front.gif', COVER)):
        if name not in drop:
            archive.add(name, data)
    for name, data in extra:
        archive.add(name, data)
    return archive


def with_opf(**lies):
    data = lies.pop('data', opf())
    archive = book(drop=('in/book.opf',))
    archive.add('in/book.opf', data, **lies)
    return archive


def zips():
    sound = book()
    put('zip-control', sound.bytes(), 'record', 'sound')
    put('zip-tail-junk', sound.bytes() + b'j' * 70000, 'either', 'the end record lies far from the end')
    put('zip-tail-short', sound.bytes() + b'jjj', 'either', 'three bytes behind the end record')
    put('zip-front-junk', b'#!/bin/sh\n' * 9 + sound.bytes(), 'either', 'text before the archive')
    second = sound.end(sound.directory(), offset=0)
    put('zip-end-twice', sound.bytes(comment=second), 'either', 'an end record within the comment')
    put('zip-comment-long', sound.bytes(comment=b'x', comment_length=9000), 'either',
        'a comment that would end behind the file')
    for n, value in (('zero', 0), ('one', 1), ('many', 40000)):
        put('zip-count-' + n, sound.bytes(here=value, count=value), 'either', 'counts %d entries' % value)
    for n, value in (('self', len(sound.bytes()) - 22), ('far', 0xfffffff0), ('near', 3)):
        put('zip-directory-' + n, sound.bytes(offset=value), 'either', 'a directory that is not there')
    put('zip-directory-size', sound.bytes(size=0xfffffffe), 'either', 'a directory of 4 GB')
    put('zip-disks', sound.bytes(disk=3, start_disk=2), 'either', 'the third of several disks')

    directory = sound.directory()
    body = bytes(sound.body)
    for n, count, size, offset, place in (
            ('sound', 4, len(directory), len(body), None), ('count', 1 << 62, len(directory), len(body), None),
            ('size', 4, (1 << 64) - 1, len(body), None), ('offset', 4, len(directory), (1 << 64) - 60, None),
            ('sum', 4, 1 << 63, 1 << 63, None), ('locator', 4, len(directory), len(body), (1 << 64) - 8)):
        end = struct.pack('<IQHHIIQQQQ', 0x06064b50, 44, 45, 45, 0, 0, count, count, size, offset)
        locator = struct.pack('<IIQI', 0x07064b50, 0,
                              len(body) + len(directory) if place is None else place, 1)
        data = body + directory + end + locator + sound.end(
            directory, here=0xffff, count=0xffff, size=0xffffffff, offset=0xffffffff)
        put('zip-wide-' + n, data, 'record' if n == 'sound' else 'either',
            '64-bit end record with its %s out of bounds' % n)
    for n, extra in (('short', struct.pack('<HHI', 1, 4, 9)), ('long', struct.pack('<HH', 1, 900)),
                     ('huge', struct.pack('<HHQQQ', 1, 24, (1 << 64) - 1, (1 << 64) - 1, (1 << 64) - 1))):
        put('zip-extra-' + n, with_opf(size=0xffffffff, packed_size=0xffffffff, offset=0xffffffff,
                                       extra=extra).bytes(), 'error', 'a 64-bit field that is ' + n)
    put('zip-name-end', with_opf(name_length=60000).bytes(), 'either', 'a name that ends behind the file')
    put('zip-extra-end', with_opf(extra_length=65535).bytes(), 'either', 'a field that ends behind the file')
    put('zip-local-name', with_opf(local_name=b'in/other').bytes(), 'either', 'two names for one entry')
    put('zip-local-name-long', with_opf(local_name=b'n' * 65535).bytes(), 'either', 'a local name of 64 KB')
    put('zip-offset-directory', with_opf(offset=len(sound.body) + 40).bytes(), 'error',
        'the entry lies within the directory')
    put('zip-offset-wrap', with_opf(offset=0xfffffffa).bytes(), 'error', 'the offset wraps around')
    put('zip-same-bytes', with_opf(offset=0).bytes(), 'error', 'the bytes of another entry')
    packed = zlib.compress(opf())[2:-4]
    put('zip-deflate-cut', with_opf(packed=packed[:-9]).bytes(), 'error', 'packed bytes cut short')
    put('zip-deflate-more', with_opf(packed=packed + b'rest').bytes(), 'either', 'bytes behind the packed ones')
    put('zip-deflate-noise', with_opf(packed=b'\xff' * 300).bytes(), 'error', 'packed noise')
    for n, by in (('less', -7), ('more', 7), ('much', 1 << 30)):
        put('zip-size-' + n, with_opf(size=len(opf()) + by).bytes(), 'error', 'claims %d bytes else' % by)
    put('zip-stored-size', with_opf(method=0, size=9).bytes(), 'error', 'stored in more bytes than it has')
    put('zip-stored-far', with_opf(method=0, packed_size=1 << 29, size=1 << 29).bytes(), 'error',
        'stored bytes that end behind the file')
    put('zip-stored-wide', with_opf(method=0, packed_size=0xfffffffe, size=0xfffffffe).bytes(), 'error',
        'stored bytes of 4 GB')
    for method in (1, 6, 9, 12, 14, 93, 95, 98, 99, 0xffff):
        put('zip-method-%d' % method, with_opf(method=method).bytes(), 'error', 'method %d' % method)
    for n, flags in (('strong', 0x41), ('masked', 0x2001), ('patch', 0x20), ('all', 0xffff)):
        put('zip-flags-' + n, with_opf(flags=flags).bytes(), 'either', 'flag bits %x' % flags)
    for n, mode in (('link', 0o120777), ('folder', 0o040755), ('pipe', 0o010644), ('device', 0o060644)):
        put('zip-opf-' + n, with_opf(mode=mode, data=(CANARY + '/secret.txt').encode()).bytes(), 'error',
            'the package document is a ' + n)
        archive = book(drop=('in/front.gif',))
        archive.add('in/front.gif', (CANARY + '/secret.txt').encode(), mode=mode)
        put('zip-cover-' + n, archive.bytes(), 'either', 'the cover is a ' + n)
    empty = book(drop=('in/front.gif',), extra=[('in/front.gif', b'')])
    put('zip-cover-empty', empty.bytes(), 'record', 'the cover is an empty file')
    unicode_name = b'\1' + struct.pack('<I', zlib.crc32(b'in/fake.opf')) + b'in/book.opf'
    put('zip-unicode-path', book(drop=('in/book.opf',)).add(
        'in/fake.opf', opf(), extra=struct.pack('<HH', 0x7075, len(unicode_name)) + unicode_name).bytes(),
        'either', 'a name of its own and another in an extra field')
    put('zip-name-nul', book(drop=('in/book.opf',)).add(b'in/book.opf\0.txt', opf()).bytes(), 'error',
        'a name that ends at a NUL')
    put('zip-path-nul', book(container=(CONTAINER % 'in/book.opf&#0;').encode()).bytes(), 'error',
        'a NUL in the path of the package document')
    put('zip-path-slash', book(container=(CONTAINER % '/in/book.opf').encode()).bytes(), 'error',
        'names match as they are')
    put('zip-path-empty', book(container=(CONTAINER % '').encode()).bytes(), 'error', 'an empty path')
    twice = book()
    for _ in range(60000):
        twice.entries.append(dict(twice.entries[1]))
    put('zip-many-same', twice.bytes(), 'either', '60000 entries of one name')
    many = book()
    many.entries += [dict(many.entries[0], name=b'%07d' % n) for n in range(200000)]
    directory = many.directory()
    data = bytes(many.body) + directory
    data += struct.pack('<IQHHIIQQQQ', 0x06064b50, 44, 45, 45, 0, 0, len(many.entries), len(many.entries),
                        len(directory), len(many.body))
    data += struct.pack('<IIQI', 0x07064b50, 0, len(many.body) + len(directory), 1)
    put('zip-many-names', data + many.end(directory, here=0xffff, count=0xffff, size=0xffffffff,
                                          offset=0xffffffff), 'either', '200000 entries')


# -- package and container documents

def xmls():
    def p(name, package, expect, why, kind='epub'):
        put('xml-' + name, book(package=package).bytes(), expect, why, kind)

    def c(name, container, expect, why):
        put('xml-container-' + name, book(container=container).bytes(), expect, why)

    secret = 'file://%s/secret.txt' % CANARY
    p('parameter', opf('<!DOCTYPE package [<!ENTITY %% e SYSTEM "%s"> %%e;]>' % secret), 'either',
      'an external parameter entity')
    p('subset', opf('<!DOCTYPE package SYSTEM "%s">' % secret), 'either', 'a local external subset')
    p('attribute', opf('<!DOCTYPE package [<!ENTITY x SYSTEM "%s">]>' % secret, cover='&x;'), 'error',
      'an external entity in an attribute')
    p('unparsed', opf('<!DOCTYPE package [<!NOTATION n SYSTEM "n"><!ENTITY x SYSTEM "%s" NDATA n>]>'
                      % secret, title='&x;'), 'error', 'an unparsed entity in text')
    p('include', opf(more='<xi:include xmlns:xi="http://www.w3.org/2001/XInclude" href="%s" parse="text"/>'
                     % secret), 'record', 'an inclusion')
    p('stylesheet', opf('<?xml-stylesheet href="%s"?>' % secret), 'record', 'a style sheet')
    p('undefined', opf(title='&nothing;'), 'error', 'an entity nobody declared')
    p('loop', opf('<!DOCTYPE package [<!ENTITY a "&b;"><!ENTITY b "&a;">]>', title='&a;'), 'error',
      'entities that hold each other')
    p('quadratic', opf('<!DOCTYPE package [<!ENTITY a "%s">]>' % ('q' * 100000), title='&a;' * 90000),
      'either', '9 GB of text from 370 KB')
    p('quadratic-attribute', opf('<!DOCTYPE package [<!ENTITY a "%s">]>' % ('q' * 100000),
                                 cover='&a;' * 90000), 'either', 'the same in an attribute')
    p('many-entities', opf('<!DOCTYPE package [%s]>' % ''.join(
        '<!ENTITY e%d "x">' % n for n in range(200000))), 'either', '200000 entities')
    p('references', opf('<!DOCTYPE package [<!ENTITY a "">]>', title='&a;' * 8000000), 'either',
      '8 million empty references')
    p('entity-tree', opf('<!DOCTYPE package [<!ENTITY a "%s">]>' % ('<x/>' * 3000),
                         more='<y>' + '&a;' * 20000 + '</y>'), 'either', '60 million elements')
    p('default-attributes', opf('<!DOCTYPE package [<!ATTLIST s %s>]>' % ' '.join(
        'd%d CDATA "v"' % n for n in range(30000)), more='<s/>' * 3000), 'either',
      '30000 attributes that no start tag shows')
    p('default-once', opf('<!DOCTYPE package [<!ATTLIST s %s>]>' % ' '.join(
        'd%d CDATA "v"' % n for n in range(250)), more='<s/>' * 190000), 'either',
      '47 million attributes that no start tag shows')
    p('model', opf('<!DOCTYPE package [<!ELEMENT s %sa%s>]>' % ('(' * 50000, ')' * 50000)), 'either',
      'a content model 50000 deep')
    p('nested', opf(more='<s>' * 200 + '</s>' * 200), 'record', '200 elements deep')
    p('sections', opf(more='<![CDATA[]]>' * 3000000), 'either', '3 million empty sections')
    p('comments', opf(more='<!---->' * 5000000), 'either', '5 million comments')
    p('instructions', opf(more='<?i?>' * 8000000), 'either', '8 million instructions')
    p('pieces', opf(title='t<!---->' * 3000000), 'either', 'a text in 3 million pieces')
    p('elements', opf(more='<s/>' * 190000), 'either', '190000 elements')
    p('elements-over', opf(more='<s/>' * 9000000), 'error', '9 million elements')
    row = '<s ' + ' '.join('k%d=""' % n for n in range(250)) + '/>'
    p('attributes', opf(more=row * 25000), 'either', '6 million attributes, 250 an element')
    p('names', opf(more=''.join('<n%d a%d=""/>' % (n, n) for n in range(190000))), 'either',
      '190000 names, each of them new')
    p('names-attributes', opf(more=''.join('<s %s/>' % ' '.join(
        'k%d=""' % (row * 250 + n) for n in range(250)) for row in range(3000))), 'either',
      '750000 names of attributes, each of them new')
    deep = ''.join('<s %s>' % ' '.join('xmlns:p%d_%d="u"' % (d, n) for n in range(250)) for d in range(200))
    p('namespaces', opf(more=deep + '<p0_0:t/>' * 190000 + '</s>' * 200), 'either',
      '50000 names in scope, asked 190000 times')
    wide = '<t ' + ' '.join('p0_%d:k=""' % n for n in range(250)) + '/>'
    p('namespaces-attributes', opf(more=deep + wide * 15000 + '</s>' * 200), 'either',
      'the same asked 4 million times by attributes')
    p('long-text', opf(title='t' * 9000000, more=''.join(
        '<dc:%s>%s</dc:%s>' % (tag, 'w' * 9000000, tag) for tag in ('subject', 'description', 'source'))),
      'either', 'four texts of 9 MB')
    p('huge-text', opf(title='t' * 50000000), 'either', 'a text of 50 MB')
    p('long-name', opf(more='<%s/>' % ('n' * 9000000)), 'either', 'a name of 9 MB')
    p('long-attribute', opf(cover='c' * 9000000), 'either', 'an attribute of 9 MB')
    p('blanks', opf() + b' ' * 60000000, 'either', '60 MB of blanks behind the document')
    p('two-roots', opf() + opf()[22:], 'error', 'two documents in one')
    p('nul', opf(title='a\0b'), 'error', 'a NUL in the text')
    p('control', opf(title='a\x1b[2J'), 'error', 'a control character')
    p('reference-nul', opf(title='&#0;'), 'error', 'a NUL by reference')
    p('reference-big', opf(title='&#x99999999999;'), 'error', 'a character beyond them all')
    p('reference-half', opf(title='&#xD800;'), 'error', 'half a surrogate pair')
    p('no-prefix', opf(more='<u:s/>'), 'either', 'a prefix nobody declared')
    for n, encoding in (('unknown', 'nothing-8'), ('utf7', 'UTF-7'), ('ebcdic', 'IBM037'),
                        ('utf16', 'UTF-16'), ('ucs4', 'ISO-10646-UCS-4'), ('long', 'E' * 40000)):
        p('encoding-' + n, opf().replace(b'"1.0"', b'"1.0" encoding="%s"' % encoding.encode(), 1), 'either',
          'said to be ' + encoding[:20])
    p('utf16-odd', '\ufeff'.encode('utf-16-le') + opf().decode().encode('utf-16-le') + b'<', 'either',
      'an odd number of bytes')
    p('utf16-cut', opf(title='\U0001f4d6').decode('utf-8').encode('utf-16').replace(b'\xd6\xdc', b'', 1),
      'either', 'half a surrogate pair in UTF-16')
    p('utf32-far', b'\0\0\0<' + b'\x7f\xff\xff\xff' * 100, 'error', 'characters beyond them all')
    for n, head in (('empty', b''), ('space', b' ' * 100), ('mark', b'\xef\xbb\xbf'), ('open', b'<'),
                    ('declaration', b'<?xml'), ('doctype', b'<!DOCTYPE p [')):
        p('only-' + n, head, 'error', 'no more than a beginning')

    # What the documents say is put into expressions as it is.
    slow = 'count(//*[count(//*[count(//*[count(//*)>0])>0])>0])'
    fill = '<s/>' * 20000
    p('expression-slow', opf(uid="q' or %s>0 or '1'='" % slow.replace('>', '&gt;'), more=fill), 'either',
      'an identifier that asks for a fourth power', kind='folium')
    p('expression-slow-cover', opf(cover='x&quot; or %s>0 or &quot;1&quot;=&quot;' % slow, more=fill),
      'either', 'a cover that does')
    p('expression-joined', opf(uid="q' or contains(concat(%s),'q') or '1'='" % ','.join(['//*'] * 800),
                               title='t' * 9000000), 'either', 'a text of 7 GB asked for', kind='folium')
    p('expression-set', opf(uid="q'] | %s | *['" % ' | '.join(['//* | //@*'] * 900), more=fill), 'either',
      'a union of 900 sets', kind='folium')
    p('expression-axes', opf(cover='&quot;] | %s | *[&quot;' % '/'.join(
        ['//*', 'ancestor-or-self::*', 'following::*', 'preceding::*'] * 4), more=fill), 'either',
      'axes upon axes')
    for depth in (3000, 200000):
        p('expression-deep-%d' % depth, opf(uid="q' or %s1%s or '1'='" % ('(' * depth, ')' * depth)),
          'either', 'brackets %d deep' % depth, kind='folium')
        p('expression-minus-%d' % depth, opf(uid="q' or %s1 or '1'='" % ('-' * depth)), 'either',
          '%d signs' % depth, kind='folium')
        p('expression-predicates-%d' % depth, opf(uid="q']%s | *['" % ('[1]' * depth)), 'either',
          '%d conditions' % depth, kind='folium')
    p('expression-function', opf(uid="q' or document('%s') or '1'='" % secret), 'either',
      'a function that reads files', kind='folium')
    p('identifier-long', opf(uid='n' * 5000000), 'either', 'an identifier of 5 MB', kind='folium')

    c('outside', (CONTAINER % '&x;').replace('?>', '?><!DOCTYPE container [<!ENTITY x SYSTEM "%s">]>' % secret,
                                             1).encode(), 'error', 'an external entity as the path')
    c('laughs', (CONTAINER % '&e9;').replace('?>', '?><!DOCTYPE container [<!ENTITY e0 "in/">%s]>' % ''.join(
        '<!ENTITY e%d "%s">' % (n, '&e%d;' % (n - 1) * 10) for n in range(1, 10)), 1).encode(), 'error',
      'a path of gigabytes')
    c('entity', (CONTAINER % '&x;').replace('?>', '?><!DOCTYPE container [<!ENTITY x "in/book.opf">]>',
                                            1).encode(), 'record', 'a path from a declared entity')
    c('up', (CONTAINER % ('../' * 30 + CANARY[1:] + '/secret.txt')).encode(), 'error', 'a path outside')
    c('deep', ('<c>' * 100000).encode(), 'error', '100000 deep')
    c('long', (CONTAINER % ('d/' * 3000000)).encode(), 'error', 'a path of 6 MB')
    c('elements', (CONTAINER % 'in/book.opf').replace('<rootfiles>', '<rootfiles>' + '<s/>' * 9000000)
      .encode(), 'error', '9 million elements')


# -- store metadata files: whatever they hold, they do not fail a book that has an identity

def binary(objects, count=None, top=0, table=None, sizes=(4, 4), tail=b''):
    out, offsets = bytearray(b'bplist00'), []
    for item in objects:
        offsets.append(len(out))
        out += item
    start = len(out) if table is None else table
    out += b''.join(offset.to_bytes(4, 'big') for offset in offsets) + tail
    return bytes(out) + struct.pack('>6xBBQQQ', *sizes, len(objects) if count is None else count, top, start)


def plists():
    def s(name, data, why, expect='record'):
        data = data.encode() if isinstance(data, str) else data
        put('plist-' + name, book(extra=[('BazaarMetadata.plist', data)]).bytes(), expect, why)

    def ref(*numbers):
        return b''.join(struct.pack('>I', number) for number in numbers)

    def entry(value):
        return binary([b'\xd1' + ref(1, 2), b'\x51k', value])

    secret = 'file://%s/secret.txt' % CANARY
    s('outside', '<!DOCTYPE plist [<!ENTITY x SYSTEM "%s">]><plist><dict><key>itemName</key><string>&x;'
      '</string></dict></plist>' % secret, 'an external entity')
    s('subset', '<!DOCTYPE plist SYSTEM "%s"><plist><dict/></plist>' % secret, 'an external subset')
    s('quadratic', '<!DOCTYPE plist [<!ENTITY a "%s">]><plist><dict><key>genre</key><string>%s</string></dict>'
      '</plist>' % ('q' * 100000, '&a;' * 90000), '9 GB of text')
    s('entity-nodes', '<!DOCTYPE plist [<!ENTITY a "%s">]><plist><array>%s</array></plist>' % (
        '<true/>' * 1000, '&a;' * 100000), '100 million values')
    s('keys-falling', PLIST % ('<dict>%s</dict>' % ''.join(
        '<key>%06d</key><true/>' % n for n in range(300000, 0, -1))), '300000 keys in falling order')
    s('keys-same', PLIST % ('<dict>%s</dict>' % ('<key>k</key><true/>' * 300000)), '300000 times one key')
    s('values', PLIST % ('<array>%s</array>' % ('<true/>' * 2000000)), '2 million values')
    s('dicts', PLIST % ('<array>%s</array>' % ('<dict/>' * 2000000)), '2 million dictionaries')
    s('strings', PLIST % ('<array>%s</array>' % ('<string/>' * 1500000)), '1.5 million texts')
    for depth in (500, 600):
        s('deep-%d' % depth, PLIST % ('<dict><key>k</key>' * depth + '<true/>' + '</dict>' * depth),
          '%d dictionaries deep' % depth)
    s('attributes', PLIST % ('<dict %s/>' % ' '.join('a%d=""' % n for n in range(100000))), '100000 attributes')
    s('comments', PLIST % ('<dict>%s</dict>' % ('<!---->' * 2000000)), '2 million comments')
    s('long-key', PLIST % ('<dict><key>%s</key><true/></dict>' % ('k' * 9000000)), 'a key of 9 MB')
    for n, text in (('integer', '<integer>%s</integer>' % ('9' * 1000000)), ('hex', '<integer>0x</integer>'),
                    ('minus', '<integer>-</integer>'), ('real', '<real>1e999999</real>'),
                    ('nan', '<real>nan</real>'), ('date', '<date>99999999999-99-99T99:99:99Z</date>'),
                    ('date-cut', '<date>2011-</date>'), ('data', '<data>%%%%</data>'),
                    ('data-odd', '<data>QQ=Q</data>'), ('nested', '<plist><dict/></plist>'),
                    ('unknown', '<other/>'), ('text', 'text')):
        s('value-' + n, PLIST % ('<dict><key>k</key>%s</dict>' % text), 'an odd value: ' + n)
        s('id-' + n, PLIST % ('<dict><key>itemId</key>%s</dict>' % text), 'an odd store ID: ' + n, 'either')
    kinds = {'text': 'words', 'empty': '', 'number': 7, 'real': 0.5, 'minus': -7, 'list': [1], 'map': {'a': 1},
             'bytes': b'\0' * 9, 'up': '../' * 30 + CANARY[1:] + '/secret.txt', 'root': '/', 'dot': '.',
             'folder': 'in/', 'inside': 'META-INF/container.xml', 'slash': '//in//front.gif'}
    for n, value in kinds.items():
        every = {key: value for key in (
            'itemName', 'artistName', 'genre', 'path', 'sourcePath', 'PVDisplayName', 'PVGenerationCount',
            'PVBookProducer', 'PVPercentComplete', 'PVInsertionDate', 'rating', 'year', 'explicit',
            'PVUploadErrorCode', 'PVUploadErrorDomain', 'BazaarU Permlink', 'releaseDate')}
        s('all-' + n, plistlib.dumps(every), 'every known key holds ' + n)
        for key in ('itemId', 'PVGeneratedItemId', 'isPreview', 'book-info', 'PVCoverImageData'):
            s('%s-%s' % (key.lower().replace('-', ''), n), plistlib.dumps({key: value}),
              '%s holds %s' % (key, n), 'either')
        s('cover-' + n, plistlib.dumps({'book-info': {
            'cover-image-path': value, 'package-file-hash': value, 'mime-type': value}}),
          'the cover path is ' + n, 'either')
    s('cover-nul', binary([b'\xd1' + ref(1, 2), b'\x59book-info', b'\xd1' + ref(3, 4),
                           b'\x5f\x10\x10cover-image-path', b'\x5f\x10\x0ein/front.gif\0x'[:17]]),
      'a cover path with a NUL')

    s('flat', binary([b'\xaf\x12' + struct.pack('>I', 3900000) + ref(1) * 3900000, b'\x09']),
      '4 million references to one value')
    narrow = bytearray(b'bplist00\xaf\x12' + struct.pack('>I', 15000000) + b'\1' * 15000000 + b'\x09')
    table = len(narrow)
    narrow += struct.pack('>II', 8, table - 1) + struct.pack('>6xBBQQQ', 4, 1, 2, 0, table)
    s('flat-narrow', bytes(narrow), '15 million references of one byte each')
    narrow = bytearray(b'bplist00\xdf\x12' + struct.pack('>I', 7000000) + b'\1' * 14000000 + b'\x51k')
    table = len(narrow)
    narrow += struct.pack('>II', 8, table - 2) + struct.pack('>6xBBQQQ', 4, 1, 2, 0, table)
    s('keys-narrow', bytes(narrow), '7 million times one key')
    text = b'\x5f\x12' + struct.pack('>I', 1000000) + b't' * 1000000
    s('text-shared', binary([b'\xaf\x12' + struct.pack('>I', 200000) + ref(1) * 200000, text]),
      '200000 times one text of 1 MB')
    s('dict-shared', binary([b'\xd2' + ref(60, 61, n + 1, n + 1) for n in range(60)] + [b'\x51a', b'\x51b']),
      '2^60 dictionaries that share')
    s('chain', binary([b'\xa1' + ref(n + 1) for n in range(200000)] + [b'\x08']), '200000 lists deep')
    inner = b''.join(b'\xaf\x12' + struct.pack('>II', 400000, n + 1) for n in range(510))
    out = b'bplist00' + inner + b'\0' * 2000000
    s('overlapping', out + b''.join(struct.pack('>I', 8 + 10 * n) for n in range(511))
      + struct.pack('>6xBBQQQ', 4, 4, 511, 0, len(out)), '510 lists of 400000 that share their bytes')
    s('self-key', binary([b'\xd1' + ref(0, 0)]), 'a dictionary that is its own key')
    for n, marker in (('null', b'\0'), ('fill', b'\x0f'), ('set', b'\xc1' + ref(1)), ('uid', b'\x80\1'),
                      ('reserved', b'\x70'), ('wide', b'\x14' + b'\xff' * 16), ('wider', b'\x1f' + b'\xff' * 40),
                      ('half', b'\x21\x7c\0'), ('date-nan', b'\x33\x7f\xf8' + bytes(6)),
                      ('date-far', b'\x33\x7f\xe0' + bytes(6)), ('date-inf', b'\x33\xff\xf0' + bytes(6)),
                      ('ascii', b'\x53\xff\xfe\x80'), ('lone', b'\x62\xd8\0\xd8\0'),
                      ('count', b'\x4f\x13' + b'\xff' * 8), ('count-minus', b'\x5f\x13\x80' + bytes(7)),
                      ('count-kind', b'\x5f\x09'), ('count-wide', b'\xaf\x14' + b'\xff' * 16),
                      ('utf16-wrap', b'\x6f\x13\x80' + bytes(7)), ('dict-wrap', b'\xdf\x13\x20' + bytes(7))):
        s('object-' + n, entry(marker), 'an odd object: ' + n)
    plain = [b'\xd1' + ref(1, 2), b'\x51k', b'\x09']
    for sizes in ((0, 4), (4, 0), (9, 4), (4, 9), (255, 255), (1, 1), (8, 8)):
        s('sizes-%d-%d' % sizes, binary(plain, sizes=sizes), 'offsets of %d, references of %d bytes' % sizes)
    for n, lies in (('top', {'top': 3}), ('top-far', {'top': 1 << 63}), ('table', {'table': 1 << 40}),
                    ('table-wrap', {'table': (1 << 64) - 4}), ('table-zero', {'table': 0}),
                    ('count', {'count': (1 << 62) + 3}), ('none', {'count': 0})):
        s('trailer-' + n, binary(plain, **lies), 'a trailer whose %s lies' % n)
    for cut in (6, 8, 9, 31, 32, 40):
        s('cut-%d' % cut, binary(plain)[:cut], 'cut at byte %d' % cut)
    put('plist-and-more', book(package=opf('', more='<!---->' * 1000000), extra=[
        ('BazaarMetadata.plist', (PLIST % ('<dict>%s</dict>' % ''.join(
            '<key>%d</key><dict/>' % n for n in range(240000)))).encode())]).bytes(), 'either',
        'the most of everything at once')
    s('sixteen', plistlib.dumps({'k': b'\0' * 11000000}), '15 MB of base64')
    s('over', plistlib.dumps({'k': b'\0' * 13000000}), '17 MB of base64')


# -- books as folders, and what else may stand under their names

def folders():
    def tree(change):
        def make(path):
            for name, data in (('META-INF/container.xml', (CONTAINER % 'in/book.opf').encode()),
                               ('in/book.opf', opf()), ('in/front.gif', COVER)):
                file = os.path.join(path, name)
                os.makedirs(os.path.dirname(file), exist_ok=True)
                with open(file, 'wb') as out:
                    out.write(data)
            change(path)
        return make

    def f(name, change, expect, why):
        put('folder-' + name, tree(change), expect, why)

    def swapped(name, make):
        def change(path):
            file = os.path.join(path, name)
            if os.path.lexists(file):
                os.unlink(file)
            make(file)
        return change

    def link(to):
        return lambda file: os.symlink(to, file)

    def holes(file):
        with open(file, 'wb') as out:
            out.truncate(1 << 40)

    def bound(file):
        here = os.getcwd()
        os.chdir(os.path.dirname(file))
        socket.socket(socket.AF_UNIX).bind(os.path.basename(file))
        os.chdir(here)

    def outside(name):
        """Moves a folder of the book out and leaves a link in its place."""
        def change(path):
            away = os.path.join(CANARY, 'away-' + os.path.basename(path))
            os.rename(os.path.join(path, name), away)
            os.symlink(away, os.path.join(path, name))
        return change

    f('control', lambda path: None, 'record', 'sound')
    f('link-in', outside('in'), 'error', 'the folder of the package document is a link to outside')
    f('link-meta', outside('META-INF'), 'error', 'the folder of the container document is such a link')
    members = {'container': 'META-INF/container.xml', 'opf': 'in/book.opf', 'cover': 'in/front.gif',
               'store': 'BazaarMetadata.plist', 'artwork': 'BazaarArtwork'}
    for n, member in members.items():
        needed = n in ('container', 'opf')
        ends = 'error' if needed else 'record'
        for kind, make in (('secret', link(CANARY + '/secret.txt')), ('zero', link('/dev/zero')),
                           ('self', link(os.path.basename(member))), ('proc', link('/proc/self/environ')),
                           ('stdin', link('/dev/stdin')), ('pipe', os.mkfifo), ('holes', holes),
                           ('folder', os.mkdir), ('socket', bound)):
            f('%s-%s' % (n, kind), swapped(member, make), ends, '%s is: %s' % (member, kind))
    for n, path in (('up', '../' * 30 + CANARY[1:] + '/secret.txt'), ('far', CANARY + '/secret.txt'),
                    ('folder', 'in'), ('dot', '.'), ('root', '/'), ('proc', '/proc/self/environ'),
                    ('long', 'd/' * 4000 + 'x'), ('name', 'n' * 5000), ('through', 'in/book.opf/x')):
        def write(file, path=path):
            with open(file, 'w') as out:
                out.write(CONTAINER % path)
        f('path-' + n, swapped('META-INF/container.xml', write), 'error', 'the path of the package document')

        def cover(file, path=path):
            with open(file, 'wb') as out:
                out.write(opf(href=path))
        f('href-' + n, swapped('in/book.opf', cover), 'record', 'the path of the cover')

        def store(file, path=path):
            with open(file, 'wb') as out:
                out.write(plistlib.dumps({'book-info': {'cover-image-path': path}}))
        f('stored-' + n, swapped('BazaarMetadata.plist', store), 'record', 'the cover path of the store file')

    put('asset-link', link(FOLDER + '/folder-control.epub'), 'record', 'a link to a sound book')
    put('asset-link-self', link('asset-link-self.epub'), 'error', 'a link to itself')
    put('asset-link-root', link('/'), 'error', 'a link to the root folder')
    put('asset-link-zero', link('/dev/zero'), 'error', 'a link to an endless device')
    put('asset-link-null', link('/dev/null'), 'error', 'a link to an empty device')
    put('asset-link-secret', link(CANARY + '/secret.txt'), 'error', 'a link to what is no book')
    put('asset-pipe', os.mkfifo, 'error', 'a pipe')
    put('asset-socket', bound, 'error', 'a socket')
    put('asset-holes', holes, 'error', 'a terabyte of holes')
    put('asset-folder', os.mkdir, 'error', 'an empty folder')


def attributes():
    names = ('assetID', 'title', 'sortTitle', 'author', 'genre', 'comments', 'year', 'explicit', 'rating',
             'lastOpened', 'firstOpened')
    for n, value in (('numbers', b'99999999999999999999999'), ('minus', b'-9223372036854775809'),
                     ('nul-first', b'\0rest'), ('blank', b' \t\n'), ('control', b'\x1b[2J\x07'),
                     ('cut', b'gr\xc3'), ('surrogate', b'\xed\xa0\x80'), ('overlong', b'\xc0\xaf'),
                     ('far', b'\xf4\x90\x80\x80'), ('mark', b'\xef\xbb\xbf'),
                     ('dates', b'Friday, Friday, Friday ' * 10), ('slashes', b'//..//')):
        put('xattr-' + n, book().bytes(), 'either', 'every attribute holds ' + n,
            attributes=[(name, value) for name in names])
    for name in names:
        put('xattr-long-' + name, book().bytes(), 'either', 'a long value of ' + name,
            attributes=[(name, b'today 1 ' * 450)])
        put('xattr-raw-' + name, book().bytes(), 'either', 'no text in ' + name, attributes=[(name, b'\xff')])


def main():
    global FOLDER, CANARY
    if len(sys.argv) != 4 or sys.argv[2] != '--canary':
        sys.exit(__doc__)
    FOLDER, CANARY = (os.path.abspath(sys.argv[n]) for n in (1, 3))
    for folder in (FOLDER, CANARY):
        os.makedirs(folder, exist_ok=True)
    with open(CANARY + '/secret.txt', 'w') as file:
        file.write(SECRET + '\n')
    for group in (zips, xmls, plists, folders, attributes):
        group()
    hostile_media.pdfs(put, CANARY)
    hostile_media.m4as(put)
    with open(FOLDER + '/manifest.json', 'w') as file:
        json.dump({'secret': SECRET, 'canary': CANARY, 'assets': ROWS}, file, indent=1)
    print('%d assets' % len(ROWS))


if __name__ == '__main__':
    main()
