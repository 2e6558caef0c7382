#pragma once

#include <cstddef>
#include <optional>
#include <string>

namespace parvel::cli {

/// The whole file of a command line, "-" being standard input; none with the reason in `problem`. A
/// file that is longer, be it a device without end, is too large.
std::optional<std::string> contentsOfFile(const std::string& path, std::size_t longest,
                                          std::string& problem);

}  // namespace parvel::cli
