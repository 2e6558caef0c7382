#pragma once

#include "parvel/platform/linux/FileDescriptor.h"

namespace parvel::host {

/// Opens a file at a relative path below a directory. No link on the way is followed and nothing
/// outside the directory is reached: ELOOP for a link, EXDEV for a path that is absolute or leaves
/// the directory, though it come back. Not open, with errno set, when it can't be opened.
[[nodiscard]] FileDescriptor openBeneath(int directory, const char* path, int flags);

/// The same, one component after the other, for kernels and filters that refuse openat2.
[[nodiscard]] FileDescriptor openBeneathByComponents(int directory, const char* path, int flags);

}  // namespace parvel::host
