#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "parvel/platform/ImageCodec.h"
#include "parvel/platform/Service.h"
#include "tests/support/EpubBuilder.h"
#include "tests/support/Images.h"
#include "tests/support/PNGBuilder.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

using ::testing::AllOf;
using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

class CoverImageData : public ::testing::Test {
protected:
    std::optional<Data> cover(const std::optional<URL>& url) {
        return PVAssetMetadataInspector::coverImageDataForAssetAtURL_error(url, &m_error);
    }
    /// A book whose OPF names a cover.
    static EpubBuilder book() {
        return EpubBuilder{}
            .opf(opfText("", R"(<item id="cover" href="c.jpg"/>)"))
            .file("OPS/c.jpg", "the OPF's");
    }
    static std::optional<Data> image(std::string_view text) { return Data::copyOf(text); }

    TemporaryDirectory m_folder;
    std::optional<Error> m_error;
};

TEST_F(CoverImageData, OfAPackageIsTheStoresArtworkFile) {
    const EpubBuilder withArtwork = book().file("BazaarArtwork", "artwork");
    const URL expanded = withArtwork.expand(m_folder / "a.epub");
    const URL zipped = withArtwork.zip(m_folder / "b.epub");
    const RecordedLog log;

    EXPECT_EQ(cover(expanded), image("artwork"));
    EXPECT_EQ(cover(zipped), image("artwork"));

    EXPECT_THAT(log.lines(), IsEmpty());
    EXPECT_EQ(m_error, std::nullopt);
}

TEST_F(CoverImageData, OfAnArchiveOfNoKindIsTheStoresArtworkFileToo) {
    const URL url = book().file("BazaarArtwork", "artwork").zip(m_folder / "a.zip");

    EXPECT_EQ(cover(url), image("artwork"));

    EXPECT_EQ(m_error, std::nullopt);
}

TEST_F(CoverImageData, OfAFolderThatIsNoPackageIsNone) {
    const URL url = book().file("BazaarArtwork", "artwork").expand(m_folder / "a");

    EXPECT_EQ(cover(url), std::nullopt);

    EXPECT_EQ(m_error, makeNoAssetTypeError(url));
}

TEST_F(CoverImageData, WithoutArtworkIsTheCoverOfTheWholeRead) {
    EXPECT_EQ(cover(book().expand(m_folder / "a.epub")), image("the OPF's"));
    EXPECT_EQ(cover(book().zip(m_folder / "b.epub")), image("the OPF's"));
}

TEST_F(CoverImageData, AnEmptyArtworkFileCountsAsNone) {
    const EpubBuilder withArtwork = book().file("BazaarArtwork", "");

    EXPECT_EQ(cover(withArtwork.expand(m_folder / "a.epub")), image("the OPF's"));
    EXPECT_EQ(cover(withArtwork.zip(m_folder / "b.epub")), image("the OPF's"));
}

TEST_F(CoverImageData, AnArtworkFileThatIsALinkIsNotFollowed) {
    m_folder.write("secret", "secret");
    const URL url = book().expand(m_folder / "a.epub");
    std::filesystem::create_symlink(m_folder / "secret", url.path() + "/BazaarArtwork");

    EXPECT_EQ(cover(url), image("the OPF's"));
}

TEST_F(CoverImageData, OfABookWithoutACoverIsNone) {
    EXPECT_EQ(cover(EpubBuilder{}.zip(m_folder / "a.epub")), std::nullopt);

    EXPECT_EQ(m_error, std::nullopt);
}

TEST_F(CoverImageData, OfWhatIsNotThereIsTheWholeReadsFailure) {
    const URL url = m_folder.url("absent.epub");
    const RecordedLog log;

    EXPECT_EQ(cover(url), std::nullopt);

    EXPECT_EQ(m_error, makeServiceError(ENOENT, url));
    EXPECT_EQ(log.lines().front(), "default Failed to query directory: " + url.absoluteString());
}

TEST_F(CoverImageData, WithoutAURLIsMissingTheURL) {
    const RecordedLog log;

    EXPECT_EQ(cover(std::nullopt), std::nullopt);

    EXPECT_EQ(m_error, makeMissingURLError());
    EXPECT_EQ(log.lines().front(), "default Failed to query directory: (null)");
}

/// Decodes what begins with "image".
class FakeCodec : public ImageCodec {
public:
    std::optional<Image> decode(const Data& bytes) override {
        m_decoded.push_back(bytes);
        std::vector<std::uint8_t> storage;
        return bytes.text(storage).starts_with("image")
                   ? std::optional(plainImage(2, 3, 0xFF102030))
                   : std::nullopt;
    }
    std::optional<Data> encodePNG(const Image&) override { return std::nullopt; }

    [[nodiscard]] const std::vector<Data>& decodedBytes() const { return m_decoded; }

private:
    std::vector<Data> m_decoded;
};

class CoverImage : public CoverImageData {
protected:
    std::optional<Image> coverImage(const std::optional<URL>& url) {
        const Service<ImageCodec>::Replacement inForce(m_codec);
        return PVAssetMetadataInspector::coverImageForAssetAtURL_error(url, &m_error);
    }

    FakeCodec m_codec;
};

TEST_F(CoverImage, IsTheDecodedCoverOfTheBytes) {
    const URL url = book().file("BazaarArtwork", "image of the store").zip(m_folder / "a.epub");
    const RecordedLog log;

    const auto image = coverImage(url);

    ASSERT_TRUE(image);
    EXPECT_EQ(image->width, 2U);
    EXPECT_EQ(image->height, 3U);
    EXPECT_THAT(m_codec.decodedBytes(), ElementsAre(Data::copyOf("image of the store")));
    EXPECT_THAT(log.lines(), IsEmpty());
    EXPECT_EQ(m_error, std::nullopt);
}

TEST_F(CoverImage, OfBytesThatCantBeDecodedIsNoneWithoutAnError) {
    EXPECT_FALSE(coverImage(book().zip(m_folder / "a.epub")));

    EXPECT_THAT(m_codec.decodedBytes(), ElementsAre(Data::copyOf("the OPF's")));
    EXPECT_EQ(m_error, std::nullopt);
}

TEST_F(CoverImage, OfArtworkThatCantBeDecodedIsNotSoughtElsewhere) {
    const URL url =
        book().file("OPS/c.jpg", "image").file("BazaarArtwork", "none").zip(m_folder / "a.epub");

    EXPECT_FALSE(coverImage(url));
}

TEST_F(CoverImage, OfABookWithoutACoverIsNone) {
    EXPECT_FALSE(coverImage(EpubBuilder{}.zip(m_folder / "a.epub")));

    EXPECT_THAT(m_codec.decodedBytes(), IsEmpty());
    EXPECT_EQ(m_error, std::nullopt);
}

TEST_F(CoverImage, OfWhatIsNotThereIsTheWholeReadsFailure) {
    const URL url = m_folder.url("absent.epub");

    EXPECT_FALSE(coverImage(url));
    EXPECT_EQ(m_error, makeServiceError(ENOENT, url));
    EXPECT_FALSE(PVAssetMetadataInspector::coverImageForAssetAtURL_error(url));

    EXPECT_FALSE(coverImage(std::nullopt));
    EXPECT_EQ(m_error, makeMissingURLError());
}

TEST_F(CoverImage, LeavesTheErrorOfAnEarlierCallBesideTheStoresArtwork) {
    m_error = makeMissingURLError();

    EXPECT_TRUE(coverImage(book().file("BazaarArtwork", "image").zip(m_folder / "a.epub")));

    EXPECT_EQ(m_error, makeMissingURLError());
}

TEST_F(CoverImage, IsDecodedByTheHelper) {
    const URL url = book().file("BazaarArtwork", plainPNG(5, 4)).zip(m_folder / "a.epub");

    const auto image = PVAssetMetadataInspector::coverImageForAssetAtURL_error(url, &m_error);

    ASSERT_TRUE(image);
    EXPECT_THAT(pixelsOf(*image), AllOf(SizeIs(20), Each(0xFF3366CC)));
}

}  // namespace
}  // namespace parvel::testing
