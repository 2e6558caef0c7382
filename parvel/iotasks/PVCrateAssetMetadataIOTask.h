#pragma once

#include <atomic>
#include <cstdint>
#include <memory>
#include <vector>

#include "parvel/iotasks/PVAssetMetadataIOTask.h"

namespace parvel {

class ArchiveCopier;

/// Brings a book into a directory as a package folder: expands a zip archive, or copies a folder as
/// it is. Progress is the size of the files finished over that of all.
class PV_EXPORT PVCrateAssetMetadataIOTask : public PVAssetMetadataIOTask {
public:
    using PVAssetMetadataIOTask::PVAssetMetadataIOTask;

    static std::shared_ptr<PVCrateAssetMetadataIOTask> initWithSourceMetadata_manager(
        AssetPtr sourceMetadata, std::shared_ptr<PVAssetMetadataFileManager> manager);

    /// Makes the package of the book at the record's `sourceURL` under its name, the extension in
    /// lower case; gives the record, complete, with that URL, and its MIME type without line breaks
    /// around it. Fails where anything has the name. -1008 with the record's URL when cancelled;
    /// otherwise `crateError`, which may be none. Deliberate. What was made of the package stays.
    AssetPtr executeWithTargetDirectory_error(const std::optional<URL>& directory,
                                              ErrorOut error = nullptr) override;
    /// Stops the running copy within its current piece. Before the execution it only sets the flag:
    /// the copy goes through. After it, it does nothing.
    void cancel() override;

    /// The copier of the execution, kept until the task goes.
    [[nodiscard]] std::shared_ptr<ArchiveCopier> copier() const;
    /// The last error that the copier told, a POSIX error with the record's URL.
    [[nodiscard]] const std::optional<Error>& crateError() const { return m_crateError; }
    [[nodiscard]] std::uint64_t totalBytes() const { return m_totalBytes; }
    /// Of the files finished so far.
    [[nodiscard]] std::uint64_t bytesSoFar() const { return m_bytesSoFar; }
    [[nodiscard]] bool isCancelled() const { return m_isCancelled.load(std::memory_order_acquire); }

private:
    class Callbacks;

    [[nodiscard]] AssetPtr copyInto(const std::optional<URL>& directory, ErrorOut error);

    /// One an execution, kept so that a late cancel meets none that is gone.
    std::vector<std::shared_ptr<ArchiveCopier>> m_copiers;
    std::atomic<ArchiveCopier*> m_currentCopier{nullptr};
    std::optional<Error> m_crateError;
    std::uint64_t m_totalBytes = 0;
    std::uint64_t m_bytesSoFar = 0;
    std::atomic<bool> m_isCancelled{false};
};

}  // namespace parvel
