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

/// Gives it owner and group as far as allowed, the mode without set-id bits, and the times.
[[nodiscard]] int copyStatus(const struct stat& status, int to);

}  // namespace parvel::host
