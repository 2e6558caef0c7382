#include "reader/PdfText.h"

#include <algorithm>
#include <array>
#include <cstdint>

#include "parvel/platform/TextRules.h"

namespace parvel::reader {

namespace {

constexpr std::u16string_view utf8Mark = u"\u00EF\u00BB\u00BF";
constexpr char16_t replacement = 0xFFFD;

/// PDFDocEncoding where it is not Latin-1 (ISO 32000, annex D.2).
constexpr std::array<char16_t, 8> from18{0x02D8, 0x02C7, 0x02C6, 0x02D9,
                                         0x02DD, 0x02DB, 0x02DA, 0x02DC};
constexpr std::array<char16_t, 32> from80{
    0x2022, 0x2020, 0x2021, 0x2026, 0x2014, 0x2013, 0x0192, 0x2044, 0x2039, 0x203A,     0x2212,
    0x2030, 0x201E, 0x201C, 0x201D, 0x2018, 0x2019, 0x201A, 0x2122, 0xFB01, 0xFB02,     0x0141,
    0x0152, 0x0160, 0x0178, 0x017D, 0x0131, 0x0142, 0x0153, 0x0161, 0x017E, replacement};

constexpr char16_t euroByte = 0xA0;
constexpr char16_t euroSign = 0x20AC;

/// A character in PDFDocEncoding that no text in UTF-16 has.
bool isOfPdfDocEncodingAlone(char16_t unit) {
    return (unit >= 0x18 && unit < 0x20) || (unit >= 0x80 && unit < 0xA0);
}

char16_t ofPdfDocEncoding(char16_t byte) {
    if (!isOfPdfDocEncodingAlone(byte))
        return byte;
    return byte < 0x80 ? from18[byte - 0x18] : from80[byte - 0x80];
}

bool isHighHalf(char16_t unit) {
    return unit >= 0xD800 && unit < 0xDC00;
}

bool isLowHalf(char16_t unit) {
    return unit >= 0xDC00 && unit < 0xE000;
}

std::string utf8OfUTF16(std::u16string_view units) {
    std::string text;
    text.reserve(units.size());
    for (std::size_t i = 0; i < units.size(); ++i) {
        std::uint32_t codePoint = units[i];
        if (isHighHalf(units[i]) && i + 1 < units.size() && isLowHalf(units[i + 1])) {
            codePoint = 0x10000 + ((codePoint - 0xD800) << 10) + (units[i + 1] - 0xDC00u);
            ++i;
        } else if (isHighHalf(units[i]) || isLowHalf(units[i])) {
            codePoint = replacement;
        }
        appendUTF8(text, codePoint);
    }
    return text;
}

}  // namespace

std::string utf8OfPdfText(std::u16string_view units) {
    units = units.substr(0, units.find(u'\0'));
    if (std::any_of(units.begin(), units.end(), [](char16_t unit) { return unit > 0xFF; }))
        return utf8OfUTF16(units);
    if (units.starts_with(utf8Mark))
        return withReplacedInvalidUTF8(std::string(units.begin() + utf8Mark.size(), units.end()));
    std::u16string decoded(units);
    if (std::any_of(units.begin(), units.end(), isOfPdfDocEncodingAlone))
        std::replace(decoded.begin(), decoded.end(), euroByte, euroSign);
    std::transform(decoded.begin(), decoded.end(), decoded.begin(), ofPdfDocEncoding);
    return utf8OfUTF16(decoded);
}

}  // namespace parvel::reader
