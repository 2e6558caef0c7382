"""What a PDF of the corpus must give (make_expectations.py), as pikepdf reads it."""
import datetime
import hashlib
import math
import os
import re

import pikepdf

COVER = (340.0, 380.0)
BLANK_PAGE = (266, 380)
CORRUPT = {'domain': 'PVFileErrorDomain', 'code': 259, 'url': True}

# Damaged files on which readers disagree: what one makes of them is a guess.
DISPUTED = (
    'malformed/PdfPig__Single Page Broken Offsets - from google drive.pdf',
    'malformed/PdfPig__SpecificTestDocuments_Hang.pdf',
    'malformed/PdfPig__SpecificTestDocuments_invalid-xref-loop.pdf',
    'malformed/PdfPig__SpecificTestDocuments_pages-indirect-to-null.pdf',
    'malformed/pdf-lib__invalid_root_ref.pdf',
    'malformed/pdf-lib__missing_xref_trailer_dict.pdf',
)
# A page count without such a page: the leaf of the page tree is no page.
PAGELESS = 'pdf/PdfPig__SpecificTestDocuments_pages-kids-not-page.pdf'
# Years after 1999 written by a program that counted from 1900.
ODD_DATES = {'D:191001004080857': datetime.datetime(2000, 10, 4, 8, 8, 57)}

DATE = re.compile(r"(?:D:)?(\d{4})(\d\d)?(\d\d)?(\d\d)?(\d\d)?(\d\d)?"
                  r"(?:Z.*|([+-])(\d\d)'?(\d\d)?'?)?$")


def date_of(text):
    """A date without zone is taken for UTC."""
    if text is None or text in ODD_DATES:
        return ODD_DATES.get(text)
    match = DATE.match(text)
    if not match:
        return None
    fields = [int(field) for field in match.groups()[:6] if field]
    fields += [1] * (3 - len(fields)) + [0] * (6 - max(len(fields), 3))
    try:
        date = datetime.datetime(*fields)
    except ValueError:
        return None
    sign, hours, minutes = match.groups()[6:]
    offset = datetime.timedelta(hours=int(hours or 0), minutes=int(minutes or 0))
    return date - offset if sign == '+' else date + offset


def inherited(page, key):
    while page is not None:
        if key in page:
            return page[key]
        page = page.get('/Parent')
    return None


def cover_size(page):
    """The crop box as far as it lies in the media box, drawn as large as the cover takes it."""
    media = [float(number) for number in inherited(page, '/MediaBox')]
    crop = [float(number) for number in inherited(page, '/CropBox') or media]
    left, bottom = max(crop[0], media[0]), max(crop[1], media[1])
    width, height = min(crop[2], media[2]) - left, min(crop[3], media[3]) - bottom
    scale = min(COVER[0] / width, COVER[1] / height)
    size = [math.floor(width * scale), math.floor(height * scale)]
    return size[::-1] if int(inherited(page, '/Rotate') or 0) % 180 else size


def text_of(information, key):
    return str(information[key]) if key in information else None


def content_of(path, name):
    """The entries that the document itself gives, and the size of its cover."""
    try:
        document = pikepdf.open(path)
    except pikepdf.PasswordError:
        return {'PVIsLocked': True, 'pageCount': 0}, None
    information = document.docinfo
    modified = date_of(text_of(information, '/ModDate'))
    entries = {
        'artistName': text_of(information, '/Author'),
        'genre': text_of(information, '/Subject'),
        'updateDate': modified,
        'modificationDate': modified,
        'releaseDate': date_of(text_of(information, '/CreationDate')),
        'PVIsLocked': False,
        'pageCount': len(document.pages),
    }
    if not document.pages:
        return entries, None
    return entries, BLANK_PAGE if name == PAGELESS else cover_size(document.pages[0].obj)


def row(root, name, attribute_record):
    if name in DISPUTED:
        return {'either': True, 'error': CORRUPT}
    path = os.path.join(root, name)
    try:
        entries, cover = content_of(path, name)
    except pikepdf.PdfError:
        return {'error': CORRUPT}
    with open(path, 'rb') as file:
        entries['PVGeneratedItemId'] = hashlib.md5(file.read()).hexdigest().upper()
    entries['itemName'] = os.path.splitext(os.path.basename(name))[0]
    entries.update(attribute_record)
    return {'record': {key: value for key, value in entries.items() if value is not None},
            'withCover': {'PVCoverImageData': {'$png': list(cover)}} if cover else {}}
