#pragma once

#include <string>

namespace parvel::host {

/// The freedesktop.org Trash, specification 1.0. Every function gives 0 or the errno value.

/// Moves an item to the home trash when it lies on that trash's file system, else to its volume's
/// own trash, else by copy to the home trash; `resulting` is its place there. The info file is made
/// first, exclusively, and goes again when the move fails. ENOENT for a missing item.
[[nodiscard]] int trashItem(const std::string& item, std::string& resulting);

/// Whether the item lies in a trash's "files" folder and has its info file there.
[[nodiscard]] bool isTrashed(const std::string& item);

/// Moves a trashed item. Within its trash the info file is renamed before it and comes back when
/// the move fails; of an item that leaves the trash it goes after the move.
[[nodiscard]] int moveTrashed(const std::string& source, const std::string& destination);

}  // namespace parvel::host
