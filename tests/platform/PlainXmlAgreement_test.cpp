#include <gtest/gtest.h>

#include <random>
#include <string>
#include <vector>

#include "parvel/platform/linux/PlainXmlParse.h"
#include "parvel/platform/linux/XmlElementTree.h"
#include "tests/support/PackageDocuments.h"
#include "tests/support/TestRounds.h"

// Whatever is taken for a plain document, libxml2 makes the same tree of.

namespace parvel::testing {
namespace {

using Choices = std::vector<std::string_view>;

std::string describedTree(const XmlElementTree& tree) {
    std::string text;
    const auto quoted = [&text](std::string_view name, std::string_view value) {
        text.append(name).append("=\"").append(value).append("\" ");
    };
    for (const XmlElementTree::Element& element : tree.elements()) {
        quoted("element", element.name);
        quoted("in", element.namespaceName);
        quoted("to", std::to_string(element.end));
        quoted("text", tree.text(element));
        for (auto index = element.attributesBegin; index < element.attributesEnd; ++index) {
            const XmlElementTree::Attribute& attribute = tree.attributes()[index];
            quoted("attribute", attribute.name);
            quoted("in", attribute.namespaceName);
            quoted("value", attribute.value);
        }
        text += '\n';
    }
    return text.append(tree.text());
}

/// Whether the document is a plain one.
bool agreesOn(std::string_view document) {
    const Data bytes = Data::copyOf(document);
    const std::optional<XmlElementTree> plain = XmlElementTree::parsePlain(bytes);
    if (!plain)
        return false;
    const std::optional<XmlElementTree> guarded = XmlElementTree::parseGuarded(bytes);
    if (!guarded)
        ADD_FAILURE() << "taken for plain, though not well-formed: " << document;
    else
        EXPECT_EQ(describedTree(*plain), describedTree(*guarded)) << document;
    return true;
}

std::string_view oneOf(std::mt19937& random, const Choices& choices) {
    return choices[random() % choices.size()];
}

void appendContent(std::mt19937& random, std::string& document, int depth) {
    static const Choices texts = {"",
                                  "\n  ",
                                  "Title",
                                  "a &amp; b",
                                  "\r\n",
                                  "&#x3b1;&#13;&#38;lt;",
                                  "\xC3\xA9\xE2\x82\xAC",
                                  "]] >",
                                  "<!-- - ]]> \xC3\xA9 & -->",
                                  "\t&gt;",
                                  "\xF0\x9F\x93\x96",
                                  "&#10;"};
    static const Choices names = {"a", "b", "o:a", "p:b.c", "q:x_1-", "meta"};
    static const Choices attributes = {"",
                                       " id='1'",
                                       " id = \"a'b\"",
                                       " xmlns='urn:o'",
                                       " xmlns:o='urn:p'",
                                       " xmlns:r='urn:r' r:id='2' id='3'",
                                       " xmlns:r='\xC3\xA9&#x20;\t&lt;' r:id='2'",
                                       "\n\to:id='\xC3\xA9'",
                                       " p:id='&lt;&#xA;\t\r\n&quot;'",
                                       " xml:lang='en' lang=''",
                                       " name='&amp;amp; &#38;#38;'"};
    document += oneOf(random, texts);
    for (unsigned children = depth > 0 ? random() % 4 : 0; children > 0; --children) {
        const std::string name(oneOf(random, names));
        document.append("<").append(name).append(oneOf(random, attributes));
        document += oneOf(random, {"", " ", "\r\n"});
        if (random() % 3 == 0) {
            document += "/>";
        } else {
            document += ">";
            appendContent(random, document, depth - 1);
            document.append("</").append(name).append(oneOf(random, {"", " "})).append(">");
        }
        document += oneOf(random, texts);
    }
}

std::string madeDocument(std::mt19937& random) {
    std::string document(oneOf(
        random,
        {"", "\xEF\xBB\xBF", "<?xml version=\"1.0\"?>", "<?xml version='1.0' encoding='utf-8'?>\n",
         "<?xml version = \"1.0\"\tencoding=\"UTF-8\" standalone=\"no\" ?>\r\n",
         "<?xml version='1.0' standalone='yes'?><!-- c -->"}));
    document +=
        oneOf(random, {"", "", "<!DOCTYPE r>",
                       "<!DOCTYPE o:r PUBLIC \"+//X//DTD R 1.0//EN\" \"http://x/r.dtd\">\n"});
    document += "<r xmlns:o=\"urn:o\" xmlns:p='urn:p' xmlns:q='http://q/?a=1#b'>";
    appendContent(random, document, 4);
    return document + "</r>" + std::string(oneOf(random, {"", "\n", "<!--c-->\r\n"}));
}

void damageDocument(std::mt19937& random, std::string& document) {
    static const Choices pieces = {"<",
                                   ">",
                                   "&",
                                   ";",
                                   "'",
                                   "\"",
                                   " ",
                                   "=",
                                   "/",
                                   "]",
                                   "]]>",
                                   "--",
                                   "-->",
                                   "<!--",
                                   "\r",
                                   "\t",
                                   ":",
                                   "xmlns",
                                   "xml:",
                                   "x",
                                   "1",
                                   "-",
                                   "<?p?>",
                                   "<![CDATA[x]]>",
                                   "&#0;",
                                   "&#xFFFE;",
                                   "&e;",
                                   "\x01",
                                   "\x7F",
                                   "\x80",
                                   "\xC0\x80",
                                   "\xED\xA0\x80",
                                   "\xEF\xBF\xBF",
                                   "\xF4\x90\x80\x80",
                                   "\xC3",
                                   "\xE2\x82",
                                   " xmlns=''",
                                   " id='1'",
                                   "%",
                                   "!",
                                   "["};
    const std::size_t at = random() % document.size();
    const std::size_t length = random() % 3;
    if (random() % 8 == 0)
        document.insert(at, document.substr(random() % document.size(), random() % 40));
    else
        document.replace(at, length, oneOf(random, pieces));
}

TEST(PlainXmlAgreement, LibxmlMakesTheSameTreeOfMadeDocuments) {
    std::mt19937 random(4711);
    std::size_t plain = 0;
    const std::size_t rounds = testRounds(300);
    for (std::size_t round = 0; round < rounds; ++round)
        plain += agreesOn(madeDocument(random)) ? 1 : 0;
    EXPECT_GT(plain, rounds * 3 / 4);
}

TEST(PlainXmlAgreement, LibxmlMakesTheSameTreeOfDamagedDocuments) {
    std::mt19937 random(815);
    std::size_t plain = 0;
    const std::size_t rounds = testRounds(3000);
    for (std::size_t round = 0; round < rounds; ++round) {
        std::string document = madeDocument(random);
        for (unsigned changes = 1 + random() % 2; changes > 0; --changes)
            damageDocument(random, document);
        plain += agreesOn(document) ? 1 : 0;
    }
    EXPECT_GT(plain, rounds / 20);
    EXPECT_LT(plain, rounds * 9 / 10);
}

TEST(PlainXmlAgreement, EveryBeginningOfADocumentIsLeftToLibxml) {
    const std::string document = "<?xml version='1.0'?><!--c--><a b='&lt;'>\xC3\xA9]<c/>&#9;</a>";
    ASSERT_TRUE(agreesOn(document));
    for (std::size_t length = 0; length < document.size(); ++length)
        EXPECT_FALSE(agreesOn(document.substr(0, length))) << length;
}

TEST(PlainXml, PackageAndContainerDocumentsArePlain) {
    EXPECT_TRUE(agreesOn(containerText("OPS/package.opf")));
    EXPECT_TRUE(agreesOn("<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<!DOCTYPE package>" +
                         opfText("<dc:title id='t' xml:lang='en'>A &amp; B</dc:title>\r\n"
                                 "<meta property='folium:format'>x</meta><!-- none -->",
                                 "<item id='cover' href='it&apos;s.png'/>")));
}

TEST(PlainXml, EverythingElseIsLeftToLibxml) {
    using namespace std::string_view_literals;
    for (const std::string_view document :
         {""sv,
          "<a/>x"sv,
          "<a/><b/>"sv,
          "<a>\0</a>"sv,
          "<a/>\0"sv,
          "<?xml version='1.1'?><a/>"sv,
          "<?xml version='1.0' encoding='latin1'?><a/>"sv,
          "<?xml encoding='UTF-8'?><a/>"sv,
          "<?xml version='1.0'encoding='UTF-8'?><a/>"sv,
          "<?xml version='1&#46;0'?><a/>"sv,
          "<?xml version='1.0' encoding='UTF&#45;8'?><a/>"sv,
          "<?xml version='1.0' standalone='y&#101;s'?><a/>"sv,
          "<?p?><a/>"sv,
          "<a><?p?></a>"sv,
          "<a><![CDATA[x]]></a>"sv,
          "<a>]]></a>"sv,
          "<!DOCTYPE a [<!ENTITY e 'x'>]><a/>"sv,
          "<!DOCTYPE a SYSTEM 'a.dtd'><a/>"sv,
          "<!DOCTYPE a PUBLIC \"x\"><a/>"sv,
          "<a/><!DOCTYPE a>"sv,
          "<a>&e;</a>"sv,
          "<a>&#0;</a>"sv,
          "<a>&#xD800;</a>"sv,
          "<a>&#x110000;</a>"sv,
          "<a>&#4294967337;</a>"sv,
          "<a>&#-9;</a>"sv,
          "<a>&#;</a>"sv,
          "<a>&#X9;</a>"sv,
          "<a>&amp</a>"sv,
          "<a>\r</a>"sv,
          "<a b='\r'/>"sv,
          "<a b='<'/>"sv,
          "<a b=c/>"sv,
          "<a b/>"sv,
          "<a b='1'c='2'/>"sv,
          "<a b='1' b='2'/>"sv,
          "<a xmlns:p='u' xmlns:q='u' p:b='1' q:b='2'/>"sv,
          "<a xmlns='u' xmlns='v'/>"sv,
          "<a xmlns=''/>"sv,
          "<a xmlns:p=''/>"sv,
          "<a xmlns:xml='http://www.w3.org/XML/1998/namespace'/>"sv,
          "<a xmlns:xmlp='u'/>"sv,
          "<a xmlns='http://www.w3.org/2000/xmlns/'/>"sv,
          "<a xmlns='a&amp;b'/>"sv,
          "<p:a/>"sv,
          "<a p:b=''/>"sv,
          "<xml:a/>"sv,
          "<a:b:c xmlns:a='u'/>"sv,
          "<:a/>"sv,
          "<a:/>"sv,
          "<\xC3\xA9/>"sv,
          "<1/>"sv,
          "<a></b>"sv,
          "<a></ab>"sv,
          "<a></a"sv,
          "</a>"sv,
          "< a/>"sv,
          "<a / >"sv,
          "<!-- -- --><a/>"sv,
          "<!-- ---><a/>"sv,
          "<!--\x01--><a/>"sv,
          "<a>\xEF\xBF\xBE</a>"sv,
          "<a>\xED\xA0\x80</a>"sv,
          "<a>\xC3</a>"sv,
          "<a b='\x80'/>"sv})
        EXPECT_FALSE(agreesOn(document)) << document;
}

TEST(PlainXml, NoDocumentThatABudgetMayStopIsPlain) {
    const auto repeated = [](std::string_view piece, int count) {
        std::string text;
        for (int i = 0; i < count; ++i)
            text += piece;
        return text;
    };
    const auto numbered = [](std::string_view piece, int count) {
        std::string text;
        for (int i = 0; i < count; ++i)
            text.append(" ").append(piece).append(std::to_string(i)).append("='u'");
        return text;
    };
    const auto nested = [&](int depth) { return repeated("<a>", depth) + repeated("</a>", depth); };
    EXPECT_TRUE(agreesOn(nested(200)));
    EXPECT_FALSE(agreesOn(nested(201)));
    EXPECT_TRUE(agreesOn("<a" + numbered("b", 32) + "/>"));
    EXPECT_FALSE(agreesOn("<a" + numbered("b", 33) + "/>"));
    EXPECT_TRUE(agreesOn("<a" + numbered("xmlns:b", 32) + "/>"));
    EXPECT_FALSE(agreesOn("<a" + numbered("xmlns:b", 33) + "/>"));
    EXPECT_TRUE(agreesOn("<" + repeated("a", 1000) + "/>"));
    EXPECT_FALSE(agreesOn("<" + repeated("a", 1001) + "/>"));
    const std::size_t content = PlainXmlParse::kLargestDocument - std::string("<a></a>").size();
    EXPECT_TRUE(agreesOn("<a>" + std::string(content, ' ') + "</a>"));
    EXPECT_FALSE(agreesOn("<a>" + std::string(content + 1, ' ') + "</a>"));
}

TEST(PlainXml, ADocumentInSeveralRangesReadsAsInOne) {
    const std::string text = "<a b='1'>text<c/></a>";
    std::vector<Data> parts;
    for (const char character : text)
        parts.push_back(Data::copyOf(std::string_view(&character, 1)));

    const auto whole = XmlElementTree::parsePlain(Data::copyOf(text));
    const auto joined = XmlElementTree::parsePlain(Data::joining(parts));

    ASSERT_TRUE(whole && joined);
    EXPECT_EQ(describedTree(*whole), describedTree(*joined));
}

}  // namespace
}  // namespace parvel::testing
