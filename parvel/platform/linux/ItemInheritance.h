#pragma once

#include <string>

namespace parvel::host {

/// What an item that takes another's place takes over from it: those of its `user.` attributes that
/// it lacks; the owner and group, a folder's members included; and, where both are files or both
/// folders, the access list and the mode. So a book that root rewrites stays its owner's. Where a
/// process may not keep all of that, ItemContent.h says what remains.

/// Whether the new item lacks anything of that, or it can't be told.
[[nodiscard]] bool hasToInherit(const std::string& oldItem, const std::string& newItem);

/// Puts it on the new item, which is to be one that nobody else has seen yet. 0 or the errno value.
[[nodiscard]] int inheritMetadata(const std::string& oldItem, const std::string& newItem);

}  // namespace parvel::host
