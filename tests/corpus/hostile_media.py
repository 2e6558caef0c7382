"""The hostile PDFs and audio files of make_hostile.py."""
import struct
import zlib


# -- PDFs

def pdf(objects, trailer='', first='%PDF-1.7\n'):
    """A document of (number, text or bytes) objects with a sound cross-reference table."""
    out, places = bytearray(first.encode()), {}
    for number, content in objects:
        places[number] = len(out)
        content = content if isinstance(content, bytes) else content.encode('latin-1')
        out += b'%d 0 obj\n%s\nendobj\n' % (number, content)
    start, size = len(out), max(places) + 1
    rows = [b'%010d 00000 n \n' % places.get(number, 0) for number in range(1, size)]
    out += b'xref\n0 %d\n0000000000 65535 f \n' % size + b''.join(rows)
    return bytes(out) + (f'trailer\n<</Size {size}/Root 1 0 R{trailer}>>\n'
                         f'startxref\n{start}\n%%EOF\n').encode()


def stream(data, entries=''):
    return b'<<%s/Length %d>>stream\n%s\nendstream' % (entries.encode(), len(data), data)


def page(entries='', content=b'0 0 1 rg 5 5 50 50 re f', box='/MediaBox[0 0 210 290]', more=()):
    """The objects of a document with one page."""
    return [(1, '<</Type/Catalog/Pages 2 0 R>>'), (2, '<</Type/Pages/Kids[3 0 R]/Count 1>>'),
            (3, f'<</Type/Page/Parent 2 0 R/Contents 4 0 R{box}{entries}>>'),
            (4, content if content.startswith(b'<<') else stream(content)), *more]


def with_info(text):
    return pdf(page(more=[(9, text)]), '/Info 9 0 R')


def packed(data, entries=''):
    return stream(zlib.compress(data, 9), '/Filter/FlateDecode' + entries)


def structures(p):
    p('sound', pdf(page()), 'record', 'nothing is wrong')
    p('nul', bytes(100000), 'error', 'a file of zeros')
    p('header', b'%PDF-1.7\n', 'error', 'a header alone')
    p('deep-array', pdf(page(more=[(9, '[' * 100000)]), '/Info 9 0 R'), 'either',
      'arrays nested 100,000 deep')
    p('deep-dictionary', pdf(page(more=[(9, '<</A' * 50000)]), '/Info 9 0 R'), 'either',
      'dictionaries nested 50,000 deep')
    p('prev-loop', pdf(page(), '/Prev 9'), 'either', 'an older cross-reference table that is none')
    p('prev-itself', pdf(page()).replace(b'/Root', b'/Prev 415/Root'), 'either',
      'an older cross-reference table in the middle of the newer')
    p('size', pdf(page()).replace(b'/Size 5', b'/Size 2147483647'), 'either',
      'a table of 2^31 objects')
    p('offset', pdf(page()).replace(b'startxref\n', b'startxref\n99999999999999999999'), 'either',
      'a table beyond every file')
    tree = [(1, '<</Type/Catalog/Pages 2 0 R>>')] + [
        (number, f'<</Type/Pages/Kids[{number + 1} 0 R]/Count 1>>') for number in range(2, 20000)]
    p('deep-pages', pdf(tree + [(20000, '<</Type/Page>>')]), 'either', 'a page tree 20,000 deep')
    p('count', pdf(page()).replace(b'/Count 1', b'/Count 2147483647'), 'either', '2^31 - 1 pages')
    p('count-minus', pdf(page()).replace(b'/Count 1', b'/Count -7'), 'either', 'minus 7 pages')
    p('kids-same', pdf(page()).replace(b'/Kids[3 0 R]', b'/Kids[' + b'3 0 R ' * 100000 + b']'),
      'either', 'one page 100,000 times')
    p('parent-loop', pdf(page(box='').copy()).replace(b'/Type/Pages', b'/Type/Pages/Parent 2 0 R'),
      'either', 'no box to be found up a chain that bites its tail')


def boxes(p):
    for name, box in (('box-none', ''), ('box-two', '/MediaBox[0 0]'),
                      ('box-text', '/MediaBox[(a) (b) (c) (d)]'),
                      ('box-reversed', '/MediaBox[210 290 0 0]'),
                      ('box-minus', '/MediaBox[-1e30 -1e30 1e30 1e30]'),
                      ('box-point', '/MediaBox[7 7 7 7]'), ('box-thin', '/MediaBox[0 0 1e-9 290]'),
                      ('box-number', '/MediaBox[0 0 99999999999999999999 1]'),
                      ('crop-outside', '/MediaBox[0 0 9 9]/CropBox[50 50 90 90]')):
        p(name, pdf(page(box=box)), 'record', 'the box of the page: ' + (box or 'none'))
    for name, rotation in (('turned-45', '45'), ('turned-much', '2147483640'),
                           ('turned-text', '(ninety)'), ('turned-real', '90.5')):
        p(name, pdf(page('/Rotate ' + rotation)), 'record', 'turned by ' + rotation)
    p('unit', pdf(page('/UserUnit 1e12')), 'record', 'a unit of 1e12 points')


def informations(p, canary):
    p('info-long', with_info('<</Author(' + 'x' * 10_000_000 + ')>>'), 'record',
      'an author of 10 MB')
    p('info-itself', with_info('<</Author 9 0 R/Subject 9 0 R/ModDate 9 0 R>>'), 'record',
      'an author that is the dictionary itself')
    p('info-stream', pdf(page(more=[(9, '<</Author 10 0 R>>'), (10, stream(b'x'))]),
                         '/Info 9 0 R'), 'record', 'an author that is a stream')
    p('info-utf16', with_info('<</Author<FEFFD800>/Subject<FEFFDC00DC00>>>'), 'record',
      'halves of surrogate pairs')
    p('info-utf8', with_info('<</Author(\xef\xbb\xbf\xff\xfe\xc0\x80)>>'), 'record',
      'UTF-8 that is none')
    p('info-control', with_info('<</Author(\\033]0;a\\007\\000b)/Subject(../../x)>>'), 'record',
      'an author that talks to a terminal')
    p('info-dates', with_info('<</CreationDate(D:99999999999999)/ModDate(D:' + '9' * 100000 + ')>>'),
      'record', 'dates without end')
    p('external', pdf(page(content=b'<</F(' + canary.encode() + b'/secret.txt)/Length 0>>stream\n'
                                   b'\nendstream')), 'record', 'content that lies in another file')


def drawings(p):
    p('operators', pdf(page(content=packed(b'q ' * 5_000_000))), 'record', '5 million saved states')
    p('filters', pdf(page(content=stream(b'x', '/Filter[' + '/FlateDecode' * 5000 + ']'))),
      'record', '5,000 filters')
    p('predictor', pdf(page(content=packed(b'x', '/DecodeParms<</Predictor 15/Columns 2147483647'
                                                 '/Colors 32/BitsPerComponent 16>>'))), 'record',
      'rows of 2^31 columns')
    pattern = '<</Pattern<</P 5 0 R>>>>'
    p('pattern', pdf(page(
        '/Resources' + pattern, b'/Pattern cs /P scn 0 0 210 290 re f',
        more=[(5, stream(b'/Pattern cs /P scn 0 0 9 9 re f',
                         '/PatternType 1/PaintType 1/TilingType 1/BBox[0 0 1 1]/XStep 1e-7'
                         '/YStep 1e-7/Resources' + pattern))])), 'either',
      'a pattern of itself in steps of nothing')
    p('mask', pdf(page('/Resources<</ExtGState<</G 5 0 R>>>>', b'/G gs 0 0 99 99 re f',
                       more=[(5, '<</SMask<</S/Luminosity/G 6 0 R>>>>'),
                             (6, stream(b'/G gs 0 0 9 9 re f',
                                        '/Subtype/Form/BBox[0 0 9 9]/Group<</S/Transparency>>'
                                        '/Resources<</ExtGState<</G 5 0 R>>>>'))])), 'either',
      'a mask that is masked by itself')
    p('font', pdf(page('/Resources<</Font<</F 5 0 R>>>>', b'BT /F 40 Tf 9 9 Td (a) Tj ET',
                       more=[(5, '<</Type/Font/Subtype/Type3/FontBBox[0 0 1 1]/FirstChar 97'
                                 '/LastChar 97/Widths[1]/FontMatrix[1 0 0 1 0 0]/Encoding'
                                 '<</Differences[97/a]>>/CharProcs<</a 6 0 R>>/Resources<</Font'
                                 '<</F 5 0 R>>>>>>'),
                             (6, stream(b'BT /F 1 Tf (aa) Tj ET'))])), 'either',
      'a letter that writes itself')
    p('font-file', pdf(page('/Resources<</Font<</F 5 0 R>>>>', b'BT /F 40 Tf 9 9 Td (abc) Tj ET',
                            more=[(5, '<</Type/Font/Subtype/TrueType/BaseFont/X/FontDescriptor'
                                      ' 6 0 R>>'),
                                  (6, '<</Type/FontDescriptor/FontName/X/FontFile2 7 0 R>>'),
                                  (7, stream(b'\0\1\0\0\xff\xff' + b'glyf' * 4000))])), 'record',
      'a font of junk')
    p('shading', pdf(page('/Resources<</Shading<</S 5 0 R>>>>', b'/S sh',
                          more=[(5, '<</ShadingType 1/ColorSpace/DeviceRGB/Function 6 0 R>>'),
                                (6, stream(b'x', '/FunctionType 0/Domain[0 1 0 1]/Range[0 1 0 1 0 1]'
                                                 '/Size[65535 65535]/BitsPerSample 32'))])),
      'either', 'a shading of 2^32 samples')
    p('jbig2', pdf(page('/Resources<</XObject<</I 5 0 R>>>>', b'99 0 0 99 0 0 cm /I Do',
                        more=[(5, stream(b'\0\0\0\0\x30\0\1\0\0\0\x13\x7f\xff\xff\xff\x7f\xff\xff\xff',
                                         '/Subtype/Image/Width 2147483647/Height 2147483647'
                                         '/BitsPerComponent 1/ColorSpace/DeviceGray'
                                         '/Filter/JBIG2Decode'))])), 'record',
      'a picture of 2^31 by 2^31 dots')


def encryptions(p):
    for name, entries in (('handler', '/Filter/Unknown/V 9/R 9'),
                          ('v5', '/Filter/Standard/V 5/R 6/O<00>/U<00>/OE<>/UE<>/Perms<>/P 0'),
                          ('length', '/Filter/Standard/V 2/R 3/Length 999999/O(a)/U(b)/P -1')):
        p('encrypt-' + name, pdf(page(), '/Encrypt<<' + entries + '>>/ID[<00><00>]'), 'either',
          'encrypted in a way that does not exist')


def pdfs(put, canary):
    def p(name, data, expect, why):
        put('pdf-' + name, data, expect, why, kind='pdf')

    structures(p)
    boxes(p)
    informations(p, canary)
    drawings(p)
    encryptions(p)


# -- audio files

def atom(name, content, size=None):
    return struct.pack('>I', 8 + len(content) if size is None else size) + name + content


def value(kind, data):
    return atom(b'data', struct.pack('>II', kind, 0) + data)


def audio(items, before=b'', after=b''):
    meta = atom(b'meta', bytes(4) + atom(b'hdlr', bytes(4) + b'\0\0\0\0mdirappl' + bytes(9)) +
                atom(b'ilst', items))
    return (atom(b'ftyp', b'M4A \0\0\0\0') + before + atom(b'moov', atom(b'udta', meta)) + after)


SONG = atom(b'cnID', value(21, struct.pack('>I', 5150)))
TITLE = b'\xa9nam'


def m4as(put):
    def p(name, data, expect, why):
        put('m4a-' + name, data, expect, why, kind='m4a')

    def hole(path):
        with open(path, 'wb') as file:
            file.write(atom(b'ftyp', b'M4A \0\0\0\0') +
                       struct.pack('>I4sQ', 1, b'mdat', 1 << 40))
            file.truncate(16 + (1 << 40))
            file.seek(0, 2)
            file.write(audio(SONG)[16:])

    p('sound', audio(SONG + atom(TITLE, value(1, b'Open'))), 'record', 'nothing is wrong')
    p('hole', hole, 'either', 'a terabyte of nothing before the tags')
    p('size-64', audio(SONG, before=struct.pack('>I4sQ', 1, b'free', 1 << 63)), 'error',
      'an atom of 2^63 bytes')
    p('size-64-small', audio(SONG, before=struct.pack('>I4sQ', 1, b'free', 3)), 'error',
      'an atom smaller than its own head')
    p('atoms', audio(SONG, before=atom(b'free', b'') * 1_000_000), 'either', 'a million empty atoms')
    p('two-movies', audio(b'', after=audio(SONG)[16:]), 'either', 'two movies, the first one bare')
    p('item-bare', audio(atom(TITLE, b'') + SONG), 'record', 'an item without a value')
    p('item-short', audio(atom(TITLE, atom(b'data', b'\0\0')) + SONG), 'record',
      'a value shorter than its type')
    p('item-long', audio(atom(TITLE, atom(b'data', b'\0\0\0\1\0\0\0\0x', 1 << 30)) + SONG), 'either',
      'a value longer than its item')
    p('song-minus', audio(atom(b'cnID', value(21, b'\xff' * 8))), 'record', 'song minus 1')
    p('song-path', audio(atom(b'cnID', value(1, b'1/../../x'))), 'record', 'a song that is a path')
    p('song-wide', audio(atom(b'cnID', value(21, bytes(4000)))), 'either', 'a song of 4,000 bytes')
    p('halves', audio(atom(TITLE, value(2, b'\xd8\0\xd8\0')) + SONG), 'record',
      'halves of surrogate pairs')
    p('title-long', audio(atom(TITLE, value(1, b'x' * (8 << 20))) + SONG), 'record',
      'a title of 8 MiB')
    p('cover-long', audio(atom(b'covr', value(14, bytes(70 << 20))) + SONG), 'record',
      'a cover of 70 MiB')
    nested = SONG
    for _ in range(20000):
        nested = atom(b'meta', nested)
    p('nested', audio(nested), 'error', 'boxes in boxes, 20,000 deep')
