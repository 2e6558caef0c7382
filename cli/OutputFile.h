#pragma once

#include <string>
#include <string_view>

namespace parvel::cli {

/// Writes a file that the person named, whole or not at all: in a hidden folder at first, from
/// where it takes its place, with the permissions of the file that stands there. What a link leads
/// to is replaced, not the link. What is no regular file, a pipe or a device, is written to as it
/// stands. Gives the errno of the failed step, else 0.
[[nodiscard]] int writeFile(const std::string& path, std::string_view bytes);

}  // namespace parvel::cli
