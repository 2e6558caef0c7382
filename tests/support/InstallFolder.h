#pragma once

#include <memory>
#include <string>

#include "parvel/iotasks/PVInstallAssetMetadataIOTask.h"
#include "tests/support/EpubBuilder.h"
#include "tests/support/ManagedFolder.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/RefusingServices.h"

namespace parvel::testing {

/// A folder with a "library" and a "staging" directory, and a task that installs into the one.
class InstallFolder : public ManagedFolder {
protected:
    InstallFolder() {
        makeFolder("library");
        makeFolder("staging");
    }

    /// A task of the manager's; one that stages makes a copy in the staging directory.
    void makeTask(const AssetPtr& source, bool stages) {
        m_task = m_manager->taskToInstallAsset(source);
        if (stages) {
            m_task->setTemporaryDirectory(m_folder.url("staging"));
            m_task->setShouldPlainCopy(true);
        }
    }
    AssetPtr execute() {
        return m_task->executeWithTargetDirectory_error(m_folder.url("library"), &m_error);
    }
    std::optional<URL> stagingDirectory() {
        return m_task->_subtaskTargetDirectoryWithInstalltDirectory_error(m_folder.url("library"),
                                                                          &m_error);
    }
    /// Makes every such act of the manager's file-system service fail.
    void refuse(RefusingFileSystem::Act refused) {
        m_manager->setFileManager(std::make_shared<RefusingFileSystem>(
            [refused](RefusingFileSystem::Act act, const URL&) { return act == refused; }));
    }

    [[nodiscard]] static MutableAssetPtr recordAt(const URL& url) {
        return PVAssetMetadata::metadataWithURL_dictionary(url, nullptr);
    }
    MutableAssetPtr zippedBook(const std::string& name) {
        return recordAt(EpubBuilder{}.zip(m_folder / name));
    }
    [[nodiscard]] std::string text(const std::string& name) const {
        return m_folder.url(name).absoluteString();
    }

    std::shared_ptr<PVInstallAssetMetadataIOTask> m_task;
};

}  // namespace parvel::testing
