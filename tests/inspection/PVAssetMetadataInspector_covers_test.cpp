#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "tests/support/EpubBuilder.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

using ::testing::IsEmpty;

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

TEST_F(CoverImageData, AFolderThatIsNoBookHasNoArtworkFile) {
    const URL url = book().file("BazaarArtwork", "artwork").expand(m_folder / "folder");

    EXPECT_EQ(cover(url), std::nullopt);

    EXPECT_EQ(m_error, makeNoAssetTypeError(url));
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

}  // namespace
}  // namespace parvel::testing
