#pragma once

#include <string>
#include <vector>

#include "parvel/foundation/PVExport.h"
#include "parvel/foundation/URL.h"

namespace parvel {

/// An item that this library's file-system service put into the user's trash.
struct TrashedItem {
    URL place;              ///< where it lies now; a move from there takes it out of the trash
    URL original;           ///< where it lay
    std::string trashedAt;  ///< local time, "2001-01-01T00:00:00"; empty where that is not known
};

/// Those that lie in the home trash and in the trash folders of the mounted volumes, the last one
/// trashed at the end. Folders that can't be read, and items that others put there, are left out.
[[nodiscard]] PV_EXPORT std::vector<TrashedItem> trashedItems();

}  // namespace parvel
