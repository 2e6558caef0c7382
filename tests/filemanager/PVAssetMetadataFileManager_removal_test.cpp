#include <gtest/gtest.h>

#include "tests/support/ManagedFolder.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/RecordingFileSystem.h"
#include "tests/support/Records.h"

namespace parvel::testing {
namespace {

using Lines = std::vector<std::string>;

class Removing : public ManagedFolder {
protected:
    bool remove(const AssetPtr& asset) { return m_manager->removeAsset_error(asset, &m_error); }
};

TEST_F(Removing, ARemovedAssetIsGone) {
    const auto book = asset("a.epub/OPS/x");
    const auto package =
        PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("a.epub"), nullptr);
    RecordedLog log;

    EXPECT_TRUE(remove(package));

    EXPECT_EQ(names(), Names{});
    EXPECT_EQ(log.lines(),
              (Lines{"default removeAsset: start {asset: 1} " + logText(m_folder.url("a.epub")),
                     "debug removeAsset: Success"}));
}

TEST_F(Removing, RemovingAMissingAssetIsThePlatformsError) {
    const auto book = PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("a.epub"), nullptr);
    RecordedLog log;

    EXPECT_FALSE(remove(book));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile, m_folder.url("a.epub")));
    EXPECT_EQ(log.lines()[1], "error removeAsset: Failed: " + logText(m_folder.url("a.epub")) +
                                  " error: " + logText(*m_error));
}

TEST_F(Removing, WhatNamesNoItemCanNotBeRemoved) {
    RecordedLog log;

    EXPECT_FALSE(remove(nullptr));
    EXPECT_EQ(m_error, makeMissingURLError());
    m_error.reset();
    EXPECT_FALSE(remove(emptyRecord()));
    EXPECT_EQ(m_error, makeMissingURLError());

    const std::string failed = "error removeAsset: Failed: (null) error: " + logText(*m_error);
    EXPECT_EQ(log.lines(), (Lines{"default removeAsset: start {asset: 0} (null)", failed,
                                  "default removeAsset: start {asset: 1} (null)", failed}));
}

TEST_F(Removing, AFailureLogsItsErrorAlsoWhereNobodyAsked) {
    const auto book = PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("a.epub"), nullptr);
    RecordedLog log;

    EXPECT_FALSE(m_manager->removeAsset_error(book));

    ASSERT_EQ(log.lines().size(), 2U);
    EXPECT_TRUE(log.lines()[1].ends_with(
        logText(makeFileError(PVFileErrorCode::NoSuchFile, m_folder.url("a.epub")))));
}

TEST_F(Removing, TheGivenServiceRemovesTheItem) {
    const auto service = std::make_shared<RecordingFileSystem>();
    m_manager->setFileManager(service);

    EXPECT_TRUE(remove(asset("a.epub")));

    EXPECT_EQ(service->calls, Lines{"remove " + (m_folder / "a.epub")});
}

TEST_F(Removing, ASuccessLeavesTheErrorAsItWas) {
    m_error = makeNoIdentityError();

    EXPECT_TRUE(remove(asset("a.epub")));

    EXPECT_EQ(m_error, makeNoIdentityError());
}

TEST_F(Removing, AnAssetThatIsNotDownloadedIsRemovedByItsPlaceholder) {
    makeFolder(".stfolder");
    m_folder.write("a.epub.nextcloud", " ");
    const auto book = PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("a.epub"), nullptr);

    EXPECT_TRUE(remove(book));

    EXPECT_EQ(names(), Names{".stfolder"});
}

TEST_F(Removing, NothingNamedLikeAPlaceholderIsRemovedOutsideOfSynchronisedFolders) {
    m_folder.write("a.epub.nextcloud", " ");
    m_folder.write("b.epub.nextcloud/kept", "kept");
    for (const char* name : {"a.epub", "b.epub"}) {
        const auto book = PVAssetMetadata::metadataWithURL_dictionary(m_folder.url(name), nullptr);

        EXPECT_FALSE(remove(book));

        EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile, m_folder.url(name)));
    }
    EXPECT_EQ(names(), (Names{"a.epub.nextcloud", "b.epub.nextcloud"}));
    EXPECT_EQ(m_folder.read("b.epub.nextcloud/kept"), "kept");
}

class Redacting : public ManagedFolder {
protected:
    AssetPtr redact(const AssetPtr& asset) {
        return m_manager->redactAsset_intoDirectory_error(asset, m_aside, &m_error);
    }

    URL m_aside = makeFolder("aside");
};

TEST_F(Redacting, ARedactedAssetIsMovedAside) {
    const auto book = asset("a.epub");
    RecordedLog log;

    const AssetPtr redacted = redact(book);

    ASSERT_TRUE(redacted);
    EXPECT_TRUE(redacted->wasRedacted());
    EXPECT_EQ(redacted->url(), m_folder.url("aside/a.epub"));
    EXPECT_EQ(names("aside"), Names{"a.epub"});
    EXPECT_EQ(log.lines(),
              (Lines{"default redactAsset: start asset: " + logText(m_folder.url("a.epub")) +
                         ", directory: " + logText(m_aside),
                     "debug redactAsset: Did perform redact move -- Success"}));
}

TEST_F(Redacting, ARedactionDoesNotReplace) {
    m_folder.write("aside/a.epub", "2");
    const auto book = asset("a.epub");
    RecordedLog log;

    EXPECT_FALSE(redact(book));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::FileExists, m_folder.url("aside/a.epub")));
    EXPECT_EQ(m_folder.read("aside/a.epub"), "2");
    EXPECT_EQ(log.lines()[1], "error redactAsset: Failed redact asset: " +
                                  logText(m_folder.url("a.epub")) + " error: " + logText(*m_error));
}

TEST_F(Redacting, AFailureLogsItsErrorAlsoWhereNobodyAsked) {
    m_folder.write("aside/a.epub", "2");
    const auto book = asset("a.epub");
    RecordedLog log;

    EXPECT_FALSE(m_manager->redactAsset_intoDirectory_error(book, m_aside));

    ASSERT_EQ(log.lines().size(), 2U);
    EXPECT_TRUE(log.lines()[1].ends_with(
        logText(makeFileError(PVFileErrorCode::FileExists, m_folder.url("aside/a.epub")))));
}

TEST_F(Redacting, WhatNamesNoItemLeavesTheError) {
    m_error = makeNoIdentityError();
    for (const AssetPtr& missing : {AssetPtr(), AssetPtr(emptyRecord())}) {
        RecordedLog log;

        EXPECT_FALSE(redact(missing));

        EXPECT_EQ(m_error, makeNoIdentityError());
        EXPECT_EQ(log.lines(),
                  (Lines{"default redactAsset: start asset: (null), directory: " + logText(m_aside),
                         "error redactAsset: Failed redact asset: (null) error: (null)"}));
    }
}

TEST_F(Redacting, TheGivenServiceMovesTheItem) {
    const auto service = std::make_shared<RecordingFileSystem>();
    m_manager->setFileManager(service);

    EXPECT_TRUE(redact(asset("a.epub")));

    EXPECT_EQ(service->calls,
              Lines{"move " + (m_folder / "a.epub") + " to " + (m_folder / "aside/a.epub")});
}

TEST_F(Redacting, ASuccessLeavesTheErrorAsItWas) {
    m_error = makeNoIdentityError();

    EXPECT_TRUE(redact(asset("a.epub")));

    EXPECT_EQ(m_error, makeNoIdentityError());
}

}  // namespace
}  // namespace parvel::testing
