#pragma once

#include <atomic>
#include <cstdint>

#include "parvel/iotasks/PVAssetMetadataIOTask.h"

namespace parvel {

struct CopyReport;
enum class CopyAnswer;

/// Copies an asset that is a single file, data and extended attributes, into a directory. A folder
/// is made there, but nothing in it is copied.
class PV_EXPORT PVCopyAssetMetadataIOTask : public PVAssetMetadataIOTask {
public:
    using PVAssetMetadataIOTask::PVAssetMetadataIOTask;

    static std::shared_ptr<PVCopyAssetMetadataIOTask> initWithSourceMetadata_manager(
        AssetPtr sourceMetadata, std::shared_ptr<PVAssetMetadataFileManager> manager);

    /// Copies the file at the record's `sourceURL` under its name, the extension in lower case, and
    /// gives the record with that URL. Fails where anything has the name. -1008 with the source URL
    /// when cancelled, or, with a progress handler, when data can't be copied; any other failure of
    /// the copy is the POSIX code -1. Both are deliberate. What was made of the copy stays.
    AssetPtr executeWithTargetDirectory_error(const std::optional<URL>& directory,
                                              ErrorOut error = nullptr) override;
    /// Takes effect at the copy's next report, also when it comes before the execution.
    void cancel() override;

    [[nodiscard]] bool isCancelled() const { return m_isCancelled.load(std::memory_order_acquire); }
    /// The file's allocated size, over which progress is told. That of an empty file is 0, and the
    /// share then no number or infinite. Deliberate.
    [[nodiscard]] std::uint64_t totalBytes() const { return m_totalBytes; }

private:
    [[nodiscard]] CopyAnswer answerTo(const CopyReport& report);

    std::atomic<bool> m_isCancelled{false};
    std::uint64_t m_totalBytes = 0;
};

}  // namespace parvel
