#include <cerrno>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "parvel/metadata/PVAssetMetadataKeys.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "parvel/platform/DateText.h"
#include "parvel/xattr/PNMetadataXattr.h"
#include "tests/support/AttributeFolder.h"
#include "tests/support/EpubBuilder.h"
#include "tests/support/ForwardingCloudStore.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/Records.h"

namespace parvel::testing {
namespace {

using ::testing::ElementsAre;

class AttributeRecord : public AttributeFolder {
protected:
    MutableAssetPtr recordAt(const URL& url) {
        return PVAssetMetadataInspector::_xAttrMetadataForAssetAtURL_error(url, &m_error);
    }
    /// The record of a file with one attribute.
    MutableAssetPtr recordWith(std::string_view name, std::string_view value) {
        const URL url = file();
        setStored(url, name, value);
        return recordAt(url);
    }

    /// What an operation finds in the caller's slot; one that leaves it there has not touched it.
    const Error m_stale = makePOSIXError(ENOTTY, std::nullopt);
    std::optional<Error> m_error = m_stale;
};

TEST_F(AttributeRecord, IsNoneForAnExtensionOfNoKind) {
    const URL url = file("book.txt");
    setStored(url, PNMetadataXattrTitle, "T");

    EXPECT_FALSE(recordAt(url));

    EXPECT_EQ(m_error, m_stale);
}

TEST_F(AttributeRecord, HasOnlyItsURLForAFileWithoutAttributes) {
    const URL url = file();

    const auto record = recordAt(url);

    ASSERT_TRUE(record);
    const auto expected = PVAssetMetadata::metadataWithURL_dictionary(url, nullptr);
    expected->setExplicit(false);
    EXPECT_TRUE(record->isEqual(expected.get()));
    EXPECT_EQ(record->lastOpenDate(), std::nullopt);
    EXPECT_EQ(record->purchaseDate(), std::nullopt);
    EXPECT_EQ(record->rating(), std::nullopt);
}

TEST_F(AttributeRecord, HasTheTextsOfTheAttributes) {
    const URL url = file();
    for (const std::string_view name :
         {PNMetadataXattrAssetID, PNMetadataXattrTitle, PNMetadataXattrSortTitle,
          PNMetadataXattrAuthor, PNMetadataXattrSortAuthor, PNMetadataXattrGenre,
          PNMetadataXattrComments, PNMetadataXattrBookDescription, PNMetadataXattrYear})
        setStored(url, name, name.substr(name.rfind('.') + 1));

    const auto record = recordAt(url);

    ASSERT_TRUE(record);
    EXPECT_EQ(valueOf(record->generatedID()), "assetID");
    EXPECT_EQ(record->assetID(), "assetID");
    EXPECT_EQ(record->title(), "title");
    EXPECT_EQ(record->sortTitle(), "sortTitle");
    EXPECT_EQ(record->author(), "author");
    EXPECT_EQ(record->sortAuthor(), "sortAuthor");
    EXPECT_EQ(valueOf(record->genre()), "genre");
    EXPECT_EQ(record->comments(), "comments");
    EXPECT_EQ(record->bookDescription(), "bookDescription");
    EXPECT_EQ(record->year(), "year");
}

TEST_F(AttributeRecord, KeepsAnEmptyText) {
    EXPECT_EQ(recordWith(PNMetadataXattrTitle, "")->title(), "");
}

TEST_F(AttributeRecord, ReadsTheExplicitMarkAsABooleanText) {
    for (const char* text : {"1", "yes", "Y", "true", "T", "  +007", "-0y", "9x"})
        EXPECT_TRUE(recordWith(PNMetadataXattrExplicit, text)->isExplicit()) << text;
    for (const char* text : {"0", "no", "", "00", "false", "+", "x1"}) {
        const auto record = recordWith(PNMetadataXattrExplicit, text);
        EXPECT_FALSE(record->isExplicit()) << text;
        EXPECT_TRUE(record->backingDictionary()->contains(key::isExplicit)) << text;
    }
}

TEST_F(AttributeRecord, ReadsDatesWithTheMetadataFormatter) {
    const Date day{86400.0 * 3000};
    const std::string text = DateText::host().stringFromDate(day);
    const auto expected = DateText::host().dateFromString(text);
    ASSERT_TRUE(expected);

    EXPECT_EQ(recordWith(PNMetadataXattrLastOpened, text)->lastOpenDate(), expected);
    EXPECT_EQ(recordWith(PNMetadataXattrFirstOpened, text)->purchaseDate(), expected);
}

TEST_F(AttributeRecord, ADateThatDoesNotParseOrIsEmptyIsNone) {
    for (const char* text : {"2001-01-01", ""}) {
        EXPECT_EQ(recordWith(PNMetadataXattrLastOpened, text)->lastOpenDate(), std::nullopt);
        EXPECT_EQ(recordWith(PNMetadataXattrFirstOpened, text)->purchaseDate(), std::nullopt);
    }
}

TEST_F(AttributeRecord, ReadsTheRatingAsAnInteger) {
    const auto ratingOf = [this](const char* text) {
        const auto rating = recordWith(PNMetadataXattrRating, text)->rating();
        return rating ? std::optional(rating->int64Value()) : std::nullopt;
    };

    EXPECT_EQ(ratingOf("4 stars"), 4);
    EXPECT_EQ(ratingOf("  -3"), -3);
    EXPECT_EQ(ratingOf("4.9"), 4);
    EXPECT_EQ(ratingOf("stars"), 0);
    EXPECT_EQ(ratingOf("99999999999999999999"), INT64_MAX);
    EXPECT_EQ(ratingOf(""), std::nullopt);
}

TEST_F(AttributeRecord, OfAFileWhoseAttributesCanNotBeReadHasItsURLAndNoError) {
    const URL url = m_folder.url("absent.epub");

    const auto record = recordAt(url);

    ASSERT_TRUE(record);
    EXPECT_EQ(record->url(), url);
    EXPECT_EQ(record->title(), std::nullopt);
    EXPECT_EQ(m_error, m_stale);
}

TEST_F(AttributeRecord, OfABookThatIsNotDownloadedIsThePlaceholders) {
    const RecordedLog log;
    setStored(file("book.epub.nextcloud"), PNMetadataXattrTitle, "Far Away");

    const auto record = recordAt(m_folder.url("book.epub"));

    ASSERT_TRUE(record);
    EXPECT_EQ(record->title(), "Far Away");
    EXPECT_EQ(record->url(), m_folder.url("book.epub"));
    EXPECT_THAT(log.lines(), ElementsAre("default xAttrs: Using promised URL"));
}

/// Synchronised storage that answers as it is told.
class ToldCloudStore : public ForwardingCloudStore {
public:
    bool downloadingStatus(const URL& url, std::optional<DownloadingStatus>& status,
                           ErrorOut error) override {
        status = m_status;
        return m_statusIsKnown || fail(error, makePOSIXError(EIO, url));
    }

    std::optional<DownloadingStatus> m_status;
    bool m_statusIsKnown = true;
};

class ImmediatelyAvailable : public AttributeRecord {
protected:
    void SetUp() override {
        AttributeRecord::SetUp();
        if (IsSkipped())
            return;
        m_book = EpubBuilder{}
                     .opf(opfText("<dc:creator>Content's</dc:creator>"))
                     .zip(m_folder / "book.epub");
        setStored(*m_book, PNMetadataXattrTitle, "Attribute's");
    }
    AssetPtr available(const std::optional<URL>& url) {
        return PVAssetMetadataInspector::immediatelyAvailableMetadataForAssetAtURL_error(url,
                                                                                         &m_error);
    }

    std::optional<URL> m_book;
};

TEST_F(ImmediatelyAvailable, OfAPlainLocalFileIsWhatTheAttributesHold) {
    const AssetPtr asset = available(m_book);

    ASSERT_TRUE(asset);
    EXPECT_EQ(asset->title(), "Attribute's");
    EXPECT_EQ(asset->author(), std::nullopt);
    EXPECT_EQ(m_error, m_stale);
}

TEST_F(ImmediatelyAvailable, IsTheWholeRecordWhereTheContentIsHere) {
    ToldCloudStore cloud;
    for (const DownloadingStatus status :
         {DownloadingStatus::Current, DownloadingStatus::Downloaded}) {
        cloud.m_status = status;

        const AssetPtr asset = available(m_book);

        ASSERT_TRUE(asset);
        EXPECT_EQ(asset->title(), "Attribute's");
        EXPECT_EQ(asset->author(), "Content's");
    }
}

TEST_F(ImmediatelyAvailable, HandsOutTheErrorOfTheWholeReadWhereTheContentIsHere) {
    ToldCloudStore cloud;
    cloud.m_status = DownloadingStatus::Current;
    const URL damaged = file("damaged.m4a");
    setStored(damaged, PNMetadataXattrAssetID, "own");

    EXPECT_FALSE(available(damaged));

    EXPECT_EQ(m_error, makeNoAssetIDError(damaged));
}

TEST_F(ImmediatelyAvailable, IsWhatTheAttributesHoldWhereTheContentIsElsewhere) {
    ToldCloudStore cloud;
    cloud.m_status = DownloadingStatus::NotDownloaded;

    const AssetPtr asset = available(m_book);

    ASSERT_TRUE(asset);
    EXPECT_EQ(asset->title(), "Attribute's");
    EXPECT_EQ(asset->author(), std::nullopt);
}

TEST_F(ImmediatelyAvailable, IsNoneWhereTheStateCanNotBeTold) {
    ToldCloudStore cloud;
    cloud.m_statusIsKnown = false;

    EXPECT_FALSE(available(m_book));

    EXPECT_EQ(m_error, m_stale);
}

TEST_F(ImmediatelyAvailable, IsNoneWithThePlatformsErrorWhereNothingIsPromised) {
    const URL url = m_folder.url("absent.epub");

    EXPECT_FALSE(available(url));

    EXPECT_EQ(m_error, makeServiceError(ENOENT, url));
}

TEST_F(ImmediatelyAvailable, IsNoneWithoutAURL) {
    EXPECT_FALSE(available(std::nullopt));

    EXPECT_EQ(m_error, m_stale);
}

TEST_F(ImmediatelyAvailable, OfAPlaceholderIsWhatItsAttributesHold) {
    setStored(file("far.epub.nextcloud"), PNMetadataXattrTitle, "Far Away");

    const AssetPtr asset = available(m_folder.url("far.epub"));

    ASSERT_TRUE(asset);
    EXPECT_EQ(asset->title(), "Far Away");
}

}  // namespace
}  // namespace parvel::testing
