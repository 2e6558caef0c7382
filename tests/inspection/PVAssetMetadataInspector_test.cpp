#include "parvel/inspection/PVAssetMetadataInspector.h"

#include <stdexcept>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "parvel/foundation/PVDigest.h"
#include "parvel/metadata/PVAssetMetadataKeys.h"
#include "parvel/platform/MalformedInput.h"
#include "parvel/platform/Service.h"
#include "parvel/platform/XmlDocument.h"
#include "parvel/platform/ZipArchive.h"
#include "parvel/xattr/PNMetadataXattr.h"
#include "tests/support/AttributeFolder.h"
#include "tests/support/EpubBuilder.h"
#include "tests/support/ForwardingXattrStore.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/Records.h"
#include "tests/support/RefusingDigest.h"

namespace parvel::testing {
namespace {

using ::testing::ElementsAre;

/// What the caller's slot holds before a call, to tell "set to none" from "left untouched".
const std::optional<Error> staleError = makePOSIXError(EXDEV, std::nullopt);

std::string failureLine(const std::optional<URL>& url, const std::optional<Error>& error) {
    return "default Failed to get metadata: " + logText(url) + " url error: " + logText(error);
}

class Inspector : public ::testing::Test {
protected:
    AssetPtr inspect(const std::optional<URL>& url) {
        return PVAssetMetadataInspector::metadataForAssetAtURL_error(url, &m_error);
    }

    TemporaryDirectory m_folder;
    std::optional<Error> m_error = staleError;
};

TEST_F(Inspector, ReadsAZippedBook) {
    const std::string opf = opfText("<dc:title>T</dc:title><dc:creator>Ada</dc:creator>");
    const URL url = EpubBuilder{}.opf(opf).zip(m_folder / "book.epub");
    const RecordedLog log;

    const AssetPtr asset = inspect(url);

    ASSERT_TRUE(asset);
    EXPECT_EQ(asset->title(), "T");
    EXPECT_EQ(asset->author(), "Ada");
    EXPECT_EQ(asset->assetID(), parvel_MD5String(Data::copyOf(opf)));
    EXPECT_EQ(asset->url(), url);
    EXPECT_THAT(log.lines(),
                ElementsAre("debug Getting metadata: " + url.absoluteString(),
                            "debug Getting eBook metadata", "debug metadataCompressed: start",
                            "debug aggregatedMetadata: start {opf: 1, bazaarMetadata: 0}",
                            "debug BazaarMetadata: start {data: 0, url: 1}",
                            "debug BazaarMetadata: data.length == 0",
                            "debug opfMetadata: start {withCover: 0}", "debug opfMetadata: has opf",
                            "debug opfMetadata: end {success: 1}",
                            "debug aggregateMetadata: end {success: 1}",
                            "debug metadataCompressed: end {success: 1",
                            "default Parsed Metadata: " + asset->description()));
}

TEST_F(Inspector, AssignsTheErrorOnSuccessToo) {
    EXPECT_TRUE(inspect(EpubBuilder{}.zip(m_folder / "book.epub")));

    EXPECT_EQ(m_error, std::nullopt);
}

TEST_F(Inspector, ASuccessMayLeaveALookupsError) {
    const URL url =
        EpubBuilder{}
            .opf(opfText("<dc:identifier>x</dc:identifier>", "", " unique-identifier=\"it's\""))
            .zip(m_folder / "book.folium");

    EXPECT_TRUE(inspect(url));

    ASSERT_TRUE(m_error);
    EXPECT_EQ(m_error->code(), static_cast<std::int64_t>(PVFileErrorCode::Corrupt));
}

TEST_F(Inspector, ReadsAnExpandedFoliumPackageWithItsOwnIdentifier) {
    const URL url = EpubBuilder{}
                        .opf(opfText("<dc:identifier>own</dc:identifier>"))
                        .expand(m_folder / "book.folium");

    const AssetPtr asset = inspect(url);

    ASSERT_TRUE(asset);
    EXPECT_EQ(asset->assetID(), "own");
}

TEST_F(Inspector, CopiesThatDifferOnlyInContentHaveOneIdentity) {
    const EpubBuilder book;
    const AssetPtr plain = inspect(book.zip(m_folder / "a.epub"));
    const AssetPtr fuller =
        inspect(EpubBuilder(book).file("OPS/1.xhtml", "<p/>").zip(m_folder / "b.epub"));
    const AssetPtr changed = inspect(EpubBuilder(book).opf(opfText(" ")).zip(m_folder / "c.epub"));

    ASSERT_TRUE(plain && fuller && changed);
    EXPECT_EQ(plain->assetID(), fuller->assetID());
    EXPECT_NE(plain->assetID(), changed->assetID());
}

TEST_F(Inspector, APreviewKeepsItsStoreIDToItself) {
    const AssetPtr asset = inspect(
        EpubBuilder{}
            .store(storeFileText("<key>isPreview</key><true/><key>itemId</key><string>7</string>"))
            .zip(m_folder / "book.epub"));

    ASSERT_TRUE(asset);
    EXPECT_EQ(asset->storeID(), nullptr);
    EXPECT_TRUE(asset->isPreview());
    EXPECT_EQ(asset->assetID(), parvel_MD5String(Data::copyOf(opfText(""))));
}

TEST_F(Inspector, GivesCoverBytesOnlyWhenAsked) {
    const URL url = EpubBuilder{}
                        .opf(opfText("", R"(<item id="cover" href="c.jpg"/>)"))
                        .file("OPS/c.jpg", "cover")
                        .zip(m_folder / "book.epub");

    const AssetPtr with =
        PVAssetMetadataInspector::metadataIncludingCoverForAssetAtURL_error(url, &m_error);
    const AssetPtr without = inspect(url);

    ASSERT_TRUE(with && without);
    EXPECT_EQ(valueOf(with->coverImageData()), Data::copyOf("cover"));
    EXPECT_EQ(without->coverImageData(), nullptr);
}

TEST_F(Inspector, TheCallersExtraMetadataGoesOverWhatWasRead) {
    const URL url = EpubBuilder{}
                        .opf(opfText("<dc:title>T</dc:title><dc:creator>Ada</dc:creator>"))
                        .zip(m_folder / "book.epub");
    const AssetPtr extra = recordOver({{String(key::itemName), "Extra"}});

    const AssetPtr asset =
        PVAssetMetadataInspector::metadataForAssetAtURL_extraMetadata_error(url, extra, &m_error);

    ASSERT_TRUE(asset);
    EXPECT_EQ(asset->title(), "Extra");
    EXPECT_EQ(asset->author(), "Ada");
    EXPECT_EQ(m_error, std::nullopt);
}

TEST_F(Inspector, ExtraMetadataIsNotNeeded) {
    const URL url = EpubBuilder{}.opf(opfText("<dc:title>T</dc:title>")).zip(m_folder / "a.epub");

    const AssetPtr asset =
        PVAssetMetadataInspector::metadataForAssetAtURL_extraMetadata_error(url, nullptr);

    ASSERT_TRUE(asset);
    EXPECT_EQ(asset->title(), "T");
}

TEST_F(Inspector, ExtraMetadataMakesNoRecordWhereNoneIsRead) {
    const URL url = m_folder.url("absent.epub");

    EXPECT_FALSE(PVAssetMetadataInspector::metadataForAssetAtURL_extraMetadata_error(
        url, emptyRecord(), &m_error));

    EXPECT_EQ(m_error, makeServiceError(ENOENT, url));
}

TEST_F(Inspector, AnAbsentURLIsMissing) {
    const RecordedLog log;

    EXPECT_FALSE(inspect(std::nullopt));

    EXPECT_EQ(m_error, makeMissingURLError());
    EXPECT_TRUE(m_error->userInfo().empty());
    EXPECT_THAT(log.lines(), ElementsAre("debug Getting metadata: (null)", "default URL is nil",
                                         failureLine(std::nullopt, m_error)));
}

TEST_F(Inspector, AnUnreachableAssetGivesThePlatformsError) {
    const URL url = m_folder.url("absent.epub");
    const RecordedLog log;

    EXPECT_FALSE(inspect(url));

    EXPECT_EQ(m_error, makeServiceError(ENOENT, url));
    EXPECT_THAT(log.lines(), ElementsAre("debug Getting metadata: " + url.absoluteString(),
                                         "default Asset is unreachable: " + url.absoluteString(),
                                         failureLine(url, m_error)));
}

TEST_F(Inspector, ADanglingLinkIsUnreachable) {
    const URL url = m_folder.url("link.epub");
    std::filesystem::create_symlink("absent.epub", url.path());

    EXPECT_FALSE(inspect(url));

    EXPECT_EQ(m_error, makeServiceError(ENOENT, url));
}

TEST_F(Inspector, AnExtensionOfNoKindHasNoType) {
    const URL url = URL::fileURLWithPath(m_folder.write("book.txt", "text"));
    const RecordedLog log;

    EXPECT_FALSE(inspect(url));

    EXPECT_EQ(m_error, makeNoAssetTypeError(url));
    EXPECT_THAT(log.lines(), ElementsAre("debug Getting metadata: " + url.absoluteString(),
                                         failureLine(url, m_error)));
}

TEST_F(Inspector, ABookThatCanNotBeAggregatedGivesTheReadersError) {
    const URL url = EpubBuilder{}.without(EpubBuilder::opfPath).zip(m_folder / "book.epub");
    const RecordedLog log;

    EXPECT_FALSE(inspect(url));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::Corrupt, url));
    ASSERT_GE(log.lines().size(), 2U);
    EXPECT_EQ(log.lines()[log.lines().size() - 2], "default Failed to create aggregated metadata");
    EXPECT_EQ(log.lines().back(), failureLine(url, m_error));
}

TEST_F(Inspector, ARecordWithoutAnIdentityIsNeverHandedOut) {
    const URL url = EpubBuilder{}.zip(m_folder / "book.epub");
    const RefusingDigest digest;
    const RecordedLog log;

    EXPECT_FALSE(inspect(url));

    EXPECT_EQ(m_error, makeNoAssetIDError(url));
    EXPECT_EQ(log.lines().back(), failureLine(url, m_error));
}

TEST_F(Inspector, WithoutAPlaceForTheErrorAFailureIsNoneAlone) {
    const RecordedLog log;

    EXPECT_FALSE(PVAssetMetadataInspector::metadataForAssetAtURL_error(std::nullopt));

    EXPECT_EQ(log.lines().back(), failureLine(std::nullopt, makeMissingURLError()));
}

/// Raises the given exception for whatever it is to open.
template <class Exception>
class ThrowingZipReader : public ZipReader {
public:
    std::unique_ptr<ZipArchive> open(const URL&, ErrorOut error) override {
        assign(error, makePOSIXError(EIO, std::nullopt));
        throw Exception("thrown");
    }

private:
    Service<ZipReader>::Replacement m_replacement{*this};
};

TEST_F(Inspector, MalformedInputWithinAReaderGivesNoneAndNoError) {
    const URL url = EpubBuilder{}.zip(m_folder / "book.epub");
    const ThrowingZipReader<MalformedInput> reader;
    const RecordedLog log;

    EXPECT_FALSE(inspect(url));

    EXPECT_EQ(m_error, std::nullopt);
    EXPECT_THAT(log.lines(),
                ElementsAre("debug Getting metadata: " + url.absoluteString(),
                            "debug Getting eBook metadata", "debug metadataCompressed: start",
                            "fault Caught exception while trying to get asset metadata: " +
                                url.absoluteString(),
                            failureLine(url, std::nullopt)));
}

TEST_F(Inspector, OtherExceptionsPassThrough) {
    const URL url = EpubBuilder{}.zip(m_folder / "book.epub");
    const ThrowingZipReader<std::runtime_error> reader;

    EXPECT_THROW(inspect(url), std::runtime_error);
}

/// Raises MalformedInput for any XML.
class ThrowingXmlParser : public XmlParser {
public:
    std::shared_ptr<const XmlDocument> parse(const Data&, const URL&, ErrorOut) override {
        throw MalformedInput("thrown");
    }

private:
    Service<XmlParser>::Replacement m_replacement{*this};
};

TEST_F(Inspector, MalformedInputWithinTheXMLGivesNoneAndNoError) {
    const URL url = EpubBuilder{}.expand(m_folder / "book.epub");
    const ThrowingXmlParser parser;

    EXPECT_FALSE(inspect(url));

    EXPECT_EQ(m_error, std::nullopt);
}

class InspectorOverAttributes : public AttributeFolder {
protected:
    std::optional<Error> m_error = staleError;
};

TEST_F(InspectorOverAttributes, TheAttributesGoOverTheContent) {
    const URL url = EpubBuilder{}
                        .opf(opfText("<dc:title>T</dc:title><dc:creator>Ada</dc:creator>"))
                        .zip(m_folder / "book.epub");
    setStored(url, PNMetadataXattrAssetID, "ID");
    setStored(url, PNMetadataXattrTitle, "Attribute's");

    const AssetPtr asset = PVAssetMetadataInspector::metadataForAssetAtURL_error(url, &m_error);

    ASSERT_TRUE(asset);
    EXPECT_EQ(asset->assetID(), "ID");
    EXPECT_EQ(asset->title(), "Attribute's");
    EXPECT_EQ(asset->author(), "Ada");
    EXPECT_EQ(m_error, std::nullopt);
}

TEST_F(InspectorOverAttributes, AnEmptyIdentityInTheAttributesIsNone) {
    const URL url = EpubBuilder{}.zip(m_folder / "book.epub");
    setStored(url, PNMetadataXattrAssetID, "");

    EXPECT_FALSE(PVAssetMetadataInspector::metadataForAssetAtURL_error(url, &m_error));

    EXPECT_EQ(m_error, makeNoAssetIDError(url));
}

/// A host that can't read attributes.
class UnreadableXattrStore : public ForwardingXattrStore {
public:
    int size(const std::string&, const std::string&, std::size_t&) override { return EIO; }
    int get(const std::string&, const std::string&, std::span<std::byte>, std::size_t&) override {
        return EIO;
    }
    int list(const std::string&, std::vector<std::string>&) override { return EIO; }
};

TEST_F(InspectorOverAttributes, AFailedAttributeReadStopsNothingAndGivesNoError) {
    const URL url = EpubBuilder{}.opf(opfText("<dc:title>T</dc:title>")).zip(m_folder / "b.epub");
    setStored(url, PNMetadataXattrTitle, "Attribute's");
    const UnreadableXattrStore store;

    const AssetPtr asset = PVAssetMetadataInspector::metadataForAssetAtURL_error(url, &m_error);

    ASSERT_TRUE(asset);
    EXPECT_EQ(asset->title(), "T");
    EXPECT_EQ(m_error, std::nullopt);
}

}  // namespace
}  // namespace parvel::testing
