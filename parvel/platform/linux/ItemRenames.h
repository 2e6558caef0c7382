#pragma once

#include <sys/stat.h>

#include <string>

namespace parvel::host {

/// Renames of whole items by path. Every function gives 0 or the errno value, and leaves the item
/// where it was after a failure.

/// Renames to a name where nothing stands, EEXIST otherwise, also where the file system's rename
/// can't refuse a taken name: then an empty item holds the name meanwhile, and stays where it can't
/// be removed after a failure. A folder of the user's own that forbids changes, and so another
/// parent, is opened to him for the step. EXDEV between two file systems.
[[nodiscard]] int renameExclusively(const std::string& source, const std::string& destination);

/// Renames over whatever stands there that may be replaced so.
[[nodiscard]] int plainRename(const std::string& source, const std::string& destination);

/// Gives each of two items the other's name, in one step; EINVAL, ENOSYS or ENOTSUP where the file
/// system can't.
[[nodiscard]] int exchangeNames(const std::string& left, const std::string& right);

/// Whether an error says that the file system's rename can't refuse or exchange names.
[[nodiscard]] bool isFlagUnsupported(int error);
/// Whether an error says that the file system gives no file a second name, or this one no more.
[[nodiscard]] bool isLinkUnsupported(int error);

/// Whether it is a folder, or one of the user's own that forbids changes even to him.
[[nodiscard]] bool isFolder(const std::string& path);
[[nodiscard]] bool isClosedFolder(const std::string& path);

/// The result of lstat.
[[nodiscard]] int itemStatus(const std::string& path, struct stat& result);

}  // namespace parvel::host
