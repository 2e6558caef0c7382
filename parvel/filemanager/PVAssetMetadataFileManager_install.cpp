#include "parvel/filemanager/PVAssetMetadataFileManager.h"
#include "parvel/iotasks/PVCopyAssetMetadataIOTask.h"
#include "parvel/iotasks/PVCrateAssetMetadataIOTask.h"
#include "parvel/iotasks/PVInstallAssetMetadataIOTask.h"

namespace parvel {

std::shared_ptr<PVInstallAssetMetadataIOTask> PVAssetMetadataFileManager::taskToInstallAsset(
    const AssetPtr& asset) {
    const std::shared_ptr<PVAssetMetadataFileManager> self = shared_from_this();
    std::shared_ptr<PVAssetMetadataIOTask> copy;
    if (asset && asset->isBook())
        copy = PVCrateAssetMetadataIOTask::initWithSourceMetadata_manager(asset, self);
    else
        copy = PVCopyAssetMetadataIOTask::initWithSourceMetadata_manager(asset, self);
    return PVInstallAssetMetadataIOTask::initWithSourceMetadata_manager_subtask(asset, self,
                                                                                std::move(copy));
}

}  // namespace parvel
