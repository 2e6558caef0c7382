#pragma once

#include <sys/stat.h>

#include <memory>
#include <string>

#include "parvel/platform/linux/FileDescriptor.h"

namespace parvel::host {

/// A file or folder that is open for reading. Its offset is shared with whoever else reads it, so
/// it is read by `pread` alone.
struct OpenItem {
    FileDescriptor descriptor;
    struct stat status = {};  ///< when it was opened
};

/// What this thread holds at the path, else the item opened anew, links followed. Opening never
/// waits, not for a FIFO's writer either. Null, with errno set, where it can't be opened.
[[nodiscard]] std::shared_ptr<const OpenItem> heldOrOpened(const std::string& path);

}  // namespace parvel::host
