#include <gtest/gtest.h>

#include "parvel/inspection/BestCover.h"
#include "tests/support/EpubBuilder.h"
#include "tests/support/PNGBuilder.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

const std::string kImage = plainPNG(2, 3);

/// An OPF document with these contents of its metadata and manifest, and more elements behind.
std::string opf(std::string_view metadata, std::string_view manifest, std::string_view more = "") {
    std::string text = opfText(metadata, manifest);
    return text.insert(text.rfind("</package>"), more);
}

/// An XHTML page with this body.
std::string page(std::string_view body) {
    return R"(<html xmlns="http://www.w3.org/1999/xhtml"><body>)" + std::string(body) +
           "</body></html>";
}

class BestCoverSearch : public ::testing::Test {
protected:
    /// The best cover of the book, which is the same for both of its shapes.
    std::optional<BestCover> best(const EpubBuilder& book) {
        const std::string name = std::to_string(++m_books) + ".epub";
        const auto zipped = bestCoverForAssetAtURL(book.zip(m_folder / ("z" + name)), &m_error);
        const auto expanded =
            bestCoverForAssetAtURL(book.expand(m_folder / ("x" + name)), &m_error);
        EXPECT_EQ(describe(zipped), describe(expanded));
        return zipped;
    }
    /// "rule image page", where rule is the rule's number.
    static std::string describe(const std::optional<BestCover>& cover) {
        if (!cover)
            return "none";
        return std::to_string(static_cast<int>(cover->rule)) + " " + cover->image + " " +
               cover->page;
    }
    std::string found(const EpubBuilder& book) { return describe(best(book)); }

    TemporaryDirectory m_folder;
    std::optional<Error> m_error;
    int m_books = 0;
};

TEST_F(BestCoverSearch, TakesTheBooksOwnCoverFirst) {
    const std::string own = plainPNG(9, 9);
    const EpubBuilder book =
        EpubBuilder{}
            .opf(opf("", R"(<item id="cover" href="own.png"/>)"
                         R"(<item id="i" href="c.png" properties="cover-image"/>)"))
            .file("OPS/own.png", own)
            .file("OPS/c.png", kImage);

    const auto cover = best(book);

    ASSERT_TRUE(cover);
    EXPECT_EQ(cover->rule, CoverRule::OwnImage);
    EXPECT_EQ(cover->bytes, Data::copyOf(own));
    EXPECT_EQ(cover->image, "");
}

TEST_F(BestCoverSearch, FindsTheItemWithTheProperty) {
    const EpubBuilder book =
        EpubBuilder{}
            .opf(opf("",
                     R"(<item id="a" href="a.png" properties="no-cover-image"/>)"
                     R"(<item id="b" href="c.png" properties="svg  cover-image"/>)",
                     R"(<guide><reference type="cover" href="a.png"/></guide>)"))
            .file("OPS/a.png", kImage)
            .file("OPS/c.png", kImage);

    const auto cover = best(book);

    ASSERT_TRUE(cover);
    EXPECT_EQ(cover->bytes, Data::copyOf(kImage));
    EXPECT_EQ(describe(cover), "1 OPS/c.png ");
}

TEST_F(BestCoverSearch, FindsTheGuidesImage) {
    const EpubBuilder book = EpubBuilder{}
                                 .opf(opf("", R"(<item id="a" href="a.xhtml"/>)",
                                          R"(<guide><reference type="toc" href="a.xhtml"/>)"
                                          R"(<reference type="Cover" href="c.png"/></guide>)"))
                                 .file("OPS/c.png", kImage);

    EXPECT_EQ(found(book), "2 OPS/c.png ");
}

TEST_F(BestCoverSearch, GoesOnPastAnEmptyImage) {
    const EpubBuilder book =
        EpubBuilder{}
            .opf(opf("", R"(<item id="a" href="a.png" properties="cover-image"/>)",
                     R"(<guide><reference type="cover" href="c.png"/></guide>)"))
            .file("OPS/a.png", "")
            .file("OPS/c.png", kImage);

    EXPECT_EQ(found(book), "2 OPS/c.png ");
}

TEST_F(BestCoverSearch, FindsTheImageOfTheGuidesPage) {
    const EpubBuilder book =
        EpubBuilder{}
            .opf(opf("", "", R"(<guide><reference type="cover" href="text/c.xhtml#top"/></guide>)"))
            .file("OPS/text/c.xhtml", page(R"(<p>Cover</p><img src="../images/c%20d.png"/>)"))
            .file("OPS/images/c d.png", kImage);

    EXPECT_EQ(found(book), "2 OPS/images/c d.png OPS/text/c.xhtml");
}

TEST_F(BestCoverSearch, FindsTheImageOfTheCoverItemThatIsAPage) {
    const std::string svg =
        R"(<svg xmlns="http://www.w3.org/2000/svg" xmlns:l="http://www.w3.org/1999/xlink">)"
        R"(<image l:href="c.png"/></svg>)";
    const auto book = [&](std::string_view metadata, std::string_view id) {
        return EpubBuilder{}
            .opf(opf(metadata, R"(<item id=")" + std::string(id) + R"(" href="p.xhtml"/>)"))
            .file("OPS/p.xhtml", page(svg))
            .file("OPS/c.png", kImage);
    };

    EXPECT_EQ(found(book(R"(<meta name="cover" content="x"/>)", "x")), "3 OPS/c.png OPS/p.xhtml");
    EXPECT_EQ(found(book("", "cover")), "3 OPS/c.png OPS/p.xhtml");
}

TEST_F(BestCoverSearch, FindsTheCoverItemUnderItsEscapedName) {
    const EpubBuilder book = EpubBuilder{}
                                 .opf(opf("", R"(<item id="cover" href="a%20b.png"/>)"))
                                 .file("OPS/a b.png", kImage);

    EXPECT_EQ(found(book), "3 OPS/a b.png ");
}

TEST_F(BestCoverSearch, FindsTheFirstImageOfTheSpine) {
    const EpubBuilder book =
        EpubBuilder{}
            .opf(opf("",
                     R"(<item id="c" href="3.xhtml"/><item id="b" href="2.xhtml"/>)"
                     R"(<item id="a'&quot;" href="1.xhtml"/>)",
                     R"(<spine><itemref idref="a'&quot;"/><itemref idref="missing"/>)"
                     R"(<itemref idref="b"/><itemref idref="c"/></spine>)"))
            .file("OPS/1.xhtml", page("<p>Half title</p>"))
            .file("OPS/2.xhtml", page(R"(<img src="missing.png"/><img src="https://x.example/y"/>)"
                                      R"(<img src="2.xhtml"/><img src="second.png"/>)"))
            .file("OPS/3.xhtml", page(R"(<img src="third.png"/>)"))
            .file("OPS/second.png", kImage)
            .file("OPS/third.png", kImage);

    EXPECT_EQ(found(book), "4 OPS/second.png OPS/2.xhtml");
}

TEST_F(BestCoverSearch, GoesOnPastARuleThatLeadsNowhere) {
    const EpubBuilder book =
        EpubBuilder{}
            .opf(opf("",
                     R"(<item id="a" href="missing.png" properties="cover-image"/>)"
                     R"(<item id="cover" href="broken.xhtml"/>)",
                     R"(<guide><reference type="cover" href="text.xhtml"/></guide>)"
                     R"(<spine><itemref idref="a"/></spine>)"))
            .file("OPS/text.xhtml", page("<p>No image</p>"))
            .file("OPS/broken.xhtml", "<html>");

    const auto cover = best(book);

    ASSERT_TRUE(cover) << "what the book itself has for a cover, image or not";
    EXPECT_EQ(cover->rule, CoverRule::OwnImage);
    EXPECT_EQ(cover->bytes, Data::copyOf("<html>"));
}

TEST_F(BestCoverSearch, NeverLeavesTheBook) {
    m_folder.write("secret.png", kImage);
    const EpubBuilder book =
        EpubBuilder{}
            .opf(opf("", R"(<item id="a" href="../../secret.png" properties="cover-image"/>)",
                     R"(<guide><reference type="cover" href="p.xhtml"/></guide>)"))
            .file("OPS/p.xhtml", page(R"(<img src="%2e%2e/%2e%2e/secret.png"/><img src="file://)" +
                                      (m_folder / "secret.png") + R"("/><img src=")" +
                                      (m_folder / "secret.png") + R"("/>)"));

    EXPECT_EQ(found(book), "none");
}

TEST_F(BestCoverSearch, HasNoCoverForABookWithoutImages) {
    EXPECT_EQ(found(EpubBuilder{}), "none");
    EXPECT_EQ(m_error, std::nullopt);
}

TEST_F(BestCoverSearch, HasTheErrorOfTheAssetsOwnCover) {
    const URL url = m_folder.url("absent.epub");

    EXPECT_FALSE(bestCoverForAssetAtURL(url, &m_error));
    EXPECT_EQ(m_error, makeServiceError(ENOENT, url));

    EXPECT_FALSE(bestCoverForAssetAtURL(std::nullopt, &m_error));
    EXPECT_EQ(m_error, makeMissingURLError());
}

TEST_F(BestCoverSearch, LeavesTheErrorAloneWhereItFindsACover) {
    const URL url =
        EpubBuilder{}
            .opf(opf("", "", R"(<guide><reference type="cover" href="c.png"/></guide>)"))
            .file("OPS/c.png", kImage)
            .zip(m_folder / "a.epub");
    m_error = makeMissingURLError();

    EXPECT_TRUE(bestCoverForAssetAtURL(url, &m_error));
    EXPECT_EQ(m_error, makeMissingURLError());
}

TEST_F(BestCoverSearch, IsForBooksAlone) {
    const URL url = EpubBuilder{}
                        .opf(opf("", R"(<item id="a" href="c.png" properties="cover-image"/>)"))
                        .file("OPS/c.png", kImage)
                        .zip(m_folder / "a.m4a");

    EXPECT_FALSE(bestCoverForAssetAtURL(url, &m_error));
}

TEST_F(BestCoverSearch, GivesAnEmptyOwnCoverWhereNoRuleFindsAnImage) {
    const EpubBuilder book =
        EpubBuilder{}.opf(opf("", R"(<item id="cover" href="c.png"/>)")).file("OPS/c.png", "");

    const auto cover = best(book);

    ASSERT_TRUE(cover);
    EXPECT_EQ(cover->rule, CoverRule::OwnImage);
    EXPECT_TRUE(cover->bytes.empty());
}

TEST_F(BestCoverSearch, ComesToAnEndOverAnEndlessSpine) {
    std::string items;
    std::string refs;
    for (int i = 0; i < 20'000; ++i) {
        items += "<item id='i" + std::to_string(i) + "' href='p.xhtml'/>";
        refs += "<itemref idref='i" + std::to_string(i) + "'/>";
    }
    const EpubBuilder book = EpubBuilder{}
                                 .opf(opf("", items, "<spine>" + refs + "</spine>"))
                                 .file("OPS/p.xhtml", page("<p>No image</p>"));

    EXPECT_FALSE(bestCoverForAssetAtURL(book.zip(m_folder / "a.epub")));
}

}  // namespace
}  // namespace parvel::testing
