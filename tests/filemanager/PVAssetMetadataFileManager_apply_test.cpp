#include <gtest/gtest.h>

#include "parvel/xattr/PNMetadataXattr.h"
#include "tests/support/EnvironmentValue.h"
#include "tests/support/ForwardingXattrStore.h"
#include "tests/support/ManagedFolder.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/Records.h"
#include "tests/support/RefusingServices.h"

namespace parvel::testing {
namespace {

/// A library and a freshly downloaded version of a book beside it.
class ApplyingUpdates : public ManagedFolder {
protected:
    ApplyingUpdates() { makeFolder("library"); }

    MutableAssetPtr book(const std::string& name, const std::string& content, Dictionary entries) {
        return PVAssetMetadata::metadataWithURL_dictionary(asset(name, content)->url(), &entries);
    }
    MutableAssetPtr newVersion() {
        return book("new.epub", "new", {{"itemId", "77"}, {"itemName", "New"}});
    }
    AssetPtr apply(const AssetPtr& update, const AssetPtr& existing) {
        return m_manager->applyUpdate_onExistingAsset_targetDirectory_error(
            update, existing, m_folder.url("library"), &m_error);
    }
    void refuseAll() {
        m_manager->setFileManager(
            std::make_shared<RefusingFileSystem>([](auto, const URL&) { return true; }));
    }

private:
    TemporaryDirectory m_locks;
    EnvironmentValue m_runtime{"XDG_RUNTIME_DIR", m_locks.path().string()};
};

/// A file system that keeps no attributes.
class UnwritableXattrStore : public ForwardingXattrStore {
public:
    int set(const std::string&, const std::string&, std::span<const std::byte>) override {
        return ENOTSUP;
    }
};

TEST_F(ApplyingUpdates, ANewBookGoesIntoTheDirectoryUnderItsID) {
    const auto update = newVersion();
    update->setHasPendingUpdates(true);

    const AssetPtr applied = apply(update, nullptr);

    ASSERT_TRUE(applied);
    EXPECT_EQ(names("library"), Names{"77.epub"});
    EXPECT_EQ(names(), Names{"library"});
    EXPECT_EQ(applied->url(), m_folder.url("library/77.epub"));
    EXPECT_FALSE(applied->hasPendingUpdates());
    EXPECT_EQ(applied->generationCount(), update->generationCount() + 1);
}

TEST_F(ApplyingUpdates, ANewBookIsStampedBeforeItMoves) {
    const AssetPtr applied = apply(newVersion(), nullptr);

    ASSERT_TRUE(applied);
    EXPECT_TRUE(applied->_hasAllocatedSize());
    if (m_error)
        GTEST_SKIP() << "no extended attributes here";
    const auto attributes = m_manager->extendedAttributesForAsset_error(applied);
    ASSERT_TRUE(attributes);
    EXPECT_EQ(valueOf(attributes->find(PNMetadataXattrAssetID)), Value("77"));
}

TEST_F(ApplyingUpdates, ANewVersionReplacesTheFileOfItsID) {
    const auto existing = book("library/77.epub", "old", {{"itemId", "77"}});

    const AssetPtr applied = apply(newVersion(), existing);

    ASSERT_TRUE(applied);
    EXPECT_EQ(names("library"), Names{"77.epub"});
    EXPECT_EQ(m_folder.read("library/77.epub"), "new");
}

TEST_F(ApplyingUpdates, TheExistingRecordComesBackWithTheNewOnesEntries) {
    const auto existing = book("library/77.epub", "old",
                               {{"itemId", "77"},
                                {"itemName", "Old"},
                                {"genre", "Crime"},
                                {"PVGeneratedItemId", "G"},
                                {"PVGenerationCount", integerValue(5)}});
    existing->setHasPendingUpdates(true);
    const auto update = newVersion();

    const AssetPtr applied = apply(update, existing);

    ASSERT_TRUE(applied);
    EXPECT_EQ(applied->title(), "New");
    EXPECT_EQ(valueOf(applied->genre()), Value("Crime"));
    EXPECT_FALSE(applied->hasPendingUpdates());
    EXPECT_EQ(applied->generationCount(), update->generationCount() + 1);
    EXPECT_EQ(applied->url(), m_folder.url("library/77.epub"));
    EXPECT_TRUE(existing->hasPendingUpdates());
    EXPECT_EQ(existing->title(), "Old");
}

TEST_F(ApplyingUpdates, AnExistingBookUnderAnotherNameStaysBesideTheNewOne) {
    const auto existing = book("library/my book.epub", "old", {{"itemId", "77"}});

    ASSERT_TRUE(apply(newVersion(), existing));

    EXPECT_EQ(names("library"), (Names{"77.epub", "my book.epub"}));
    EXPECT_EQ(m_folder.read("library/my book.epub"), "old");
}

TEST_F(ApplyingUpdates, APDFKeepsItsOwnNameAndReplaces) {
    book("library/a.pdf", "old", {});

    const AssetPtr applied = apply(book("a.pdf", "new", {{"itemId", "77"}}), nullptr);

    ASSERT_TRUE(applied);
    EXPECT_EQ(names("library"), Names{"a.pdf"});
    EXPECT_EQ(m_folder.read("library/a.pdf"), "new");
}

TEST_F(ApplyingUpdates, ASynchronisedBookIsReplacedInItsStorageUnderTheNewTitle) {
    makeFolder("cloud/.stfolder");
    const auto existing = book("cloud/Old.epub", "old", {{"itemId", "77"}, {"itemName", "Old"}});

    const AssetPtr applied = apply(newVersion(), existing);

    ASSERT_TRUE(applied);
    EXPECT_EQ(names("library"), Names{});
    EXPECT_EQ(names("cloud"), (Names{".stfolder", "New.epub"}));
    EXPECT_EQ(m_folder.read("cloud/New.epub"), "new");
    EXPECT_EQ(applied->url(), m_folder.url("cloud/New.epub"));
    EXPECT_FALSE(m_error);
}

TEST_F(ApplyingUpdates, AFailedMoveOfANewBookIsNone) {
    const auto update = newVersion();
    refuseAll();

    EXPECT_FALSE(apply(update, nullptr));
    EXPECT_EQ(m_error, makePOSIXError(EIO, m_folder.url("new.epub")));
    EXPECT_EQ(m_folder.read("new.epub"), "new");
    EXPECT_EQ(names("library"), Names{});
}

TEST_F(ApplyingUpdates, AFailedMoveGivesTheExistingRecordAllTheSame) {
    const auto existing = book("library/77.epub", "old", {{"itemId", "77"}, {"itemName", "Old"}});
    existing->setHasPendingUpdates(true);
    const auto update = newVersion();
    refuseAll();

    const AssetPtr applied = apply(update, existing);

    ASSERT_TRUE(applied);
    EXPECT_EQ(applied->title(), "Old");
    EXPECT_FALSE(applied->hasPendingUpdates());
    EXPECT_EQ(applied->generationCount(), existing->generationCount() + 1);
    EXPECT_EQ(m_error, makePOSIXError(EIO, m_folder.url("new.epub")));
    EXPECT_EQ(m_folder.read("library/77.epub"), "old");
    EXPECT_EQ(m_folder.read("new.epub"), "new");
}

TEST_F(ApplyingUpdates, WithoutAnUpdateThereIsNone) {
    const auto existing = book("library/77.epub", "old", {});

    EXPECT_FALSE(apply(nullptr, existing));
    EXPECT_FALSE(apply(nullptr, nullptr));
    EXPECT_EQ(m_folder.read("library/77.epub"), "old");
}

TEST_F(ApplyingUpdates, AnUpdateThatCanNotBeStampedIsMovedWithTheErrorBesideItsRecord) {
    const UnwritableXattrStore noAttributes;
    const auto update = newVersion();

    const AssetPtr applied = apply(update, nullptr);

    ASSERT_TRUE(applied);
    EXPECT_EQ(names("library"), Names{"77.epub"});
    EXPECT_TRUE(applied->_hasAllocatedSize());
    EXPECT_EQ(m_error, makePOSIXError(ENOTSUP, m_folder.url("new.epub")));
}

TEST_F(ApplyingUpdates, AnUpdateThatIsMissingFailsAtTheMove) {
    const Dictionary identity{{"itemId", "77"}};
    const auto missing =
        PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("missing.epub"), &identity);

    EXPECT_FALSE(apply(missing, nullptr));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile, m_folder.url("missing.epub")));
    EXPECT_EQ(names("library"), Names{});
}

TEST_F(ApplyingUpdates, AnUpdateWithoutURLHasNothingToMove) {
    const auto existing = book("library/77.epub", "old", {{"itemId", "77"}, {"genre", "Crime"}});

    EXPECT_FALSE(apply(recordOver({{"itemId", "77"}}), nullptr));
    EXPECT_EQ(m_error, makeMissingURLError());

    m_error.reset();
    const AssetPtr applied = apply(recordOver({{"itemId", "77"}, {"genre", "Other"}}), existing);
    ASSERT_TRUE(applied);
    EXPECT_EQ(m_error, makeMissingURLError());
    EXPECT_EQ(valueOf(applied->genre()), Value("Crime"));
    EXPECT_EQ(m_folder.read("library/77.epub"), "old");
}

TEST_F(ApplyingUpdates, ABookWithoutIDHasNoNameToMoveTo) {
    RecordedLog log;

    EXPECT_FALSE(apply(book("new.epub", "new", {}), nullptr));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::Corrupt, std::nullopt));
    EXPECT_EQ(log.lines().back(), "error Failed to rename imported book");
    EXPECT_EQ(m_folder.read("new.epub"), "new");
    EXPECT_EQ(names("library"), Names{});
}

TEST_F(ApplyingUpdates, AFailedReplacementInSynchronisedStorageGivesTheExistingRecord) {
    makeFolder("cloud/.stfolder");
    const auto existing = book("cloud/Old.epub", "old", {{"itemId", "77"}, {"itemName", "Old"}});
    existing->setHasPendingUpdates(true);
    const auto update = newVersion();
    refuseAll();

    const AssetPtr applied = apply(update, existing);

    ASSERT_TRUE(applied);
    EXPECT_EQ(m_error, makePOSIXError(EIO, m_folder.url("new.epub")));
    EXPECT_EQ(applied->title(), "Old");
    EXPECT_EQ(applied->url(), m_folder.url("cloud/Old.epub"));
    EXPECT_FALSE(applied->hasPendingUpdates());
    EXPECT_EQ(applied->generationCount(), existing->generationCount() + 1);
    EXPECT_EQ(m_folder.read("cloud/Old.epub"), "old");
    EXPECT_EQ(m_folder.read("new.epub"), "new");
}

TEST_F(ApplyingUpdates, WithoutAPlaceForTheErrorAFailureIsTheSame) {
    const auto existing = book("library/77.epub", "old", {{"itemId", "77"}});
    const auto update = newVersion();
    refuseAll();

    EXPECT_FALSE(m_manager->applyUpdate_onExistingAsset_targetDirectory_error(
        update, nullptr, m_folder.url("library")));
    EXPECT_TRUE(m_manager->applyUpdate_onExistingAsset_targetDirectory_error(
        update, existing, m_folder.url("library")));
}

}  // namespace
}  // namespace parvel::testing
