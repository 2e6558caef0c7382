#pragma once

#include <sys/stat.h>

#include <optional>
#include <string>
#include <vector>

#include "parvel/platform/linux/cloud/SyncClient.h"

namespace parvel::host {

/// Whose mark stands in the root of synchronised storage.
enum class SyncMark {
    None,
    Syncthing,
    Nextcloud,
    Desktop,  ///< no mark on disk: the desktop tells of the folder
};

/// A folder that the desktop says is kept in step.
struct DesktopRoot {
    std::string path;
    std::string client;  ///< what a person knows it by
    struct stat status;
};

/// Where an item lies.
struct SyncedPlace {
    SyncMark mark = SyncMark::None;
    std::string markName;
    SyncedItem item;      ///< empty outside of synchronised storage
    struct stat root {};  ///< of the root
    std::string client;   ///< of a root of the desktop's
};

/// The nearest root above the item, by the marks on the disk. None, with errno set, when the item's
/// own folder or the way up from it can't be reached; outside of every root, a place without mark.
[[nodiscard]] std::optional<SyncedPlace> markedPlaceOf(const std::string& path);
/// The same by these folders alone.
[[nodiscard]] std::optional<SyncedPlace> desktopPlaceOf(const std::string& path,
                                                        const std::vector<DesktopRoot>& desktop);

/// The outermost marked root that the folder is or lies below, links resolved; none elsewhere.
[[nodiscard]] std::optional<std::string> markedRootAbove(const std::string& folder);

}  // namespace parvel::host
