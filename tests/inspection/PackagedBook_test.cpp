#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "parvel/inspection/_PVxPubMetadataInspector.h"
#include "tests/support/EpubBuilder.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/Records.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

std::string storeFileWithCover(std::string_view path) {
    return storeFileText("<key>book-info</key><dict><key>cover-image-path</key><string>" +
                         std::string(path) + "</string></dict>");
}

std::string opfWithCover(std::string_view href) {
    return opfText("<dc:title>T</dc:title>",
                   R"(<item id="cover" href=")" + std::string(href) + R"("/>)");
}

enum class Shape { Expanded, Zipped };

class PackagedBook : public ::testing::Test {
protected:
    std::shared_ptr<_PVAggregatedAssetMetadata> read(const std::optional<URL>& url,
                                                     bool includeCover = false) {
        return _PVxPubMetadataInspector::metadataForAssetAtURL_preloadedMetadata_includeCover_error(
            url, nullptr, includeCover, &m_error);
    }
    std::optional<Data> coverOf(const URL& url) {
        const auto aggregate = read(url, /*includeCover=*/true);
        EXPECT_TRUE(aggregate);
        return aggregate ? aggregate->coverImageData() : std::nullopt;
    }
    static std::optional<Data> bytes(std::string_view text) { return Data::copyOf(text); }

    TemporaryDirectory m_folder;
    std::optional<Error> m_error;
};

/// What holds for both shapes of a package.
class PackagedBookOfEitherShape : public PackagedBook, public ::testing::WithParamInterface<Shape> {
protected:
    URL build(const EpubBuilder& book, std::string_view name = "book.epub") {
        return GetParam() == Shape::Zipped ? book.zip(m_folder / name)
                                           : book.expand(m_folder / name);
    }
};

INSTANTIATE_TEST_SUITE_P(Shapes, PackagedBookOfEitherShape,
                         ::testing::Values(Shape::Expanded, Shape::Zipped), [](const auto& shape) {
                             return shape.param == Shape::Zipped ? "Zipped" : "Expanded";
                         });

TEST_P(PackagedBookOfEitherShape, GivesTheRecordsOfItsDocuments) {
    const std::string opf = opfText("<dc:title>T</dc:title>");
    const URL url =
        build(EpubBuilder{}.opf(opf).store(storeFileText("<key>genre</key><string>G</string>")));

    const auto aggregate = read(url);

    ASSERT_TRUE(aggregate && aggregate->bazaarMetadata());
    EXPECT_EQ(aggregate->opfMetadata()->title(), "T");
    EXPECT_EQ(valueOf(aggregate->bazaarMetadata()->genre()), "G");
    EXPECT_EQ(aggregate->aggregateData()->opf(), Data::copyOf(opf));
    EXPECT_EQ(aggregate->aggregateData()->opfPath(), EpubBuilder::opfPath);
    EXPECT_EQ(aggregate->url(), url);
    EXPECT_EQ(m_error, std::nullopt);
}

TEST_P(PackagedBookOfEitherShape, HandsThePreloadedRecordOn) {
    const URL url = build(EpubBuilder{});
    const AssetPtr preloaded = emptyRecord();

    const auto aggregate =
        _PVxPubMetadataInspector::metadataForAssetAtURL_preloadedMetadata_includeCover_error(
            url, preloaded, /*includeCover=*/false);

    ASSERT_TRUE(aggregate);
    EXPECT_EQ(aggregate->preloadedMetadata(), preloaded);
}

TEST_P(PackagedBookOfEitherShape, AMissingOrBrokenStoreFileNeverFailsIt) {
    const auto without = read(build(EpubBuilder{}, "a.epub"));
    const auto broken = read(build(EpubBuilder{}.store("nonsense"), "b.epub"));
    const auto empty = read(build(EpubBuilder{}.store(""), "c.epub"));

    ASSERT_TRUE(without && broken && empty);
    EXPECT_EQ(without->bazaarMetadata(), nullptr);
    EXPECT_EQ(broken->bazaarMetadata(), nullptr);
    EXPECT_EQ(empty->bazaarMetadata(), nullptr);
    EXPECT_EQ(m_error, std::nullopt);
}

TEST_P(PackagedBookOfEitherShape, ReadsTheCoverThatTheOPFNames) {
    const URL url =
        build(EpubBuilder{}.opf(opfWithCover("images/c.jpg")).file("OPS/images/c.jpg", "cover"));

    EXPECT_EQ(coverOf(url), bytes("cover"));
    EXPECT_EQ(read(url)->coverImageData(), std::nullopt);
}

TEST_P(PackagedBookOfEitherShape, ReadsTheCoverThatTheStoreFileNamesBeforeTheOPFs) {
    const URL url = build(EpubBuilder{}
                              .opf(opfWithCover("c.jpg"))
                              .file("OPS/c.jpg", "the OPF's")
                              .store(storeFileWithCover("store.jpg"))
                              .file("store.jpg", "the store's"));

    EXPECT_EQ(coverOf(url), bytes("the store's"));
}

TEST_P(PackagedBookOfEitherShape, TheStoreFilesCoverIsTheOnlyOneTried) {
    const auto withStoreCover = [](std::string_view path) {
        return EpubBuilder{}
            .opf(opfWithCover("c.jpg"))
            .file("OPS/c.jpg", "the OPF's")
            .store(storeFileWithCover(path));
    };

    EXPECT_EQ(coverOf(build(withStoreCover("absent.jpg"), "a.epub")), std::nullopt);
    EXPECT_EQ(coverOf(build(withStoreCover(""), "b.epub")), std::nullopt);
    EXPECT_EQ(m_error, std::nullopt);
}

TEST_P(PackagedBookOfEitherShape, APreviewsStoreFileNamesTheCoverToo) {
    const URL url = build(EpubBuilder{}
                              .opf(opfWithCover("c.jpg"))
                              .file("OPS/c.jpg", "the OPF's")
                              .store(storeFileText("<key>isPreview</key><true/><key>book-info</key>"
                                                   "<dict><key>cover-image-path</key>"
                                                   "<string>store.jpg</string></dict>"))
                              .file("store.jpg", "the store's"));

    EXPECT_EQ(coverOf(url), bytes("the store's"));
}

TEST_P(PackagedBookOfEitherShape, AMissingCoverNeverFailsIt) {
    const URL url = build(EpubBuilder{}.opf(opfWithCover("absent.jpg")));

    EXPECT_EQ(coverOf(url), std::nullopt);
    EXPECT_EQ(m_error, std::nullopt);
}

TEST_P(PackagedBookOfEitherShape, ACoversPathIsNotPercentDecoded) {
    const URL url = build(EpubBuilder{}
                              .opf(opfWithCover("my%20c.jpg"))
                              .file("OPS/my c.jpg", "decoded")
                              .file("OPS/my%20c.jpg", "as it stands"));

    EXPECT_EQ(coverOf(url), bytes("as it stands"));
}

TEST_P(PackagedBookOfEitherShape, ItsNamePlaysNoPart) {
    EXPECT_TRUE(read(build(EpubBuilder{}, "book.folium")));
    EXPECT_TRUE(read(build(EpubBuilder{}, "book.pdf")));
}

TEST_P(PackagedBookOfEitherShape, AnUnusableOPFIsNone) {
    EXPECT_FALSE(read(build(EpubBuilder{}.opf("<package"), "a.epub")));
    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::Corrupt, m_folder.url("a.epub")));

    m_error.reset();
    EXPECT_FALSE(read(build(EpubBuilder{}.opf("<package/>"), "b.epub")));
    EXPECT_EQ(m_error, std::nullopt);
}

TEST_P(PackagedBookOfEitherShape, AnEmptyOPFPathNamesNoOPF) {
    const URL url = build(EpubBuilder{}.container(containerText("")));
    const RecordedLog log;

    EXPECT_FALSE(read(url));

    ASSERT_TRUE(m_error);
    EXPECT_EQ(m_error->code(), static_cast<std::int64_t>(PVFileErrorCode::Corrupt));
    EXPECT_EQ(log.lines()[1], GetParam() == Shape::Zipped ? "default Failed to extract opf data"
                                                          : "default Failed to get opf data");
}

TEST_F(PackagedBook, WithoutAURLIsMissingTheURL) {
    const RecordedLog log;

    EXPECT_FALSE(read(std::nullopt));

    EXPECT_EQ(m_error, makeMissingURLError());
    EXPECT_THAT(log.lines(), IsEmpty());
}

TEST_F(PackagedBook, WhoseShapeCanNotBeToldIsNoneWithThePlatformsError) {
    const URL url = m_folder.url("absent.epub");
    const RecordedLog log;

    EXPECT_FALSE(read(url));

    EXPECT_EQ(m_error, makeServiceError(ENOENT, url));
    EXPECT_THAT(log.lines(), ElementsAre("default Failed to determine if url is directory"));
}

// Expanded packages.

TEST_F(PackagedBook, ExpandedLogsItsWay) {
    const URL url = EpubBuilder{}.store(storeFileText("")).expand(m_folder / "book.epub");
    const RecordedLog log;

    ASSERT_TRUE(read(url));

    EXPECT_THAT(
        log.lines(),
        ElementsAre("debug Getting data from uncompressed book",
                    "debug aggregatedMetadata: start {opf: 1, bazaarMetadata: 1}",
                    "debug BazaarMetadata: start {data: 1, url: 1}",
                    "debug BazaarMetadata: success", "debug opfMetadata: start {withCover: 0}",
                    "debug opfMetadata: has opf", "debug opfMetadata: end {success: 1}",
                    "debug aggregateMetadata: end {success: 1}"));
}

TEST_F(PackagedBook, ExpandedWithoutAContainerGivesTheReadError) {
    const URL url = EpubBuilder{}.without("META-INF/container.xml").expand(m_folder / "book.epub");
    const RecordedLog log;

    EXPECT_FALSE(read(url));

    EXPECT_EQ(m_error,
              makeServiceError(ENOENT, url.appendingPathComponent("META-INF/container.xml")));
    EXPECT_THAT(log.lines(),
                ElementsAre("debug Getting data from uncompressed book",
                            "default Failed to create containerXML document",
                            "default Failed to get opf data. url: " + url.absoluteString() +
                                " error: " + logText(*m_error)));
}

TEST_F(PackagedBook, ExpandedWithABrokenContainerGivesTheParsersError) {
    const URL url = EpubBuilder{}.container("<container").expand(m_folder / "book.epub");
    const RecordedLog log;

    EXPECT_FALSE(read(url));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::Corrupt,
                                     url.appendingPathComponent("META-INF/container.xml")));
    EXPECT_EQ(log.lines()[1], "default Failed to create containerXML document");
}

TEST_F(PackagedBook, ExpandedWithoutAnOPFPathGivesNoError) {
    const URL url = EpubBuilder{}.container("<container/>").expand(m_folder / "book.epub");
    const RecordedLog log;

    EXPECT_FALSE(read(url));

    EXPECT_EQ(m_error, std::nullopt);
    EXPECT_THAT(log.lines(), ElementsAre("debug Getting data from uncompressed book",
                                         "default Failed to get opf path",
                                         "default Failed to get opf data. url: " +
                                             url.absoluteString() + " error: (null)"));
}

TEST_F(PackagedBook, ExpandedWithoutItsOPFGivesTheReadError) {
    const URL url = EpubBuilder{}.without(EpubBuilder::opfPath).expand(m_folder / "book.epub");
    const RecordedLog log;

    EXPECT_FALSE(read(url));

    EXPECT_EQ(m_error, makeServiceError(ENOENT, url.appendingPathComponent("OPS/content.opf")));
    EXPECT_THAT(
        log.lines(),
        ElementsAre("debug Getting data from uncompressed book", "default Failed to get opf data",
                    "default Failed to get opf data. url: " + url.absoluteString() +
                        " error: " + logText(*m_error)));
}

TEST_F(PackagedBook, ExpandedLogsNoErrorWhereNoneWasAskedFor) {
    const URL url = EpubBuilder{}.without("META-INF/container.xml").expand(m_folder / "book.epub");
    const RecordedLog log;

    EXPECT_FALSE(
        _PVxPubMetadataInspector::metadataForAssetAtURL_preloadedMetadata_includeCover_error(
            url, nullptr, /*includeCover=*/false));

    EXPECT_EQ(log.lines().back(),
              "default Failed to get opf data. url: " + url.absoluteString() + " error: (null)");
}

TEST_F(PackagedBook, ExpandedDropsALeadingSlashOfAPath) {
    const URL url = EpubBuilder{}
                        .container(containerText("/OPS/content.opf"))
                        .opf(opfWithCover("c.jpg"))
                        .file("OPS/c.jpg", "cover")
                        .expand(m_folder / "book.epub");

    const auto aggregate = read(url, /*includeCover=*/true);

    ASSERT_TRUE(aggregate);
    EXPECT_EQ(aggregate->aggregateData()->opfPath(), "/OPS/content.opf");
    EXPECT_EQ(aggregate->coverImageData(), bytes("cover"));
}

TEST_F(PackagedBook, ExpandedReadsNothingOutsideThePackage) {
    m_folder.write("outside.opf", opfText(""));
    m_folder.write("outside.jpg", "secret");
    const URL opfOutside =
        EpubBuilder{}.container(containerText("../outside.opf")).expand(m_folder / "a.epub");
    const URL coverOutside =
        EpubBuilder{}.opf(opfWithCover("../../outside.jpg")).expand(m_folder / "b.epub");
    const URL coverInside = EpubBuilder{}
                                .opf(opfWithCover("../c.jpg"))
                                .file("c.jpg", "cover")
                                .expand(m_folder / "c.epub");
    const URL coverLink = EpubBuilder{}.opf(opfWithCover("link.jpg")).expand(m_folder / "d.epub");
    std::filesystem::create_symlink(m_folder / "outside.jpg", m_folder / "d.epub/OPS/link.jpg");

    EXPECT_FALSE(read(opfOutside));
    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::Corrupt,
                                     opfOutside.appendingPathComponent("../outside.opf")));
    EXPECT_EQ(coverOf(coverOutside), std::nullopt);
    EXPECT_EQ(coverOf(coverInside), bytes("cover"));
    EXPECT_EQ(coverOf(coverLink), std::nullopt);
}

TEST_F(PackagedBook, ExpandedBehindALinkIsRead) {
    EpubBuilder{}.expand(m_folder / "book.epub");
    std::filesystem::create_symlink(m_folder / "book.epub", m_folder / "link.epub");

    EXPECT_TRUE(read(m_folder.url("link.epub")));
}

// Zip archives.

TEST_F(PackagedBook, ZippedLogsItsWay) {
    const URL url = EpubBuilder{}.store(storeFileText("")).zip(m_folder / "book.epub");
    const RecordedLog log;

    ASSERT_TRUE(read(url, /*includeCover=*/true));

    EXPECT_THAT(
        log.lines(),
        ElementsAre("debug metadataCompressed: start",
                    "debug aggregatedMetadata: start {opf: 1, bazaarMetadata: 1}",
                    "debug BazaarMetadata: start {data: 1, url: 1}",
                    "debug BazaarMetadata: success", "debug opfMetadata: start {withCover: 1}",
                    "debug opfMetadata: has opf", "debug opfMetadata: getting cover",
                    "debug opfMetadata: end {success: 1}",
                    "debug aggregateMetadata: end {success: 1}",
                    "debug metadataCompressed: end {success: 1"));
}

TEST_F(PackagedBook, ThatIsNoArchiveGivesTheArchiveReadersError) {
    const URL url = URL::fileURLWithPath(m_folder.write("book.epub", "no archive"));
    const RecordedLog log;

    EXPECT_FALSE(read(url));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::Corrupt, url));
    EXPECT_THAT(log.lines(),
                ElementsAre("debug metadataCompressed: start", "default Failed to make zipArchive",
                            "debug metadataCompressed: end {success: 0"));
}

TEST_F(PackagedBook, ZippedWithoutAContainerLeavesTheErrorAndHasNoLineOfItsOwn) {
    const URL url = EpubBuilder{}.without("META-INF/container.xml").zip(m_folder / "book.epub");
    m_error = makeNoIdentityError();
    const RecordedLog log;

    EXPECT_FALSE(read(url));

    EXPECT_EQ(m_error, makeNoIdentityError());
    EXPECT_THAT(log.lines(),
                ElementsAre("debug metadataCompressed: start", "default Failed to get opf data",
                            "debug metadataCompressed: end {success: 0"));
}

TEST_F(PackagedBook, ZippedWithoutAnOPFPathSaysURL) {
    const URL url = EpubBuilder{}.container("<container/>").zip(m_folder / "book.epub");
    const RecordedLog log;

    EXPECT_FALSE(read(url));

    EXPECT_EQ(m_error, std::nullopt);
    EXPECT_THAT(
        log.lines(),
        ElementsAre("debug metadataCompressed: start", "default Failed to get opf url",
                    "default Failed to get opf data", "debug metadataCompressed: end {success: 0"));
}

TEST_F(PackagedBook, ZippedWithABrokenContainerSaysURLWithTheParsersError) {
    const URL url = EpubBuilder{}.container("<container").zip(m_folder / "book.epub");
    const RecordedLog log;

    EXPECT_FALSE(read(url));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::Corrupt, url));
    EXPECT_EQ(log.lines()[1], "default Failed to get opf url");
}

TEST_F(PackagedBook, ZippedWithoutItsOPFMakesAnError) {
    const URL url = EpubBuilder{}.without(EpubBuilder::opfPath).zip(m_folder / "book.epub");
    const RecordedLog log;

    EXPECT_FALSE(read(url));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::Corrupt, url));
    EXPECT_THAT(
        log.lines(),
        ElementsAre("debug metadataCompressed: start", "default Failed to extract opf data",
                    "default Failed to get opf data", "debug metadataCompressed: end {success: 0"));
}

TEST_F(PackagedBook, ZippedMatchesEntryNamesAsTheyStand) {
    EXPECT_FALSE(
        read(EpubBuilder{}.container(containerText("/OPS/content.opf")).zip(m_folder / "a.epub")));
    EXPECT_FALSE(
        read(EpubBuilder{}.container(containerText("ops/content.opf")).zip(m_folder / "b.epub")));
    EXPECT_EQ(coverOf(EpubBuilder{}
                          .opf(opfWithCover("../c.jpg"))
                          .file("c.jpg", "cover")
                          .zip(m_folder / "c.epub")),
              std::nullopt);
}

TEST_F(PackagedBook, ZippedWithAnUnusableOPFEndsWithoutSuccess) {
    const URL url = EpubBuilder{}.opf("<package/>").zip(m_folder / "book.epub");
    const RecordedLog log;

    EXPECT_FALSE(read(url));

    ASSERT_GE(log.lines().size(), 2U);
    EXPECT_EQ(log.lines()[log.lines().size() - 2], "default Failed to create dictionary from opf");
    EXPECT_EQ(log.lines().back(), "debug metadataCompressed: end {success: 0");
}

}  // namespace
}  // namespace parvel::testing
