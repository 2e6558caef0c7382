#include <gtest/gtest.h>

#include "parvel/inspection/BookMembers.h"
#include "tests/support/EpubBuilder.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

TEST(MemberForReference, IsRelativeToTheFolderOfTheMember) {
    EXPECT_EQ(memberForReference("c.png", "OPS/content.opf"), "OPS/c.png");
    EXPECT_EQ(memberForReference("images/c.png", "OPS/text/a.xhtml"), "OPS/text/images/c.png");
    EXPECT_EQ(memberForReference("../images/c.png", "OPS/text/a.xhtml"), "OPS/images/c.png");
    EXPECT_EQ(memberForReference("./c.png", "content.opf"), "c.png");
    EXPECT_EQ(memberForReference("c.png", "/OPS/content.opf"), "OPS/c.png");
}

TEST(MemberForReference, StartsAtTheRootWithASlash) {
    EXPECT_EQ(memberForReference("/images/c.png", "OPS/content.opf"), "images/c.png");
}

TEST(MemberForReference, DropsFragmentAndQuery) {
    EXPECT_EQ(memberForReference("a.xhtml#cover", "OPS/content.opf"), "OPS/a.xhtml");
    EXPECT_EQ(memberForReference("a.xhtml?x#y", "OPS/content.opf"), "OPS/a.xhtml");
    EXPECT_EQ(memberForReference("#cover", "OPS/content.opf"), "");
    EXPECT_EQ(memberForReference("", "OPS/content.opf"), "");
}

TEST(MemberForReference, DecodesEscapesWhereTheyAreSound) {
    EXPECT_EQ(memberForReference("my%20cover.png", "OPS/content.opf"), "OPS/my cover.png");
    EXPECT_EQ(memberForReference("my cover.png", "OPS/content.opf"), "OPS/my cover.png");
    EXPECT_EQ(memberForReference("100%.png", "OPS/content.opf"), "OPS/100%.png");
    EXPECT_EQ(memberForReference("c.png", "my OPS/content.opf"), "my OPS/c.png");
}

TEST(MemberForReference, StaysBelowTheRoot) {
    EXPECT_EQ(memberForReference("../../../etc/passwd", "OPS/content.opf"), "etc/passwd");
    EXPECT_EQ(memberForReference("%2E%2E/%2e%2e/etc/passwd", "OPS/content.opf"), "etc/passwd");
    EXPECT_EQ(memberForReference("..", "OPS/content.opf"), "");
    EXPECT_EQ(memberForReference("../..", "content.opf"), "");
}

TEST(MemberForReference, OfAnotherPlaceIsNone) {
    EXPECT_EQ(memberForReference("https://example.org/c.png", "OPS/content.opf"), "");
    EXPECT_EQ(memberForReference("file:///etc/passwd", "OPS/content.opf"), "");
    EXPECT_EQ(memberForReference("data:image/png;base64,AAAA", "OPS/content.opf"), "");
    EXPECT_EQ(memberForReference("//example.org/c.png", "OPS/content.opf"), "");
}

TEST(BookMembers, AreReadFromBothShapes) {
    const TemporaryDirectory folder;
    const EpubBuilder book = EpubBuilder{}.file("OPS/a.txt", "text");

    for (const URL& url : {book.zip(folder / "a.epub"), book.expand(folder / "b.epub")}) {
        BookMembers members(url);

        EXPECT_EQ(members.read("OPS/a.txt"), Data::copyOf("text"));
        EXPECT_EQ(members.read("OPS/b.txt"), std::nullopt);
        EXPECT_EQ(members.read(""), std::nullopt);
        EXPECT_TRUE(members.parse("META-INF/container.xml"));
        EXPECT_FALSE(members.parse("OPS/a.txt"));
    }
}

TEST(BookMembers, AreNotReadThroughLinks) {
    const TemporaryDirectory folder;
    folder.write("secret", "secret");
    const URL url = EpubBuilder{}.expand(folder / "a.epub");
    std::filesystem::create_symlink(folder / "secret", url.path() + "/link");

    EXPECT_EQ(BookMembers(url).read("link"), std::nullopt);
    EXPECT_EQ(BookMembers(url).read("../secret"), std::nullopt);
}

TEST(BookMembers, OfWhatIsNoBookAreNone) {
    const TemporaryDirectory folder;
    folder.write("a.epub", "no archive");

    EXPECT_TRUE(BookMembers(folder.url("a.epub")).isExhausted());
    EXPECT_EQ(BookMembers(folder.url("a.epub")).read("mimetype"), std::nullopt);
    EXPECT_EQ(BookMembers(folder.url("absent.epub")).read("mimetype"), std::nullopt);
}

TEST(BookMembers, AreReadNoLongerWhenTheBudgetIsUsedUp) {
    const TemporaryDirectory folder;
    const std::string large(40'000'000, '\0');
    BookMembers members(EpubBuilder{}.file("large", large).expand(folder / "a.epub"));
    int reads = 0;

    while (members.read("large"))
        ++reads;

    EXPECT_EQ(reads, 3);
    for (int i = 0; i < 200 && !members.isExhausted(); ++i)
        EXPECT_EQ(members.read("absent"), std::nullopt);
    EXPECT_TRUE(members.isExhausted());
    EXPECT_EQ(members.read("mimetype"), std::nullopt);
}

}  // namespace
}  // namespace parvel::testing
