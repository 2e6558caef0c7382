#include "parvel/inspection/_PVAggregatedAssetData.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "parvel/inspection/_PVAggregatedAssetMetadata.h"
#include "parvel/metadata/PVAssetMetadataKeys.h"
#include "tests/support/PackageDocuments.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/Records.h"

namespace parvel::testing {
namespace {

using ::testing::ElementsAre;
using ::testing::IsSupersetOf;

constexpr std::string_view coverStoreEntry =
    "<key>book-info</key><dict><key>cover-image-path</key><string>store.jpg</string></dict>";

class AggregatedData : public ::testing::Test {
protected:
    static std::shared_ptr<_PVAggregatedAssetData> data(
        std::string_view opf, std::string_view path = "/books/book.epub",
        std::string_view opfPath = "OPS/content.opf") {
        return _PVAggregatedAssetData::initWithURL_opfData_path(URL::fileURLWithPath(path),
                                                                Data::copyOf(opf), String(opfPath));
    }
    /// The cover path that an OPF at the given place gives.
    static std::optional<Value> coverPath(std::string_view opfPath, std::string_view metadata,
                                          std::string_view manifest) {
        const auto record = data(opfText(metadata, manifest), "/books/book.epub", opfPath)
                                ->_opfMetadataWithCover_error(/*cover=*/true);
        return valueOf(record->coverImagePath());
    }

    std::optional<Error> m_error;
};

TEST_F(AggregatedData, CanNotBeMadeWithoutItsOPF) {
    EXPECT_EQ(_PVAggregatedAssetData::init(), nullptr);
}

TEST_F(AggregatedData, ReadsTheFieldsOfTheOPF) {
    const auto record = data(opfText(R"(<dc:contributor id="pvp">Tool</dc:contributor>
        <dc:creator>Ada</dc:creator><dc:title>T</dc:title><dc:subject>Novel</dc:subject>
        <dc:description>About</dc:description><dc:identifier>id</dc:identifier>
        <meta xmlns="" property="folium:format">fixed</meta>)"))
                            ->_opfMetadataWithCover_error(/*cover=*/false, &m_error);

    ASSERT_TRUE(record);
    EXPECT_EQ(valueOf(record->producer()), "Tool");
    EXPECT_EQ(record->author(), "Ada");
    EXPECT_EQ(record->title(), "T");
    EXPECT_EQ(valueOf(record->genre()), "Novel");
    EXPECT_EQ(valueOf(record->assetDescription()), "About");
    EXPECT_EQ(valueOf(record->format()), "fixed");
    EXPECT_EQ(record->generatedID(), nullptr);
    EXPECT_EQ(record->url(), URL::fileURLWithPath("/books/book.epub"));
    EXPECT_EQ(m_error, std::nullopt);
}

TEST_F(AggregatedData, LeavesOutWhatTheOPFDoesNotHave) {
    const auto record = data(opfText(""))->_opfMetadataWithCover_error(/*cover=*/true);

    ASSERT_TRUE(record);
    EXPECT_TRUE(record->isEqual(PVAssetMetadata::metadataWithURL_dictionary(
                                    URL::fileURLWithPath("/books/book.epub"), nullptr)
                                    .get()));
}

TEST_F(AggregatedData, OnlyTheToolsOwnBooksTakeTheirIdentifierFromTheOPF) {
    const std::string identifier = "<dc:identifier>own</dc:identifier>";
    const std::string producer = R"(<dc:contributor id="pvp">Folium Author</dc:contributor>)";

    const auto ordinary = data(opfText(identifier));
    const auto folium = data(opfText(identifier), "/books/book.folium");
    const auto richMedia = data(opfText(producer + identifier));

    EXPECT_EQ(ordinary->_opfMetadataWithCover_error(/*cover=*/false)->generatedID(), nullptr);
    EXPECT_EQ(valueOf(folium->_opfMetadataWithCover_error(/*cover=*/false)->generatedID()), "own");
    EXPECT_EQ(valueOf(richMedia->_opfMetadataWithCover_error(/*cover=*/false)->generatedID()),
              "own");
}

TEST_F(AggregatedData, ACoversPathIsJoinedOntoTheOPFsFolder) {
    const std::string_view meta = R"(<meta name="cover" content="img"/>)";
    const std::string_view item = R"(<item id="img" href="images/c.jpg"/>)";

    EXPECT_EQ(coverPath("OPS/content.opf", meta, item), "OPS/images/c.jpg");
    EXPECT_EQ(coverPath("content.opf", meta, item), "images/c.jpg");
    EXPECT_EQ(coverPath("/OPS/content.opf", meta, item), "/OPS/images/c.jpg");
    EXPECT_EQ(coverPath("OPS/content.opf", meta, R"(<item id="img" href="../my%20c.jpg"/>)"),
              "OPS/../my%20c.jpg");
}

TEST_F(AggregatedData, TheItemCoverIsLookedForOnlyWithoutAnId) {
    const std::string_view item = R"(<item id="cover" href="c.jpg"/>)";

    EXPECT_EQ(coverPath("a.opf", "", item), "c.jpg");
    EXPECT_EQ(coverPath("a.opf", R"(<meta name="cover" content=""/>)", item), "c.jpg");
    EXPECT_EQ(coverPath("a.opf", R"(<meta name="cover" content="img"/>)", item), std::nullopt);
}

TEST_F(AggregatedData, WithoutAManifestThereIsNoCover) {
    const auto record =
        data(R"(<package xmlns="http://www.idpf.org/2007/opf"><metadata/></package>)")
            ->_opfMetadataWithCover_error(/*cover=*/true, &m_error);

    ASSERT_TRUE(record);
    EXPECT_EQ(record->coverImagePath(), nullptr);
    EXPECT_EQ(m_error, std::nullopt);
}

TEST_F(AggregatedData, LogsItsWayThroughTheOPF) {
    const RecordedLog log;

    EXPECT_TRUE(data(opfText(""))->_opfMetadataWithCover_error(/*cover=*/true));

    EXPECT_THAT(
        log.lines(),
        ElementsAre("debug opfMetadata: start {withCover: 1}", "debug opfMetadata: has opf",
                    "debug opfMetadata: getting cover", "debug opfMetadata: end {success: 1}"));
}

TEST_F(AggregatedData, LogsNoCoverWhereNoneIsAskedFor) {
    const RecordedLog log;

    EXPECT_TRUE(data(opfText(""))->_opfMetadataWithCover_error(/*cover=*/false));

    EXPECT_THAT(log.lines(),
                ElementsAre("debug opfMetadata: start {withCover: 0}", "debug opfMetadata: has opf",
                            "debug opfMetadata: end {success: 1}"));
}

TEST_F(AggregatedData, AnOPFThatIsNoXMLGivesNoneWithTheParsersError) {
    const RecordedLog log;

    EXPECT_FALSE(data("<package")->_opfMetadataWithCover_error(/*cover=*/false, &m_error));

    EXPECT_EQ(m_error,
              makeFileError(PVFileErrorCode::Corrupt, URL::fileURLWithPath("/books/book.epub")));
    EXPECT_THAT(log.lines(), ElementsAre("debug opfMetadata: start {withCover: 0}",
                                         "default Failed to create opf document"));
}

TEST_F(AggregatedData, AnOPFWithoutMetadataGivesNoneWithoutAnError) {
    const RecordedLog log;

    EXPECT_FALSE(data("<package/>")->_opfMetadataWithCover_error(/*cover=*/false, &m_error));

    EXPECT_EQ(m_error, std::nullopt);
    EXPECT_THAT(log.lines(),
                ElementsAre("debug opfMetadata: start {withCover: 0}", "debug opfMetadata: has opf",
                            "default Failed to find metadata element."));
}

TEST_F(AggregatedData, ALookupThatDoesNotEvaluateLeavesItsErrorBesideTheRecord) {
    const auto record = data(opfText(R"(<meta name="cover" content='a"b'/>)"))
                            ->_opfMetadataWithCover_error(/*cover=*/true, &m_error);

    ASSERT_TRUE(record);
    EXPECT_EQ(record->coverImagePath(), nullptr);
    EXPECT_TRUE(m_error);
}

TEST_F(AggregatedData, AggregatesBothSources) {
    const auto made = data(opfText("<dc:title>T</dc:title>"));
    made->setBazaarMetadata(Data::copyOf(storeFileText("<key>genre</key><string>Novel</string>")));
    const AssetPtr preloaded = emptyRecord();
    const RecordedLog log;

    const auto aggregate = made->metadataWithPreloadedMetadata_includeCover_error(
        preloaded, /*includeCover=*/false, &m_error);

    ASSERT_TRUE(aggregate && aggregate->bazaarMetadata());
    EXPECT_EQ(aggregate->url(), made->url());
    EXPECT_EQ(aggregate->aggregateData(), made);
    EXPECT_EQ(aggregate->opfMetadata()->title(), "T");
    EXPECT_EQ(valueOf(aggregate->bazaarMetadata()->genre()), "Novel");
    EXPECT_EQ(aggregate->preloadedMetadata(), preloaded);
    EXPECT_EQ(aggregate->coverImageData(), std::nullopt);
    EXPECT_EQ(m_error, std::nullopt);
    EXPECT_THAT(
        log.lines(),
        ElementsAre("debug aggregatedMetadata: start {opf: 1, bazaarMetadata: 1}",
                    "debug BazaarMetadata: start {data: 1, url: 1}",
                    "debug BazaarMetadata: success", "debug opfMetadata: start {withCover: 0}",
                    "debug opfMetadata: has opf", "debug opfMetadata: end {success: 1}",
                    "debug aggregateMetadata: end {success: 1}"));
}

TEST_F(AggregatedData, WithoutAStoreFileThereIsNoStoreRecord) {
    const RecordedLog log;

    const auto aggregate =
        data(opfText(""))
            ->metadataWithPreloadedMetadata_includeCover_error(nullptr, /*includeCover=*/false);

    ASSERT_TRUE(aggregate);
    EXPECT_EQ(aggregate->bazaarMetadata(), nullptr);
    EXPECT_THAT(log.lines(),
                IsSupersetOf({"debug aggregatedMetadata: start {opf: 1, bazaarMetadata: 0}",
                              "debug BazaarMetadata: start {data: 0, url: 1}",
                              "debug BazaarMetadata: data.length == 0"}));
}

TEST_F(AggregatedData, ABrokenStoreFileCountsAsAbsentAndGivesNoError) {
    const auto made = data(opfText(""));
    made->setBazaarMetadata(Data::copyOf("no property list"));
    const RecordedLog log;

    const auto aggregate = made->metadataWithPreloadedMetadata_includeCover_error(
        nullptr, /*includeCover=*/false, &m_error);

    ASSERT_TRUE(aggregate);
    EXPECT_EQ(aggregate->bazaarMetadata(), nullptr);
    EXPECT_EQ(m_error, std::nullopt);
    EXPECT_THAT(log.lines(), IsSupersetOf({"debug BazaarMetadata: fail"}));
}

TEST_F(AggregatedData, AnUnusableOPFFailsHoweverGoodTheStoreFileIs) {
    const auto made = data("<package/>");
    made->setBazaarMetadata(Data::copyOf(storeFileText("<key>itemId</key><integer>7</integer>")));
    const RecordedLog log;

    EXPECT_FALSE(made->metadataWithPreloadedMetadata_includeCover_error(
        nullptr, /*includeCover=*/false, &m_error));

    EXPECT_EQ(m_error, std::nullopt);
    EXPECT_THAT(
        log.lines(),
        ElementsAre("debug aggregatedMetadata: start {opf: 1, bazaarMetadata: 1}",
                    "debug BazaarMetadata: start {data: 1, url: 1}",
                    "debug BazaarMetadata: success", "debug opfMetadata: start {withCover: 0}",
                    "debug opfMetadata: has opf", "default Failed to find metadata element.",
                    "default Failed to create dictionary from opf"));
}

TEST_F(AggregatedData, AStoreFileThatNamesACoverSuppressesTheOPFs) {
    const auto made = data(opfText("", R"(<item id="cover" href="c.jpg"/>)"));
    made->setBazaarMetadata(Data::copyOf(storeFileText(coverStoreEntry)));
    const RecordedLog log;

    const auto aggregate =
        made->metadataWithPreloadedMetadata_includeCover_error(nullptr, /*includeCover=*/true);

    ASSERT_TRUE(aggregate && aggregate->bazaarMetadata());
    EXPECT_EQ(valueOf(aggregate->bazaarMetadata()->coverImagePath()), "store.jpg");
    EXPECT_EQ(aggregate->opfMetadata()->coverImagePath(), nullptr);
    EXPECT_THAT(log.lines(), IsSupersetOf({"debug opfMetadata: start {withCover: 0}"}));
}

TEST_F(AggregatedData, ACoverPathThatIsNoTextCountsAsAbsent) {
    const auto made = data(opfText("", R"(<item id="cover" href="c.jpg"/>)"));
    made->setBazaarMetadata(Data::copyOf(storeFileText(
        "<key>book-info</key><dict><key>cover-image-path</key><integer>7</integer></dict>")));

    const auto aggregate =
        made->metadataWithPreloadedMetadata_includeCover_error(nullptr, /*includeCover=*/true);

    ASSERT_TRUE(aggregate);
    EXPECT_EQ(valueOf(aggregate->opfMetadata()->coverImagePath()), "OPS/c.jpg");
}

}  // namespace
}  // namespace parvel::testing
