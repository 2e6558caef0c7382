#pragma once

#include <memory>

#include "parvel/foundation/PVExport.h"
#include "parvel/platform/FileCoordinator.h"
#include "parvel/platform/FileSystemService.h"

namespace parvel {

/// Tells what file operations would come to, and touches nothing: `--dry-run` stands on it.
///
/// Its file-system service answers as the host's would, with the same results and errors, and
/// remembers what would have changed, so that the next operation finds it so. Its coordinator waits
/// for nobody. While it lives, the attributes, modes and files that the library writes on any
/// thread are remembered instead of written, too, and a book is copied or expanded into a folder of
/// the system's temporary directory that goes with the rehearsal.
///
///     Rehearsal rehearsal;
///     const auto manager =
///         PVAssetMetadataFileManager::initWithFileManager(rehearsal.fileManager());
///     manager->setFileCoordinator(rehearsal.fileCoordinator());
///
/// What only the act itself would tell stays unforeseen: a competitor, a failing disk. Nothing is
/// downloaded, and what would have to be counts as not coming. A file's content is read where it
/// lies, so an item that only would have been moved is to be inspected at its old place. One at a
/// time in a process; its services may be called from any thread.
class PV_EXPORT Rehearsal {
public:
    Rehearsal();
    ~Rehearsal();
    Rehearsal(const Rehearsal&) = delete;
    Rehearsal& operator=(const Rehearsal&) = delete;

    [[nodiscard]] std::shared_ptr<FileSystemService> fileManager() const;
    [[nodiscard]] std::shared_ptr<FileCoordinator> fileCoordinator() const;

private:
    struct Services;
    std::unique_ptr<Services> m_services;
};

}  // namespace parvel
