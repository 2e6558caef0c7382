#include <gtest/gtest.h>

#include "parvel/foundation/ValueReadings.h"
#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "parvel/platform/MediaTags.h"
#include "parvel/platform/Service.h"
#include "parvel/xattr/ExtendedAttributes.h"
#include "parvel/xattr/PNMetadataXattr.h"
#include "tests/support/MP4Builder.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

using Lines = std::vector<std::string>;

std::string soundAudiobook() {
    return mp4::file(mp4::item("cnID", 21, mp4::number(42, 4)) +
                     mp4::item(mp4::kArtist, 1, "An Author") +
                     mp4::item(mp4::kSongName, 1, "A Title") + mp4::item("covr", 13, "jpeg"));
}

class Audiobook : public ::testing::Test {
protected:
    URL write(const std::string& bytes) {
        m_folder.write("a.m4a", bytes);
        return m_folder.url("a.m4a");
    }
    MutableAssetPtr read(const URL& url, bool includeCover = false,
                         const AssetPtr& preloaded = nullptr) {
        return PVAssetMetadataInspector::
            _audiobook_metadataForAssetAtURL_preloadedMetadata_includeCover_error(
                url, preloaded, includeCover, &m_error);
    }

    TemporaryDirectory m_folder;
    std::optional<Error> m_error;
};

TEST_F(Audiobook, TheTagsBecomeStoreIDArtistAndItemName) {
    const URL url = write(soundAudiobook());
    RecordedLog log;

    const auto record = read(url);

    ASSERT_TRUE(record);
    EXPECT_EQ(stringForm(record->storeID()), "42");
    EXPECT_EQ(record->author(), "An Author");
    EXPECT_EQ(record->title(), "A Title");
    EXPECT_FALSE(record->coverImageData());
    EXPECT_FALSE(record->generatedID());
    EXPECT_EQ(record->url(), url);
    EXPECT_FALSE(m_error);
    EXPECT_EQ(log.lines(), Lines{"debug Getting audiobook metadata"});
}

TEST_F(Audiobook, NoOtherTagIsRead) {
    const auto record = read(write(mp4::file(mp4::item("\xA9"
                                                       "gen",
                                                       1, "Genre") +
                                             mp4::item("desc", 1, "Description"))));

    EXPECT_FALSE(record->genre());
    EXPECT_FALSE(record->bookDescription());
}

TEST_F(Audiobook, ACoverThatIsAskedForComesAsEmbedded) {
    const auto record = read(write(soundAudiobook()), /*includeCover=*/true);

    ASSERT_TRUE(record->coverImageData());
    EXPECT_EQ(*record->coverImageData(), Value(Data::copyOf("jpeg")));
}

TEST_F(Audiobook, ThePreloadedRecordWins) {
    const URL url = write(soundAudiobook());
    const auto preloaded = PVAssetMetadata::metadataWithURL_dictionary(url, nullptr);
    preloaded->setTitle("Mine");

    const auto record = read(url, /*includeCover=*/false, preloaded);

    EXPECT_EQ(record->title(), "Mine");
    EXPECT_EQ(record->author(), "An Author");
}

TEST_F(Audiobook, ThePreloadedAuthorAndCoverWinOverTheTags) {
    const URL url = write(soundAudiobook());
    const auto preloaded = PVAssetMetadata::metadataWithURL_dictionary(url, nullptr);
    preloaded->setAuthor("Mine");
    const Data cover = Data::copyOf(std::string_view("my cover"));
    preloaded->setCoverImageData(&cover);

    const auto record = read(url, /*includeCover=*/true, preloaded);

    EXPECT_EQ(record->author(), "Mine");
    EXPECT_EQ(*record->coverImageData(), Value(cover));
    EXPECT_EQ(record->title(), "A Title");
    EXPECT_EQ(stringForm(record->storeID()), "42");
}

TEST_F(Audiobook, WhatIsNoAudioFileIsRefusedWithItsURL) {
    const URL url = write("just some text, no atoms");

    EXPECT_FALSE(read(url));

    EXPECT_EQ(m_error, makeNoAssetIDError(url));
}

TEST_F(Audiobook, TheInspectorRefusesOneWithoutIdentity) {
    const URL url = write(mp4::file(mp4::item(mp4::kSongName, 1, "A Title")));

    EXPECT_FALSE(PVAssetMetadataInspector::metadataForAssetAtURL_error(url, &m_error));

    EXPECT_EQ(m_error, makeNoAssetIDError(url));
}

TEST_F(Audiobook, TheInspectorTakesTheIdentityFromTheAttributes) {
    const URL url = write(mp4::file(""));
    if (!pvamfm_setExtendedAttributeString_forKey_error(url, "own", PNMetadataXattrAssetID))
        GTEST_SKIP() << "no extended attributes on this file system";

    const AssetPtr record = PVAssetMetadataInspector::metadataForAssetAtURL_error(url, &m_error);

    ASSERT_TRUE(record);
    EXPECT_EQ(record->assetID(), "own");
    EXPECT_FALSE(m_error);
}

TEST_F(Audiobook, AnIdentityInTheAttributesDoesNotHelpWhatIsNoAudioFile) {
    const URL url = write("just some text, no atoms");
    if (!pvamfm_setExtendedAttributeString_forKey_error(url, "own", PNMetadataXattrAssetID))
        GTEST_SKIP() << "no extended attributes on this file system";

    EXPECT_FALSE(PVAssetMetadataInspector::metadataForAssetAtURL_error(url, &m_error));

    EXPECT_EQ(m_error, makeNoAssetIDError(url));
}

TEST_F(Audiobook, TheInspectorReadsTheWholeWay) {
    const URL url = write(soundAudiobook());

    const AssetPtr record =
        PVAssetMetadataInspector::metadataIncludingCoverForAssetAtURL_error(url, &m_error);

    ASSERT_TRUE(record);
    EXPECT_EQ(record->assetID(), "42");
    EXPECT_TRUE(record->coverImageData());
}

/// An audio file without tags that notes what is asked of it.
class WatchedTags : public MediaTags {
public:
    class Asset : public MediaAsset {
    public:
        explicit Asset(std::vector<MediaTag>& asked) : m_asked(asked) {}
        std::optional<std::string> text(MediaTag tag) override {
            m_asked.push_back(tag);
            return std::nullopt;
        }
        std::optional<Data> bytes(MediaTag tag, std::uint64_t) override {
            m_asked.push_back(tag);
            return std::nullopt;
        }

    private:
        std::vector<MediaTag>& m_asked;
    };
    std::unique_ptr<MediaAsset> open(const URL&) override { return std::make_unique<Asset>(asked); }
    std::vector<MediaTag> asked;

private:
    Service<MediaTags>::Replacement m_replacement{*this};
};

TEST_F(Audiobook, ACoverIsNotTouchedUnlessAskedFor) {
    WatchedTags tags;

    const auto record = read(m_folder.url("a.m4a"));

    EXPECT_EQ(tags.asked,
              (std::vector<MediaTag>{MediaTag::SongID, MediaTag::Artist, MediaTag::SongName}));
    EXPECT_FALSE(record->storeID());
    EXPECT_FALSE(record->author());
    EXPECT_FALSE(record->title());
}

TEST_F(Audiobook, ASongIDIsKeptAsTextAlsoWhereItIsZero) {
    const auto record = read(write(mp4::file(mp4::item("cnID", 21, mp4::number(0, 4)))));

    ASSERT_TRUE(record->storeID());
    EXPECT_EQ(*record->storeID(), Value("0"));
}

TEST_F(Audiobook, ItsCoverIsTheOneOfTheWholeRead) {
    const auto cover =
        PVAssetMetadataInspector::coverImageDataForAssetAtURL_error(write(soundAudiobook()));

    EXPECT_EQ(cover, Data::copyOf(std::string_view("jpeg")));
}

}  // namespace
}  // namespace parvel::testing
