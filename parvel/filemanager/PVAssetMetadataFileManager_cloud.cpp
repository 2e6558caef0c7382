// Moves assets into and out of synchronised storage. Into a taken place go only replacements, in
// one atomic step each and under coordination; no completed step is undone.

#include "parvel/filemanager/AssetNames.h"
#include "parvel/filemanager/PVAssetMetadataFileManager.h"
#include "parvel/foundation/PVCasts.h"
#include "parvel/foundation/PVParvelLog.h"
#include "parvel/metadata/AssetURL.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"

namespace parvel {

namespace {

/// Deliberate: the texts that name a corrupt asset are chosen only where it has a URL after all.
std::string reasonOfMissingURL(const AssetPtr& asset) {
    if (!asset)
        return "PVAssetMetadata is nil";
    if (!asset->url())
        return "Unknown";
    const String* name = PVDynamicCast(classOf<String>, asset->displayName());
    return name ? "PVAssetMetadata with name: " + *name + " is corrupt and has no url set"
                : "PVAssetMetadata is corrupt and has no url or itemName set";
}

}  // namespace

AssetPtr PVAssetMetadataFileManager::setUbiquitous_asset_intoDirectory_replace_error(
    bool ubiquitous, const AssetPtr& asset, const URL& directory, bool replace, ErrorOut error) {
    const auto source = urlOf(asset);
    if (!source) {
        assign(error, makeCorruptAssetError(reasonOfMissingURL(asset)));
        PVParvelLog().error("setUbiquitous: Failed to migrate asset: %@ error: %@",
                            asset ? asset->title() : std::nullopt, error ? *error : std::nullopt);
        return nullptr;
    }
    const String sanitized = _sanitizedFilenameForAsset(asset).value_or("");
    if (sanitized.empty())
        return nullptr;
    const String name = fittingFileName(sanitized);

    if (replace) {
        // Deliberate: neither the outcome nor an error is reported.
        m_fileCoordinator->coordinateWriting(
            directory.appendingPathComponent(name), WritingIntent::ForReplacing, nullptr,
            [&](const std::optional<URL>& url) {
                if (url)
                    m_fileManager->replaceItem(*url, *source, ReplaceOptions::Default);
            });
        return nullptr;
    }

    for (;;) {
        const URL target = directory.appendingPathComponent(
            nonCollidingNameForFileName_inDestPath(name, directory.path()));
        std::optional<Error> failure;
        if (m_fileManager->setUbiquitous(ubiquitous, *source, target, &failure))
            return asset->copyWithUpdatedURL(target);
        // A competitor that took the name meanwhile sends the count on.
        const bool isTaken = failure == makeFileError(PVFileErrorCode::FileExists, target) &&
                             m_fileManager->itemExistsAtPath(target.path());
        if (!isTaken) {
            if (failure)
                assign(error, std::move(failure));
            return nullptr;
        }
    }
}

AssetPtr PVAssetMetadataFileManager::replaceUbiquitousAsset_withAsset_error(
    const AssetPtr& asset, const AssetPtr& newVersion, ErrorOut error) {
    const auto existing = urlOf(asset);
    const auto replacement = urlOf(newVersion);
    const auto name = _sanitizedFilenameForAsset(newVersion);
    if (!existing || !replacement || !name)
        return fail(error, makeMissingURLError());
    const URL target =
        existing->deletingLastPathComponent().appendingPathComponent(fittingFileName(*name));

    std::optional<Error> kept;
    std::optional<URL> resulting;
    std::optional<Error> coordinationError;
    m_fileCoordinator->coordinateWriting(
        *existing, WritingIntent::ForReplacing, &coordinationError,
        [&](const std::optional<URL>& url) {
            if (url) {
                const bool isReplaced = m_fileManager->replaceItem(
                    *url, *replacement, ReplaceOptions::Default, &resulting, &kept);
                if (isReplaced && !resulting)
                    resulting = url;
                return;
            }
            PVParvelLog().error("replaceUbiquitousAsset: Failed due to nil newURL provided.");
            kept = makeMissingURLError();
        });
    if (!kept)
        kept = coordinationError;

    if (!kept && resulting && *resulting != target) {
        m_fileCoordinator->coordinateWriting(
            *existing, WritingIntent::ForMoving, &coordinationError,
            [&](const std::optional<URL>&) {
                if (m_fileManager->moveItem(*resulting, target, &kept))
                    m_fileCoordinator->itemDidMove(*existing, target);
            });
        if (!kept)
            kept = coordinationError;
    }

    AssetPtr result = kept ? nullptr : newVersion->copyWithUpdatedURL(target);
    assign(error, std::move(kept));
    return result;
}

}  // namespace parvel
