#pragma once

#include <sys/stat.h>

#include <cstdint>
#include <functional>

namespace parvel::host {

/// What makes up a single file or folder, copied from one open descriptor to another. Every
/// function gives 0 or the errno value.

/// Told how many bytes are copied after each piece of at most 1 MiB, or 16 where they are shared;
/// ends the copy with anything but 0.
using PieceReport = std::function<int(std::uint64_t copied)>;

/// Copies a regular file to its end, into an empty one, sharing the bytes on disk where the file
/// system can. EIO where it does not have the size that is expected of it.
[[nodiscard]] int copyContent(int from, int to, std::uint64_t size,
                              const PieceReport& report = nullptr);

/// Copies the `user.` attributes, or those that are missing there. File systems without attributes
/// lose them; what can't be read is an error.
[[nodiscard]] int copyAttributes(int from, int to, bool onlyMissing = false);

/// Whether one has every attribute that the other has, whatever its value; false where either can't
/// be told.
[[nodiscard]] bool hasAttributesOf(int from, int to);

/// Gives it the owner and group, or the group alone, as far as this process may; a host that
/// refuses is no error. The descriptor may be one for the path alone.
[[nodiscard]] int copyOwner(const struct stat& status, int to);

/// Gives it owner and group as copyOwner does, the access list, or none, and the mode without
/// set-id bits. Nobody is let in whom the other kept out: without its group, the group and all
/// others are left what both of them had; without its access list, or with one but without its
/// group, the owner alone is left his.
[[nodiscard]] int copyAccess(int from, const struct stat& status, int to);

/// Whether both have the same access list, or none; false where that can't be told.
[[nodiscard]] bool haveSameAccessList(int left, int right);

/// Gives it what copyAccess does, and the times.
[[nodiscard]] int copyStatus(int from, const struct stat& status, int to);

}  // namespace parvel::host
