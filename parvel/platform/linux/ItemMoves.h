#pragma once

#include <string>

#include "parvel/platform/FileSystemService.h"

namespace parvel::host {

/// Moves and replacements of whole items by path. Every function gives 0 or the errno value, and
/// has synced what it published when it gives 0.

/// Moves to a name where nothing stands, EEXIST otherwise, whatever the two file systems can do.
[[nodiscard]] int moveExclusively(const std::string& source, const std::string& destination);

/// Copies to a name where nothing stands; the copy appears whole or not at all.
[[nodiscard]] int copyExclusively(const std::string& source, const std::string& destination);

/// Whether the replacement is a link that leads to the existing item or below it: in that place it
/// would lead nowhere, and what it led to would be gone.
[[nodiscard]] bool isLinkInto(const std::string& existing, const std::string& replacement);

/// Puts the replacement in the existing item's place, and moves it there when nothing stands there.
/// EINVAL for a link into the existing item. Where the file system can't exchange two names, the
/// old item steps aside as `.parvel-aside-<random>`; it is left so, whole, by a kill in between,
/// and where the step and then, twice, the way back fail.
[[nodiscard]] int replace(const std::string& existing, const std::string& replacement,
                          ReplaceOptions options);

}  // namespace parvel::host
