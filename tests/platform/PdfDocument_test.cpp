#include "parvel/platform/PdfDocument.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>

#include "tests/support/PdfBuilder.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

class PdfDocumentTest : public ::testing::Test {
protected:
    std::unique_ptr<PdfDocument> open(const std::string& bytes) {
        m_folder.write("a.pdf", bytes);
        return PdfDocuments::host().open(m_folder.url("a.pdf"), &m_error);
    }
    std::unique_ptr<PdfDocument> open(const PdfBuilder& builder) { return open(builder.bytes()); }
    void expectNoDocument(const std::string& bytes) {
        EXPECT_FALSE(open(bytes));
        ASSERT_TRUE(m_error);
        EXPECT_EQ(*m_error, makeFileError(PVFileErrorCode::Corrupt, m_folder.url("a.pdf")));
    }
    /// The rotation of a page with these entries.
    int rotationOf(std::string_view entries) {
        const auto document = open(PdfBuilder{}.page(entries));
        const auto page = document ? document->firstPage() : nullptr;
        return page ? page->rotation() : -1;
    }

    TemporaryDirectory m_folder;
    std::optional<Error> m_error;
};

TEST_F(PdfDocumentTest, ReadsTheDocumentInformation) {
    const auto document = open(PdfBuilder{}
                                   .information("/Author (Ann) /Subject (Clouds) "
                                                "/CreationDate (D:20010101000001Z) "
                                                "/ModDate (D:20010101000002Z)")
                                   .page("")
                                   .page(""));

    ASSERT_TRUE(document);
    EXPECT_FALSE(document->isLocked());
    EXPECT_EQ(document->author(), "Ann");
    EXPECT_EQ(document->subject(), "Clouds");
    EXPECT_EQ(document->creationDate(), Date{1});
    EXPECT_EQ(document->modificationDate(), Date{2});
    EXPECT_EQ(document->pageCount(), 2U);
}

TEST_F(PdfDocumentTest, HasNoneOfTheEntriesThatAreMissing) {
    const auto document = open(PdfBuilder{}.page(""));

    ASSERT_TRUE(document);
    EXPECT_FALSE(document->author());
    EXPECT_FALSE(document->subject());
    EXPECT_FALSE(document->creationDate());
    EXPECT_FALSE(document->modificationDate());
}

TEST_F(PdfDocumentTest, TellsAnEmptyTextFromAMissingOne) {
    const auto document = open(PdfBuilder{}.information("/Author ()").page(""));

    ASSERT_TRUE(document);
    EXPECT_EQ(document->author(), "");
}

TEST_F(PdfDocumentTest, ReadsTextsInEachEncoding) {
    const auto document = open(PdfBuilder{}
                                   .information("/Author <FEFF005A006F00EB4F60> "
                                                "/Subject <EFBBBFC3ADC39F>")
                                   .page(""));

    ASSERT_TRUE(document);
    EXPECT_EQ(document->author(), "Zo\u00EB\u4F60");
    EXPECT_EQ(document->subject(), "\u00ED\u00DF");
}

TEST_F(PdfDocumentTest, LeavesOutATextOverItsLimit) {
    const auto document = open(PdfBuilder{}
                                   .information("/Author (" + std::string(64 * 1024 + 1, 'a') +
                                                ") /Subject (" + std::string(64 * 1024, 's') + ")")
                                   .page(""));

    ASSERT_TRUE(document);
    EXPECT_FALSE(document->author());
    EXPECT_EQ(document->subject()->size(), 64U * 1024);
}

TEST_F(PdfDocumentTest, OpensALockedDocumentWithoutItsInformation) {
    const std::string key(64, 'A');
    const auto document = open(PdfBuilder{}
                                   .information("/Author (Ann)")
                                   .trailer("/Encrypt << /Filter /Standard /V 1 /R 2 /P -4 /O <" +
                                            key + "> /U <" + key + "> >> /ID [<00> <00>]")
                                   .page(""));

    ASSERT_TRUE(document);
    EXPECT_TRUE(document->isLocked());
    EXPECT_FALSE(document->author());
    EXPECT_EQ(document->pageCount(), 0U);
    EXPECT_FALSE(document->firstPage());
}

TEST_F(PdfDocumentTest, OpensNothingElse) {
    expectNoDocument("");
    expectNoDocument("no document");
    expectNoDocument("%PDF-1.7\n");
}

TEST_F(PdfDocumentTest, OpensADocumentBehindOtherBytes) {
    EXPECT_TRUE(open("some bytes\n" + PdfBuilder{}.page("").bytes()));
}

TEST_F(PdfDocumentTest, OpensNoFileThatIsNotThere) {
    EXPECT_FALSE(PdfDocuments::host().openFile(m_folder.url("a.pdf"), &m_error));
    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile, m_folder.url("a.pdf")));
}

TEST_F(PdfDocumentTest, OpensNoFolderAsAFile) {
    EXPECT_FALSE(PdfDocuments::host().openFile(m_folder.url(""), &m_error));
    EXPECT_EQ(m_error->domain(), PVPOSIXErrorDomain);
    EXPECT_EQ(m_error->code(), EISDIR);
}

TEST_F(PdfDocumentTest, DoesNotWaitForAPipe) {
    ASSERT_EQ(::mkfifo((m_folder / "a.pdf").c_str(), 0600), 0);

    EXPECT_FALSE(PdfDocuments::host().openFile(m_folder.url("a.pdf"), &m_error));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::Corrupt, m_folder.url("a.pdf")));
}

TEST_F(PdfDocumentTest, HandsOverAllBytesOfAFileInOrder) {
    std::string bytes;
    for (int i = 0; i < 100000; ++i)
        bytes += std::to_string(i);
    m_folder.write("a.pdf", bytes);
    const auto file = PdfDocuments::host().openFile(m_folder.url("a.pdf"));
    ASSERT_TRUE(file);

    std::string taken;
    const bool isRead =
        file->readAll([&](Data::Bytes piece) { taken.append(piece.begin(), piece.end()); });

    EXPECT_TRUE(isRead);
    EXPECT_EQ(taken, bytes);
}

TEST_F(PdfDocumentTest, IsTheFileThatWasOpenedThoughAnotherHasItsNameNow) {
    m_folder.write("a.pdf", PdfBuilder{}.information("/Author (Ann)").page("").bytes());
    const auto file = PdfDocuments::host().openFile(m_folder.url("a.pdf"));
    ASSERT_TRUE(file);
    std::filesystem::remove(m_folder / "a.pdf");
    m_folder.write("a.pdf", "another");

    const auto document = PdfDocuments::host().openDocument(*file);

    ASSERT_TRUE(document);
    EXPECT_EQ(document->author(), "Ann");
}

TEST_F(PdfDocumentTest, HasNoFirstPageWithoutPages) {
    const auto document = open(PdfBuilder{});

    ASSERT_TRUE(document);
    EXPECT_EQ(document->pageCount(), 0U);
    EXPECT_FALSE(document->firstPage());
}

TEST_F(PdfDocumentTest, HasNoFirstPageWhereThePageCountLies) {
    const auto document = open(PdfBuilder{}.count("3"));

    ASSERT_TRUE(document);
    EXPECT_EQ(document->pageCount(), 3U);
    EXPECT_FALSE(document->firstPage());
}

TEST_F(PdfDocumentTest, TakesANegativePageCountForNone) {
    const auto document = open(PdfBuilder{}.count("-3"));

    ASSERT_TRUE(document);
    EXPECT_EQ(document->pageCount(), 0U);
}

TEST_F(PdfDocumentTest, GivesTheCropBoxsSize) {
    const auto document = open(PdfBuilder{}.page("/CropBox [100 100 300.5 500]"));

    const auto page = document->firstPage();

    ASSERT_TRUE(page);
    EXPECT_DOUBLE_EQ(page->cropBoxWidth(), 200.5);
    EXPECT_DOUBLE_EQ(page->cropBoxHeight(), 400);
}

TEST_F(PdfDocumentTest, CutsTheCropBoxAtTheMediaBox) {
    const auto document = open(PdfBuilder{}.page("/CropBox [-100 -100 3000 5000]"));

    const auto page = document->firstPage();

    ASSERT_TRUE(page);
    EXPECT_DOUBLE_EQ(page->cropBoxWidth(), 612);
    EXPECT_DOUBLE_EQ(page->cropBoxHeight(), 792);
}

TEST_F(PdfDocumentTest, DoesNotTurnTheCropBoxsSize) {
    const auto document = open(PdfBuilder{}.page("/Rotate 90"));

    const auto page = document->firstPage();

    ASSERT_TRUE(page);
    EXPECT_DOUBLE_EQ(page->cropBoxWidth(), 612);
}

TEST_F(PdfDocumentTest, GivesTheRotationWithinOneTurn) {
    EXPECT_EQ(rotationOf(""), 0);
    EXPECT_EQ(rotationOf("/Rotate 90"), 90);
    EXPECT_EQ(rotationOf("/Rotate 180"), 180);
    EXPECT_EQ(rotationOf("/Rotate 450"), 90);
    EXPECT_EQ(rotationOf("/Rotate -90"), 270);
    EXPECT_EQ(rotationOf("/Rotate 45"), 0);
}

TEST_F(PdfDocumentTest, InheritsTheRotation) {
    const auto document =
        open(PdfBuilder{}.inherited("/MediaBox [0 0 10 10] /Rotate 270").page(""));

    const auto page = document->firstPage();

    ASSERT_TRUE(page);
    EXPECT_EQ(page->rotation(), 270);
}

}  // namespace
}  // namespace parvel::testing
