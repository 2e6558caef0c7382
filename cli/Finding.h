#pragma once

#include <string>
#include <string_view>

namespace parvel::cli {

/// What endangers an asset, or hinders the library, and what to do about it.
struct Finding {
    std::string_view kind;  ///< one word, for programs
    std::string message;
    std::string advice;
};

}  // namespace parvel::cli
