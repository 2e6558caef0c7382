#pragma once

#include <string>

#include "parvel/platform/ArchiveCopier.h"
#include "parvel/platform/linux/CopierReports.h"

namespace parvel::host {

/// The files and links of a folder's tree; what the archive copier says holds.
[[nodiscard]] ArchiveCopier::Count countPackage(const std::string& folder,
                                                const CopierReports& reports);

/// Copies a folder's tree into a new folder. 0 or the errno value, told already.
[[nodiscard]] int copyPackage(const std::string& source, const std::string& destination,
                              const CopierReports& reports);

/// Whether a link that stands so many folders deep in a package leads to a place inside it, by its
/// text: not absolute, and with ".." at its start alone, where it can't lead past another link.
[[nodiscard]] bool linkStaysInside(const std::string& target, int depth);

}  // namespace parvel::host
