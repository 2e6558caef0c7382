#include "parvel/xattr/AttributeDictionary.h"

#include <gtest/gtest.h>

#include <cerrno>

#include "parvel/xattr/PNMetadataXattr.h"
#include "tests/support/AttributeFolder.h"
#include "tests/support/ForwardingXattrStore.h"
#include "tests/support/RecordedLog.h"

namespace parvel::testing {
namespace {

using AttributeDictionary = AttributeFolder;

constexpr std::string_view dictionaryNames[] = {
    PNMetadataXattrAssetID,  PNMetadataXattrTitle,           PNMetadataXattrSortTitle,
    PNMetadataXattrAuthor,   PNMetadataXattrSortAuthor,      PNMetadataXattrGenre,
    PNMetadataXattrComments, PNMetadataXattrBookDescription, PNMetadataXattrYear,
    PNMetadataXattrExplicit, PNMetadataXattrLastOpened,      PNMetadataXattrFirstOpened,
    PNMetadataXattrRating,
};

/// Records which attributes are asked for, and can refuse the list or one of them.
class WatchedStore : public ForwardingXattrStore {
public:
    int size(const std::string& path, const std::string& name, std::size_t& size) override {
        return name == m_refused ? EIO : ForwardingXattrStore::size(path, name, size);
    }
    int get(const std::string& path, const std::string& name, std::span<std::byte> buffer,
            std::size_t& length) override {
        m_asked.push_back(name);
        return name == m_refused ? EIO : ForwardingXattrStore::get(path, name, buffer, length);
    }
    int list(const std::string& path, std::vector<std::string>& names) override {
        return m_listFails ? EIO : ForwardingXattrStore::list(path, names);
    }

    std::vector<std::string> m_asked;
    std::string m_refused;
    bool m_listFails = false;
};

TEST_F(AttributeDictionary, HoldsTheThirteenNamesThatAreRead) {
    const URL url = file();
    Dictionary expected;
    for (const std::string_view name : dictionaryNames) {
        setStored(url, name, name.substr(name.rfind('.')));
        expected.set(name, name.substr(name.rfind('.')));
    }

    EXPECT_EQ(attributeDictionaryAtURL(url), expected);
}

TEST_F(AttributeDictionary, LeavesOutTheNamesThatAreTheClientsAlone) {
    const URL url = file();
    for (const std::string_view name :
         {PNMetadataXattrCollectionID, PNMetadataXattrReadingLocation, PNMetadataXattrHighWaterMark,
          PNMetadataXattrOptionFlags, PNMetadataXattrThumbnail})
        setStored(url, name, "x");
    setStored(url, "com.example.other", "x");

    EXPECT_EQ(attributeDictionaryAtURL(url), Dictionary());
}

TEST_F(AttributeDictionary, IsEmptyAndNotNoneForAFileWithoutAttributes) {
    EXPECT_EQ(attributeDictionaryAtURL(file()), Dictionary());
}

TEST_F(AttributeDictionary, KeepsAnEmptyValue) {
    const URL url = file();
    setStored(url, PNMetadataXattrGenre, "");

    EXPECT_EQ(attributeDictionaryAtURL(url), (Dictionary{{String(PNMetadataXattrGenre), ""}}));
}

TEST_F(AttributeDictionary, HoldsAValueOfAnyLength) {
    const URL url = file();
    for (const std::size_t length : {511, 512, 513, 2000}) {
        const std::string value(length, 'x');
        setStored(url, PNMetadataXattrComments, value);

        EXPECT_EQ(attributeDictionaryAtURL(url),
                  (Dictionary{{String(PNMetadataXattrComments), value}}));
    }
}

TEST_F(AttributeDictionary, EndsAValueAtItsFirstNUL) {
    const URL url = file();
    setStored(url, PNMetadataXattrGenre, std::string_view("Novel\0la", 8));

    EXPECT_EQ(attributeDictionaryAtURL(url), (Dictionary{{String(PNMetadataXattrGenre), "Novel"}}));
}

TEST_F(AttributeDictionary, LeavesOutAValueThatIsNoUTF8) {
    const URL url = file();
    setStored(url, PNMetadataXattrTitle, "\xFF");
    setStored(url, PNMetadataXattrGenre, "Novel");

    EXPECT_EQ(attributeDictionaryAtURL(url), (Dictionary{{String(PNMetadataXattrGenre), "Novel"}}));
}

TEST_F(AttributeDictionary, IsNoneForAFileThatIsNotThere) {
    EXPECT_EQ(attributeDictionaryAtURL(m_folder.url("absent.epub")), std::nullopt);
}

TEST_F(AttributeDictionary, IsNoneForAURLOfNoFile) {
    const URL url = file();
    setStored(url, PNMetadataXattrTitle, "x");

    EXPECT_EQ(attributeDictionaryAtURL(*URL::fromString("http://example.com" + url.path())),
              std::nullopt);
}

TEST(AttributeDictionaryWithoutAttributes, IsNoneWhereTheFileSystemKeepsNone) {
    const URL url = URL::fileURLWithPath("/proc/self/status");
    std::size_t size = 0;
    if (XattrStore::host().size(url.path(), "parvel", size) != ENOTSUP)
        GTEST_SKIP() << "/proc answers otherwise here";

    EXPECT_EQ(attributeDictionaryAtURL(url), std::nullopt);
}

TEST_F(AttributeDictionary, IsNoneWhenOneReadFails) {
    const URL url = file();
    setStored(url, PNMetadataXattrAssetID, "ID");
    setStored(url, PNMetadataXattrAuthor, "x");
    WatchedStore store;
    store.m_refused = PNMetadataXattrAuthor;

    EXPECT_EQ(attributeDictionaryAtURL(url), std::nullopt);
}

TEST_F(AttributeDictionary, AsksInTheOrderOfTheTableAndStopsAtTheFirstFailure) {
    const URL url = file();
    for (const std::string_view name : dictionaryNames)
        setStored(url, name, "x");
    WatchedStore store;
    store.m_refused = PNMetadataXattrSortTitle;

    EXPECT_EQ(attributeDictionaryAtURL(url), std::nullopt);

    const std::vector<std::string> expected{std::string(PNMetadataXattrAssetID),
                                            std::string(PNMetadataXattrTitle),
                                            std::string(PNMetadataXattrSortTitle)};
    EXPECT_EQ(store.m_asked, expected);
}

TEST_F(AttributeDictionary, AsksOnlyForTheFirstNameAndThoseThatStandThere) {
    const URL url = file();
    setStored(url, PNMetadataXattrRating, "5");
    WatchedStore store;

    EXPECT_TRUE(attributeDictionaryAtURL(url));

    const std::vector<std::string> expected{std::string(PNMetadataXattrAssetID),
                                            std::string(PNMetadataXattrRating)};
    EXPECT_EQ(store.m_asked, expected);
}

TEST_F(AttributeDictionary, ReadableAttributesAreAskedForOnlyWhereTheyStand) {
    const URL url = file();
    setStored(url, PNMetadataXattrRating, "5");
    WatchedStore store;

    EXPECT_EQ(readableAttributesAtURL(url), (Dictionary{{String(PNMetadataXattrRating), "5"}}));
    EXPECT_EQ(store.m_asked, std::vector<std::string>{std::string(PNMetadataXattrRating)});
}

TEST_F(AttributeDictionary, ReadableAttributesAreNoneAtAllWhenOneReadFails) {
    const URL url = file();
    setStored(url, PNMetadataXattrAssetID, "ID");
    setStored(url, PNMetadataXattrAuthor, "x");
    WatchedStore store;
    store.m_refused = PNMetadataXattrAuthor;

    EXPECT_EQ(readableAttributesAtURL(url), Dictionary());
}

TEST_F(AttributeDictionary, ReadableAttributesAreThoseOfThePlaceholder) {
    const URL placeholder = file("book.epub.nextcloud");
    setStored(placeholder, PNMetadataXattrTitle, "Far Away");

    EXPECT_EQ(readableAttributesAtURL(m_folder.url("book.epub")),
              (Dictionary{{String(PNMetadataXattrTitle), "Far Away"}}));
}

TEST_F(AttributeDictionary, AsksNameByNameWhereTheListFails) {
    const URL url = file();
    setStored(url, PNMetadataXattrAssetID, "ID");
    setStored(url, PNMetadataXattrRating, "5");
    WatchedStore store;
    store.m_listFails = true;

    EXPECT_EQ(attributeDictionaryAtURL(url), (Dictionary{{String(PNMetadataXattrAssetID), "ID"},
                                                         {String(PNMetadataXattrRating), "5"}}));
    EXPECT_EQ(store.m_asked.size(), std::size(dictionaryNames));
}

/// Has no decorated form of one name.
class StoreWithoutAName : public ForwardingXattrStore {
public:
    bool decorate(std::string& name) override {
        if (name != PNMetadataXattrYear)
            return ForwardingXattrStore::decorate(name);
        errno = EINVAL;
        return false;
    }
};

TEST_F(AttributeDictionary, IsNoneWhereANameCanNotBeDecorated) {
    const URL url = file();
    setStored(url, PNMetadataXattrTitle, "Title");
    const StoreWithoutAName store;

    EXPECT_EQ(attributeDictionaryAtURL(url), std::nullopt);
}

TEST_F(AttributeDictionary, IsNoneForAFileThatCanBeListedButNotRead) {
    const URL url = file();
    setStored(url, "com.example.other", "x");
    WatchedStore store;
    store.m_refused = PNMetadataXattrAssetID;

    EXPECT_EQ(attributeDictionaryAtURL(url), std::nullopt);
}

TEST_F(AttributeDictionary, ReadsThePlaceholderOfABookThatIsNotDownloaded) {
    const RecordedLog log;
    const URL placeholder = file("book.epub.nextcloud");
    setStored(placeholder, PNMetadataXattrTitle, "Far Away");

    const auto attributes = attributeDictionaryAtURL(m_folder.url("book.epub"));

    EXPECT_EQ(attributes, (Dictionary{{String(PNMetadataXattrTitle), "Far Away"}}));
    EXPECT_EQ(log.lines(), std::vector<std::string>{"default xAttrs: Using promised URL"});
}

TEST_F(AttributeDictionary, LogsNothingForAFileThatIsThere) {
    const RecordedLog log;

    EXPECT_TRUE(attributeDictionaryAtURL(file()));

    EXPECT_TRUE(log.lines().empty());
}

TEST_F(AttributeDictionary, IsNoneForAFileThatCanNotBeReadAlsoWithoutAttributes) {
    const URL url = file();
    WatchedStore store;
    store.m_refused = PNMetadataXattrAssetID;

    EXPECT_EQ(attributeDictionaryAtURL(url), std::nullopt);
}

}  // namespace
}  // namespace parvel::testing
