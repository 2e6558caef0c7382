#pragma once

#include "parvel/iotasks/PVAssetMetadataIOTask.h"

namespace parvel {

/// Puts an asset into the library: its subtask copies it into a staging directory, or the source
/// itself is taken; the manager stamps it and moves it to its final place. Made by the manager's
/// taskToInstallAsset; the caller sets the flags and executes it.
///
///     auto task = manager->taskToInstallAsset(asset);
///     task->setTemporaryDirectory(staging);
///     task->setShouldPlainCopy(true);
///     AssetPtr installed = task->executeWithTargetDirectory_error(library, &error);
///
/// The staging directory's item of the source's name is deleted first. Without a temporary
/// directory that is the library's own item of that name, or the source itself. Deliberate: always
/// give a new book a temporary directory.
class PV_EXPORT PVInstallAssetMetadataIOTask : public PVAssetMetadataIOTask {
public:
    PVInstallAssetMetadataIOTask(Construction construction, AssetPtr sourceMetadata,
                                 std::shared_ptr<PVAssetMetadataFileManager> manager,
                                 std::shared_ptr<PVAssetMetadataIOTask> subtask);
    /// Manager and subtask must be there.
    static std::shared_ptr<PVInstallAssetMetadataIOTask> initWithSourceMetadata_manager_subtask(
        AssetPtr sourceMetadata, std::shared_ptr<PVAssetMetadataFileManager> manager,
        std::shared_ptr<PVAssetMetadataIOTask> subtask);

    /// The task that copies the asset into the staging directory.
    [[nodiscard]] const std::shared_ptr<PVAssetMetadataIOTask>& subtask() const {
        return m_subtask;
    }
    /// Where the copy is made before it is moved; none for the target directory.
    [[nodiscard]] const std::optional<URL>& temporaryDirectory() const {
        return m_temporaryDirectory;
    }
    void setTemporaryDirectory(std::optional<URL> directory) {
        m_temporaryDirectory = std::move(directory);
    }
    /// The library's asset that this one replaces; null for a new book. After a success it has
    /// pending updates.
    [[nodiscard]] const AssetPtr& updatingAsset() const { return m_updatingAsset; }
    void setUpdatingAsset(AssetPtr asset) { m_updatingAsset = std::move(asset); }
    /// Whether the asset replaces what stands at its place.
    [[nodiscard]] bool replaceExisting() const { return m_replaceExisting; }
    void setReplaceExisting(bool replace) { m_replaceExisting = replace; }
    /// Whether a PDF or audiobook takes another name where its own is taken.
    [[nodiscard]] bool renameIfCollision() const { return m_renameIfCollision; }
    void setRenameIfCollision(bool rename) { m_renameIfCollision = rename; }
    /// Whether a book is named after its identifier.
    [[nodiscard]] bool useAssetIDFileName() const { return m_useAssetIDFileName; }
    void setUseAssetIDFileName(bool use) { m_useAssetIDFileName = use; }
    /// Whether the asset goes into synchronised storage.
    [[nodiscard]] bool makeUbiquitous() const { return m_makeUbiquitous; }
    void setMakeUbiquitous(bool ubiquitous) { m_makeUbiquitous = ubiquitous; }
    /// Whether the subtask makes a copy; else the source itself is moved.
    [[nodiscard]] bool shouldPlainCopy() const { return m_shouldPlainCopy; }
    void setShouldPlainCopy(bool copy) { m_shouldPlainCopy = copy; }

    /// The record of the asset at its final place. Every error is the failing step's own. A failed
    /// copy leaves what it made in the staging directory; a failed move deletes the staged copy,
    /// and without a copy the source. Deliberate.
    AssetPtr executeWithTargetDirectory_error(const std::optional<URL>& directory,
                                              ErrorOut error = nullptr) override;
    /// Cancels the subtask.
    void cancel() override;

    /// The staging directory, after the item of the source's name in it is gone; none where that
    /// can't be deleted, or where the source has no name of its own. The misspelling is the
    /// operation's name.
    [[nodiscard]] std::optional<URL> _subtaskTargetDirectoryWithInstalltDirectory_error(
        const std::optional<URL>& installDirectory, ErrorOut error = nullptr);

private:
    [[nodiscard]] AssetPtr place(const AssetPtr& asset, const std::optional<URL>& directory,
                                 ErrorOut error);
    void cleanUp(const AssetPtr& asset, const std::optional<Error>& moveError);

    std::shared_ptr<PVAssetMetadataIOTask> m_subtask;
    std::optional<URL> m_temporaryDirectory;
    AssetPtr m_updatingAsset;
    bool m_replaceExisting = false;
    bool m_renameIfCollision = false;
    bool m_useAssetIDFileName = false;
    bool m_makeUbiquitous = false;
    bool m_shouldPlainCopy = false;
};

}  // namespace parvel
