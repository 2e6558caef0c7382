// Makes the copy under its own name in the target directory, exclusively, and leaves there what a
// failed or cancelled copy has made.

#include "parvel/iotasks/PVCopyAssetMetadataIOTask.h"

#include <utility>

#include "parvel/foundation/PVParvelLog.h"
#include "parvel/iotasks/PlacedCopy.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "parvel/platform/CopyService.h"
#include "parvel/platform/ResourceQueries.h"
#include "parvel/platform/Service.h"

namespace parvel {

std::shared_ptr<PVCopyAssetMetadataIOTask>
PVCopyAssetMetadataIOTask::initWithSourceMetadata_manager(
    AssetPtr sourceMetadata, std::shared_ptr<PVAssetMetadataFileManager> manager) {
    return std::make_shared<PVCopyAssetMetadataIOTask>(Construction(), std::move(sourceMetadata),
                                                       std::move(manager));
}

AssetPtr PVCopyAssetMetadataIOTask::executeWithTargetDirectory_error(
    const std::optional<URL>& directory, ErrorOut error) {
    const std::optional<URL> source =
        sourceMetadata() ? sourceMetadata()->sourceURL() : std::nullopt;
    const std::optional<URL> target = urlOfCopy(source, directory);
    ResourceQueries& queries = Service<ResourceQueries>::current();
    const std::optional<bool> isDirectory =
        source ? queries.isDirectory(*source, error) : std::nullopt;
    if (!isDirectory) {
        PVParvelLog().error("Failed to stat file: %@ error: %@", source,
                            error ? *error : std::nullopt);
        return nullptr;
    }

    CopyService::StatusCallback callback;
    if (!*isDirectory) {
        std::optional<Error> sizeError;
        if (const auto size = queries.totalAllocatedSize(*source, &sizeError)) {
            m_totalBytes = *size;
            callback = [this](const CopyReport& report) { return answerTo(report); };
        } else {
            PVParvelLog().error("Failed to get total bytes from file: %@ error: %@", source,
                                sizeError);
        }
    }

    const int result =
        Service<CopyService>::current().copy(source->path(), pathOrEmpty(target), callback);
    if (result == 0)
        return sourceMetadata()->copyWithUpdatedURL(target);
    if (isCancelled())
        return fail(error, makeCancelledError(*source));
    // Deliberate: the code is what the copy returned, not errno; and without a place for the error
    // nothing is logged.
    if (error) {
        assign(error, makePOSIXError(result, *source));
        PVParvelLog().error("Failed to copy file: %@ error: %@", source, *error);
    }
    return nullptr;
}

CopyAnswer PVCopyAssetMetadataIOTask::answerTo(const CopyReport& report) {
    if (report.operation == CopyOperation::Data && progressHandler()) {
        if (report.stage == CopyStage::Error) {
            PVParvelLog().info("Copy file error");
            // Deliberate: a data error is reported as a cancellation.
            m_isCancelled.store(true, std::memory_order_release);
        }
        if (report.stage == CopyStage::Progress && report.bytesCopied) {
            // Deliberate: a source of no allocated size gives infinity, or no number.
            reportProgress(static_cast<double>(*report.bytesCopied) /
                           static_cast<double>(m_totalBytes));
        }
    }
    return isCancelled() ? CopyAnswer::Quit : CopyAnswer::Continue;
}

void PVCopyAssetMetadataIOTask::cancel() {
    m_isCancelled.store(true, std::memory_order_release);
}

}  // namespace parvel
