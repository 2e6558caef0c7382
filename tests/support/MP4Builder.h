#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace parvel::testing::mp4 {

inline std::string number(std::uint64_t value, int bytes) {
    std::string text;
    for (int i = bytes - 1; i >= 0; --i)
        text += static_cast<char>(value >> (8 * i));
    return text;
}

/// An atom with a 32-bit size.
inline std::string atom(std::string_view name, const std::string& content) {
    return number(content.size() + 8, 4) + std::string(name) + content;
}

/// The same with a 64-bit size.
inline std::string largeAtom(std::string_view name, const std::string& content) {
    return number(1, 4) + std::string(name) + number(content.size() + 16, 8) + content;
}

inline std::string dataAtom(unsigned type, const std::string& value) {
    return atom("data", number(type, 4) + number(0, 4) + value);
}

inline std::string item(std::string_view name, unsigned type, const std::string& value) {
    return atom(name, dataAtom(type, value));
}

inline const std::string kArtist =
    "\xA9"
    "ART";
inline const std::string kSongName =
    "\xA9"
    "nam";

/// moov/udta/meta/ilst, "meta" with its version and flags.
inline std::string movie(const std::string& items) {
    return atom("moov",
                atom("udta", atom("meta", number(0, 4) + atom("hdlr", std::string(25, '\0')) +
                                              atom("ilst", items))));
}

inline std::string file(const std::string& items) {
    return atom("ftyp", "M4A " + number(0, 4)) + movie(items);
}

}  // namespace parvel::testing::mp4
