#pragma once

#include <string>
#include <string_view>

namespace parvel::testing {

inline std::string repeatedText(std::string_view text, int count) {
    std::string result;
    while (count-- > 0)
        result += text;
    return result;
}

}  // namespace parvel::testing
