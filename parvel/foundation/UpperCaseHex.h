#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "parvel/foundation/Data.h"

namespace parvel {

/// Two hexadecimal digits for each byte, in order.
[[nodiscard]] inline std::string upperCaseHex(Data::Bytes bytes) {
    constexpr std::string_view kDigits = "0123456789ABCDEF";
    std::string text;
    text.reserve(2 * bytes.size());
    for (const std::uint8_t byte : bytes) {
        text += kDigits[byte >> 4];
        text += kDigits[byte & 15];
    }
    return text;
}

}  // namespace parvel
