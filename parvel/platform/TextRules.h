#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

namespace parvel {

/// Unicode rules for UTF-8 text.
class TextRules {
public:
    virtual ~TextRules() = default;

    /// Lower case by the Unicode rules of no particular language. Bytes that are no UTF-8 stay.
    [[nodiscard]] virtual std::string lowercased(std::string_view text) = 0;
    /// The text without what no synchronised storage takes in a file name: unassigned code points,
    /// punctuation, control and format characters, and `/ \ ? % * | " < > : #`. Low line and
    /// hyphen-minus stay. Bytes that are no UTF-8 become U+FFFD.
    [[nodiscard]] virtual std::string withoutForbiddenNameCharacters(std::string_view text) = 0;

    static TextRules& host();
};

/// Appends the character; the code point is at most U+10FFFF and no surrogate.
void appendUTF8(std::string& text, std::uint32_t codePoint);
/// The length in bytes of the character at the front, 0 where none begins there; the text is not
/// empty.
[[nodiscard]] std::size_t utf8SequenceLength(std::string_view text);
[[nodiscard]] bool isValidUTF8(std::string_view text);
/// The text with U+FFFD for each byte that is no part of valid UTF-8.
[[nodiscard]] std::string withReplacedInvalidUTF8(std::string_view text);
/// The length in UTF-16 units of valid UTF-8 text.
[[nodiscard]] std::size_t utf16Length(std::string_view text);
/// The first UTF-16 units of valid UTF-8 text. A cut through a surrogate pair leaves U+FFFD for the
/// half that stays.
[[nodiscard]] std::string utf16Prefix(std::string_view text, std::size_t units);
/// The text with one blank for each run of two or more.
[[nodiscard]] std::string withCollapsedBlanks(std::string_view text);

}  // namespace parvel
