#include "parvel/foundation/URL.h"

#include <gtest/gtest.h>

#include <filesystem>

namespace parvel::testing {
namespace {

URL file(std::string_view path) {
    return URL::fileURLWithPath(path);
}

std::string pathOfText(std::string_view text) {
    const std::optional<URL> url = URL::fromString(text);
    return url ? url->path() : "none";
}

TEST(URL, KeepsThePathThatItIsMadeFrom) {
    EXPECT_TRUE(file("/a/b c.epub").isFileURL());
    EXPECT_EQ(file("/a/b c.epub").path(), "/a/b c.epub");
    EXPECT_EQ(file("a/b").path(), "a/b");
    EXPECT_EQ(file("").path(), "");
}

TEST(URL, DropsTrailingSlashesButTheRoots) {
    EXPECT_EQ(file("/a/b/").path(), "/a/b");
    EXPECT_EQ(file("/a/b//").path(), "/a/b");
    EXPECT_EQ(file("/").path(), "/");
    EXPECT_EQ(file("//").path(), "/");
    EXPECT_EQ(file("/").absoluteString(), "file:///");
}

TEST(URL, EncodesAllButThePlainCharactersOfAPath) {
    const std::string plain = "/ABCXYZabcxyz0189-._~!$&'()*+,;=:@";

    EXPECT_EQ(file(plain).absoluteString(), "file://" + plain);
    EXPECT_EQ(file("/a b%?#[]\"<>\\^`{|}").absoluteString(),
              "file:///a%20b%25%3F%23%5B%5D%22%3C%3E%5C%5E%60%7B%7C%7D");
    EXPECT_EQ(file("/\xC3\xA4\xFF\x01\x7F").absoluteString(), "file:///%C3%A4%FF%01%7F");
}

TEST(URL, PutsAReplacementCharacterForANUL) {
    EXPECT_EQ(file(std::string_view("/a\0b\0", 5)).path(),
              "/a\xEF\xBF\xBD"
              "b\xEF\xBF\xBD");
}

TEST(URL, ReadsItsOwnTextBackForEveryByte) {
    std::string path = "/";
    for (int byte = 1; byte < 256; ++byte)
        path += static_cast<char>(byte);
    const URL url = file(path + "x");
    const std::optional<URL> read = URL::fromString(url.absoluteString());

    ASSERT_TRUE(read);
    EXPECT_EQ(read->path(), path + "x");
    EXPECT_EQ(*read, url);
}

TEST(URL, KeepsTheTextThatItIsMadeFrom) {
    const std::optional<URL> url = URL::fromString("FILE://localhost/%61/b/");

    ASSERT_TRUE(url);
    EXPECT_EQ(url->absoluteString(), "FILE://localhost/%61/b/");
    EXPECT_EQ(url->path(), "/a/b");
    EXPECT_TRUE(url->isFileURL());
}

TEST(URL, ReadsFileURLsInEveryForm) {
    EXPECT_EQ(pathOfText("file:///a/b"), "/a/b");
    EXPECT_EQ(pathOfText("file:/a/b"), "/a/b");
    EXPECT_EQ(pathOfText("file://LocalHost/a"), "/a");
    EXPECT_EQ(pathOfText("file:///a%20b%c3%A4"), "/a b\xC3\xA4");
    EXPECT_EQ(pathOfText("file:///a?query#fragment"), "/a");
    EXPECT_EQ(pathOfText("file:///a#fragment?x"), "/a");
    EXPECT_EQ(pathOfText("file:///"), "/");
    EXPECT_EQ(pathOfText("file:////"), "/");
    EXPECT_EQ(pathOfText("file:///\xC3\xA4"), "/\xC3\xA4");
    EXPECT_EQ(pathOfText("file:///a%2Fb"), "/a/b");
}

TEST(URL, IsNoneForTextThatIsNoURL) {
    for (std::string_view text :
         {"", "/a/b", "a", ":", ":a", "1a:b", "a_b:c", "-a:b", "//host/path", "file:///a b",
          "file:///a\tb", "file:///a\n", " file:///a", "file:///a\x7F", "http://h/a b"})
        EXPECT_FALSE(URL::fromString(text)) << text;
    EXPECT_FALSE(URL::fromString(std::string_view("file:///a\0", 10)));
}

TEST(URL, IsNoneForABrokenFileURL) {
    for (std::string_view text :
         {"file:", "file://", "file://localhost", "file:?a", "file://?a", "file:///a%",
          "file:///a%4", "file:///a%4g", "file:///a%g4", "file:///a%00b", "file://host/a",
          "file://localhost:80/a", "file://user@localhost/a"})
        EXPECT_FALSE(URL::fromString(text)) << text;
}

TEST(URL, TakesNoCharacterBesideTheHexadecimalDigitsForOne) {
    for (const char* text : {"%/0", "%:0", "%@0", "%G0", "%`0", "%g0", "%0/", "%0:", "%0@", "%0G",
                             "%0`", "%0g", "%+1", "%-1", "% 1"})
        EXPECT_EQ(pathOfText("file:///a" + std::string(text)), "none") << text;
    for (const char* text : {"%30", "%39", "%41", "%4F", "%6a", "%6f"})
        EXPECT_NE(pathOfText("file:///" + std::string(text)), "none") << text;
}

TEST(URL, ReadsOtherURLsWithTheirPathAsItStands) {
    const std::optional<URL> url = URL::fromString("https://host:80/a%20b/c.png?x=/y.z#f");

    ASSERT_TRUE(url);
    EXPECT_FALSE(url->isFileURL());
    EXPECT_EQ(url->path(), "/a%20b/c.png");
    EXPECT_EQ(url->lastPathComponent(), "c.png");
    EXPECT_EQ(url->pathExtension(), "png");
    EXPECT_EQ(pathOfText("http://host"), "");
    EXPECT_EQ(pathOfText("http://host?q"), "");
    EXPECT_EQ(pathOfText("mailto:a@b"), "a@b");
    EXPECT_EQ(pathOfText("x-y+z.1:p"), "p");
    EXPECT_EQ(pathOfText("http://h/a%zz"), "/a%zz");
}

TEST(URL, EqualsByPathWhereItIsAFiles) {
    EXPECT_EQ(file("/a b"), *URL::fromString("file:///a%20b/"));
    EXPECT_EQ(file("/a b").hash(), URL::fromString("file://localhost/a%20b")->hash());
    EXPECT_NE(file("/a"), file("/A"));
    EXPECT_NE(file("/a/./b"), file("/a/b"));
}

TEST(URL, EqualsByTextWhereItIsNoFiles) {
    EXPECT_EQ(*URL::fromString("http://h/a"), *URL::fromString("http://h/a"));
    EXPECT_NE(*URL::fromString("http://h/a"), *URL::fromString("http://h/a?q"));
    EXPECT_NE(*URL::fromString("x:/a"), file("/a"));
}

TEST(URL, KeepsItsTextWhenItIsMovedFrom) {
    URL url = URL::fileURLWithPath("/a/b");
    const URL made(std::move(url));
    URL assigned = URL::fileURLWithPath("/c");
    assigned = std::move(url);

    EXPECT_EQ(made.path(), "/a/b");
    EXPECT_EQ(assigned.path(), "/a/b");
    EXPECT_EQ(url.path(), "/a/b");  // NOLINT(bugprone-use-after-move)
}

TEST(URL, HasALastComponentAndAnExtension) {
    EXPECT_EQ(file("/a/b.epub").lastPathComponent(), "b.epub");
    EXPECT_EQ(file("/a/b.epub/").pathExtension(), "epub");
    EXPECT_EQ(file("/").lastPathComponent(), "/");
    EXPECT_EQ(file("/").pathExtension(), "");
    EXPECT_EQ(file("/a.b/c").pathExtension(), "");
}

TEST(URL, LosesItsLastComponent) {
    EXPECT_EQ(file("/a/b").deletingLastPathComponent(), file("/a"));
    EXPECT_EQ(file("/a").deletingLastPathComponent(), file("/"));
    EXPECT_EQ(file("/").deletingLastPathComponent(), file("/"));
    EXPECT_EQ(file("a").deletingLastPathComponent(), file(""));
    EXPECT_EQ(URL::fromString("file://localhost/a%20b/c?q")->deletingLastPathComponent(),
              file("/a b"));
}

TEST(URL, AppendsAComponentWithOneSlash) {
    EXPECT_EQ(file("/a").appendingPathComponent("b c").absoluteString(), "file:///a/b%20c");
    EXPECT_EQ(file("/a").appendingPathComponent("/b/c/"), file("/a/b/c"));
    EXPECT_EQ(file("/").appendingPathComponent("a"), file("/a"));
    EXPECT_EQ(file("a").appendingPathComponent("b"), file("a/b"));
    EXPECT_EQ(file("/a").appendingPathComponent(""), file("/a"));
    EXPECT_EQ(file("/a").appendingPathComponent("50%25").path(), "/a/50%25");
}

TEST(URL, ChangesThePathOfAURLThatIsNoFilesAndKeepsTheRest) {
    const URL url = *URL::fromString("http://h/a/b?q#f");

    EXPECT_EQ(url.appendingPathComponent("c d").absoluteString(), "http://h/a/b/c%20d?q#f");
    EXPECT_EQ(url.appendingPathComponent("c").path(), "/a/b/c");
    EXPECT_EQ(url.deletingLastPathComponent().absoluteString(), "http://h/a?q#f");
    EXPECT_EQ(URL::fromString("http://h?q")->appendingPathComponent("a").absoluteString(),
              "http://h/a?q");
    EXPECT_EQ(URL::fromString("http://h")->deletingLastPathComponent().absoluteString(),
              "http://h");
}

TEST(URL, IsStandardizedByItsText) {
    EXPECT_EQ(file("/a/./b//c/../d").standardized(), file("/a/b/d"));
    EXPECT_EQ(file("/../../a").standardized(), file("/a"));
    EXPECT_EQ(file("/a/..").standardized(), file("/"));
    EXPECT_EQ(file("/a/.").standardized(), file("/a"));
    EXPECT_EQ(file("//a///b").standardized(), file("/a/b"));
    EXPECT_EQ(file("/.hidden/...").standardized(), file("/.hidden/..."));
    EXPECT_EQ(file("/").standardized(), file("/"));
}

TEST(URL, StandardizedStartsARelativePathAtTheCurrentDirectory) {
    const std::string directory = std::filesystem::current_path().string();

    EXPECT_EQ(file("a/../b").standardized(), file(directory).appendingPathComponent("b"));
    EXPECT_EQ(file("").standardized(), file(directory));
}

TEST(URL, StandardizedLeavesAStandardOneAndOthersAsTheyAre) {
    EXPECT_EQ(URL::fromString("FILE:///a/b")->standardized().absoluteString(), "FILE:///a/b");
    EXPECT_EQ(URL::fromString("http://h/a/../b")->standardized().absoluteString(),
              "http://h/a/../b");
}

TEST(PathText, HasALastComponent) {
    EXPECT_EQ(lastComponentOfPath("a/b"), "b");
    EXPECT_EQ(lastComponentOfPath("a/b//"), "b");
    EXPECT_EQ(lastComponentOfPath("/a"), "a");
    EXPECT_EQ(lastComponentOfPath("a"), "a");
    EXPECT_EQ(lastComponentOfPath("///"), "/");
    EXPECT_EQ(lastComponentOfPath(""), "");
}

TEST(PathText, HasTheExtensionBehindTheLastDot) {
    EXPECT_EQ(extensionOfPath("a.tar.gz"), "gz");
    EXPECT_EQ(extensionOfPath("A.EPUB"), "EPUB");
    EXPECT_EQ(extensionOfPath(".epub"), "epub");
    EXPECT_EQ(extensionOfPath("a."), "");
    EXPECT_EQ(extensionOfPath("a"), "");
    EXPECT_EQ(extensionOfPath(".."), "");
    EXPECT_EQ(extensionOfPath("a.b/c"), "");
    EXPECT_EQ(extensionOfPath("a.b/"), "b");
    EXPECT_EQ(extensionOfPath("a.b c"), "b c");
}

TEST(PathText, LosesItsExtension) {
    EXPECT_EQ(pathWithoutExtension("/x/a.tar.gz"), "/x/a.tar");
    EXPECT_EQ(pathWithoutExtension(".epub"), "");
    EXPECT_EQ(pathWithoutExtension("a."), "a.");
    EXPECT_EQ(pathWithoutExtension("a"), "a");
    EXPECT_EQ(pathWithoutExtension("a.b/c"), "a.b/c");
    EXPECT_EQ(pathWithoutExtension("/a.b/"), "/a");
}

TEST(PathText, LosesItsLastComponent) {
    EXPECT_EQ(pathWithoutLastComponent("a/b/c"), "a/b");
    EXPECT_EQ(pathWithoutLastComponent("a//b"), "a");
    EXPECT_EQ(pathWithoutLastComponent("a/b/"), "a");
    EXPECT_EQ(pathWithoutLastComponent("/a"), "/");
    EXPECT_EQ(pathWithoutLastComponent("//a"), "/");
    EXPECT_EQ(pathWithoutLastComponent("/"), "/");
    EXPECT_EQ(pathWithoutLastComponent("a"), "");
    EXPECT_EQ(pathWithoutLastComponent(""), "");
}

TEST(PathText, IsJoinedWithOneSlash) {
    EXPECT_EQ(pathAppending("a", "b"), "a/b");
    EXPECT_EQ(pathAppending("a//", "//b"), "a/b");
    EXPECT_EQ(pathAppending("/", "b"), "/b");
    EXPECT_EQ(pathAppending("", "b/c"), "b/c");
    EXPECT_EQ(pathAppending("a", ""), "a");
    EXPECT_EQ(pathAppending("", ""), "");
}

}  // namespace
}  // namespace parvel::testing
