#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

namespace parvel::cli {

/// One character of UTF-8 text and how many bytes it takes.
struct Character {
    char32_t codePoint;
    std::size_t length;
};

/// The character that begins at the offset; none where the bytes there are no UTF-8 (RFC 3629:
/// nothing overlong, no surrogates, nothing above U+10FFFF).
std::optional<Character> characterAt(std::string_view text, std::size_t offset);

void appendUtf8(char32_t codePoint, std::string& out);

}  // namespace parvel::cli
