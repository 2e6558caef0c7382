#pragma once

#include <string_view>

namespace parvel::cli {

/// The only keys of the dictionaries that stand for values which JSON has no form for.
inline constexpr std::string_view kDateMark = "$date";
inline constexpr std::string_view kDataMark = "$data";
inline constexpr std::string_view kRealMark = "$real";

/// Whether a key, alone in its dictionary, is a mark or a mark with further `$` before it. Such a
/// key of a real dictionary is written with one more.
inline bool isMarkOrEscapedMark(std::string_view key) {
    const std::size_t dollars = key.find_first_not_of('$');
    if (dollars == 0 || dollars == std::string_view::npos)
        return false;
    const std::string_view mark = key.substr(dollars - 1);
    return mark == kDateMark || mark == kDataMark || mark == kRealMark;
}

}  // namespace parvel::cli
