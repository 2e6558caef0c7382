#pragma once

#include <memory>

#include "cli/CommandLine.h"
#include "parvel/filemanager/PVAssetMetadataFileManager.h"
#include "parvel/platform/Rehearsal.h"

namespace parvel::cli {

/// What a command changes files with: the disk, or a rehearsal that touches nothing.
class DryRun {
public:
    /// Declares --dry-run.
    void declare(CommandLine& line);
    /// Begins the rehearsal where one is asked for. It lasts as long as this object.
    void begin();

    [[nodiscard]] bool isAsked() const { return m_isAsked; }
    [[nodiscard]] std::shared_ptr<PVAssetMetadataFileManager> makeManager() const;

private:
    bool m_isAsked = false;
    std::unique_ptr<Rehearsal> m_rehearsal;
};

}  // namespace parvel::cli
