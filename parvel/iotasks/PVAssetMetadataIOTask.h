#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <utility>

#include "parvel/foundation/ErrorOut.h"
#include "parvel/foundation/PVExport.h"
#include "parvel/foundation/URL.h"
#include "parvel/metadata/PVAssetMetadata.h"

namespace parvel {

class PVAssetMetadataFileManager;

/// Brings one asset into a directory: the abstract base of all tasks that do. A task is made,
/// configured, executed once on the caller's thread and dropped; nothing is retried. `cancel` alone
/// may come from another thread.
class PV_EXPORT PVAssetMetadataIOTask {
protected:
    /// Taken by the constructors, so that the library alone can call them.
    struct Construction {
        explicit Construction() = default;
    };

public:
    /// Called on the executing thread, from inside the copy, with a copy of the source record whose
    /// `percentComplete` is the share done.
    using ProgressHandler = std::function<void(const AssetPtr&)>;

    PVAssetMetadataIOTask(Construction, AssetPtr sourceMetadata,
                          std::shared_ptr<PVAssetMetadataFileManager> manager);
    virtual ~PVAssetMetadataIOTask();
    PVAssetMetadataIOTask(const PVAssetMetadataIOTask&) = delete;
    PVAssetMetadataIOTask& operator=(const PVAssetMetadataIOTask&) = delete;

    static std::shared_ptr<PVAssetMetadataIOTask> initWithSourceMetadata_manager(
        AssetPtr sourceMetadata, std::shared_ptr<PVAssetMetadataFileManager> manager);

    /// The asset to copy or install.
    [[nodiscard]] const AssetPtr& sourceMetadata() const { return m_sourceMetadata; }
    /// The manager that made the task and moves what it made.
    [[nodiscard]] const std::shared_ptr<PVAssetMetadataFileManager>& manager() const {
        return m_manager;
    }
    [[nodiscard]] const ProgressHandler& progressHandler() const { return m_progressHandler; }
    void setProgressHandler(ProgressHandler handler) { m_progressHandler = std::move(handler); }

    /// The record of the asset at its new place, or none. The base class's own throws
    /// std::invalid_argument, "This is an abstract class method".
    virtual AssetPtr executeWithTargetDirectory_error(const std::optional<URL>& directory,
                                                      ErrorOut error = nullptr);
    /// The base class's own does nothing. A task that is executing then fails with -1008.
    virtual void cancel();

protected:
    /// Tells the progress handler, which must be there, the share done.
    void reportProgress(double share) const;

private:
    AssetPtr m_sourceMetadata;
    std::shared_ptr<PVAssetMetadataFileManager> m_manager;
    ProgressHandler m_progressHandler;
};

}  // namespace parvel
