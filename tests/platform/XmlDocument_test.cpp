#include "parvel/platform/XmlDocument.h"

#include <gtest/gtest.h>

#include <atomic>
#include <thread>
#include <vector>

#include "parvel/foundation/Error.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

constexpr std::string_view kDeclarations =
    "declare namespace dc=\"http://purl.org/dc/elements/1.1/\"; "
    "declare namespace o=\"http://www.idpf.org/2007/opf\"; ";

constexpr std::string_view kBook = R"(<?xml version="1.0"?>
<package xmlns="http://www.idpf.org/2007/opf" unique-identifier="uid">
 <metadata xmlns:dc="http://purl.org/dc/elements/1.1/">
  <dc:identifier id="a">first</dc:identifier>
  <dc:identifier id="uid">second</dc:identifier>
  <dc:title>The <i>Long</i> &amp; <![CDATA[<Winding>]]> Road</dc:title>
  <meta property="folium:format" xmlns="">folium</meta>
  <meta property="folium:format">other</meta>
  <meta name="cover" content="pic"/>
 </metadata>
</package>)";

URL bookURL() {
    return URL::fileURLWithPath("/books/content.opf");
}

std::shared_ptr<const XmlDocument> parsed(std::string_view text, ErrorOut error = nullptr) {
    return XmlParser::host().parse(Data::copyOf(text), bookURL(), error);
}

XPathResult evaluated(const XmlNode& node, std::string_view expression, ErrorOut error = nullptr) {
    return node.document->evaluate(node.node, std::string(kDeclarations) + std::string(expression),
                                   error);
}

/// The string value of the first node; "none" for no match, "failed" for no evaluation.
std::string valueAt(const XmlNode& node, std::string_view expression) {
    const XPathResult result = evaluated(node, expression);
    if (!result.evaluated)
        return "failed";
    return result.first ? result.first->document->stringValue(result.first->node) : "none";
}

std::string valueIn(std::string_view text, std::string_view expression) {
    const auto document = parsed(text);
    return document ? valueAt(document->root(), expression) : "no document";
}

XmlNode metadataOf(const std::shared_ptr<const XmlDocument>& document) {
    return *evaluated(document->root(), "/o:package[1]/o:metadata[1]").first;
}

TEST(XmlDocument, GivesTheFirstNodeInDocumentOrder) {
    const XmlNode metadata = metadataOf(parsed(kBook));

    EXPECT_EQ(valueAt(metadata, "dc:identifier[1]"), "first");
    EXPECT_EQ(valueAt(metadata, "dc:identifier[@id='uid']"), "second");
    EXPECT_EQ(valueAt(metadata, "dc:title | dc:identifier"), "first");
    EXPECT_EQ(valueAt(metadata, "dc:title/preceding-sibling::dc:identifier"), "first");
    EXPECT_EQ(valueAt(metadata, "//dc:identifier"), "first");
}

TEST(XmlDocument, GivesNoNodeWithoutAnErrorForNoMatch) {
    std::optional<Error> error;

    const XPathResult result = evaluated(metadataOf(parsed(kBook)), "dc:creator[1]", &error);

    EXPECT_TRUE(result.evaluated);
    EXPECT_FALSE(result.first);
    EXPECT_FALSE(error);
}

TEST(XmlDocument, MatchesAnUnprefixedNameInNoNamespaceOnly) {
    const XmlNode metadata = metadataOf(parsed(kBook));

    EXPECT_EQ(valueAt(metadata, "meta[@property='folium:format']"), "folium");
    EXPECT_EQ(valueAt(metadata, "o:meta[@property='folium:format']"), "other");
}

TEST(XmlDocument, TakesAnUndeclaredPrefixForAPartOfTheName) {
    const auto document = parsed("<a><u:b u:x='1' x='2'>no</u:b><b u:x='3'>yes</b></a>");

    EXPECT_EQ(valueAt(document->root(), "/a/b"), "yes");
    EXPECT_EQ(valueAt(document->root(), "/a/b[@x='3']"), "none");
    EXPECT_EQ(valueAt(document->root(), "/a/b/@x"), "none");
    EXPECT_EQ(valueAt(document->root(), "/a/*/@x"), "2");
}

TEST(XmlDocument, ReadsAttributeNodes) {
    EXPECT_EQ(valueIn(kBook, "/o:package/@unique-identifier"), "uid");
}

TEST(XmlDocument, ReadsNamespaceNodes) {
    const auto document = parsed("<a xmlns:p='urn:x'/>");

    const XPathResult result = evaluated(document->root(), "/a/namespace::p");

    ASSERT_TRUE(result.first);
    EXPECT_EQ(document->stringValue(result.first->node), "urn:x");
    EXPECT_EQ(document->attribute(result.first->node, "p"), std::nullopt);
}

TEST(XmlDocument, JoinsTheTextOfAllDescendantsInAStringValue) {
    EXPECT_EQ(valueAt(metadataOf(parsed(kBook)), "dc:title[1]"), "The Long & <Winding> Road");
}

TEST(XmlDocument, ReadsAnAttributeInNoNamespace) {
    const auto document = parsed("<a x='1' p:y='2' xmlns:p='urn:x' z=''/>");
    const XmlNode element = *evaluated(document->root(), "/a").first;

    EXPECT_EQ(document->attribute(element.node, "x"), "1");
    EXPECT_EQ(document->attribute(element.node, "z"), "");
    EXPECT_EQ(document->attribute(element.node, "y"), std::nullopt);
    EXPECT_EQ(document->attribute(element.node, "w"), std::nullopt);
    EXPECT_EQ(document->attribute(nullptr, "x"), std::nullopt);
}

TEST(XmlDocument, FailsForWhatDoesNotEvaluate) {
    const XmlNode metadata = metadataOf(parsed(kBook));

    for (const char* expression :
         {"dc:identifier[@id='a'b']", "count(*)", "'text'", "unbound:name", "", "///", "a[",
          "1 =", "declare namespace q='urn:q' dc:title", "dc:identifier[id()]", "nonsense()"}) {
        std::optional<Error> error;
        EXPECT_FALSE(evaluated(metadata, expression, &error).evaluated) << expression;
        ASSERT_TRUE(error) << expression;
        EXPECT_EQ(*error, makeFileError(PVFileErrorCode::Corrupt, std::nullopt)) << expression;
    }
}

TEST(XmlDocument, InsertsRawTextIntoAnExpressionAsItIs) {
    EXPECT_EQ(valueAt(metadataOf(parsed(kBook)), "dc:identifier[@id='x' or '1'='1']"), "first");
}

TEST(XmlDocument, BindsOnlyThePrefixesOfThePrologueAtHand) {
    const auto document = parsed("<a xmlns='urn:1'><b xmlns='urn:2'>in</b></a>");

    EXPECT_TRUE(document->evaluate(nullptr, "declare namespace p=\"urn:1\"; /p:a").first);
    EXPECT_FALSE(document->evaluate(nullptr, "declare namespace p=\"urn:2\"; /p:a").first);
    EXPECT_TRUE(document->evaluate(nullptr, "declare namespace q='urn:1';/q:a").first);
    EXPECT_FALSE(document->evaluate(nullptr, "/q:a").evaluated);
}

TEST(XmlDocument, KeepsTheDocumentAliveThroughANode) {
    const XmlNode metadata = metadataOf(parsed(kBook));

    EXPECT_EQ(metadata.document.use_count(), 1);
    EXPECT_EQ(valueAt(metadata, "dc:identifier[2]"), "second");
}

TEST(XmlDocument, RefusesWhatIsNotWellFormed) {
    for (const char* text : {"", " ", "text", "<a>", "<a></b>", "<a/><b/>", "<a/>text", "<a x=1/>",
                             "<a x='1' x='2'/>", "<a>&undefined;</a>", "<a>\x01</a>", "<a x='<'/>",
                             "\xEF\xBB\xBF", "<a", "<!DOCTYPE a>"}) {
        std::optional<Error> error;
        EXPECT_FALSE(parsed(text, &error)) << text;
        ASSERT_TRUE(error) << text;
        EXPECT_EQ(*error, makeFileError(PVFileErrorCode::Corrupt, bookURL())) << text;
    }
}

TEST(XmlDocument, ReadsBytesOfSeveralRanges) {
    const Data parts[] = {Data::copyOf("<a><b>o"), Data(), Data::copyOf("ne</b"),
                          Data::copyOf("></a>")};

    const auto document = XmlParser::host().parse(Data::joining(parts), bookURL());

    ASSERT_TRUE(document);
    EXPECT_EQ(valueAt(document->root(), "/a/b"), "one");
}

TEST(XmlDocument, ReadsTheUsualEncodings) {
    using namespace std::string_literals;
    EXPECT_EQ(valueIn("\xEF\xBB\xBF<a>\xC3\xA9</a>", "/a"), "\xC3\xA9");
    EXPECT_EQ(valueIn("<?xml version='1.0' encoding='ISO-8859-1'?><a>\xE9</a>", "/a"), "\xC3\xA9");
    EXPECT_EQ(valueIn("<?xml version='1.0' encoding='windows-1252'?><a>\x80</a>", "/a"),
              "\xE2\x82\xAC");
    EXPECT_EQ(valueIn("\xFF\xFE<\0a\0>\0\xE9\0<\0/\0a\0>\0"s, "/a"), "\xC3\xA9");
    EXPECT_EQ(valueIn("\xFE\xFF\0<\0a\0>\0\xE9\0<\0/\0a\0>"s, "/a"), "\xC3\xA9");
    EXPECT_EQ(valueIn("<a>\xE9</a>", "/a"), "no document");
    EXPECT_EQ(valueIn("\xFF\xFE<\0a\0>\0\x00\xD8<\0/\0a\0>\0"s, "/a"), "no document");
}

TEST(XmlDocument, ReadsADeclaredEntityAsItsText) {
    EXPECT_EQ(valueIn("<!DOCTYPE a [<!ENTITY e 'one &#38;#38; two'><!ENTITY f '[&e;]'>]>"
                      "<a x='&f;&#38;&amp;&lt;'>&f; &e;<b/>&f;</a>",
                      "/a"),
              "[one & two] one & two[one & two]");
    EXPECT_EQ(valueIn("<!DOCTYPE a [<!ENTITY e 'one &#38;#38; two'><!ENTITY f '[&e;]'>]>"
                      "<a x='&f;&#38;&amp;&lt;'/>",
                      "/a/@x"),
              "[one & two]&&<");
    EXPECT_EQ(valueIn("<!DOCTYPE a [<!ENTITY e 'a\tb'>]><a x='-&e;-'/>", "/a/@x"), "-a b-");
    EXPECT_EQ(valueIn("<!DOCTYPE a [<!ENTITY e ''>]><a>-&e;-&e;-</a>", "/a"), "---");
}

TEST(XmlDocument, LeavesOutTheMarkupOfAnEntity) {
    EXPECT_EQ(valueIn("<!DOCTYPE a [<!ENTITY e 'x<b>y<c/></b>z'>]><a>&e;-&e;</a>", "/a"),
              "xyz-xyz");
    EXPECT_EQ(valueIn("<!DOCTYPE a [<!ENTITY e 'x<b>y</b>z'>]><a>&e;</a>", "/a/b"), "none");
}

TEST(XmlDocument, FindsAnAttributeByAnEntitysText) {
    EXPECT_EQ(
        valueIn("<!DOCTYPE a [<!ENTITY e 'pvp'>]><a><b id='&e;'>it</b></a>", "/a/b[@id='pvp']"),
        "it");
}

TEST(XmlDocument, AppliesDeclaredAttributeDefaults) {
    EXPECT_EQ(valueIn("<!DOCTYPE a [<!ATTLIST a x CDATA 'default'>]><a/>", "/a/@x"), "default");
}

TEST(XmlDocument, ReadsAnUndeclaredEntityAsEmptyWhereItCouldBeDeclaredElsewhere) {
    EXPECT_EQ(valueIn("<!DOCTYPE a SYSTEM 'a.dtd'><a>-&nbsp;-</a>", "/a"), "--");
}

TEST(XmlDocument, OpensNoExternalEntity) {
    const TemporaryDirectory folder;
    const std::string canary = folder.write("canary", "canary");
    const std::string pe = folder.write("canary.dtd", "<!ENTITY e 'canary'>");

    EXPECT_EQ(
        valueIn("<!DOCTYPE a [<!ENTITY e SYSTEM 'file://" + canary + "'>]><a>-&e;-&e;-</a>", "/a"),
        "---");
    EXPECT_EQ(valueIn("<!DOCTYPE a SYSTEM '" + pe + "'><a>-&e;-</a>", "/a"), "--");
    EXPECT_EQ(valueIn("<!DOCTYPE a [<!ENTITY % p SYSTEM '" + pe + "'>%p;]><a>--</a>", "/a"), "--");
    EXPECT_EQ(valueIn("<!DOCTYPE a [<!ENTITY e SYSTEM '" + canary + "'>]><a x='&e;'/>", "/a/@x"),
              "no document");
}

TEST(XmlDocument, ReadsDifferentDocumentsOnDifferentThreads) {
    std::atomic<int> good = 0;
    std::vector<std::thread> threads;
    for (int thread = 0; thread < 4; ++thread) {
        threads.emplace_back([&good] {
            for (int round = 0; round < 100; ++round) {
                good += valueAt(metadataOf(parsed(kBook)), "dc:identifier[2]") == "second";
                good += parsed("<a>&undefined;</b>") == nullptr;
            }
        });
    }
    for (std::thread& thread : threads)
        thread.join();

    EXPECT_EQ(good, 800);
}

TEST(XmlDocument, IsQuietOnStandardError) {
    ::testing::internal::CaptureStderr();

    (void)parsed("<a>&undefined;</b>");
    (void)parsed("<?xml version='1.0' encoding='nonsense'?><a/>");
    (void)parsed("<a>\xE9</a>");
    (void)parsed(std::string("\xFF\xFE<\0a\0>\0\x00\xD8<\0/\0a\0>\0", 16));
    (void)evaluated(metadataOf(parsed(kBook)), "dc:identifier[@id='a'b']");
    (void)evaluated(metadataOf(parsed(kBook)), "unbound:x");

    EXPECT_EQ(::testing::internal::GetCapturedStderr(), "");
}

}  // namespace
}  // namespace parvel::testing
