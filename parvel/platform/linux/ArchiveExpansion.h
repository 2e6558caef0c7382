#pragma once

#include <sys/stat.h>

#include <cstdint>
#include <memory>
#include <string>

#include "parvel/platform/ArchiveCopier.h"
#include "parvel/platform/linux/ArchiveEntries.h"
#include "parvel/platform/linux/CopierReports.h"
#include "parvel/platform/linux/FileDescriptor.h"

namespace parvel::host {

/// An archive that is counted and expanded with its directory read once.
class SourceArchive {
public:
    /// Null with the errno value, told nobody: EBADMSG for what is no archive.
    [[nodiscard]] static std::unique_ptr<SourceArchive> open(const std::string& path,
                                                             const CopierReports& reports,
                                                             int& error);

    /// Whether the path names the same file still, unchanged as far as its times tell.
    [[nodiscard]] bool isStillAt(const std::string& path) const;
    [[nodiscard]] std::uint64_t size() const {
        return static_cast<std::uint64_t>(m_status.st_size);
    }
    [[nodiscard]] const struct stat& status() const { return m_status; }
    [[nodiscard]] ArchiveEntries& entries() { return *m_entries; }

private:
    FileDescriptor m_file;
    struct stat m_status {};
    std::unique_ptr<ArchiveEntries> m_entries;
};

/// The archive's entries that are no folders; what the archive copier says holds.
[[nodiscard]] ArchiveCopier::Count countArchiveEntries(SourceArchive& source,
                                                       const CopierReports& reports);

/// Expands the archive into a new folder. 0 or the errno value, told already.
[[nodiscard]] int expandArchive(SourceArchive& source, const std::string& destination,
                                const CopierReports& reports);

}  // namespace parvel::host
