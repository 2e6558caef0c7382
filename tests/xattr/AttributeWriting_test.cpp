#include "parvel/xattr/AttributeWriting.h"

#include <sys/stat.h>

#include <filesystem>

#include <gtest/gtest.h>

#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "parvel/platform/DirectoryEnumerator.h"
#include "parvel/platform/ResourceQueries.h"
#include "parvel/platform/Service.h"
#include "parvel/xattr/PNMetadataXattr.h"
#include "tests/support/AttributeFolder.h"
#include "tests/support/ForwardingXattrStore.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/RefusingSizeQuery.h"

namespace parvel::testing {
namespace {

namespace fs = std::filesystem;
using Text = std::optional<std::string>;

class AttributeWriting : public AttributeFolder {
protected:
    MutableAssetPtr record(const URL& url) const {
        const auto record = PVAssetMetadata::metadataWithURL_dictionary(url, nullptr);
        record->setGeneratedID("ID");
        record->setTitle("Title");
        record->setAuthor("Author");
        record->setGenre("Genre");
        return record;
    }

    std::optional<Error> m_error;
};

TEST_F(AttributeWriting, SettingWritesIdentityTitleAuthorAndGenre) {
    const URL url = file();

    EXPECT_TRUE(setAttributesForAsset(record(url), &m_error));

    EXPECT_EQ(stored(url, PNMetadataXattrAssetID), "ID");
    EXPECT_EQ(stored(url, PNMetadataXattrTitle), "Title");
    EXPECT_EQ(stored(url, PNMetadataXattrAuthor), "Author");
    EXPECT_EQ(stored(url, PNMetadataXattrGenre), "Genre");
    EXPECT_EQ(stored(url, PNMetadataXattrExplicit), Text());
    EXPECT_FALSE(m_error);
}

TEST_F(AttributeWriting, SettingMarksAnExplicitAssetWithOne) {
    const URL url = file();
    const auto asset = record(url);
    asset->setExplicit(true);

    EXPECT_TRUE(setAttributesForAsset(asset, &m_error));

    EXPECT_EQ(stored(url, PNMetadataXattrExplicit), "1");
}

TEST_F(AttributeWriting, SettingNeverRemovesAnAbsentValuesAttribute) {
    const URL url = file();
    setStored(url, PNMetadataXattrTitle, "kept");
    const auto asset = record(url);
    asset->setTitle(std::nullopt);

    EXPECT_TRUE(setAttributesForAsset(asset, &m_error));

    EXPECT_EQ(stored(url, PNMetadataXattrTitle), "kept");
}

TEST_F(AttributeWriting, SettingTwiceWritesNothingTheSecondTime) {
    const URL url = file();
    const auto asset = record(url);
    ASSERT_TRUE(setAttributesForAsset(asset, nullptr));
    asset->setTitle("Changed");

    EXPECT_TRUE(setAttributesForAsset(asset, &m_error));

    EXPECT_EQ(stored(url, PNMetadataXattrTitle), "Title");
}

TEST_F(AttributeWriting, AStoredIdentityOfAnyAssetKeepsItsAttributes) {
    const URL url = file();
    setStored(url, PNMetadataXattrAssetID, "");

    EXPECT_TRUE(setAttributesForAsset(record(url), &m_error));

    EXPECT_EQ(stored(url, PNMetadataXattrTitle), Text());
}

TEST_F(AttributeWriting, SettingNeedsAURLAndAnAssetID) {
    EXPECT_FALSE(setAttributesForAsset(nullptr, &m_error));
    EXPECT_EQ(m_error, makeMissingURLError());

    const auto asset = record(file());
    asset->setGeneratedID(std::nullopt);
    EXPECT_FALSE(setAttributesForAsset(asset, &m_error));
    EXPECT_EQ(m_error, makeNoIdentityError());
}

TEST_F(AttributeWriting, UpdatingWritesWhatDiffers) {
    const URL url = file();
    const auto asset = record(url);
    ASSERT_TRUE(setAttributesForAsset(asset, nullptr));
    asset->setTitle("Changed");
    asset->setSortTitle("never written");

    EXPECT_TRUE(updateAttributesForAsset(asset, &m_error));

    EXPECT_EQ(stored(url, PNMetadataXattrTitle), "Changed");
    EXPECT_EQ(stored(url, PNMetadataXattrSortTitle), Text());
}

TEST_F(AttributeWriting, UpdatingWritesEachOfTitleAuthorAndGenreByItself) {
    const URL url = file();
    const auto asset = record(url);
    ASSERT_TRUE(setAttributesForAsset(asset, nullptr));

    asset->setAuthor("Another");
    EXPECT_TRUE(updateAttributesForAsset(asset, &m_error));
    EXPECT_EQ(stored(url, PNMetadataXattrAuthor), "Another");
    EXPECT_EQ(stored(url, PNMetadataXattrTitle), "Title");

    asset->setGenre("Other");
    EXPECT_TRUE(updateAttributesForAsset(asset, &m_error));
    EXPECT_EQ(stored(url, PNMetadataXattrGenre), "Other");

    asset->setTitle("");
    EXPECT_TRUE(updateAttributesForAsset(asset, &m_error));
    EXPECT_EQ(stored(url, PNMetadataXattrTitle), "");
    EXPECT_FALSE(m_error);
}

TEST_F(AttributeWriting, UpdatingLeavesWhatTheRecordLacks) {
    const URL url = file();
    ASSERT_TRUE(setAttributesForAsset(record(url), nullptr));
    const auto bare = PVAssetMetadata::metadataWithURL_dictionary(url, nullptr);
    bare->setGeneratedID("ID");

    EXPECT_FALSE(updateAttributesForAsset(bare, &m_error));

    EXPECT_EQ(stored(url, PNMetadataXattrTitle), "Title");
    EXPECT_EQ(stored(url, PNMetadataXattrAuthor), "Author");
    EXPECT_EQ(stored(url, PNMetadataXattrGenre), "Genre");
    EXPECT_FALSE(m_error);
}

TEST_F(AttributeWriting, UpdatingWithNothingChangedIsFalseWithoutAnError) {
    const auto asset = record(file());
    ASSERT_TRUE(setAttributesForAsset(asset, nullptr));

    EXPECT_FALSE(updateAttributesForAsset(asset, &m_error));

    EXPECT_FALSE(m_error);
}

TEST_F(AttributeWriting, AnAbsentStoredValueCountsAsDifferent) {
    const URL url = file();
    setStored(url, PNMetadataXattrAssetID, "ID");

    EXPECT_TRUE(updateAttributesForAsset(record(url), &m_error));

    EXPECT_EQ(stored(url, PNMetadataXattrGenre), "Genre");
}

TEST_F(AttributeWriting, UpdatingSetsTheExplicitMarkButNeverClearsIt) {
    const URL url = file();
    setStored(url, PNMetadataXattrAssetID, "ID");
    setStored(url, PNMetadataXattrExplicit, "no");
    const auto asset = record(url);
    asset->setExplicit(true);
    EXPECT_TRUE(updateAttributesForAsset(asset, &m_error));
    EXPECT_EQ(stored(url, PNMetadataXattrExplicit), "1");

    setStored(url, PNMetadataXattrExplicit, "yes");
    EXPECT_FALSE(updateAttributesForAsset(asset, &m_error));
    EXPECT_EQ(stored(url, PNMetadataXattrExplicit), "yes");

    asset->setExplicit(false);
    EXPECT_FALSE(updateAttributesForAsset(asset, &m_error));
    EXPECT_EQ(stored(url, PNMetadataXattrExplicit), "yes");
}

TEST_F(AttributeWriting, AnotherAssetsAttributesAreNeverOverwritten) {
    const URL url = file();
    setStored(url, PNMetadataXattrAssetID, "another");

    EXPECT_FALSE(updateAttributesForAsset(record(url), &m_error));

    EXPECT_EQ(m_error, makeNoIdentityError());
    EXPECT_EQ(stored(url, PNMetadataXattrTitle), Text());
}

TEST_F(AttributeWriting, UpdatingNeedsAURLAnAssetIDAndReadableAttributes) {
    EXPECT_FALSE(updateAttributesForAsset(nullptr, &m_error));
    EXPECT_EQ(m_error, makeMissingURLError());

    const auto asset = record(file());
    setStored(*asset->url(), PNMetadataXattrAssetID, "ID");
    asset->setGeneratedID(std::nullopt);
    EXPECT_FALSE(updateAttributesForAsset(asset, &m_error));
    EXPECT_EQ(m_error, makeNoIdentityError());

    m_error.reset();
    EXPECT_FALSE(updateAttributesForAsset(record(m_folder.url("gone.epub")), &m_error));
    EXPECT_EQ(m_error, makeNoIdentityError());
}

TEST_F(AttributeWriting, WritingNothingIsFalseWithoutAnError) {
    EXPECT_FALSE(writeAttributes({}, file(), &m_error));
    EXPECT_FALSE(writeAttributes({{"name", "value"}}, std::nullopt, &m_error));

    EXPECT_FALSE(m_error);
}

/// Notes the order of writes and fails one of them.
class FailingWrites : public ForwardingXattrStore {
public:
    int set(const std::string& path, const std::string& name,
            std::span<const std::byte> value) override {
        names.push_back(name);
        return name == failing ? ENOSPC : ForwardingXattrStore::set(path, name, value);
    }
    std::vector<std::string> names;
    std::string failing;
};

TEST_F(AttributeWriting, TheIdentityIsWrittenLast) {
    FailingWrites store;

    EXPECT_TRUE(setAttributesForAsset(record(file()), &m_error));

    EXPECT_EQ(store.names,
              (std::vector<std::string>{
                  std::string(PNMetadataXattrAuthor), std::string(PNMetadataXattrGenre),
                  std::string(PNMetadataXattrTitle), std::string(PNMetadataXattrAssetID)}));
}

TEST_F(AttributeWriting, TheFirstFailureEndsTheWritingAndKeepsWhatWasWritten) {
    const URL url = file();
    FailingWrites store;
    store.failing = PNMetadataXattrGenre;

    EXPECT_FALSE(setAttributesForAsset(record(url), &m_error));

    EXPECT_EQ(m_error, makePOSIXError(ENOSPC, url));
    EXPECT_EQ(stored(url, PNMetadataXattrAuthor), "Author");
    EXPECT_EQ(stored(url, PNMetadataXattrTitle), Text());
    EXPECT_EQ(stored(url, PNMetadataXattrAssetID), Text());
}

TEST_F(AttributeWriting, APackagesVisibleFilesGetMode0600AndTheirSizesAreSummed) {
    const std::string file = m_folder.write("p.epub/OPS/a", std::string(5000, 'x'));
    m_folder.write("p.epub/b", "x");
    const std::string hidden = m_folder.write("p.epub/.hidden/c", std::string(9000, 'x'));
    const std::string outside = m_folder.write("outside", "x");
    for (const std::string& path : {file, hidden, outside, m_folder / "p.epub/b"})
        fs::permissions(path, fs::perms{0755});
    fs::permissions(m_folder / "p.epub/OPS", fs::perms{0750});
    fs::create_symlink(outside, m_folder / "p.epub/link");

    const std::uint64_t size =
        fixPermissionsAndCalculateAllocatedSize(m_folder.url("p.epub"), &m_error);

    struct stat a {};
    struct stat b {};
    ASSERT_EQ(stat(file.c_str(), &a), 0);
    ASSERT_EQ(stat((m_folder / "p.epub/b").c_str(), &b), 0);
    EXPECT_EQ(size, static_cast<std::uint64_t>(a.st_blocks + b.st_blocks) * 512);
    EXPECT_EQ(a.st_mode & 0777, 0600U);
    EXPECT_EQ(b.st_mode & 0777, 0600U);
    EXPECT_EQ(fs::status(hidden).permissions(), fs::perms{0755});
    EXPECT_EQ(fs::status(outside).permissions(), fs::perms{0755});
    EXPECT_EQ(fs::status(m_folder / "p.epub/OPS").permissions(), fs::perms{0750});
    EXPECT_FALSE(m_error);
}

TEST_F(AttributeWriting, ASingleFileKeepsItsModeAndGivesItsSize) {
    const URL url = file();
    fs::permissions(url.path(), fs::perms{0644});
    m_error = makeNoIdentityError();

    const std::uint64_t size = fixPermissionsAndCalculateAllocatedSize(url, &m_error);

    struct stat status {};
    ASSERT_EQ(stat(url.path().c_str(), &status), 0);
    EXPECT_EQ(size, static_cast<std::uint64_t>(status.st_blocks) * 512);
    EXPECT_EQ(status.st_mode & 0777, 0644U);
    EXPECT_FALSE(m_error);
}

TEST_F(AttributeWriting, AnItemThatCanNotBeQueriedHasNoSizeAndSaysWhy) {
    RecordedLog log;

    EXPECT_EQ(fixPermissionsAndCalculateAllocatedSize(m_folder.url("gone"), &m_error), 0U);

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile, m_folder.url("gone")));
    EXPECT_EQ(log.lines(), std::vector<std::string>{"error Failed to state file for directory"});
}

TEST_F(AttributeWriting, AFileWhoseSizeCanNotBeToldGivesNoneAndNoError) {
    const URL url = file();
    m_error = makeNoIdentityError();
    const RefusingSizeQuery queries;
    RecordedLog log;

    EXPECT_EQ(fixPermissionsAndCalculateAllocatedSize(url, &m_error), 0U);

    EXPECT_FALSE(m_error);
    EXPECT_EQ(log.lines(), std::vector<std::string>{"error Failed to stat file for size"});
}

/// Shows one entry of which nothing can be told.
class UnknownEntries : public DirectoryEnumerator {
public:
    class Unknown : public Entry {
    public:
        explicit Unknown(std::vector<unsigned>& modes) : m_modes(modes) {}
        std::optional<bool> isDirectory() const override { return std::nullopt; }
        std::optional<std::uint64_t> totalAllocatedSize() const override { return std::nullopt; }
        bool setPermissions(unsigned mode) const override {
            m_modes.push_back(mode);
            return false;
        }

    private:
        std::vector<unsigned>& m_modes;
    };
    void enumerate(const URL&, const std::function<void(const Entry&)>& visit) override {
        visit(Unknown(modes));
    }
    std::vector<unsigned> modes;

private:
    Service<DirectoryEnumerator>::Replacement m_replacement{*this};
};

TEST_F(AttributeWriting, AnEntryOfUnknownKindGetsTheModeAndCountsNothing) {
    fs::create_directory(m_folder / "p.epub");
    UnknownEntries entries;

    EXPECT_EQ(fixPermissionsAndCalculateAllocatedSize(m_folder.url("p.epub"), &m_error), 0U);

    EXPECT_EQ(entries.modes, std::vector<unsigned>{0600U});
    EXPECT_FALSE(m_error);
}

class UnreadableIdentity : public ForwardingXattrStore {
public:
    int size(const std::string&, const std::string&, std::size_t&) override { return EIO; }
};

TEST_F(AttributeWriting, AFailedReadOfTheIdentityIsTheErrorOfASetThatWrites) {
    const URL url = file();
    UnreadableIdentity store;

    EXPECT_TRUE(setAttributesForAsset(record(url), &m_error));

    EXPECT_EQ(m_error, makePOSIXError(EIO, std::nullopt));
    EXPECT_EQ(stored(url, PNMetadataXattrTitle), "Title");
}

TEST_F(AttributeWriting, AFileWithoutAnIdentityIsNotUpdated) {
    const URL url = file();

    EXPECT_FALSE(updateAttributesForAsset(record(url), &m_error));

    EXPECT_EQ(m_error, makeNoIdentityError());
    EXPECT_EQ(stored(url, PNMetadataXattrTitle), Text());
}

TEST_F(AttributeWriting, AStoreIDIsTheIdentityThatIsWritten) {
    const URL url = file();
    const auto asset = record(url);
    const Value storeID("42");
    asset->setStoreID(&storeID);

    EXPECT_TRUE(setAttributesForAsset(asset, &m_error));

    EXPECT_EQ(stored(url, PNMetadataXattrAssetID), "42");
}

TEST_F(AttributeWriting, AValueThatIsNoTextRemovesNothing) {
    const URL url = file();
    setStored(url, PNMetadataXattrTitle, "kept");

    EXPECT_TRUE(writeAttributes({{String(PNMetadataXattrTitle), Number::real(1)}}, url, &m_error));

    EXPECT_EQ(stored(url, PNMetadataXattrTitle), "kept");
}

TEST(AttributeNames, AreTheseEighteen) {
    EXPECT_EQ(PNMetadataXattrAssetID, "com.kestrel.Folium.assetID");
    EXPECT_EQ(PNMetadataXattrTitle, "com.kestrel.Folium.title");
    EXPECT_EQ(PNMetadataXattrSortTitle, "com.kestrel.Folium.sortTitle");
    EXPECT_EQ(PNMetadataXattrAuthor, "com.kestrel.Folium.author");
    EXPECT_EQ(PNMetadataXattrSortAuthor, "com.kestrel.Folium.sortAuthor");
    EXPECT_EQ(PNMetadataXattrGenre, "com.kestrel.Folium.genre");
    EXPECT_EQ(PNMetadataXattrComments, "com.kestrel.Folium.comments");
    EXPECT_EQ(PNMetadataXattrBookDescription, "com.kestrel.Folium.bookDescription");
    EXPECT_EQ(PNMetadataXattrYear, "com.kestrel.Folium.year");
    EXPECT_EQ(PNMetadataXattrExplicit, "com.kestrel.Folium.explicit");
    EXPECT_EQ(PNMetadataXattrLastOpened, "com.kestrel.Folium.lastOpened");
    EXPECT_EQ(PNMetadataXattrFirstOpened, "com.kestrel.Folium.firstOpened");
    EXPECT_EQ(PNMetadataXattrRating, "com.kestrel.Folium.rating");
    EXPECT_EQ(PNMetadataXattrCollectionID, "com.kestrel.Folium.collectionID");
    EXPECT_EQ(PNMetadataXattrReadingLocation, "com.kestrel.Folium.readingLocation");
    EXPECT_EQ(PNMetadataXattrHighWaterMark, "com.kestrel.Folium.highWaterMark");
    EXPECT_EQ(PNMetadataXattrOptionFlags, "com.kestrel.Folium.optionFlags");
    EXPECT_EQ(PNMetadataXattrThumbnail, "com.kestrel.Folium.thumbnail");
}

}  // namespace
}  // namespace parvel::testing
