#include <cerrno>

#include <gtest/gtest.h>

#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "tests/support/FakePdf.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/RefusingDigest.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

using Lines = std::vector<std::string>;

/// The MD5 of FakePdfs' bytes.
constexpr std::string_view bytesMD5 = "54102E1972F481EA113027866DB898D5";

class PdfMetadata : public ::testing::Test {
protected:
    MutableAssetPtr read(bool includeCover = false, const AssetPtr& preloaded = nullptr) {
        return PVAssetMetadataInspector::
            _pdf_metadataForAssetAtURL_preloadedMetadata_includeCover_error(m_url, preloaded,
                                                                            includeCover, &m_error);
    }
    /// A preloaded record as the attributes give it.
    [[nodiscard]] MutableAssetPtr preloaded() const {
        return PVAssetMetadata::metadataWithURL_dictionary(m_url, nullptr);
    }

    URL m_url = URL::fileURLWithPath("/books/Walden.pdf");
    FakePdfs m_pdfs;
    FakeImageCodec m_codec;
    std::optional<Error> m_error;
};

TEST_F(PdfMetadata, TheDocumentInformationBecomesTheRecord) {
    m_pdfs.content.authorText = "Henry David Thoreau";
    m_pdfs.content.subjectText = "Essay";
    m_pdfs.content.created = Date{100};
    m_pdfs.content.modified = Date{200.5};
    m_pdfs.content.pages = 7;
    RecordedLog log;

    const auto record = read();

    ASSERT_TRUE(record);
    EXPECT_EQ(record->author(), "Henry David Thoreau");
    EXPECT_EQ(*record->genre(), Value("Essay"));
    EXPECT_EQ(*record->releaseDate(), Value(Date{100}));
    EXPECT_EQ(*record->modificationDate(), Value(Date{200.5}));
    EXPECT_EQ(*record->updateDate(), Value(Date{200.5}));
    EXPECT_EQ(record->pageCount(), 7U);
    EXPECT_EQ(record->url(), m_url);
    EXPECT_FALSE(m_error);
    EXPECT_EQ(log.lines(), Lines{"debug Getting pdf metadata"});
}

TEST_F(PdfMetadata, WhatTheDocumentLacksIsAbsent) {
    const auto record = read();

    EXPECT_FALSE(record->author());
    EXPECT_FALSE(record->genre());
    EXPECT_FALSE(record->releaseDate());
    EXPECT_FALSE(record->modificationDate());
    EXPECT_FALSE(record->updateDate());
    EXPECT_FALSE(record->coverImageData());
}

TEST_F(PdfMetadata, TheFileNameWithoutItsExtensionIsTitleAndDisplayName) {
    m_url = URL::fileURLWithPath("/books/UPPER.Vol 1.PDF");

    const auto record = read();

    EXPECT_EQ(*record->itemName(), Value("UPPER.Vol 1"));
    EXPECT_EQ(*record->displayName(), Value("UPPER.Vol 1"));
}

TEST_F(PdfMetadata, AFileNameThatIsNoTextGivesOne) {
    m_url = URL::fileURLWithPath("/books/caf\xE9.pdf");

    const auto record = read();

    EXPECT_EQ(*record->itemName(), Value("caf\uFFFD"));
    EXPECT_EQ(*record->displayName(), Value("caf\uFFFD"));
}

TEST_F(PdfMetadata, TheIdentityIsTheDigestOfTheBytesReadOnce) {
    const auto record = read();

    EXPECT_EQ(record->assetID(), bytesMD5);
    EXPECT_EQ(*record->generatedID(), Value(bytesMD5));
    EXPECT_EQ(m_pdfs.filesOpened, 1);
    EXPECT_EQ(m_pdfs.filesRead, 1);
    EXPECT_EQ(m_pdfs.documentsOpened, 1);
}

TEST_F(PdfMetadata, EqualBytesHaveEqualIdentitiesWhateverTheName) {
    const auto record = read();
    m_url = URL::fileURLWithPath("/elsewhere/Copy.pdf");

    EXPECT_EQ(read()->assetID(), record->assetID());
}

TEST_F(PdfMetadata, AKeptIdentitySavesTheDigest) {
    const auto kept = preloaded();
    kept->setGeneratedID("KEPT");

    const auto record = read(/*includeCover=*/false, kept);

    EXPECT_EQ(record->assetID(), "KEPT");
    EXPECT_EQ(m_pdfs.filesRead, 0);
}

TEST_F(PdfMetadata, AnEmptyKeptIdentityDoesNotAndStillWins) {
    const auto kept = preloaded();
    kept->setGeneratedID("");

    const auto record = read(/*includeCover=*/false, kept);

    EXPECT_EQ(m_pdfs.filesRead, 1);
    EXPECT_EQ(*record->generatedID(), Value(""));
}

TEST_F(PdfMetadata, ARefusedDigestLeavesTheRecordWithoutIdentity) {
    const RefusingDigest digest;
    RecordedLog log;

    const auto record = read();

    ASSERT_TRUE(record);
    EXPECT_FALSE(record->generatedID());
    EXPECT_FALSE(m_error);
    EXPECT_EQ(log.lines(),
              (Lines{"debug Getting pdf metadata", "error Failed to generate PDF ID"}));
}

/// A host whose digests fail at their end, in force while it lives.
class UnfinishedDigest : public Digest {
public:
    std::unique_ptr<Running> beginMD5() override { return std::make_unique<Unfinished>(); }
    std::optional<SHA256> sha256(const Data&) override { return std::nullopt; }

private:
    struct Unfinished : Running {
        void update(Data::Bytes) override {}
        std::optional<MD5> finish() override { return std::nullopt; }
    };

    Service<Digest>::Replacement m_replacement{*this};
};

TEST_F(PdfMetadata, ADigestThatFailsAtItsEndLeavesTheRecordWithoutIdentity) {
    const UnfinishedDigest digest;
    m_pdfs.content.authorText = "Henry David Thoreau";
    RecordedLog log;

    const auto record = read();

    ASSERT_TRUE(record);
    EXPECT_FALSE(record->generatedID());
    EXPECT_EQ(record->author(), "Henry David Thoreau");
    EXPECT_FALSE(m_error);
    EXPECT_EQ(log.lines(),
              (Lines{"debug Getting pdf metadata", "error Failed to generate PDF ID"}));
}

TEST_F(PdfMetadata, WithAKeptIdentityAFileThatCanNotBeOpenedFailsTheSame) {
    const auto kept = preloaded();
    kept->setGeneratedID("KEPT");
    m_pdfs.openError = makePOSIXError(EACCES, m_url);
    RecordedLog log;

    EXPECT_FALSE(read(/*includeCover=*/false, kept));

    EXPECT_EQ(m_error, makePOSIXError(EACCES, m_url));
    EXPECT_EQ(log.lines(),
              (Lines{"debug Getting pdf metadata", "default Failed to read PDF contents"}));
}

TEST_F(PdfMetadata, AFileThatCanNotBeOpenedFailsWithThatError) {
    m_pdfs.openError = makePOSIXError(EACCES, m_url);
    RecordedLog log;

    EXPECT_FALSE(read());

    EXPECT_EQ(m_error, makePOSIXError(EACCES, m_url));
    EXPECT_EQ(log.lines(),
              (Lines{"debug Getting pdf metadata", "default Failed to read PDF contents"}));
}

TEST_F(PdfMetadata, AFileThatCanNotBeReadToItsEndFailsWithThatError) {
    m_pdfs.readError = makePOSIXError(EIO, m_url);
    RecordedLog log;

    EXPECT_FALSE(read());

    EXPECT_EQ(m_error, makePOSIXError(EIO, m_url));
    EXPECT_EQ(m_pdfs.documentsOpened, 0);
    EXPECT_EQ(log.lines(),
              (Lines{"debug Getting pdf metadata", "default Failed to read PDF contents"}));
}

TEST_F(PdfMetadata, WhatIsNoDocumentFailsAsCorrupt) {
    m_pdfs.documentError = makeFileError(PVFileErrorCode::Corrupt, m_url);
    RecordedLog log;

    EXPECT_FALSE(read());

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::Corrupt, m_url));
    EXPECT_EQ(log.lines(),
              (Lines{"debug Getting pdf metadata", "default Failed to create PDF document"}));
}

TEST_F(PdfMetadata, TheReasonOfAFailedDocumentPassesOut) {
    m_pdfs.documentError =
        Error(PVFileErrorDomain, 259,
              {{std::string(PVURLErrorKey), m_url},
               {std::string(PVLocalizedFailureReasonErrorKey), "the helper is missing"}});

    EXPECT_FALSE(read());

    ASSERT_TRUE(m_error);
    EXPECT_EQ(m_error->message(), "the helper is missing");
}

TEST_F(PdfMetadata, ALockedDocumentIsReadAndMarked) {
    m_pdfs.content.locked = true;
    m_pdfs.content.pages = 0;

    const auto record = read(/*includeCover=*/true);

    ASSERT_TRUE(record);
    EXPECT_TRUE(record->isLocked());
    EXPECT_EQ(record->pageCount(), 0U);
    EXPECT_FALSE(record->coverImageData());
    EXPECT_EQ(record->assetID(), bytesMD5);
}

TEST_F(PdfMetadata, AnOpenDocumentIsMarkedAsNotLocked) {
    EXPECT_EQ(*read()->dictionaryRepresentation()->find("PVIsLocked"),
              Value(Number::boolean(false)));
}

TEST_F(PdfMetadata, TheCoverIsTheFirstPageInItsBox) {
    const auto record = read(/*includeCover=*/true);

    EXPECT_EQ(*record->coverImageData(), Value(Data::copyOf("293x380")));
    EXPECT_EQ(m_pdfs.documentsOpened, 2);  // for the cover once more
    EXPECT_EQ(m_pdfs.filesRead, 1);
    EXPECT_FALSE(m_error);
}

TEST_F(PdfMetadata, NoPageIsDrawnUnasked) {
    EXPECT_FALSE(read(/*includeCover=*/false)->coverImageData());

    EXPECT_EQ(m_pdfs.documentsOpened, 1);
    EXPECT_TRUE(m_pdfs.drawn.empty());
}

TEST_F(PdfMetadata, ADocumentWithoutPagesHasNoCover) {
    m_pdfs.content.pages = 0;

    const auto record = read(/*includeCover=*/true);

    EXPECT_FALSE(record->coverImageData());
    EXPECT_EQ(m_pdfs.documentsOpened, 1);
}

TEST_F(PdfMetadata, AKeptCoverSavesTheDrawing) {
    const Data kept = Data::copyOf("kept");
    const auto record = preloaded();
    record->setCoverImageData(&kept);

    EXPECT_EQ(*read(/*includeCover=*/true, record)->coverImageData(), Value(kept));

    EXPECT_TRUE(m_pdfs.drawn.empty());
}

TEST_F(PdfMetadata, AnEmptyKeptCoverDoesNotAndStillWins) {
    const Data empty;
    const auto record = preloaded();
    record->setCoverImageData(&empty);

    EXPECT_EQ(*read(/*includeCover=*/true, record)->coverImageData(), Value(empty));

    EXPECT_EQ(m_pdfs.drawn.size(), 1U);
}

TEST_F(PdfMetadata, APageThatCanNotBeDrawnLeavesTheRecordWithoutCover) {
    m_pdfs.content.page->draws = false;
    RecordedLog log;

    const auto record = read(/*includeCover=*/true);

    ASSERT_TRUE(record);
    EXPECT_FALSE(record->coverImageData());
    EXPECT_FALSE(m_error);
    EXPECT_EQ(log.lines(), Lines{"debug Getting pdf metadata"});
}

TEST_F(PdfMetadata, AnImageThatCanNotBeEncodedLeavesTheRecordWithoutCover) {
    m_codec.encodes = false;

    const auto record = read(/*includeCover=*/true);

    ASSERT_TRUE(record);
    EXPECT_FALSE(record->coverImageData());
    EXPECT_FALSE(m_error);
}

TEST_F(PdfMetadata, ADocumentThatIsGoneForTheCoverLeavesTheRecordWithoutIt) {
    m_pdfs.documentError = makeFileError(PVFileErrorCode::Corrupt, m_url);
    m_pdfs.documentsBeforeError = 1;

    const auto record = read(/*includeCover=*/true);

    ASSERT_TRUE(record);
    EXPECT_FALSE(record->coverImageData());
    EXPECT_FALSE(m_error);
}

TEST_F(PdfMetadata, APageThatIsMissingInSpiteOfTheCountIsBlank) {
    m_pdfs.content.page.reset();

    const auto record = read(/*includeCover=*/true);

    EXPECT_EQ(*record->coverImageData(), Value(Data::copyOf("266x380")));
}

TEST_F(PdfMetadata, WhatIsKeptOnTheFileGoesOverTheContent) {
    m_pdfs.content.authorText = "The Document's";
    m_pdfs.content.subjectText = "Essay";
    const auto kept = preloaded();
    kept->setTitle("Mine");
    kept->setAuthor("Me");

    const auto record = read(/*includeCover=*/false, kept);

    EXPECT_EQ(record->title(), "Mine");
    EXPECT_EQ(record->author(), "Me");
    EXPECT_EQ(*record->genre(), Value("Essay"));
    EXPECT_EQ(*record->displayName(), Value("Walden.pdf"));  // the kept record has one of its own
}

class PdfInspection : public ::testing::Test {
protected:
    TemporaryDirectory m_folder;
    URL m_url = URL::fileURLWithPath(m_folder.write("Walden.pdf", "bytes"));
    FakePdfs m_pdfs;
    FakeImageCodec m_codec;
};

TEST_F(PdfInspection, ReadsAPDFByItsExtension) {
    std::optional<Error> error;

    const AssetPtr asset = PVAssetMetadataInspector::metadataForAssetAtURL_error(m_url, &error);

    ASSERT_TRUE(asset);
    EXPECT_TRUE(asset->isPDF());
    EXPECT_EQ(asset->assetID(), bytesMD5);
    EXPECT_EQ(error, std::nullopt);
}

TEST_F(PdfInspection, RefusesOneWithoutIdentity) {
    const RefusingDigest digest;
    std::optional<Error> error;

    EXPECT_FALSE(PVAssetMetadataInspector::metadataForAssetAtURL_error(m_url, &error));

    EXPECT_EQ(error, makeNoAssetIDError(m_url));
}

TEST_F(PdfInspection, HandsOutTheReadersError) {
    m_pdfs.documentError = makeFileError(PVFileErrorCode::Corrupt, m_url);
    std::optional<Error> error;

    EXPECT_FALSE(PVAssetMetadataInspector::metadataForAssetAtURL_error(m_url, &error));

    EXPECT_EQ(error, makeFileError(PVFileErrorCode::Corrupt, m_url));
}

TEST_F(PdfInspection, GivesTheDrawnPageAsCoverImage) {
    EXPECT_EQ(PVAssetMetadataInspector::coverImageDataForAssetAtURL_error(m_url),
              Data::copyOf("293x380"));
}

}  // namespace
}  // namespace parvel::testing
