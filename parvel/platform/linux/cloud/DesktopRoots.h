#pragma once

#include <vector>

#include "parvel/platform/linux/Libsystemd.h"
#include "parvel/platform/linux/cloud/SyncedPlace.h"

namespace parvel::host {

/// The folders that the desktop's sync clients announce over D-Bus (the CloudProviders interface of
/// freedesktop.org), asked of every client that has registered itself with a file in a
/// `cloud-providers` folder of `$XDG_DATA_DIRS` and runs. None starts for it. What can't be had
/// before the deadline is left out, and all of it where libsystemd is not complete; that is loaded
/// once a client has registered itself.
[[nodiscard]] std::vector<DesktopRoot> desktopRoots(
    Deadline deadline, const Libsystemd& (*libsystemd)() = Libsystemd::host);

}  // namespace parvel::host
