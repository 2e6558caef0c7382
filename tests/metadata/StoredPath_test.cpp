#include "parvel/metadata/StoredPath.h"

#include <gtest/gtest.h>

namespace parvel::testing {
namespace {

struct LoweringRow {
    const char* name;
    std::string_view path;
    std::string_view lowered;
};

class AStoredPath : public ::testing::TestWithParam<LoweringRow> {};

TEST_P(AStoredPath, HasItsLastExtensionLowered) {
    EXPECT_EQ(pathWithLowercasedExtension(GetParam().path), GetParam().lowered);
}

INSTANTIATE_TEST_SUITE_P(
    Paths, AStoredPath,
    ::testing::Values(LoweringRow{"Capitals", "/Lib/BOOK.EPUB", "/Lib/BOOK.epub"},
                      LoweringRow{"MixedCase", "/Lib/Book.ePub", "/Lib/Book.epub"},
                      LoweringRow{"LowerCase", "/Lib/BOOK.epub", "/Lib/BOOK.epub"},
                      LoweringRow{"TheLastAlone", "/BOOK.EPUB.ZIP", "/BOOK.EPUB.zip"},
                      LoweringRow{"None", "/LIB.DIR/BOOK", "/LIB.DIR/BOOK"},
                      LoweringRow{"TrailingDot", "/BOOK.", "/BOOK."}, LoweringRow{"Empty", "", ""},
                      LoweringRow{"Root", "/", "/"},
                      LoweringRow{"BeginsWithTheDot", "/.EPUB", "/.epub"},
                      LoweringRow{"ManyDots", "/A...B", "/A...b"},
                      LoweringRow{"TrailingSlash", "/Lib/BOOK.EPUB/", "/Lib/BOOK.epub"},
                      LoweringRow{"TrailingSlashAfterNoExtension", "/LIB/", "/LIB/"},
                      LoweringRow{"Digits", "/A.M4A", "/A.m4a"},
                      LoweringRow{"NonASCII", "/\xC3\x84.\xC3\x84\xC3\x96X",
                                  "/\xC3\x84.\xC3\xA4\xC3\xB6x"},
                      LoweringRow{"NonASCIIStem", "/\xC3\x84.EPUB", "/\xC3\x84.epub"},
                      LoweringRow{"InvalidBytes", "/\xFF.E\xFFX", "/\xFF.e\xFFx"}),
    [](const auto& row) { return row.param.name; });

TEST(StoredPath, IsAFileURLWhereItIsText) {
    const Value path = "/a b.epub";

    EXPECT_EQ(fileURLOfStoredPath(&path), URL::fileURLWithPath("/a b.epub"));
}

TEST(StoredPath, IsNoURLWhereItIsAbsentOrEmptyOrNoText) {
    const Value empty = "";
    const Value number = Number::signedInteger(5);

    EXPECT_EQ(fileURLOfStoredPath(nullptr), std::nullopt);
    EXPECT_EQ(fileURLOfStoredPath(&empty), std::nullopt);
    EXPECT_EQ(fileURLOfStoredPath(&number), std::nullopt);
}

}  // namespace
}  // namespace parvel::testing
