#include "parvel/platform/MediaTags.h"

#include <sys/stat.h>
#include <unistd.h>

#include <random>

#include <gtest/gtest.h>

#include "tests/support/MP4Builder.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/TestRounds.h"

namespace parvel::testing {
namespace {

using namespace mp4;
using Text = std::optional<std::string>;

constexpr std::uint64_t kLimit = 1 << 20;

class AudioTags : public ::testing::Test {
protected:
    std::unique_ptr<MediaAsset> open(const std::string& bytes) {
        m_folder.write("a.m4a", bytes);
        return MediaTags::host().open(m_folder.url("a.m4a"));
    }
    Text text(const std::string& bytes, MediaTag tag) {
        const auto asset = open(bytes);
        EXPECT_TRUE(asset);
        return asset ? asset->text(tag) : std::nullopt;
    }
    Text songID(unsigned type, const std::string& value) {
        return text(file(item("cnID", type, value)), MediaTag::SongID);
    }

    TemporaryDirectory m_folder;
};

std::string bytesOf(const std::optional<Data>& data) {
    std::vector<std::uint8_t> storage;
    return data ? std::string(data->text(storage)) : "(none)";
}

TEST_F(AudioTags, SongIDArtistAndSongNameAreRead) {
    const std::string bytes = file(item(kArtist, 1, "An Author") + item("cnID", 21, number(42, 4)) +
                                   item(kSongName, 1, "A Title"));

    EXPECT_EQ(text(bytes, MediaTag::SongID), "42");
    EXPECT_EQ(text(bytes, MediaTag::Artist), "An Author");
    EXPECT_EQ(text(bytes, MediaTag::SongName), "A Title");
}

TEST_F(AudioTags, AMissingTagIsNone) {
    EXPECT_EQ(text(file(""), MediaTag::Artist), std::nullopt);
}

TEST_F(AudioTags, ASongIDOfOneTwoFourOrEightBytesIsRead) {
    EXPECT_EQ(songID(21, number(7, 1)), "7");
    EXPECT_EQ(songID(21, number(700, 2)), "700");
    EXPECT_EQ(songID(21, number(70000, 4)), "70000");
    EXPECT_EQ(songID(21, number(70000000000, 8)), "70000000000");
}

TEST_F(AudioTags, ASongIDAboveTwoToThe31StaysPositive) {
    EXPECT_EQ(songID(21, number(3000000000, 4)), "3000000000");
}

TEST_F(AudioTags, AnEightByteSongIDIsSigned) {
    EXPECT_EQ(songID(21, number(~std::uint64_t{0}, 8)), "-1");
}

TEST_F(AudioTags, ASongIDAsTextIsRead) {
    EXPECT_EQ(songID(1, "12345"), "12345");
}

TEST_F(AudioTags, ASongIDOfTheImplicitTypeIsAnInteger) {
    EXPECT_EQ(songID(0, number(42, 4)), "42");
}

TEST_F(AudioTags, AnyOtherTagOfTheImplicitTypeIsNoText) {
    EXPECT_EQ(text(file(item(kArtist, 0, "x")), MediaTag::Artist), std::nullopt);
}

TEST_F(AudioTags, AnIntegerOfFiveBytesIsNone) {
    EXPECT_EQ(songID(21, number(1, 5)), std::nullopt);
    EXPECT_EQ(songID(21, ""), std::nullopt);
}

TEST_F(AudioTags, TextInUTF16IsRead) {
    EXPECT_EQ(text(file(item(kSongName, 2, std::string("\0B\0\xFC\xD8\x3D\xDE\x00", 8))),
                   MediaTag::SongName),
              "Bü😀");
    EXPECT_EQ(text(file(item(kSongName, 2, "\xD7\xFF\xE0\x01\xFF\x21")), MediaTag::SongName),
              "\uD7FF\uE001\uFF21");
}

TEST_F(AudioTags, BrokenTextIsNone) {
    EXPECT_EQ(text(file(item(kSongName, 1, "\xFF")), MediaTag::SongName), std::nullopt);
    EXPECT_EQ(text(file(item(kSongName, 2, "x")), MediaTag::SongName), std::nullopt);
    EXPECT_EQ(text(file(item(kSongName, 2, std::string("\xD8\x3D\0B", 4))), MediaTag::SongName),
              std::nullopt);
}

TEST_F(AudioTags, AnEmptyTextIsAText) {
    EXPECT_EQ(text(file(item(kSongName, 1, "")), MediaTag::SongName), "");
}

TEST_F(AudioTags, TheFirstItemOfAKeyWins) {
    EXPECT_EQ(text(file(item(kArtist, 1, "first") + item(kArtist, 1, "second")), MediaTag::Artist),
              "first");
}

TEST_F(AudioTags, TheFirstItemDecidesAlsoWhereItIsNoText) {
    EXPECT_EQ(text(file(item(kArtist, 13, "jpeg") + item(kArtist, 1, "second")), MediaTag::Artist),
              std::nullopt);
}

TEST_F(AudioTags, TheFirstValueInAnItemWins) {
    EXPECT_EQ(text(file(atom(kArtist, dataAtom(1, "one") + dataAtom(1, "two"))), MediaTag::Artist),
              "one");
}

TEST_F(AudioTags, ItemsFarApartAreReadInAnyOrder) {
    const std::string cover(300'000, 'x');
    const auto asset = open(file(item("cnID", 21, number(42, 4)) + item("covr", 13, cover) +
                                 item(kArtist, 1, "An Author")));

    ASSERT_TRUE(asset);
    EXPECT_EQ(asset->text(MediaTag::Artist), "An Author");
    EXPECT_EQ(asset->text(MediaTag::SongID), "42");
    EXPECT_EQ(bytesOf(asset->bytes(MediaTag::CoverArt, kLimit)), cover);
    EXPECT_EQ(asset->text(MediaTag::Artist), "An Author");
}

TEST_F(AudioTags, AnItemsLeadingNameAtomIsPassedOver) {
    const std::string bytes = file(atom("covr", atom("name", "cover") + dataAtom(13, "jpeg")));

    EXPECT_EQ(bytesOf(open(bytes)->bytes(MediaTag::CoverArt, kLimit)), "jpeg");
}

TEST_F(AudioTags, ACoverIsTheFirstItemsBytesOfAnyTypeButText) {
    EXPECT_EQ(bytesOf(open(file(item("covr", 14, "png") + item("covr", 13, "jpeg")))
                          ->bytes(MediaTag::CoverArt, kLimit)),
              "png");
    EXPECT_EQ(bytesOf(open(file(item("covr", 0, "raw")))->bytes(MediaTag::CoverArt, kLimit)),
              "raw");
    EXPECT_EQ(bytesOf(open(file(item("covr", 1, "text")))->bytes(MediaTag::CoverArt, kLimit)),
              "(none)");
}

TEST_F(AudioTags, ACoverOverTheLimitIsNone) {
    const std::string bytes = file(item("covr", 13, "12345"));

    EXPECT_EQ(bytesOf(open(bytes)->bytes(MediaTag::CoverArt, 4)), "(none)");
    EXPECT_EQ(bytesOf(open(bytes)->bytes(MediaTag::CoverArt, 5)), "12345");
}

TEST_F(AudioTags, ATextOverAMebibyteIsNone) {
    const std::string longest(1 << 20, 'x');

    EXPECT_EQ(text(file(item(kArtist, 1, longest)), MediaTag::Artist), longest);
    EXPECT_EQ(text(file(item(kArtist, 1, longest + "x")), MediaTag::Artist), std::nullopt);
}

TEST_F(AudioTags, ACoverThatClaimsMoreThanTheFileHasIsNone) {
    const std::string bytes =
        file(number(400 << 20, 4) + "covr" + number((400 << 20) - 8, 4) + "data" + "short");

    EXPECT_EQ(bytesOf(open(bytes)->bytes(MediaTag::CoverArt, 1ULL << 40)), "(none)");
}

TEST_F(AudioTags, AValueThatIsTooShortForItsHeadIsNone) {
    for (std::size_t length = 0; length < 8; ++length) {
        const std::string value = atom("data", std::string(length, '\1'));
        EXPECT_EQ(text(file(atom("cnID", value)), MediaTag::SongID), std::nullopt) << length;
    }
    EXPECT_EQ(text(file(item(kArtist, 1, "")), MediaTag::Artist), "");
}

TEST_F(AudioTags, AValueThatClaimsMoreThanItsItemHasIsNone) {
    const std::string claimed = number(100, 4) + "data" + number(1, 4) + number(0, 4) + "An Author";

    EXPECT_EQ(text(file(atom(kArtist, claimed)), MediaTag::Artist), std::nullopt);
}

TEST_F(AudioTags, MetaWithoutVersionAndFlagsIsRead) {
    const std::string meta =
        atom("meta", atom("hdlr", std::string(25, '\0')) + atom("ilst", item(kArtist, 1, "a")));

    EXPECT_EQ(text(atom("ftyp", "") + atom("moov", atom("udta", meta)), MediaTag::Artist), "a");
}

TEST_F(AudioTags, MetaDirectlyInTheMovieIsRead) {
    const std::string meta = atom("meta", number(0, 4) + atom("ilst", item(kArtist, 1, "a")));

    EXPECT_EQ(text(atom("moov", meta), MediaTag::Artist), "a");
}

TEST_F(AudioTags, AMovieBehindTheSoundIsRead) {
    const std::string bytes = atom("ftyp", "M4A ") + largeAtom("mdat", std::string(100000, 's')) +
                              movie(item(kArtist, 1, "a"));

    EXPECT_EQ(text(bytes, MediaTag::Artist), "a");
}

TEST_F(AudioTags, AMovieOfALargeSizeIsRead) {
    const std::string small = movie(item(kArtist, 1, "a"));

    EXPECT_EQ(text(atom("ftyp", "") + largeAtom("moov", small.substr(8)), MediaTag::Artist), "a");
}

TEST_F(AudioTags, AMovieThatRunsToTheEndOfTheFileIsRead) {
    const std::string small = movie(item(kArtist, 1, "a"));

    EXPECT_EQ(text(atom("ftyp", "") + number(0, 4) + small.substr(4), MediaTag::Artist), "a");
}

TEST_F(AudioTags, AFileOfTwoGigabytesOfHolesCostsOnlyItsHeads) {
    const std::string path = m_folder.write(
        "big.m4a", atom("ftyp", "M4A ") + number(1, 4) + "mdat" + number((2ULL << 30) + 16, 8));
    const std::string tail = movie(item(kArtist, 1, "a"));
    ASSERT_EQ(truncate(path.c_str(), (2LL << 30) + 28), 0);
    std::ofstream(path, std::ios::binary | std::ios::app) << tail;

    const auto asset = MediaTags::host().open(m_folder.url("big.m4a"));

    ASSERT_TRUE(asset);
    EXPECT_EQ(asset->text(MediaTag::Artist), "a");
}

TEST_F(AudioTags, WhatDoesNotBeginLikeAnMP4FileIsNoAsset) {
    EXPECT_FALSE(open(""));
    EXPECT_FALSE(open("ftyp"));
    EXPECT_FALSE(open("just some text, no atoms"));
    EXPECT_TRUE(open(atom("free", "")));
}

TEST_F(AudioTags, APipeIsNoAssetAndIsNotWaitedFor) {
    ASSERT_EQ(mkfifo((m_folder / "p.m4a").c_str(), 0600), 0);

    EXPECT_FALSE(MediaTags::host().open(m_folder.url("p.m4a")));
    EXPECT_FALSE(MediaTags::host().open(m_folder.url("missing.m4a")));
}

TEST_F(AudioTags, AURLOfNoFileIsNoAsset) {
    m_folder.write("a.m4a", file(""));

    EXPECT_FALSE(MediaTags::host().open(
        *URL::fromString("http://example.com" + m_folder.url("a.m4a").path())));
}

TEST_F(AudioTags, ATextOrNumberIsNoCover) {
    for (const unsigned type : {1U, 2U, 21U, 22U, 65U, 78U}) {
        const auto asset = open(file(item("covr", type, number(1, 4))));
        EXPECT_FALSE(asset->bytes(MediaTag::CoverArt, kLimit)) << type;
    }
}

TEST_F(AudioTags, ALinkToAFileIsFollowed) {
    m_folder.write("a.m4a", file(item(kArtist, 1, "a")));
    ASSERT_EQ(symlink("a.m4a", (m_folder / "link.m4a").c_str()), 0);

    EXPECT_TRUE(MediaTags::host().open(m_folder.url("link.m4a")));
}

TEST_F(AudioTags, ManyItemsAndEmptyAtomsEnd) {
    std::string items;
    for (int i = 0; i < 50000; ++i)
        items += atom("xxxx", "");
    items += item(kArtist, 1, "a");

    EXPECT_EQ(text(file(items), MediaTag::Artist), "a");
}

TEST_F(AudioTags, AnAtomSmallerThanItsHeadEndsTheSearch) {
    EXPECT_EQ(text(file(number(4, 4) + "xxxx" + item(kArtist, 1, "a")), MediaTag::Artist),
              std::nullopt);
}

TEST_F(AudioTags, MutatedFilesEndInSomeAnswer) {
    const std::string sound =
        file(item("cnID", 21, number(42, 4)) + item(kArtist, 1, "a") + item("covr", 13, "jpeg"));
    std::mt19937 random(1);
    for (std::size_t round = 0; round < testRounds(200); ++round) {
        std::string bytes = sound;
        for (int i = 0; i < 3; ++i)
            bytes[random() % bytes.size()] = static_cast<char>(random());
        bytes.resize(random() % 4 == 0 ? random() % bytes.size() : bytes.size());
        if (const auto asset = open(bytes)) {
            const auto id = asset->text(MediaTag::SongID);
            EXPECT_LE(id ? id->size() : 0, bytes.size() + 20);
            const auto cover = asset->bytes(MediaTag::CoverArt, kLimit);
            EXPECT_LE(cover ? cover->size() : 0, bytes.size());
        }
    }
}

}  // namespace
}  // namespace parvel::testing
