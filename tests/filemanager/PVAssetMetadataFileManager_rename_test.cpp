#include <gtest/gtest.h>

#include <fstream>

#include "tests/support/ManagedFolder.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/Records.h"
#include "tests/support/RefusingServices.h"

namespace parvel::testing {
namespace {

using Lines = std::vector<std::string>;

class RenamingPDFs : public ManagedFolder {
protected:
    AssetPtr rename(const AssetPtr& pdf, const std::optional<String>& name) {
        return m_manager->_renameExistingPDFMetadata_toDisplayName_error(pdf, name, &m_error);
    }
    void expectError(const Error& error) { EXPECT_EQ(m_error, error); }
};

TEST_F(RenamingPDFs, APDFTakesItsDisplayName) {
    const auto pdf = asset("a.pdf", "bytes");
    RecordedLog log;

    const AssetPtr renamed = rename(pdf, "My Guide");

    ASSERT_TRUE(renamed);
    EXPECT_EQ(m_folder.read("My Guide.pdf"), "bytes");
    EXPECT_EQ(names(), Names{"My Guide.pdf"});
    EXPECT_EQ(renamed->url(), m_folder.url("My Guide.pdf"));
    EXPECT_EQ(valueOf(renamed->displayName()), Value("My Guide"));
    EXPECT_EQ(renamed->previousURL(), m_folder.url("a.pdf"));
    EXPECT_EQ(renamed->generationCount(), pdf->generationCount() + 1);
    EXPECT_EQ(pdf->url(), m_folder.url("a.pdf"));
    EXPECT_EQ(log.lines(), Lines{"default PDFRenamed: renamed -- Success"});
    EXPECT_FALSE(m_error);
}

TEST_F(RenamingPDFs, SlashesAndColonsBecomeLowLines) {
    const AssetPtr renamed = rename(asset("a.pdf"), "a/b:c");

    ASSERT_TRUE(renamed);
    EXPECT_EQ(names(), Names{"a_b_c.pdf"});
    EXPECT_EQ(valueOf(renamed->displayName()), Value("a_b_c"));
}

TEST_F(RenamingPDFs, ADisplayNameOfDotsStaysInTheFolder) {
    const AssetPtr renamed = rename(asset("library/a.pdf"), "../..");

    ASSERT_TRUE(renamed);
    EXPECT_EQ(names("library"), Names{".._...pdf"});
    ASSERT_TRUE(rename(renamed, ".."));
    EXPECT_EQ(names("library"), Names{"...pdf"});
}

TEST_F(RenamingPDFs, ADisplayNameThatEndsInTheExtensionGetsASecondOne) {
    const AssetPtr renamed = rename(asset("a.pdf"), "b.pdf");

    ASSERT_TRUE(renamed);
    EXPECT_EQ(names(), Names{"b.pdf.pdf"});
}

TEST_F(RenamingPDFs, AnUpperCaseExtensionBecomesLowerCase) {
    const AssetPtr renamed = rename(asset("a.PDF"), "a");

    ASSERT_TRUE(renamed);
    EXPECT_EQ(names(), Names{"a.pdf"});
}

TEST_F(RenamingPDFs, OtherKindsComeBackUnchanged) {
    for (const char* name : {"a.epub", "a.folium", "a.m4a", "a.txt"}) {
        const auto other = asset(name);
        RecordedLog log;

        EXPECT_EQ(rename(other, "My Name"), other);
        EXPECT_EQ(log.lines(), Lines{});
    }
    EXPECT_EQ(names(), (Names{"a.epub", "a.folium", "a.m4a", "a.txt"}));
}

TEST_F(RenamingPDFs, WithoutADisplayNameAPDFComesBackUnchanged) {
    const auto pdf = asset("a.pdf");

    EXPECT_EQ(rename(pdf, std::nullopt), pdf);
    EXPECT_EQ(names(), Names{"a.pdf"});
}

TEST_F(RenamingPDFs, NoRecordComesBackAsNone) {
    EXPECT_FALSE(rename(nullptr, "a"));
    EXPECT_FALSE(m_error);
}

TEST_F(RenamingPDFs, ARecordWithoutURLCanNotBeRenamed) {
    const auto pdf = emptyRecord();
    pdf->setAssetType(PVAssetTypePDF);
    RecordedLog log;

    EXPECT_FALSE(rename(pdf, "a"));
    expectError(makeMissingURLError());
    EXPECT_EQ(log.lines(), Lines{"error PDFRename: nil source url -- Bailing Out"});
}

TEST_F(RenamingPDFs, ADisplayNameThatMakesNoFileNameIsRefused) {
    for (const String& name : {String(), String("a\0b", 3)}) {
        const auto pdf = asset("a.pdf");
        m_error.reset();
        RecordedLog log;

        EXPECT_FALSE(rename(pdf, name));
        expectError(makeMissingURLError());
        EXPECT_EQ(log.lines(), Lines{"error PDFRename: nil proposedURL url -- Bailing Out"});
    }
    EXPECT_EQ(names(), Names{"a.pdf"});
}

TEST_F(RenamingPDFs, APDFOfThatNameAlreadyComesBackAsItIs) {
    const auto pdf = asset("a.pdf");
    RecordedLog log;

    EXPECT_EQ(rename(pdf, "a"), pdf);
    EXPECT_EQ(log.lines(), Lines{"debug PDFRename: assetURL == proposedURL"});
    EXPECT_FALSE(m_error);
}

TEST_F(RenamingPDFs, AMissingPDFIsNoSuchFile) {
    const auto pdf = PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("a.pdf"), nullptr);
    asset("b.pdf");
    RecordedLog log;

    EXPECT_FALSE(rename(pdf, "b"));
    expectError(makeFileError(PVFileErrorCode::NoSuchFile, m_folder.url("a.pdf")));
    EXPECT_EQ(log.lines(), Lines{"error PDFRename: Source File does not exist -- Bailing Out"});
}

TEST_F(RenamingPDFs, AnExistingFileIsNeverOverwritten) {
    const auto pdf = asset("a.pdf", "mine");
    asset("b.pdf", "other");
    RecordedLog log;

    EXPECT_FALSE(rename(pdf, "b"));
    expectError(makeFileError(PVFileErrorCode::FileExists, m_folder.url("b.pdf")));
    EXPECT_EQ(log.lines(), Lines{"error PDFRename: File exists -- Fail"});
    EXPECT_EQ(m_folder.read("a.pdf"), "mine");
    EXPECT_EQ(m_folder.read("b.pdf"), "other");
}

TEST_F(RenamingPDFs, ADanglingLinkOccupiesTheName) {
    const auto pdf = asset("a.pdf");
    std::filesystem::create_symlink("missing", m_folder / "b.pdf");

    EXPECT_FALSE(rename(pdf, "b"));
    expectError(makeFileError(PVFileErrorCode::FileExists, m_folder.url("b.pdf")));
}

TEST_F(RenamingPDFs, AFailedMoveLeavesThePDFAndItsErrorStands) {
    const auto pdf = asset("a.pdf");
    m_manager->setFileManager(
        std::make_shared<RefusingFileSystem>([](auto, const URL&) { return true; }));
    RecordedLog log;

    EXPECT_FALSE(rename(pdf, "b"));
    expectError(makePOSIXError(EIO, m_folder.url("a.pdf")));
    EXPECT_EQ(log.lines(), Lines{"error PDFRename: failed to rename -- Fail"});
    EXPECT_EQ(names(), Names{"a.pdf"});
}

/// Takes the new name between the test and the move.
class CompetingRenameService : public ForwardingFileSystemService {
public:
    CompetingRenameService() : ForwardingFileSystemService(FileSystemService::makeDefault()) {}
    bool moveItem(const URL& source, const URL& destination, ErrorOut error) override {
        std::ofstream(destination.path()) << "competitor";
        return ForwardingFileSystemService::moveItem(source, destination, error);
    }
};

TEST_F(RenamingPDFs, ACompetitorThatTookTheNameIsAFailedMoveAndIsNotOverwritten) {
    const auto pdf = asset("a.pdf", "mine");
    m_manager->setFileManager(std::make_shared<CompetingRenameService>());
    RecordedLog log;

    EXPECT_FALSE(rename(pdf, "b"));
    expectError(makeFileError(PVFileErrorCode::FileExists, m_folder.url("b.pdf")));
    EXPECT_EQ(log.lines(), Lines{"error PDFRename: failed to rename -- Fail"});
    EXPECT_EQ(m_folder.read("a.pdf"), "mine");
    EXPECT_EQ(m_folder.read("b.pdf"), "competitor");
}

TEST_F(RenamingPDFs, ANameThatIsTooLongIsAFailedMove) {
    const auto pdf = asset("a.pdf");

    EXPECT_FALSE(rename(pdf, String(300, 'x')));
    expectError(makePOSIXError(ENAMETOOLONG, m_folder.url(std::string(300, 'x') + ".pdf")));
    EXPECT_EQ(names(), Names{"a.pdf"});
}

TEST_F(RenamingPDFs, NormalisingRenamesAPDFAfterItsOwnDisplayName) {
    const auto pdf = asset("a.pdf");
    pdf->setDisplayName("My Guide");

    const AssetPtr renamed = m_manager->normalizeNamingForAsset_error(pdf, &m_error);

    ASSERT_TRUE(renamed);
    EXPECT_EQ(renamed->url(), m_folder.url("My Guide.pdf"));
    EXPECT_EQ(names(), Names{"My Guide.pdf"});
}

TEST_F(RenamingPDFs, NormalisingPassesTheRenamesErrorOut) {
    const auto pdf = asset("a.pdf");
    pdf->setDisplayName("b");
    asset("b.pdf", "other");
    RecordedLog log;

    EXPECT_FALSE(m_manager->normalizeNamingForAsset_error(pdf, &m_error));
    expectError(makeFileError(PVFileErrorCode::FileExists, m_folder.url("b.pdf")));
    EXPECT_EQ(log.lines(), Lines{"error PDFRename: File exists -- Fail"});
    EXPECT_EQ(names(), (Names{"a.pdf", "b.pdf"}));
}

TEST_F(RenamingPDFs, NormalisingAPDFOfThatNameGivesItBack) {
    const auto pdf = asset("a.pdf");
    pdf->setDisplayName("a");

    EXPECT_EQ(m_manager->normalizeNamingForAsset_error(pdf, &m_error), pdf);
    EXPECT_FALSE(m_error);
}

TEST_F(RenamingPDFs, NormalisingLeavesOtherKindsAndOddDisplayNamesAlone) {
    const auto book = asset("a.epub");
    book->setDisplayName("My Book");
    const Dictionary numbered{{"PVDisplayName", integerValue(7)}};
    const auto pdf = PVAssetMetadata::metadataWithURL_dictionary(asset("a.pdf")->url(), &numbered);

    EXPECT_EQ(m_manager->normalizeNamingForAsset_error(book, &m_error), book);
    EXPECT_EQ(m_manager->normalizeNamingForAsset_error(pdf, &m_error), pdf);
    EXPECT_FALSE(m_manager->normalizeNamingForAsset_error(nullptr, &m_error));
    EXPECT_EQ(names(), (Names{"a.epub", "a.pdf"}));
    EXPECT_FALSE(m_error);
}

}  // namespace
}  // namespace parvel::testing
