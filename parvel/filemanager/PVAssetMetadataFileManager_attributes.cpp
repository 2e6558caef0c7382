#include "parvel/filemanager/PVAssetMetadataFileManager.h"
#include "parvel/xattr/AttributeWriting.h"

namespace parvel {

bool PVAssetMetadataFileManager::setExtendedAttributesForAsset_error(const AssetPtr& asset,
                                                                     ErrorOut error) {
    return setAttributesForAsset(asset, error);
}

bool PVAssetMetadataFileManager::updateExtendedAttributesForAsset_error(const AssetPtr& asset,
                                                                        ErrorOut error) {
    return updateAttributesForAsset(asset, error);
}

bool PVAssetMetadataFileManager::_writeExtendedAttributes_url_error(const Dictionary& attributes,
                                                                    const std::optional<URL>& url,
                                                                    ErrorOut error) {
    return writeAttributes(attributes, url, error);
}

std::uint64_t PVAssetMetadataFileManager::_fixPermissionsAndCalculateAllocatedSizeAtURL_error(
    const URL& url, ErrorOut error) {
    return fixPermissionsAndCalculateAllocatedSize(url, error);
}

}  // namespace parvel
