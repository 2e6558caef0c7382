// Renames a PDF after its display name, by one move that never overwrites. After a failure the file
// stands under its old name.

#include <algorithm>

#include "parvel/filemanager/AssetNames.h"
#include "parvel/filemanager/PVAssetMetadataFileManager.h"
#include "parvel/foundation/PVCasts.h"
#include "parvel/foundation/PVParvelLog.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"

namespace parvel {

namespace {

String fileNameStem(String displayName) {
    const auto separates = [](char character) { return character == '/' || character == ':'; };
    std::replace_if(displayName.begin(), displayName.end(), separates, '_');
    return displayName;
}

/// None for a stem that makes no file name: an empty one, or one with a NUL.
std::optional<URL> siblingPDF(const URL& url, const String& stem) {
    const String name = stem + ".pdf";
    if (stem.empty() || !isOneComponent(name))
        return std::nullopt;
    return url.deletingLastPathComponent().appendingPathComponent(name).standardized();
}

}  // namespace

AssetPtr PVAssetMetadataFileManager::normalizeNamingForAsset_error(const AssetPtr& asset,
                                                                   ErrorOut error) {
    if (!asset || !asset->isPDF())
        return asset;
    const String* name = PVDynamicCast(classOf<String>, asset->displayName());
    return _renameExistingPDFMetadata_toDisplayName_error(
        asset, name ? std::optional(*name) : std::nullopt, error);
}

AssetPtr PVAssetMetadataFileManager::_renameExistingPDFMetadata_toDisplayName_error(
    const AssetPtr& asset, const std::optional<String>& displayName, ErrorOut error) {
    if (!asset || !asset->isPDF() || !displayName)
        return asset;

    const String name = fileNameStem(*displayName);
    const auto url = asset->url();
    if (!url) {
        PVParvelLog().error("PDFRename: nil source url -- Bailing Out");
        return fail(error, makeMissingURLError());
    }
    const auto proposed = siblingPDF(*url, name);
    if (!proposed) {
        PVParvelLog().error("PDFRename: nil proposedURL url -- Bailing Out");
        return fail(error, makeMissingURLError());
    }
    if (*url == *proposed) {
        PVParvelLog().debug("PDFRename: assetURL == proposedURL");
        return asset;
    }

    if (!m_fileManager->itemExistsAtPath(url->path())) {
        PVParvelLog().error("PDFRename: Source File does not exist -- Bailing Out");
        return fail(error, makeFileError(PVFileErrorCode::NoSuchFile, url));
    }
    if (m_fileManager->itemExistsAtPath(proposed->path())) {
        PVParvelLog().error("PDFRename: File exists -- Fail");
        return fail(error, makeFileError(PVFileErrorCode::FileExists, proposed));
    }
    if (!m_fileManager->moveItem(*url, *proposed, error)) {
        PVParvelLog().error("PDFRename: failed to rename -- Fail");
        return nullptr;
    }

    // Deliberate: the prefix differs from the other lines.
    PVParvelLog().info("PDFRenamed: renamed -- Success");
    return asset->copyWithUpdates([&](PVMutableAssetMetadata& copy) {
        copy.setUrl(proposed);
        copy.setDisplayName(name);
        copy.setPreviousURL(url);
        copy.setGenerationCount(copy.generationCount() + 1);
    });
}

}  // namespace parvel
