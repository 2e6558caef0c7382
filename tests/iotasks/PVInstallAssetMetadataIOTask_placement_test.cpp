#include <gtest/gtest.h>

#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "tests/support/EnvironmentValue.h"
#include "tests/support/InstallFolder.h"

namespace parvel::testing {
namespace {

class PlacingInstalls : public InstallFolder {
protected:
    PlacingInstalls() { makeFolder("cloud/.stfolder"); }

    /// The same install into synchronised storage.
    AssetPtr executeIntoCloud() {
        m_task->setMakeUbiquitous(true);
        return m_task->executeWithTargetDirectory_error(m_folder.url("cloud"), &m_error);
    }
    [[nodiscard]] Names booksInCloud() const {
        Names all = names("cloud");
        std::erase(all, ".stfolder");
        return all;
    }

private:
    TemporaryDirectory m_locks;
    EnvironmentValue m_runtime{"XDG_RUNTIME_DIR", m_locks.path().string()};
};

TEST_F(PlacingInstalls, AReplacingUpdateLandsUnderTheOldAssetsName) {
    const AssetPtr old = asset("library/Old Name.pdf", "old");
    makeTask(asset("new.pdf", "new"), /*stages=*/true);
    m_task->setUpdatingAsset(old);
    m_task->setReplaceExisting(true);

    const AssetPtr installed = execute();

    ASSERT_TRUE(installed);
    EXPECT_EQ(installed->url(), m_folder.url("library/Old Name.pdf"));
    EXPECT_EQ(names("library"), Names{"Old Name.pdf"});
    EXPECT_EQ(m_folder.read("library/Old Name.pdf"), "new");
}

TEST_F(PlacingInstalls, AnUpdateThatDoesNotReplaceIsMovedLikeANewAsset) {
    const AssetPtr old = asset("library/old.pdf", "old");
    makeTask(asset("new.pdf", "new"), /*stages=*/true);
    m_task->setUpdatingAsset(old);

    const AssetPtr installed = execute();

    ASSERT_TRUE(installed);
    EXPECT_EQ(names("library"), (Names{"new.pdf", "old.pdf"}));
}

TEST_F(PlacingInstalls, ANewAssetReplacesItsNamesakeIfAsked) {
    m_folder.write("library/a.pdf", "old");
    makeTask(asset("a.pdf", "new"), /*stages=*/true);
    m_task->setReplaceExisting(true);

    ASSERT_TRUE(execute());

    EXPECT_EQ(names("library"), Names{"a.pdf"});
    EXPECT_EQ(m_folder.read("library/a.pdf"), "new");
}

TEST_F(PlacingInstalls, ANewPDFCountsUpIfAsked) {
    m_folder.write("library/a.pdf", "old");
    makeTask(asset("a.pdf", "new"), /*stages=*/true);
    m_task->setRenameIfCollision(true);

    const AssetPtr installed = execute();

    ASSERT_TRUE(installed);
    EXPECT_EQ(installed->url(), m_folder.url("library/a 1.pdf"));
    EXPECT_EQ(m_folder.read("library/a.pdf"), "old");
}

TEST_F(PlacingInstalls, ANewBookIsNamedAfterItsIdentifierIfAsked) {
    const auto source = zippedBook("Book.epub");
    const Value storeID = "4711";
    source->setStoreID(&storeID);
    makeTask(source, /*stages=*/true);
    m_task->setUseAssetIDFileName(true);

    const AssetPtr installed = execute();

    ASSERT_TRUE(installed);
    EXPECT_EQ(names("library"), Names{"4711.epub"});
}

TEST_F(PlacingInstalls, AnUpdateThatNamesNoItemIsNotPlacedAndTheOldLibraryStays) {
    for (const char* path : {"/", "/some/.."}) {
        m_folder.write("library/kept.pdf", "kept");
        makeTask(asset("new.pdf", "new"), /*stages=*/true);
        m_task->setUpdatingAsset(recordAt(URL::fileURLWithPath(path)));
        m_task->setReplaceExisting(true);

        EXPECT_FALSE(execute()) << path;

        EXPECT_EQ(names("library"), Names{"kept.pdf"}) << path;
        EXPECT_EQ(names("staging"), Names{}) << path;
    }
}

TEST_F(PlacingInstalls, ANewBookGoesIntoSynchronisedStorageUnderItsSanitisedName) {
    const auto source = zippedBook("Book.epub");
    source->setTitle("My: Book?");
    makeTask(source, /*stages=*/true);

    const AssetPtr installed = executeIntoCloud();

    ASSERT_TRUE(installed);
    EXPECT_EQ(installed->url(), m_folder.url("cloud/My Book.epub"));
    EXPECT_EQ(booksInCloud(), Names{"My Book.epub"});
    EXPECT_EQ(names("staging"), Names{});
}

TEST_F(PlacingInstalls, ANewBookReplacesNoneInSynchronisedStorageThoughAsked) {
    m_folder.write("cloud/Book.epub", "other");
    makeTask(zippedBook("Book.epub"), /*stages=*/true);
    m_task->setReplaceExisting(true);

    const AssetPtr installed = executeIntoCloud();

    ASSERT_TRUE(installed);
    EXPECT_EQ(installed->url(), m_folder.url("cloud/Book 1.epub"));
    EXPECT_EQ(booksInCloud(), (Names{"Book 1.epub", "Book.epub"}));
    EXPECT_EQ(m_folder.read("cloud/Book.epub"), "other");
}

TEST_F(PlacingInstalls, AnUpdateReplacesTheBookInSynchronisedStorage) {
    m_folder.write("cloud/Old.epub/OPS/old", "old");
    const AssetPtr old = recordAt(m_folder.url("cloud/Old.epub"));
    const auto source = zippedBook("New.epub");
    source->setTitle("New");
    makeTask(source, /*stages=*/true);
    m_task->setUpdatingAsset(old);
    m_task->setReplaceExisting(true);

    const AssetPtr installed = executeIntoCloud();

    ASSERT_TRUE(installed);
    EXPECT_EQ(installed->url(), m_folder.url("cloud/New.epub"));
    EXPECT_EQ(booksInCloud(), Names{"New.epub"});
    EXPECT_TRUE(m_task->updatingAsset()->hasPendingUpdates());
}

TEST_F(PlacingInstalls, AFolderThatNobodySynchronisesFailsTheInstall) {
    makeTask(asset("a.pdf"), /*stages=*/true);
    m_task->setMakeUbiquitous(true);

    EXPECT_FALSE(execute());

    EXPECT_EQ(m_error, makePOSIXError(ENOTSUP, m_folder.url("library/a.pdf")));
    EXPECT_EQ(names("staging"), Names{});
}

TEST_F(PlacingInstalls, AfterASuccessTheUpdatedAssetHasPendingUpdates) {
    const auto old = asset("library/old.pdf", "old");
    old->setTitle("Title");
    makeTask(asset("new.pdf"), /*stages=*/true);
    m_task->setUpdatingAsset(old);

    ASSERT_TRUE(execute());

    ASSERT_TRUE(m_task->updatingAsset());
    EXPECT_NE(m_task->updatingAsset(), old);
    EXPECT_TRUE(m_task->updatingAsset()->hasPendingUpdates());
    EXPECT_EQ(m_task->updatingAsset()->title(), "Title");
    EXPECT_FALSE(old->hasPendingUpdates());
}

TEST_F(PlacingInstalls, AfterAFailureTheUpdatedAssetIsTheSame) {
    const AssetPtr old = asset("library/new.pdf", "old");
    makeTask(asset("new.pdf"), /*stages=*/true);
    m_task->setUpdatingAsset(old);

    EXPECT_FALSE(execute());

    EXPECT_EQ(m_task->updatingAsset(), old);
}

}  // namespace
}  // namespace parvel::testing
