#pragma once

#include <sys/stat.h>
#include <unistd.h>

#include "parvel/platform/linux/ItemContent.h"

namespace parvel::host {

/// Gives what is made to the archive's owner and group, where this process is root's: everybody
/// else's new items are his, in the group that new items have there.
class ArchiveOwner {
public:
    /// Nothing is left to give where the new folder, in which all is made, is theirs as it is: what
    /// is made in it has its owner and group, too.
    ArchiveOwner(const struct stat& archive, int newFolder)
        : m_archive(archive), m_hasToGive(::geteuid() == 0 && !isTheirs(newFolder)) {}

    /// 0 or the errno value; a file system that refuses is no error.
    [[nodiscard]] int give(int item) const { return m_hasToGive ? copyOwner(m_archive, item) : 0; }

private:
    [[nodiscard]] bool isTheirs(int item) const {
        struct stat status {};
        return ::fstat(item, &status) == 0 && status.st_uid == m_archive.st_uid &&
               status.st_gid == m_archive.st_gid;
    }

    const struct stat& m_archive;
    bool m_hasToGive;
};

}  // namespace parvel::host
