#include "parvel/filemanager/PVAssetMetadataFileManager.h"

#include <utility>

#include "parvel/metadata/AssetURL.h"
#include "parvel/platform/Service.h"
#include "parvel/xattr/AttributeDictionary.h"

namespace parvel {

std::shared_ptr<PVAssetMetadataFileManager> PVAssetMetadataFileManager::init() {
    return initWithFileManager(nullptr);
}

std::shared_ptr<PVAssetMetadataFileManager> PVAssetMetadataFileManager::initWithFileManager(
    std::shared_ptr<FileSystemService> fileManager) {
    if (!fileManager)
        fileManager = FileSystemService::makeDefault();
    return std::shared_ptr<PVAssetMetadataFileManager>(
        new PVAssetMetadataFileManager(std::move(fileManager)));
}

PVAssetMetadataFileManager::PVAssetMetadataFileManager(
    std::shared_ptr<FileSystemService> fileManager)
    : m_fileManager(std::move(fileManager)), m_fileCoordinator(FileCoordinator::makeDefault()) {}

const std::shared_ptr<FileSystemService>& PVAssetMetadataFileManager::fileManager() const {
    return m_fileManager;
}

void PVAssetMetadataFileManager::setFileManager(std::shared_ptr<FileSystemService> fileManager) {
    m_fileManager = std::move(fileManager);
}

const std::shared_ptr<FileCoordinator>& PVAssetMetadataFileManager::fileCoordinator() const {
    return m_fileCoordinator;
}

void PVAssetMetadataFileManager::setFileCoordinator(
    std::shared_ptr<FileCoordinator> fileCoordinator) {
    m_fileCoordinator = std::move(fileCoordinator);
}

DateText& PVAssetMetadataFileManager::dateFormatter() {
    return Service<DateText>::current();
}

String PVAssetMetadataFileManager::stringFromMetadataDate(const Date& date) {
    return dateFormatter().stringFromDate(date);
}

std::optional<Date> PVAssetMetadataFileManager::metadataDateFromString(std::string_view text) {
    return dateFormatter().dateFromString(text);
}

std::optional<Dictionary> PVAssetMetadataFileManager::extendedAttributesForAsset_error(
    const AssetPtr& asset, ErrorOut error) const {
    const auto url = urlOf(asset);
    if (!url)
        return fail(error, makeMissingURLError());
    // Deliberate: a failed read's error stays inside.
    return attributeDictionaryAtURL(*url);
}

}  // namespace parvel
