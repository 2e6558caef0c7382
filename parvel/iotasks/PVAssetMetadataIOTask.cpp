#include "parvel/iotasks/PVAssetMetadataIOTask.h"

#include <stdexcept>
#include <utility>

#include "parvel/metadata/PVMutableAssetMetadata.h"

namespace parvel {

PVAssetMetadataIOTask::PVAssetMetadataIOTask(Construction, AssetPtr sourceMetadata,
                                             std::shared_ptr<PVAssetMetadataFileManager> manager)
    : m_sourceMetadata(std::move(sourceMetadata)), m_manager(std::move(manager)) {}

PVAssetMetadataIOTask::~PVAssetMetadataIOTask() = default;

std::shared_ptr<PVAssetMetadataIOTask> PVAssetMetadataIOTask::initWithSourceMetadata_manager(
    AssetPtr sourceMetadata, std::shared_ptr<PVAssetMetadataFileManager> manager) {
    return std::make_shared<PVAssetMetadataIOTask>(Construction(), std::move(sourceMetadata),
                                                   std::move(manager));
}

AssetPtr PVAssetMetadataIOTask::executeWithTargetDirectory_error(const std::optional<URL>&,
                                                                 ErrorOut) {
    throw std::invalid_argument("This is an abstract class method");
}

void PVAssetMetadataIOTask::cancel() {}

void PVAssetMetadataIOTask::reportProgress(double share) const {
    m_progressHandler(m_sourceMetadata->copyWithUpdates(
        [share](PVMutableAssetMetadata& copy) { copy.setPercentComplete(share); }));
}

}  // namespace parvel
