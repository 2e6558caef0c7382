#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "parvel/platform/linux/TrashFolders.h"

namespace parvel::host {

/// What an info file says of its item.
struct TrashInfo {
    std::string original;      ///< the absolute path that the item had
    std::string deletionDate;  ///< local time, as it stands there
    bool isOurs = false;       ///< this library put the item there
};

/// Makes the info file of an item with that absolute path, exclusively, and writes it to the disk.
/// 0 or the errno value.
[[nodiscard]] int writeTrashInfo(const std::string& file, const TrashFolder& trash,
                                 std::string_view absolute);

/// None for a file that can't be read, is too long, or is no info file.
[[nodiscard]] std::optional<TrashInfo> readTrashInfo(const std::string& file,
                                                     const TrashFolder& trash);

}  // namespace parvel::host
