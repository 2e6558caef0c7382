#include <gtest/gtest.h>

#include "parvel/platform/XmlDocument.h"
#include "tests/support/TestRounds.h"

namespace parvel::testing {
namespace {

std::string times(std::size_t count, std::string_view piece) {
    std::string text;
    text.reserve(count * piece.size());
    for (std::size_t i = 0; i < count; ++i)
        text += piece;
    return text;
}

/// ` a0="" a1="" …`
std::string attributes(std::size_t count, std::string_view prefix = "a",
                       std::string_view value = "") {
    std::string text;
    for (std::size_t i = 0; i < count; ++i)
        text.append(" ").append(prefix).append(std::to_string(i)).append("=\"").append(value) +=
            '"';
    return text;
}

std::string inUTF16(std::string_view ascii) {
    std::string text = "\xFF\xFE";
    for (const char c : ascii)
        text.append({c, '\0'});
    return text;
}

std::string inUTF32(std::string_view ascii) {
    std::string text("\xFF\xFE\0\0", 4);
    for (const char c : ascii)
        text.append({c, '\0', '\0', '\0'});
    return text;
}

std::shared_ptr<const XmlDocument> document(std::string_view text) {
    return XmlParser::host().parse(Data::copyOf(text), URL::fileURLWithPath("/x.opf"));
}

bool isAccepted(std::string_view text) {
    return document(text) != nullptr;
}

std::string laughs(std::string_view use) {
    std::string text = "<!DOCTYPE a [<!ENTITY e0 'lol'>";
    for (int i = 1; i < 20; ++i)
        text += "<!ENTITY e" + std::to_string(i) + " '" +
                times(10, "&e" + std::to_string(i - 1) + ";") + "'>";
    return text + "]><a" + std::string(use);
}

TEST(HostileXml, ElementsAreAcceptedUpToTheLimit) {
    EXPECT_TRUE(isAccepted("<a>" + times(199'999, "<b/>") + "</a>"));
    EXPECT_FALSE(isAccepted("<a>" + times(200'000, "<b/>") + "</a>"));
    EXPECT_TRUE(isAccepted(
        "<a>" + times(120'000, "\n<item id=\"i1\" href=\"chapter1.xhtml\" type=\"text\"/>") +
        "</a>"));
}

TEST(HostileXml, AttributesAreAcceptedUpToTheLimit) {
    EXPECT_TRUE(isAccepted("<a" + attributes(256) + "/>"));
    EXPECT_FALSE(isAccepted("<a" + attributes(257) + "/>"));
    EXPECT_TRUE(isAccepted("<a" + attributes(128) + attributes(128, "xmlns:n", "urn:x") + "/>"));
    EXPECT_FALSE(isAccepted("<a" + attributes(129) + attributes(128, "xmlns:n", "urn:x") + "/>"));
}

/// `<a0/><a1/>…`
std::string differentElements(std::size_t count) {
    std::string text;
    for (std::size_t i = 0; i < count; ++i)
        text += "<a" + std::to_string(i) + "/>";
    return "<a>" + text + "</a>";
}

TEST(HostileXml, NamesAreAcceptedUpToTheLimit) {
    EXPECT_TRUE(isAccepted(differentElements(49'000)));
    EXPECT_FALSE(isAccepted(differentElements(51'000)));
}

TEST(HostileXml, VeryManyAttributesAreRefusedInEveryEncoding) {
    for (const std::size_t count : {20'000U, 100'000U}) {
        const std::string many = "<a" + attributes(count) + "/>";
        EXPECT_FALSE(isAccepted(many));
        EXPECT_FALSE(isAccepted(inUTF16(many)));
        EXPECT_FALSE(isAccepted(inUTF32(many)));
        EXPECT_FALSE(isAccepted("<?xml version='1.0' encoding='ISO-8859-1'?>" + many));
        EXPECT_FALSE(isAccepted("<a b='<'/>" + many));
        EXPECT_FALSE(isAccepted("<a \"><b" + attributes(count, "a", "'") + "/>"));
    }
}

TEST(HostileXml, VeryManyNamespacesAreRefused) {
    EXPECT_FALSE(isAccepted("<a" + attributes(20'000, "xmlns:n", "urn:x") + "/>"));
    EXPECT_FALSE(isAccepted(inUTF16("<a" + attributes(20'000, "xmlns:n", "urn:x") + "/>")));

    std::string nested;
    for (int level = 0; level < 200; ++level)
        nested += "<a" + attributes(200, "xmlns:n" + std::to_string(level) + "-", "urn:x") + ">";
    EXPECT_FALSE(isAccepted(nested + times(200, "</a>")));
}

TEST(HostileXml, NamespacesAreNotSoughtWithoutEnd) {
    std::string prefixed = "<n0:b";
    for (int i = 0; i < 250; ++i)
        prefixed += " n0:x" + std::to_string(i) + "=''";
    const std::string deep = "<a" + attributes(100, "xmlns:n", "urn:x") + ">" + times(200, "<a>");
    const std::string end = times(201, "</a>");

    EXPECT_TRUE(isAccepted(deep + times(100, prefixed + "/>") + end));
    EXPECT_FALSE(isAccepted(deep + times(2'000, prefixed + "/>") + end));
}

TEST(HostileXml, VeryManyDeclaredAttributesAreRefused) {
    std::string list;
    for (int i = 0; i < 3'000; ++i)
        list += "\nx" + std::to_string(i) + " CDATA ''";
    EXPECT_FALSE(isAccepted("<!DOCTYPE a [<!ATTLIST a" + list + ">]><a/>"));
}

TEST(HostileXml, AnEndlessDocumentTypeIsRefused) {
    EXPECT_FALSE(isAccepted("<!DOCTYPE a [<!ATTLIST a b NOTATION (n0" + times(100'000, "|n") +
                            ") #IMPLIED>]><a/>"));
    EXPECT_FALSE(isAccepted("<!DOCTYPE a [<!ENTITY % p \"<!ELEMENT a (" + times(20'000, "b|") +
                            "c)>\">" + times(2'000, "%p;") + "]><a/>"));
}

TEST(HostileXml, LongTextAndValuesAreNoReasonToRefuse) {
    EXPECT_TRUE(isAccepted("<a x='" + times(1'000'000, "=\"> ") + "'/>"));
    EXPECT_TRUE(isAccepted("<a>" + times(1'000'000, "x='' >") + "</a>"));
    EXPECT_TRUE(isAccepted("<a><!--" + times(100'000, "<b x='' ") + "--></a>"));
    EXPECT_TRUE(isAccepted("<a><![CDATA[" + times(100'000, "<b x='' ") + "]]></a>"));
    EXPECT_TRUE(isAccepted("<a><?p " + times(100'000, "<b x='' ") + "?></a>"));
}

TEST(HostileXml, DeepDocumentsAreRefused) {
    EXPECT_TRUE(isAccepted(times(200, "<a>") + times(200, "</a>")));
    EXPECT_FALSE(isAccepted(times(50'000, "<a>") + times(50'000, "</a>")));
}

TEST(HostileXml, EntityBombsAreRefused) {
    EXPECT_FALSE(isAccepted(laughs(">&e19;</a>")));
    EXPECT_FALSE(isAccepted(laughs(" x='&e19;'/>")));
    EXPECT_FALSE(isAccepted("<!DOCTYPE a [<!ENTITY e '&f;'><!ENTITY f '&e;'>]><a>&e;</a>"));
    EXPECT_FALSE(isAccepted("<!DOCTYPE a [<!ENTITY e '&f;'><!ENTITY f '&e;'>]><a x='&e;'/>"));

    const std::string big = "<!DOCTYPE a [<!ENTITY e '" + times(50'000, "x") + "'>]><a";
    EXPECT_TRUE(isAccepted(big + ">" + times(10, "&e;") + "</a>"));
    EXPECT_FALSE(isAccepted(big + ">" + times(10'000, "&e;") + "</a>"));
    EXPECT_FALSE(isAccepted(big + " x='" + times(10'000, "&e;") + "'/>"));
}

TEST(HostileXml, AttributesWithinAnEntityAreBounded) {
    EXPECT_FALSE(
        isAccepted("<!DOCTYPE a [<!ENTITY e '<b" + attributes(5'000) + "/>'>]><a>&e;</a>"));
}

TEST(HostileXml, ADocumentOfManyNodesIsRefusedBeforeItTakesTheMemory) {
    EXPECT_FALSE(isAccepted("<a>" + times(5'000'000, "<!---->x") + "</a>"));
    EXPECT_FALSE(isAccepted("<a>" + times(5'000'000, "<?p?>") + "</a>"));
    EXPECT_FALSE(isAccepted("<a>" + times(20'000, "<b" + attributes(200) + "/>") + "</a>"));
}

TEST(HostileXml, AnExpressionOutOfABookIsBounded) {
    std::string text = "<a>";
    for (int i = 0; i < 20'000; ++i)
        text += "<b id='aaaaaaaaaaaaaaaaaa'>aaaaaaaaaaaaaaaaaaaaaaaaaaaaaaa</b>";
    const auto book = document(text + "</a>");
    ASSERT_TRUE(book);

    for (const char* test :
         {"/ = //b", "//b = //b", "contains(/, concat(/, 'b'))", "translate(/, /, /)",
          "count(//b[count(//b) > 3]) > 2", "concat(/,/,/,/,/,/,/,/,/,/,/,/,/,/,/,/,/,/,/)"}) {
        const std::string expression = "/a/b[@id='x' or " + std::string(test) + "]";
        EXPECT_FALSE(book->evaluate(nullptr, expression).evaluated) << test;
    }
    EXPECT_FALSE(book->evaluate(nullptr, times(20'000, "(")).evaluated);
    EXPECT_FALSE(book->evaluate(nullptr, times(4'000, "(")).evaluated);
    EXPECT_FALSE(book->evaluate(nullptr, times(4'000, "-") + "1").evaluated);
}

TEST(HostileXml, ALookupInALongListIsEvaluated) {
    std::string text = "<a>";
    for (int i = 0; i < 60'000; ++i)
        text += "\n<b id='same'/>";
    text += "<b id='last'>found</b></a>";
    const auto book = document(text);
    ASSERT_TRUE(book);

    const XPathResult last = book->evaluate(nullptr, "/a/b[@id='last']");
    ASSERT_TRUE(last.first);
    EXPECT_EQ(book->stringValue(last.first->node), "found");
    EXPECT_TRUE(book->evaluate(nullptr, "/a/b[@id='same']").first);
}

/// How many of a document's damaged copies still parse. Those are asked for all that they hold.
int readableAfterDamage(std::string_view good, std::size_t rounds) {
    int readable = 0;
    std::uint32_t random = 1;
    const auto next = [&](std::size_t limit) {
        random = random * 1664525 + 1013904223;
        return (random >> 8) % limit;
    };
    for (std::size_t round = 0; round < rounds; ++round) {
        std::string bad(good);
        for (std::size_t changes = 1 + next(3); changes > 0; --changes) {
            const std::size_t place = next(bad.size());
            if (next(2) == 0)
                bad[place] = static_cast<char>(next(256));
            else
                bad.insert(place, good, next(good.size()), next(16));
        }
        const auto book = document(bad);
        if (!book)
            continue;
        ++readable;
        for (const char* expression :
             {"/*", "/a/b[@y='x']", "//@*", "//text()", "//namespace::*"}) {
            const XPathResult found = book->evaluate(nullptr, expression);
            if (found.first)
                (void)book->stringValue(found.first->node);
        }
    }
    return readable;
}

TEST(HostileXml, DamagedDocumentsEndWell) {
    constexpr std::string_view good =
        "<?xml version='1.0'?><!DOCTYPE a [<!ENTITY e 'x&f;'><!ENTITY f '&#38;#60;<i>y</i>'>"
        "<!ENTITY % p '<!ENTITY g \"z\">'>%p;<!ATTLIST b x CDATA 'd' y ID #IMPLIED>"
        "<!ENTITY s SYSTEM 'file:///nowhere'>]><a xmlns:n='urn:n'>&e;<b y='&g;&amp;' n:z=''/>"
        "<n:c xmlns='urn:c'><!-- c --><?p i?><![CDATA[<]]>&s;&e;</n:c></a>";
    ASSERT_TRUE(isAccepted(good));

    EXPECT_GT(readableAfterDamage(good, testRounds(5'000)), 0);
}

}  // namespace
}  // namespace parvel::testing
