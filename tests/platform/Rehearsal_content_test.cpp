#include <cerrno>

#include <gtest/gtest.h>

#include "parvel/filemanager/PVAssetMetadataFileManager.h"
#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "parvel/iotasks/PVInstallAssetMetadataIOTask.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "parvel/platform/Rehearsal.h"
#include "parvel/platform/StagingDirectory.h"
#include "tests/support/EpubBuilder.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/Records.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

namespace fs = std::filesystem;

/// What came of one operation: its record, its error and its log.
struct RehearsedOutcome {
    std::optional<Value> record;
    std::optional<Error> error;
    std::vector<std::string> log;
};

/// A library in which every change is rehearsed, and then made.
class RehearsedChanges : public ::testing::Test {
protected:
    using Change = std::function<AssetPtr(PVAssetMetadataFileManager& manager, const URL& staging,
                                          ErrorOut error)>;

    void SetUp() override { fs::create_directories(m_folder / "library"); }

    /// Every name below the folder, with the content of files.
    [[nodiscard]] std::map<std::string, std::string> disk() const {
        std::map<std::string, std::string> state;
        for (const auto& entry : fs::recursive_directory_iterator(m_folder.path())) {
            const std::string name = entry.path().lexically_relative(m_folder.path()).string();
            const bool isFile = fs::is_regular_file(entry.symlink_status());
            state[name] = isFile ? m_folder.read(name) : "no file";
        }
        return state;
    }

    RehearsedOutcome made(const std::shared_ptr<PVAssetMetadataFileManager>& manager,
                          const Change& change) {
        RehearsedOutcome outcome;
        RecordedLog log;
        const auto staging = StagingDirectory::makeIn(m_folder.url("library"), &outcome.error);
        if (!staging)
            return outcome;
        const AssetPtr record = change(*manager, staging->url(), &outcome.error);
        if (record) {
            Dictionary entries = *record->dictionaryRepresentation();
            entries.remove("PVAllocatedSize");  // of another file system, where it was rehearsed
            entries.remove("PVInsertionDate");
            outcome.record = entries;
        }
        for (const std::string& line : log.lines())
            outcome.log.push_back(line.substr(0, line.find_first_of("/{")));
        return outcome;
    }

    /// Holds the rehearsal to the change, and the disk to what it was after the rehearsal.
    RehearsedOutcome expectForeseen(const Change& change) {
        const auto before = disk();
        RehearsedOutcome rehearsed;
        {
            const Rehearsal rehearsal;
            const auto manager =
                PVAssetMetadataFileManager::initWithFileManager(rehearsal.fileManager());
            manager->setFileCoordinator(rehearsal.fileCoordinator());
            rehearsed = made(manager, change);
        }
        EXPECT_EQ(disk(), before);
        RehearsedOutcome real = made(PVAssetMetadataFileManager::init(), change);
        EXPECT_EQ(rehearsed.record, real.record);
        EXPECT_EQ(rehearsed.error.has_value(), real.error.has_value());
        if (rehearsed.error && real.error) {
            EXPECT_EQ(rehearsed.error->domain(), real.error->domain());
            EXPECT_EQ(rehearsed.error->code(), real.error->code());
        }
        EXPECT_EQ(rehearsed.log, real.log);
        return real;
    }

    AssetPtr inspected(const URL& url) {
        return PVAssetMetadataInspector::metadataForAssetAtURL_error(url);
    }
    AssetPtr zippedBook() {
        return inspected(EpubBuilder{}
                             .opf(opfText("<dc:title>Old</dc:title>"))
                             .file("BazaarArtwork", "store's cover")
                             .zip(m_folder / "library/a.epub"));
    }
    static Change edit(const AssetPtr& asset, const Dictionary& updates) {
        return [=](PVAssetMetadataFileManager& manager, const URL& staging, ErrorOut error) {
            return manager.updateAsset_withUpdates_temporaryDirectory_inflateIfNeeded_error(
                asset, &updates, staging, /*inflateIfNeeded=*/true, error);
        };
    }
    /// Installs under a name of its own, since the staging directory's differs from run to run.
    Change install(const AssetPtr& asset, bool copies) {
        return [=, this](PVAssetMetadataFileManager& manager, const URL& staging, ErrorOut error) {
            const auto task = manager.taskToInstallAsset(asset);
            task->setTemporaryDirectory(staging);
            task->setShouldPlainCopy(copies);
            task->setRenameIfCollision(true);
            return task->executeWithTargetDirectory_error(m_folder.url("library"), error);
        };
    }

    TemporaryDirectory m_folder;
};

TEST_F(RehearsedChanges, AnEditOfAZippedBookIsForeseen) {
    const RehearsedOutcome real = expectForeseen(
        edit(zippedBook(), {{"itemName", "New"}, {"PVCoverImageData", Data::copyOf("my cover")}}));

    ASSERT_TRUE(real.record);
    EXPECT_EQ(valueOf(real.record->as<Dictionary>()->find("PVCoverImageDataReplaced")),
              Value(Data::copyOf("store's cover")));
}

TEST_F(RehearsedChanges, ARestoredCoverIsForeseen) {
    const URL package = EpubBuilder{}
                            .file("BazaarArtwork", "my cover")
                            .file("BazaarArtwork-original", "first cover")
                            .expand(m_folder / "library/a.epub");

    const RehearsedOutcome real =
        expectForeseen(edit(inspected(package), {{"PVCoverImageData", Value()}}));

    ASSERT_TRUE(real.record);
    EXPECT_EQ(valueOf(real.record->as<Dictionary>()->find("PVCoverImageData")),
              Value(Data::copyOf("first cover")));
}

TEST_F(RehearsedChanges, ACoverWithoutBackupIsForeseen) {
    const URL package =
        EpubBuilder{}.file("BazaarArtwork", "my cover").expand(m_folder / "library/a.epub");

    EXPECT_TRUE(expectForeseen(edit(inspected(package), {{"PVCoverImageData", Value()}})).error);
}

TEST_F(RehearsedChanges, ADamagedArchiveIsForeseen) {
    const AssetPtr book = PVAssetMetadata::metadataWithURL_dictionary(
        URL::fileURLWithPath(m_folder.write("library/a.epub", "no zip file")), nullptr);

    EXPECT_FALSE(expectForeseen(edit(book, {{"itemName", "New"}})).record);
}

TEST_F(RehearsedChanges, APDFsNewNameIsForeseen) {
    const AssetPtr pdf = PVAssetMetadata::metadataWithURL_dictionary(
        URL::fileURLWithPath(m_folder.write("library/a.pdf", "bytes")), nullptr);

    EXPECT_TRUE(expectForeseen(edit(pdf, {{"itemName", "New"}})).record);
}

TEST_F(RehearsedChanges, AnInstallIsForeseen) {
    for (const bool copies : {true, false}) {
        const AssetPtr book = inspected(EpubBuilder{}.zip(m_folder / "new.epub"));
        const AssetPtr pdf = PVAssetMetadata::metadataWithURL_dictionary(
            URL::fileURLWithPath(m_folder.write("b.pdf", "bytes")), nullptr);
        fs::remove_all(m_folder / "library");
        m_folder.write("library/b.pdf", "taken");

        EXPECT_TRUE(expectForeseen(install(book, copies)).record);
        EXPECT_TRUE(expectForeseen(install(pdf, copies)).record);
    }
}

TEST_F(RehearsedChanges, AnInstallOverATakenNameIsForeseen) {
    const AssetPtr book = inspected(EpubBuilder{}.expand(m_folder / "new.epub"));
    m_folder.write("library/new.epub", "taken");

    const RehearsedOutcome real = expectForeseen(install(book, /*copies=*/true));

    EXPECT_FALSE(real.record);
    EXPECT_EQ(real.error,
              makeFileError(PVFileErrorCode::FileExists, m_folder.url("library/new.epub")));
}

TEST_F(RehearsedChanges, WhatCanNotBeLookedUpFailsAsItWould) {
    fs::create_symlink("circle", m_folder / "circle");
    const URL url = m_folder.url("circle/a.pdf");

    const RehearsedOutcome real =
        expectForeseen([&url](PVAssetMetadataFileManager&, const URL&, ErrorOut error) {
            return PVAssetMetadataInspector::metadataForAssetAtURL_error(url, error);
        });

    ASSERT_TRUE(real.error);
    EXPECT_EQ(real.error->code(), ELOOP);
}

TEST_F(RehearsedChanges, AStagingDirectoryOnlyTakesItsName) {
    const auto before = disk();
    const Rehearsal rehearsal;
    {
        const auto staging = StagingDirectory::makeIn(m_folder.url("library"));
        ASSERT_TRUE(staging);
        EXPECT_TRUE(rehearsal.fileManager()->itemExistsAtPath(staging->url().path()));
        EXPECT_EQ(disk(), before);
    }
    EXPECT_FALSE(StagingDirectory::makeIn(m_folder.url("missing")));
}

TEST_F(RehearsedChanges, AStagingDirectoryGoesWithItsOwner) {
    std::optional<Error> error;
    const auto before = disk();
    {
        const auto staging = StagingDirectory::makeIn(m_folder.url("library"), &error);
        ASSERT_TRUE(staging);
        m_folder.write("library/" + std::string(staging->url().lastPathComponent()) + "/a/b", "c");
        EXPECT_TRUE(staging->url().lastPathComponent().starts_with('.'));
    }
    EXPECT_EQ(disk(), before);
    EXPECT_FALSE(StagingDirectory::makeIn(m_folder.url("missing"), &error));
    EXPECT_EQ(error, makeFileError(PVFileErrorCode::NoSuchFile, m_folder.url("missing")));
}

}  // namespace
}  // namespace parvel::testing
