#pragma once

#include <optional>
#include <string>

namespace parvel::testing {

/// A folder for everybody on a new file system of the type, mounted for this process and its
/// children alone and the same at every call; none, with the reason, where that can't be.
[[nodiscard]] std::optional<std::string> mountedFileSystem(const std::string& type,
                                                           std::string& reason);

}  // namespace parvel::testing
