#pragma once

#include <string>
#include <string_view>

namespace parvel::reader {

/// A text of a document as UTF-8, up to the first NUL, from the 16-bit units that the PDF library
/// gives for it: those of a text in UTF-16, else its bytes. The bytes are UTF-8 behind a byte order
/// mark (ISO 32000-2, 7.9.2.2), else in PDFDocEncoding. What is neither a character of its encoding
/// nor whole becomes U+FFFD.
///
/// A text in UTF-16 can't be told from bytes when it holds nothing above U+00FF. So 0xA0 is taken
/// for PDFDocEncoding's euro sign only beside a byte that would be a control character in UTF-16;
/// else it is left a no-break space, which such texts have far oftener.
[[nodiscard]] std::string utf8OfPdfText(std::u16string_view units);

}  // namespace parvel::reader
