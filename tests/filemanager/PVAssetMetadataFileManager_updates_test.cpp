#include <gtest/gtest.h>

#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "parvel/platform/PropertyList.h"
#include "parvel/xattr/PNMetadataXattr.h"
#include "tests/support/EditedLibrary.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/Records.h"
#include "tests/support/RefusingServices.h"

namespace parvel::testing {
namespace {

using Lines = std::vector<std::string>;
using Act = RefusingFileSystem::Act;

/// The library with updates of its book, and what they left on the disk.
class UpdatingAssets : public EditedLibrary {
protected:
    AssetPtr update(const AssetPtr& updated, const Dictionary& updates, bool inflate = true) {
        return m_manager->updateAsset_withUpdates_temporaryDirectory_inflateIfNeeded_error(
            updated, &updates, m_folder.url("temporary"), inflate, &m_error);
    }
    void refuse(Act act, const std::string& name) {
        m_manager->setFileManager(
            std::make_shared<RefusingFileSystem>([act, name](Act asked, const URL& url) {
                return asked == act && url.lastPathComponent() == name;
            }));
    }

    [[nodiscard]] std::optional<Value> storedInStoreFile(std::string_view key) const {
        const std::string bytes = m_folder.read("library/a.epub/BazaarMetadata.plist");
        const auto list = PropertyListCodec::host().parse(Data::copyOf(bytes), std::nullopt);
        const Dictionary* dictionary = list ? list->as<Dictionary>() : nullptr;
        return dictionary ? valueOf(dictionary->find(key)) : std::nullopt;
    }
    [[nodiscard]] std::optional<Value> attribute(const std::string& name,
                                                 std::string_view key) const {
        const auto record =
            PVAssetMetadata::metadataWithURL_dictionary(m_folder.url(name), nullptr);
        const auto attributes = m_manager->extendedAttributesForAsset_error(record);
        return attributes ? valueOf(attributes->find(key)) : std::nullopt;
    }
    /// Whether the file system keeps attributes.
    [[nodiscard]] bool hasIdentity() const {
        return attribute("library/a.epub", PNMetadataXattrAssetID).has_value();
    }
    /// The lines of the update itself, without those of its steps.
    static Lines ofUpdate(const RecordedLog& log) {
        Lines lines;
        for (const std::string& line : log.lines()) {
            if (line.find(" updateMetadata: ") != std::string::npos)
                lines.push_back(line);
        }
        return lines;
    }
};

TEST_F(UpdatingAssets, AnExpandedBookTakesAllUpdates) {
    const AssetPtr book = expandedBook();
    ASSERT_TRUE(book);
    m_folder.write("library/a.epub/BazaarArtwork", "old cover");
    const Data cover = Data::copyOf("new cover");

    const AssetPtr updated =
        update(book, {{"itemName", "New"}, {"genre", "Crime"}, {"PVCoverImageData", cover}});

    ASSERT_TRUE(updated);
    EXPECT_EQ(updated->title(), "New");
    EXPECT_EQ(updated->author(), "Author");
    EXPECT_EQ(valueOf(updated->coverImageData()), Value(cover));
    EXPECT_EQ(valueOf(updated->coverImageDataReplaced()), Value(Data::copyOf("old cover")));
    EXPECT_EQ(updated->generationCount(), book->generationCount() + 1);
    EXPECT_EQ(m_folder.read("library/a.epub/BazaarArtwork"), "new cover");
    EXPECT_EQ(m_folder.read("library/a.epub/BazaarArtwork-original"), "old cover");
    EXPECT_EQ(storedInStoreFile("itemName"), Value("New"));
    EXPECT_EQ(storedInStoreFile("PVCoverImageData"), std::nullopt);
    EXPECT_EQ(names("temporary"), Names{});
    EXPECT_FALSE(m_error);
    if (!hasIdentity())
        GTEST_SKIP() << "no extended attributes here";
    EXPECT_EQ(attribute("library/a.epub", PNMetadataXattrTitle), Value("New"));
    EXPECT_EQ(attribute("library/a.epub", PNMetadataXattrGenre), Value("Crime"));
}

TEST_F(UpdatingAssets, ARemovedCoverBringsTheFirstOneBack) {
    const AssetPtr book = expandedBook();
    ASSERT_TRUE(book);
    m_folder.write("library/a.epub/BazaarArtwork", "second");
    m_folder.write("library/a.epub/BazaarArtwork-original", "first");

    const AssetPtr updated = update(book, {{"PVCoverImageData", Value()}});

    ASSERT_TRUE(updated);
    EXPECT_EQ(m_folder.read("library/a.epub/BazaarArtwork"), "first");
    EXPECT_FALSE(std::filesystem::exists(m_folder / "library/a.epub/BazaarArtwork-original"));
    EXPECT_EQ(valueOf(updated->coverImageData()), Value(Data::copyOf("first")));
    EXPECT_EQ(storedInStoreFile("PVCoverImageData"), std::nullopt);
    EXPECT_FALSE(m_error);
}

TEST_F(UpdatingAssets, ARemovedCoverThatHadNoFileFailsTheUpdateBeforeItsStoreFile) {
    const AssetPtr book = expandedBook();
    ASSERT_TRUE(book);
    RecordedLog log;

    EXPECT_FALSE(update(book, {{"itemName", "New"}, {"PVCoverImageData", Value()}}));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile,
                                     m_folder.url("library/a.epub/BazaarArtwork")));
    EXPECT_EQ(ofUpdate(log),
              Lines{"error updateMetadata: Update image cover failed -- Bailing Out"});
    EXPECT_EQ(storedInStoreFile("itemName"), std::nullopt);
}

TEST_F(UpdatingAssets, WithoutInflationARemovedCoverIsTheNullMarkerAndNoFileIsTouched) {
    const AssetPtr book = expandedBook();
    ASSERT_TRUE(book);
    m_folder.write("library/a.epub/BazaarArtwork", "second");

    const AssetPtr updated = update(book, {{"PVCoverImageData", Value()}}, /*inflate=*/false);

    ASSERT_TRUE(updated);
    EXPECT_EQ(valueOf(updated->coverImageData()), Value());
    EXPECT_EQ(m_folder.read("library/a.epub/BazaarArtwork"), "second");
}

TEST_F(UpdatingAssets, AFirstCoverLeavesNoError) {
    const AssetPtr updated =
        update(expandedBook(), {{"PVCoverImageData", Data::copyOf("first cover")}});

    ASSERT_TRUE(updated);
    EXPECT_FALSE(m_error);
    EXPECT_TRUE(storedInStoreFile("itemName"));
}

TEST_F(UpdatingAssets, TheStepsComeInTheirOrder) {
    const AssetPtr book = expandedBook();
    ASSERT_TRUE(book);
    if (!hasIdentity())
        GTEST_SKIP() << "no extended attributes here";
    RecordedLog log;

    const AssetPtr updated = update(book, {{"itemName", "New"}});

    ASSERT_TRUE(updated);
    ASSERT_EQ(log.lines().size(), 9U);
    EXPECT_TRUE(
        log.lines()[0].starts_with("debug persistXattrMetadata: xattr updated for assetMetadata "));
    EXPECT_EQ(log.lines()[1], "default inflateMetadata: start {asset: 1, temporaryDirectory: 1");
    EXPECT_EQ(log.lines()[2], "debug ReplaceCover: start");
    EXPECT_EQ(log.lines()[3], "debug ReplaceCover: No cover to update -- Done");
    EXPECT_EQ(log.lines()[4], "debug PersistMetadata: start");
    EXPECT_EQ(log.lines()[5], "error Failed to backup BazaarMetadata.plist");
    EXPECT_EQ(log.lines()[6], "debug persistMetadata: Persisted updated book metadata");
    EXPECT_TRUE(log.lines()[7].starts_with(
        "debug persistXattrMetadata: nothing to save for assetMetadata "));
    EXPECT_EQ(log.lines()[8], "default updatedMetadata: Done -- Success");
}

TEST_F(UpdatingAssets, AZippedBookIsExpandedInPlaceBeforeItsFilesAreWritten) {
    const AssetPtr book = zippedBook();
    ASSERT_TRUE(book);

    const AssetPtr updated = update(book, {{"itemName", "New"}});

    ASSERT_TRUE(updated);
    EXPECT_EQ(updated->url(), m_folder.url("library/a.epub"));
    EXPECT_TRUE(isFolder("library/a.epub"));
    EXPECT_EQ(m_folder.read("library/a.epub/OPS/text.xhtml"), "text");
    EXPECT_EQ(storedInStoreFile("itemName"), Value("New"));
    EXPECT_EQ(names("library"), Names{"a.epub"});
    EXPECT_EQ(names("temporary"), Names{});
    EXPECT_FALSE(m_error);
}

TEST_F(UpdatingAssets, WhatAnInspectionThenFindsIsTheUpdate) {
    ASSERT_TRUE(update(zippedBook(), {{"itemName", "New"}, {"genre", "Crime"}}));

    const AssetPtr found =
        PVAssetMetadataInspector::metadataForAssetAtURL_error(m_folder.url("library/a.epub"));

    ASSERT_TRUE(found);
    EXPECT_EQ(found->title(), "New");
    EXPECT_EQ(valueOf(found->genre()), Value("Crime"));
    EXPECT_EQ(found->author(), "Author");
}

TEST_F(UpdatingAssets, WithoutInflationOnlyTheAttributesAreWritten) {
    const AssetPtr book = zippedBook();
    ASSERT_TRUE(book);
    const std::string zip = m_folder.read("library/a.epub");
    RecordedLog log;

    const AssetPtr updated = update(book, {{"itemName", "New"}}, /*inflate=*/false);

    ASSERT_TRUE(updated);
    EXPECT_EQ(updated->title(), "New");
    EXPECT_EQ(updated->generationCount(), book->generationCount() + 1);
    EXPECT_EQ(m_folder.read("library/a.epub"), zip);
    EXPECT_EQ(ofUpdate(log), Lines{"error updateMetadata: Won't inflate -- Done"});
    if (!hasIdentity())
        GTEST_SKIP() << "no extended attributes here";
    EXPECT_EQ(attribute("library/a.epub", PNMetadataXattrTitle), Value("New"));
}

TEST_F(UpdatingAssets, WithoutInflationAnExpandedBooksFilesStayToo) {
    const AssetPtr book = expandedBook();
    ASSERT_TRUE(book);
    const Names before = names("library/a.epub");

    ASSERT_TRUE(update(book, {{"PVCoverImageData", Data::copyOf("cover")}}, /*inflate=*/false));

    EXPECT_EQ(names("library/a.epub"), before);
}

TEST_F(UpdatingAssets, UpdatesThatChangeNothingGiveBackTheAssetItself) {
    const AssetPtr book = expandedBook();
    ASSERT_TRUE(book);
    const Names before = names("library/a.epub");
    const Value displayName = *book->displayName();
    RecordedLog log;

    const AssetPtr updated = update(book, {{"itemName", "Old"}, {"PVDisplayName", displayName}});

    EXPECT_EQ(updated, book);
    EXPECT_EQ(names("library/a.epub"), before);
    EXPECT_EQ(ofUpdate(log), Lines{"error updateMetadata: updates == metadta -- Done"});
    EXPECT_FALSE(m_error);
}

TEST_F(UpdatingAssets, UpdatesThatChangeNothingWriteTheAttributesAllTheSame) {
    const AssetPtr book = expandedBook();
    ASSERT_TRUE(book);
    if (!hasIdentity())
        GTEST_SKIP() << "no extended attributes here";
    const auto changed = book->copyWithUpdates(
        [](PVMutableAssetMetadata& copy) { copy.setTitle("Not yet on disk"); });

    EXPECT_EQ(update(changed, {}), changed);

    EXPECT_EQ(attribute("library/a.epub", PNMetadataXattrTitle), Value("Not yet on disk"));
}

TEST_F(UpdatingAssets, NoUpdatesChangeNothing) {
    const AssetPtr book = expandedBook();
    ASSERT_TRUE(book);

    EXPECT_EQ(m_manager->updateAsset_withUpdates_temporaryDirectory_inflateIfNeeded_error(
                  book, nullptr, std::nullopt, /*inflateIfNeeded=*/true),
              book);
}

TEST_F(UpdatingAssets, ATitleAloneIsTheDisplayNameToo) {
    const AssetPtr updated = update(expandedBook(), {{"itemName", "New"}});

    ASSERT_TRUE(updated);
    EXPECT_EQ(valueOf(updated->displayName()), Value("New"));
}

TEST_F(UpdatingAssets, TheCountIsRaisedFromTheUpdates) {
    const AssetPtr updated =
        update(expandedBook(), {{"PVGenerationCount", integerValue(41)}}, /*inflate=*/false);

    ASSERT_TRUE(updated);
    EXPECT_EQ(updated->generationCount(), 42U);
}

TEST_F(UpdatingAssets, ThePreviewMarkIsTheUpdatesOwn) {
    const auto book = pdf("library/a.pdf", {{"isPreview", booleanValue(true)}});

    const AssetPtr cleared = update(book, {{"genre", "Crime"}});
    const AssetPtr kept = update(book, {{"genre", "Crime"}, {"isPreview", booleanValue(true)}});

    ASSERT_TRUE(cleared && kept);
    EXPECT_EQ(valueOf(cleared->backingDictionary()->find("isPreview")), booleanValue(false));
    EXPECT_TRUE(kept->isPreview());
    EXPECT_TRUE(book->isPreview());
}

TEST_F(UpdatingAssets, APDFIsRenamedAfterItsNewTitle) {
    const auto book = pdf("library/a.pdf");

    const AssetPtr updated = update(book, {{"itemName", "New: Title"}});

    ASSERT_TRUE(updated);
    EXPECT_EQ(names("library"), Names{"New_ Title.pdf"});
    EXPECT_EQ(updated->url(), m_folder.url("library/New_ Title.pdf"));
    EXPECT_EQ(updated->previousURL(), m_folder.url("library/a.pdf"));
    EXPECT_EQ(valueOf(updated->displayName()), Value("New: Title"));
    EXPECT_EQ(updated->generationCount(), book->generationCount() + 2);
}

TEST_F(UpdatingAssets, APDFRenamedByItsDisplayNameAloneComesBackUnderItsOldPlace) {
    const auto book = pdf("library/a.pdf");

    const AssetPtr updated = update(book, {{"PVDisplayName", "b"}});

    EXPECT_EQ(updated, book);
    EXPECT_EQ(names("library"), Names{"b.pdf"});
}

TEST_F(UpdatingAssets, APDFIsOnlyGivenItsCover) {
    const auto book = pdf("library/a.pdf");
    const Data cover = Data::copyOf("cover");

    const AssetPtr updated = update(book, {{"PVCoverImageData", cover}});

    ASSERT_TRUE(updated);
    EXPECT_EQ(valueOf(updated->coverImageData()), Value(cover));
    EXPECT_EQ(names("library"), Names{"a.pdf"});
}

TEST_F(UpdatingAssets, AFailedRenameEndsTheUpdate) {
    const auto book = pdf("library/a.pdf", {{"PVGeneratedItemId", "ID"}, {"genre", "Old"}});
    (void)m_manager->setExtendedAttributesForAsset_error(book);
    asset("library/b.pdf", "other");
    RecordedLog log;

    EXPECT_FALSE(update(book, {{"itemName", "b"}, {"genre", "New"}}));

    const Error error = makeFileError(PVFileErrorCode::FileExists, m_folder.url("library/b.pdf"));
    EXPECT_EQ(m_error, error);
    EXPECT_EQ(log.lines(), (Lines{"error PDFRename: File exists -- Fail",
                                  "error updateMetadata: Failed rename: " +
                                      m_folder.url("library/a.pdf").absoluteString() +
                                      " error: " + logText(error)}));
    EXPECT_EQ(names("library"), (Names{"a.pdf", "b.pdf"}));
    EXPECT_NE(attribute("library/a.pdf", PNMetadataXattrGenre), Value("New"));
}

TEST_F(UpdatingAssets, AFailedRenameIsLoggedWithItsErrorWhereNobodyAskedForIt) {
    const auto book = pdf("library/a.pdf");
    asset("library/b.pdf");
    const Dictionary updates{{"itemName", "b"}};
    RecordedLog log;

    EXPECT_FALSE(m_manager->updateAsset_withUpdates_temporaryDirectory_inflateIfNeeded_error(
        book, &updates, std::nullopt, /*inflateIfNeeded=*/true));

    EXPECT_TRUE(log.lines().back().ends_with(
        logText(makeFileError(PVFileErrorCode::FileExists, m_folder.url("library/b.pdf")))));
}

TEST_F(UpdatingAssets, NoRecordIsAFailedRename) {
    RecordedLog log;

    EXPECT_FALSE(update(nullptr, {{"itemName", "b"}}));

    EXPECT_EQ(log.lines(), Lines{"error updateMetadata: Failed rename: (null) error: (null)"});
}

TEST_F(UpdatingAssets, AMissingBookIsAFailedInflation) {
    const auto book = PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("a.epub"), nullptr);
    RecordedLog log;

    EXPECT_FALSE(update(book, {{"itemName", "New"}}));

    EXPECT_FALSE(m_error);
    EXPECT_EQ(ofUpdate(log), Lines{"error updateMetadata: Inflate failed -- Bailing Out"});
}

TEST_F(UpdatingAssets, ABookThatCanNotBeExpandedStaysWithItsNewAttributes) {
    const AssetPtr book = zippedBook();
    ASSERT_TRUE(book);
    const bool keepsAttributes = hasIdentity();
    const std::string zip = m_folder.read("library/a.epub");
    refuse(Act::Replace, "a.epub");
    RecordedLog log;

    EXPECT_FALSE(update(book, {{"itemName", "New"}}));

    EXPECT_EQ(m_error, makePOSIXError(EIO, m_folder.url("temporary/a.epub")));
    EXPECT_EQ(m_folder.read("library/a.epub"), zip);
    EXPECT_EQ(names("library"), Names{"a.epub"});
    EXPECT_EQ(names("temporary"), Names{});
    EXPECT_EQ(ofUpdate(log), Lines{"error updateMetadata: Inflate failed -- Bailing Out"});
    if (!keepsAttributes)
        GTEST_SKIP() << "no extended attributes here";
    EXPECT_EQ(attribute("library/a.epub", PNMetadataXattrTitle), Value("New"));
}

TEST_F(UpdatingAssets, ABookWhoseCoverCanNotBeWrittenStaysExpandedWithoutStoreFile) {
    const AssetPtr book = zippedBook();
    ASSERT_TRUE(book);
    const RefusingFileWriter writer;
    RecordedLog log;

    EXPECT_FALSE(update(book, {{"PVCoverImageData", Data::copyOf("cover")}}));

    EXPECT_EQ(m_error, makePOSIXError(EIO, m_folder.url("library/a.epub/BazaarArtwork")));
    EXPECT_TRUE(isFolder("library/a.epub"));
    EXPECT_EQ(names("library/a.epub"), (Names{"META-INF", "OPS", "mimetype"}));
    EXPECT_EQ(ofUpdate(log),
              Lines{"error updateMetadata: Update image cover failed -- Bailing Out"});
}

TEST_F(UpdatingAssets, AnEmptyCoverIsAFailure) {
    EXPECT_FALSE(update(expandedBook(), {{"PVCoverImageData", Data()}}));
    EXPECT_FALSE(m_error);
}

TEST_F(UpdatingAssets, AStoreFileThatCanNotBeWrittenIsNoFailure) {
    const AssetPtr book = expandedBook();
    ASSERT_TRUE(book);
    const RefusingFileWriter writer;
    RecordedLog log;

    EXPECT_TRUE(update(book, {{"itemName", "New"}}));

    EXPECT_FALSE(m_error);
    EXPECT_EQ(log.lines().back(), "default updatedMetadata: Done -- Success");
    EXPECT_EQ(storedInStoreFile("itemName"), std::nullopt);
}

TEST_F(UpdatingAssets, TheOldStoreFileIsKept) {
    const AssetPtr book =
        inspected(builder()
                      .store(storeFileText("<key>itemId</key><integer>77</integer>"))
                      .expand(m_folder / "library/a.epub"));
    ASSERT_TRUE(book);
    const std::string old = m_folder.read("library/a.epub/BazaarMetadata.plist");

    ASSERT_TRUE(update(book, {{"itemName", "New"}}));

    EXPECT_EQ(m_folder.read("library/a.epub/BazaarMetadata-original.plist"), old);
    EXPECT_EQ(storedInStoreFile("itemName"), Value("New"));
    EXPECT_EQ(storedInStoreFile("itemId"), Value("77"));
}

TEST_F(UpdatingAssets, ABookInAnUpperCaseExtensionIsLookedForInLowerCase) {
    // A copy's URL is that of its path, whose extension is in lower case.
    const AssetPtr book = inspected(builder().zip(m_folder / "library/a.EPUB"));
    ASSERT_TRUE(book);
    RecordedLog log;

    EXPECT_FALSE(update(book, {{"itemName", "New"}}));

    EXPECT_EQ(names("library"), Names{"a.EPUB"});
    EXPECT_EQ(ofUpdate(log), Lines{"error updateMetadata: Inflate failed -- Bailing Out"});
}

}  // namespace
}  // namespace parvel::testing
