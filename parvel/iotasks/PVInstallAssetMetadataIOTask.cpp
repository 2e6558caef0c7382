// Steps of an install, and what remains when one fails:
//   1. an item of the source's name goes from the staging directory (nothing else is touched);
//   2. the subtask copies the asset there (what it made stays), unless the source itself is taken;
//   3. the copy is stamped with its size, date and attributes (a failure is only logged);
//   4. the manager moves it to its place, in one step each; else the copy, or the source, goes.

#include "parvel/iotasks/PVInstallAssetMetadataIOTask.h"

#include <utility>

#include "parvel/filemanager/PVAssetMetadataFileManager.h"
#include "parvel/foundation/PVParvelLog.h"
#include "parvel/metadata/AssetURL.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "parvel/platform/ResourceQueries.h"
#include "parvel/platform/Service.h"

namespace parvel {

namespace {

/// Whether the URL's last component names an item in a folder, and not that folder or one above it.
bool hasOwnName(const URL& url) {
    const std::string_view name = url.lastPathComponent();
    return !name.empty() && name != "/" && name != "." && name != "..";
}

}  // namespace

PVInstallAssetMetadataIOTask::PVInstallAssetMetadataIOTask(
    Construction construction, AssetPtr sourceMetadata,
    std::shared_ptr<PVAssetMetadataFileManager> manager,
    std::shared_ptr<PVAssetMetadataIOTask> subtask)
    : PVAssetMetadataIOTask(construction, std::move(sourceMetadata), std::move(manager)),
      m_subtask(std::move(subtask)) {}

std::shared_ptr<PVInstallAssetMetadataIOTask>
PVInstallAssetMetadataIOTask::initWithSourceMetadata_manager_subtask(
    AssetPtr sourceMetadata, std::shared_ptr<PVAssetMetadataFileManager> manager,
    std::shared_ptr<PVAssetMetadataIOTask> subtask) {
    return std::make_shared<PVInstallAssetMetadataIOTask>(Construction(), std::move(sourceMetadata),
                                                          std::move(manager), std::move(subtask));
}

AssetPtr PVInstallAssetMetadataIOTask::executeWithTargetDirectory_error(
    const std::optional<URL>& directory, ErrorOut error) {
    // Deliberate: carries on, and fails where the directory is needed.
    if (!directory)
        PVParvelLog().fault("Executing install task without targetDirectory");
    PVParvelLog().info(
        "Install: start {targetDirectory: %d, temporaryDirectory: %d} targetDirectory: %@ temporaryDirectory: %@",
        directory.has_value(), m_temporaryDirectory.has_value(), directory, m_temporaryDirectory);
    ErrorSlot slot{error};

    const auto stagingDirectory =
        _subtaskTargetDirectoryWithInstalltDirectory_error(directory, slot.out());
    if (!stagingDirectory) {
        PVParvelLog().error("Invalid target url for copying: %@ error: %@", directory,
                            slot.value());
        return nullptr;
    }
    PVParvelLog().debug("Copying to directory: %@", stagingDirectory);

    m_subtask->setProgressHandler(progressHandler());
    const AssetPtr staged = m_shouldPlainCopy ? m_subtask->executeWithTargetDirectory_error(
                                                    stagingDirectory, slot.out())
                                              : sourceMetadata();
    if (!staged) {
        PVParvelLog().error("Failed copy. source: %@ target: %@ error: %@", urlOf(sourceMetadata()),
                            directory, slot.value());
        return nullptr;
    }

    std::optional<Error> stampError;
    const AssetPtr stamped =
        manager()->updateWithKeyAttributesAssetMetadata_error(staged, &stampError);
    if (stampError)
        PVParvelLog().error("Failure when adding size and insertion date to moved asset. error: %@",
                            stampError);

    AssetPtr placed = place(stamped, directory, slot.out());
    if (!placed) {
        cleanUp(stamped, slot.value());
        return nullptr;
    }
    if (m_updatingAsset)
        m_updatingAsset = m_updatingAsset->copyWithUpdates(
            [](PVMutableAssetMetadata& copy) { copy.setHasPendingUpdates(true); });
    return placed;
}

std::optional<URL> PVInstallAssetMetadataIOTask::_subtaskTargetDirectoryWithInstalltDirectory_error(
    const std::optional<URL>& installDirectory, ErrorOut error) {
    PVParvelLog().info("TemporaryDirectory: start {installDirectory: %d, temporaryDirectory: %d}",
                       installDirectory.has_value(), m_temporaryDirectory.has_value());
    const std::optional<URL>& staging =
        m_temporaryDirectory ? m_temporaryDirectory : installDirectory;
    const std::optional<URL> source = urlOf(sourceMetadata());
    // Deliberate: such a source has no candidate; clearing it would delete the directory itself.
    if (source && !hasOwnName(*source))
        return std::nullopt;

    const std::optional<URL> candidate =
        staging && source
            ? std::optional(staging->appendingPathComponent(source->lastPathComponent()))
            : std::nullopt;
    // Deliberate: whatever stands there goes, the library's item or the source itself included.
    if (candidate && Service<ResourceQueries>::current().isReachable(*candidate)) {
        if (!manager()->fileManager()->removeItem(*candidate, error)) {
            PVParvelLog().error("TemporaryDirectory: Failed to delete temporary file: %@",
                                candidate);
            return std::nullopt;
        }
        // Deliberate: the misspelling is part of the text.
        PVParvelLog().info("TemporaryDirectory: Deleted existig temporary file: %@", candidate);
        return staging;
    }
    // Deliberate: the misspelling is part of the text.
    PVParvelLog().debug("TemporaryDiretory: Target URL available: %@", candidate);
    return staging;
}

/// Moves the stamped asset to its final place, which an update keeps.
AssetPtr PVInstallAssetMetadataIOTask::place(const AssetPtr& asset,
                                             const std::optional<URL>& directory, ErrorOut error) {
    const bool isReplacing = m_updatingAsset && m_replaceExisting;
    if (m_makeUbiquitous && isReplacing)
        return manager()->replaceUbiquitousAsset_withAsset_error(m_updatingAsset, asset, error);
    if (!directory)
        return nullptr;
    if (m_makeUbiquitous)
        return manager()->setUbiquitous_asset_intoDirectory_replace_error(
            /*ubiquitous=*/true, asset, *directory, /*replace=*/false, error);
    if (!isReplacing)
        return manager()
            ->moveAsset_toDirectory_replaceExisting_renameIfCollision_useAssetIDFileName_error(
                asset, *directory, m_replaceExisting, m_renameIfCollision, m_useAssetIDFileName,
                error);
    const std::optional<URL> replaced = m_updatingAsset->url();
    if (!replaced || !hasOwnName(*replaced))
        return nullptr;
    return manager()->moveAsset_toURL_replaceExisting_error(
        asset, directory->appendingPathComponent(replaced->lastPathComponent()),
        /*replaceExisting=*/true, error);
}

// Deliberate: without a copy this deletes the source.
void PVInstallAssetMetadataIOTask::cleanUp(const AssetPtr& asset,
                                           const std::optional<Error>& moveError) {
    const std::optional<URL> url = urlOf(asset);
    PVParvelLog().error("Failed move -- Cleaning Up: %@ error: %@", url, moveError);
    std::optional<Error> removalError;
    if (url && manager()->fileManager()->removeItem(*url, &removalError))
        PVParvelLog().info("Removed temporary file");
    else
        PVParvelLog().error("Failed to remove temporary file: %@ error: %@", url, removalError);
}

void PVInstallAssetMetadataIOTask::cancel() {
    m_subtask->cancel();
}

}  // namespace parvel
