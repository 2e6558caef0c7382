#pragma once

#include <string>

#include "parvel/platform/ArchiveCopier.h"
#include "parvel/platform/linux/CopierReports.h"

namespace parvel::host {

/// The archive's entries that are no folders; what the archive copier says holds.
[[nodiscard]] ArchiveCopier::Count countArchiveEntries(const std::string& archive,
                                                       const CopierReports& reports);

/// Expands the archive into a new folder. 0 or the errno value, told already.
[[nodiscard]] int expandArchive(const std::string& archive, const std::string& destination,
                                const CopierReports& reports);

}  // namespace parvel::host
