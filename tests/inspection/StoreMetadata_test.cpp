#include <stdexcept>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "parvel/inspection/_PVxPubMetadataInspector.h"
#include "parvel/platform/MalformedInput.h"
#include "parvel/platform/PropertyList.h"
#include "parvel/platform/Service.h"
#include "tests/support/EpubBuilder.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/Records.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

const URL storeURL = URL::fileURLWithPath("/books/book.epub");

AssetPtr parsedStore(std::string_view bytes, ErrorOut error = nullptr) {
    const Data data = Data::copyOf(bytes);
    return _PVxPubMetadataInspector::bazaarMetadataFromData_url_error(&data, storeURL, error);
}

TEST(StoreMetadata, KeepsEveryEntryOfTheFileUnderItsOwnKey) {
    const RecordedLog log;
    std::optional<Error> error;

    const AssetPtr record = parsedStore(storeFileText("<key>artistName</key><string>Ada</string>"
                                                      "<key>price</key><real>5.5</real>"
                                                      "<key>itemId</key><integer>42</integer>"),
                                        &error);

    ASSERT_TRUE(record);
    EXPECT_EQ(record->author(), "Ada");
    EXPECT_EQ(valueOf(record->backingDictionary()->find("price")), realValue(5.5));
    EXPECT_EQ(valueOf(record->storeID()), "42");
    EXPECT_EQ(record->url(), storeURL);
    EXPECT_EQ(error, std::nullopt);
    EXPECT_THAT(log.lines(), ElementsAre("debug BazaarMetadata: start {data: 1, url: 1}",
                                         "debug BazaarMetadata: success"));
}

TEST(StoreMetadata, AbsentBytesAndURLAreNone) {
    const RecordedLog log;
    std::optional<Error> error;

    EXPECT_FALSE(
        _PVxPubMetadataInspector::bazaarMetadataFromData_url_error(nullptr, std::nullopt, &error));

    EXPECT_EQ(error, std::nullopt);
    EXPECT_THAT(log.lines(), ElementsAre("debug BazaarMetadata: start {data: 0, url: 0}",
                                         "debug BazaarMetadata: data.length == 0"));
}

TEST(StoreMetadata, EmptyBytesAreNone) {
    const RecordedLog log;

    EXPECT_FALSE(parsedStore(""));

    EXPECT_THAT(log.lines(), ElementsAre("debug BazaarMetadata: start {data: 1, url: 1}",
                                         "debug BazaarMetadata: data.length == 0"));
}

TEST(StoreMetadata, BytesThatAreNoPropertyListGiveTheParsersError) {
    const RecordedLog log;
    std::optional<Error> error;

    EXPECT_FALSE(parsedStore("nonsense", &error));

    EXPECT_EQ(error, makeFileError(PVFileErrorCode::Corrupt, storeURL));
    EXPECT_THAT(log.lines(), ElementsAre("debug BazaarMetadata: start {data: 1, url: 1}",
                                         "debug BazaarMetadata: fail"));
}

TEST(StoreMetadata, AListThatIsNoDictionaryGivesARecordOfTheURLAlone) {
    const RecordedLog log;

    const AssetPtr record =
        parsedStore(R"(<plist version="1.0"><array><string>itemId</string></array></plist>)");

    ASSERT_TRUE(record);
    EXPECT_TRUE(
        record->isEqual(PVAssetMetadata::metadataWithURL_dictionary(storeURL, nullptr).get()));
    EXPECT_THAT(log.lines(), ElementsAre("debug BazaarMetadata: start {data: 1, url: 1}",
                                         "debug BazaarMetadata: success"));
}

TEST(StoreMetadata, WithoutAURLOrAnEntryThereIsNoRecord) {
    const Data empty = Data::copyOf(storeFileText(""));

    EXPECT_FALSE(_PVxPubMetadataInspector::bazaarMetadataFromData_url_error(&empty, std::nullopt));
}

/// Raises the given exception for whatever it is to parse.
template <class Exception>
class ThrowingPropertyListCodec : public PropertyListCodec {
public:
    std::optional<Value> parse(const Data&, const std::optional<URL>&, ErrorOut) override {
        throw Exception("thrown");
    }
    std::optional<Data> writeXML(const Value&) override { return std::nullopt; }
};

TEST(StoreMetadata, MalformedInputWithinAListIsLoggedAndGivesNone) {
    ThrowingPropertyListCodec<MalformedInput> codec;
    const Service<PropertyListCodec>::Replacement replacement(codec);
    const RecordedLog log;
    std::optional<Error> error;

    EXPECT_FALSE(parsedStore("x", &error));

    EXPECT_EQ(error, std::nullopt);
    EXPECT_THAT(log.lines(), ElementsAre("debug BazaarMetadata: start {data: 1, url: 1}",
                                         "error Exception while parsing Bazaar Metadta"));
}

TEST(StoreMetadata, OtherExceptionsPassThrough) {
    ThrowingPropertyListCodec<std::runtime_error> codec;
    const Service<PropertyListCodec>::Replacement replacement(codec);

    EXPECT_THROW(parsedStore("x"), std::runtime_error);
}

class StoreMetadataFile : public ::testing::Test {
protected:
    TemporaryDirectory m_folder;
    std::optional<Error> m_error;
};

TEST_F(StoreMetadataFile, IsReadAtTheURLItself) {
    const URL url = URL::fileURLWithPath(m_folder.write(
        "BazaarMetadata.plist", storeFileText("<key>itemName</key><string>T</string>")));

    const AssetPtr record =
        PVAssetMetadataInspector::bazaarMetadataForBookAssetAtURL_error(url, &m_error);

    ASSERT_TRUE(record);
    EXPECT_EQ(record->title(), "T");
    EXPECT_EQ(record->url(), url);
    EXPECT_EQ(m_error, std::nullopt);
}

TEST_F(StoreMetadataFile, IsNotLookedForInAPackage) {
    const URL url = EpubBuilder{}
                        .store(storeFileText("<key>itemName</key><string>T</string>"))
                        .expand(m_folder / "book.epub");
    const RecordedLog log;

    EXPECT_FALSE(PVAssetMetadataInspector::bazaarMetadataForBookAssetAtURL_error(url, &m_error));

    EXPECT_EQ(m_error, std::nullopt);
    EXPECT_THAT(log.lines(), IsEmpty());
}

TEST_F(StoreMetadataFile, IsNoneWithoutAnErrorWhereNothingCanBeRead) {
    const URL empty = URL::fileURLWithPath(m_folder.write("empty.plist", ""));
    const RecordedLog log;

    for (const std::optional<URL>& url :
         {std::optional<URL>(), std::optional(m_folder.url("absent")), std::optional(empty)})
        EXPECT_FALSE(
            PVAssetMetadataInspector::bazaarMetadataForBookAssetAtURL_error(url, &m_error));

    EXPECT_EQ(m_error, std::nullopt);
    EXPECT_THAT(log.lines(), IsEmpty());
}

TEST_F(StoreMetadataFile, PassesTheParsersErrorOn) {
    const URL url = URL::fileURLWithPath(m_folder.write("a.plist", "nonsense"));

    EXPECT_FALSE(PVAssetMetadataInspector::bazaarMetadataForBookAssetAtURL_error(url, &m_error));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::Corrupt, url));
}

TEST_F(StoreMetadataFile, IsReadFromAnOpenArchive) {
    const URL with = EpubBuilder{}
                         .store(storeFileText("<key>itemName</key><string>T</string>"))
                         .zip(m_folder / "with.epub");
    const URL without = EpubBuilder{}.zip(m_folder / "without.epub");

    const AssetPtr record = _PVxPubMetadataInspector::bazaarMetadataFromZipArchive_url_error(
        *ZipReader::host().open(with), storeURL);
    ASSERT_TRUE(record);
    EXPECT_EQ(record->title(), "T");
    EXPECT_EQ(record->url(), storeURL);
    EXPECT_FALSE(_PVxPubMetadataInspector::bazaarMetadataFromZipArchive_url_error(
        *ZipReader::host().open(without), storeURL, &m_error));
    EXPECT_EQ(m_error, std::nullopt);
}

}  // namespace
}  // namespace parvel::testing
