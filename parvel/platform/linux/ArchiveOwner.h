#pragma once

#include <sys/stat.h>
#include <unistd.h>

#include "parvel/platform/linux/ItemContent.h"

namespace parvel::host {

/// Gives what is made to the archive's owner and group, where this process is root's: everybody
/// else's new items are his, in the group that new items have there.
class ArchiveOwner {
public:
    explicit ArchiveOwner(const struct stat& archive) : m_archive(archive) {}

    /// 0 or the errno value; a file system that refuses is no error.
    [[nodiscard]] int give(int item) const { return m_isRoot ? copyOwner(m_archive, item) : 0; }

private:
    const struct stat& m_archive;
    bool m_isRoot = ::geteuid() == 0;
};

}  // namespace parvel::host
