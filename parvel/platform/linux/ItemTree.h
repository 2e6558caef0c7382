#pragma once

#include <sys/stat.h>

#include <string>

namespace parvel::host {

/// Whole items, files, links and folder trees, by descriptors: no link is followed below the item.
/// Every function gives 0 or the errno value.

/// Copies an item to a name where nothing stands: data, `user.` attributes, what copyStatus gives.
/// A link is copied as a link. A device, pipe or socket is refused with EOPNOTSUPP, a tree deeper
/// than 200 folders with ELOOP. What was made stays after a failure: copy into a staging folder.
[[nodiscard]] int copyTree(const std::string& source, const std::string& destination);

/// Removes an item with all that is in it. `removedAny`, where given, tells whether anything went
/// before a failure; where nothing did, the item is as it was, modes included.
[[nodiscard]] int removeTree(const std::string& path, bool* removedAny = nullptr);

/// Makes the item's name free in one step, then removes the item. Where nothing of it can be
/// removed it stands under its name again; what is left of one that went in part is hidden, and
/// cleared later.
[[nodiscard]] int discardItem(const std::string& path);

/// Writes an item's data and metadata through to the disk.
[[nodiscard]] int syncItem(const std::string& path);
/// Writes a folder's entries through to the disk; a file system that can't is no error.
[[nodiscard]] int syncFolder(const std::string& path);

/// Whether two results of stat are of one item.
[[nodiscard]] inline bool isSameItem(const struct stat& left, const struct stat& right) {
    return left.st_dev == right.st_dev && left.st_ino == right.st_ino;
}

}  // namespace parvel::host
