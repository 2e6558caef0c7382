#include "parvel/platform/TextRules.h"

#include <algorithm>
#include <cstdint>
#include <cstring>

namespace parvel {
namespace {

/// How many of the text's first bytes are ASCII, at least; quick over long stretches.
std::size_t asciiStretch(std::string_view text) {
    constexpr std::uint64_t kHighBits = 0x8080808080808080;
    std::size_t length = 0;
    for (std::uint64_t word = 0; text.size() - length >= sizeof word; length += sizeof word) {
        std::memcpy(&word, text.data() + length, sizeof word);
        if ((word & kHighBits) != 0)
            break;
    }
    return length;
}

bool isContinuation(std::string_view text, std::size_t index, unsigned least = 0x80,
                    unsigned most = 0xBF) {
    if (index >= text.size())
        return false;
    const auto byte = static_cast<unsigned char>(text[index]);
    return byte >= least && byte <= most;
}

}  // namespace

// RFC 3629; table 3-7 of the Unicode standard.
std::size_t utf8SequenceLength(std::string_view text) {
    const auto first = static_cast<unsigned char>(text.front());
    if (first < 0x80)
        return 1;
    if (first >= 0xC2 && first <= 0xDF)
        return isContinuation(text, 1) ? 2 : 0;
    if (first >= 0xE0 && first <= 0xEF) {
        const unsigned least = first == 0xE0 ? 0xA0 : 0x80;  // no overlong forms
        const unsigned most = first == 0xED ? 0x9F : 0xBF;   // no surrogates
        return isContinuation(text, 1, least, most) && isContinuation(text, 2) ? 3 : 0;
    }
    if (first >= 0xF0 && first <= 0xF4) {
        const unsigned least = first == 0xF0 ? 0x90 : 0x80;
        const unsigned most = first == 0xF4 ? 0x8F : 0xBF;  // none above U+10FFFF
        const bool isWhole = isContinuation(text, 1, least, most) && isContinuation(text, 2) &&
                             isContinuation(text, 3);
        return isWhole ? 4 : 0;
    }
    return 0;
}

namespace {

/// The length of the valid UTF-8 that the text begins with.
std::size_t validStretch(std::string_view text) {
    std::size_t length = 0;
    while (length < text.size()) {
        length += asciiStretch(text.substr(length));
        if (length == text.size())
            break;
        const std::size_t sequence = utf8SequenceLength(text.substr(length));
        if (sequence == 0)
            break;
        length += sequence;
    }
    return length;
}

}  // namespace

void appendUTF8(std::string& text, std::uint32_t codePoint) {
    const auto byte = [&](std::uint32_t bits) { text += static_cast<char>(bits); };
    const auto tail = [&](int shift) { byte(0x80 | (codePoint >> shift & 0x3F)); };
    if (codePoint < 0x80) {
        byte(codePoint);
    } else if (codePoint < 0x800) {
        byte(0xC0 | codePoint >> 6);
        tail(0);
    } else if (codePoint < 0x10000) {
        byte(0xE0 | codePoint >> 12);
        tail(6);
        tail(0);
    } else {
        byte(0xF0 | codePoint >> 18);
        tail(12);
        tail(6);
        tail(0);
    }
}

bool isValidUTF8(std::string_view text) {
    return validStretch(text) == text.size();
}

std::string withReplacedInvalidUTF8(std::string_view text) {
    std::string valid;
    valid.reserve(text.size());
    while (!text.empty()) {
        const std::size_t length = validStretch(text);
        valid.append(text.substr(0, length));
        text.remove_prefix(length);
        if (!text.empty()) {
            valid.append("\xEF\xBF\xBD");
            text.remove_prefix(1);
        }
    }
    return valid;
}

std::size_t utf16Length(std::string_view text) {
    std::size_t length = 0;
    for (char character : text) {
        const auto byte = static_cast<unsigned char>(character);
        const bool isContinuationByte = (byte & 0xC0) == 0x80;
        length += (isContinuationByte ? 0U : 1U) + (byte >= 0xF0 ? 1U : 0U);
    }
    return length;
}

std::string utf16Prefix(std::string_view text, std::size_t units) {
    std::string prefix;
    std::size_t used = 0;
    for (std::size_t at = 0; at < text.size() && used < units;) {
        const std::size_t length = std::max<std::size_t>(utf8SequenceLength(text.substr(at)), 1);
        const std::size_t taken = length == 4 ? 2 : 1;
        if (used + taken > units)
            return prefix + "\xEF\xBF\xBD";
        prefix.append(text.substr(at, length));
        used += taken;
        at += length;
    }
    return prefix;
}

std::string withCollapsedBlanks(std::string_view text) {
    std::string collapsed;
    for (const char character : text) {
        if (character != ' ' || !collapsed.ends_with(' '))
            collapsed += character;
    }
    return collapsed;
}

}  // namespace parvel
