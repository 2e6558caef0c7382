#pragma once

#include <stdlib.h>
#include <sys/stat.h>

#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "parvel/foundation/URL.h"

namespace parvel::host {

/// The folder that an item stands in, as a path that can be opened.
inline std::string parentFolderOf(const std::string& path) {
    const std::string_view parent = pathWithoutLastComponent(path);
    return parent.empty() ? std::string(path.starts_with('/') ? "/" : ".") : std::string(parent);
}

/// The absolute path with every link on it resolved; none, with errno set, where nothing stands.
inline std::optional<std::string> canonicalPath(const std::string& path) {
    const std::unique_ptr<char, void (*)(void*)> canonical(::realpath(path.c_str(), nullptr),
                                                           &::free);
    return canonical ? std::optional<std::string>(canonical.get()) : std::nullopt;
}

/// Whether anything stands at the path, a dangling link included.
inline bool itemStandsAt(const std::string& path) {
    struct stat status {};
    return ::lstat(path.c_str(), &status) == 0;
}

/// Whether the path lies below the folder, by their texts.
inline bool isBelow(std::string_view path, std::string_view folder) {
    return path.size() > folder.size() && path.starts_with(folder) &&
           (folder.ends_with('/') || path[folder.size()] == '/');
}

}  // namespace parvel::host
