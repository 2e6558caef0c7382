#pragma once

#include <fcntl.h>

#include "parvel/platform/linux/FileDescriptor.h"
#include "parvel/platform/linux/SystemCall.h"

namespace parvel::host {

/// Opens a folder by its name in another; none, with errno set, also for what is no folder.
inline FileDescriptor openFolder(int parent, const char* name, int flags) {
    return FileDescriptor(
        retried([&] { return ::openat(parent, name, O_DIRECTORY | O_CLOEXEC | flags); }));
}

/// Opens a file or folder for reading, and waits for nobody; none, with errno set, for a link.
inline FileDescriptor openItem(int folder, const char* name) {
    return FileDescriptor(retried(
        [&] { return ::openat(folder, name, O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC); }));
}

}  // namespace parvel::host
