#include <gtest/gtest.h>

#include <array>
#include <random>
#include <string>
#include <vector>

#include "parvel/platform/linux/LocationPath.h"
#include "parvel/platform/linux/XPathTree.h"
#include "parvel/platform/linux/XmlElementTree.h"
#include "tests/support/TestRounds.h"

// The list of elements and libxml2's tree answer every plain location path alike.

namespace parvel::testing {
namespace {

constexpr std::string_view kPrologue =
    "declare namespace o=\"urn:o\"; declare namespace p=\"urn:p\"; ";

struct BothTrees {
    std::optional<XmlElementTree> elements;
    std::optional<XPathTree> nodes;
};

BothTrees bothTreesOf(std::string_view text) {
    const Data bytes = Data::copyOf(text);
    BothTrees both{XmlElementTree::parse(bytes), std::nullopt};
    if (std::optional<XmlTree> tree = XmlTreeParse(bytes).run())
        both.nodes.emplace(std::move(*tree));
    return both;
}

std::string pickedFrom(std::mt19937& random, const std::vector<std::string>& choices) {
    return choices[random() % choices.size()];
}

void appendElement(std::mt19937& random, std::string& text, int depth) {
    const std::string name = pickedFrom(random, {"a", "b", "o:a", "o:b", "p:a", "x:a", "u:a"});
    text += "<" + name;
    if (random() % 4 == 0)
        text += pickedFrom(random, {" xmlns='urn:o'", " xmlns=''", " xmlns:o='urn:p'"});
    if (random() % 2 == 0)
        text += pickedFrom(random, {" id='1'", " id='2'", " id='&amp;&#x9;2'", " o:id='1'",
                                    " u:id='1'", " u:id='2' id='1'"});
    if (random() % 4 == 0)
        text += pickedFrom(random, {" name='1'", " xml:id='n1'", " p:name='2'"});
    text += ">";
    for (unsigned children = random() % 5; depth > 0 && children > 0; --children) {
        text += pickedFrom(random, {"", " t ", "<![CDATA[<c>]]>", "<!-- c -->", "&e;", "<?p i?>"});
        appendElement(random, text, depth - 1);
    }
    text += pickedFrom(random, {"", "end", "&lt;\r\n", "&e;"}) + "</" + name + ">";
}

std::string randomDocument(std::mt19937& random) {
    std::string text =
        "<!DOCTYPE r [<!ENTITY e 'entity <i>text</i>'>"
        "<!ATTLIST a name CDATA 'default'>]>"
        "<r xmlns:o='urn:o' xmlns:p='urn:p' xmlns:x='urn:x'>";
    for (int i = 0; i < 4; ++i)
        appendElement(random, text, 3);
    return text + "</r>";
}

std::string randomPath(std::mt19937& random) {
    std::string path = pickedFrom(random, {"", "", "", "/", "/r/", "/r[1]/"});
    const unsigned steps = 1 + random() % 3;
    for (unsigned i = 0; i < steps; ++i) {
        path += (i > 0 ? "/" : "") + pickedFrom(random, {"a", "b", "a", "o:a", "o:b", "p:a"});
        for (unsigned predicates = random() % 4 / 2; predicates > 0; --predicates)
            path += pickedFrom(random, {"[1]", "[2]", "[@id='1']", "[ @id = \"2\" ]",
                                        "[@name='default']", "[@id='&\t2']"});
    }
    return path + pickedFrom(random, {"", "", "/@id", "/@name"});
}

/// What a node found says of itself: its kind, its name and its string value.
std::string answerOf(const XmlElementTree& tree, const void* node) {
    if (const auto* element = tree.elementAt(node))
        return "element " + std::string(element->name) + " " +
               std::to_string(tree.indexOf(*element)) + " " + std::string(tree.text(*element));
    if (const auto* attribute = tree.attributeAt(node))
        return "attribute " + std::to_string(tree.indexOf(tree.ownerOf(*attribute))) + " " +
               std::string(attribute->value);
    return "none";
}

std::string answerOf(const XPathTree& tree, const XmlElementTree& elements, const xmlNode* node) {
    if (!node)
        return "none";
    const bool isElement = node->type == XML_ELEMENT_NODE;
    const xmlNode* owner = isElement ? node : node->parent;
    std::uint32_t index = 0;
    while (index < elements.elements().size() && tree.elementAt(index) != owner)
        ++index;
    const std::string value = XPathTree::stringValue(node);
    if (!isElement)
        return "attribute " + std::to_string(index) + " " + value;
    return "element " + std::string(reinterpret_cast<const char*>(node->name)) + " " +
           std::to_string(index) + " " + value;
}

TEST(XPathAgreement, PlainPathsGiveTheSameNodeInBothTrees) {
    std::mt19937 random(20011);
    int found = 0;
    for (std::size_t round = 0; round < testRounds(60); ++round) {
        const std::string text = randomDocument(random);
        BothTrees both = bothTreesOf(text);
        ASSERT_TRUE(both.elements && both.nodes) << text;
        for (int i = 0; i < 20; ++i) {
            const std::string expression = std::string(kPrologue) + randomPath(random);
            const XPathText split = splitPrologue(expression);
            const auto path = LocationPath::parse(split.expression, split.bindings);
            const auto index =
                static_cast<std::uint32_t>(random() % both.elements->elements().size());
            const auto* context = i % 4 == 0 ? nullptr : &both.elements->elements()[index];
            const xmlNode* node =
                context ? both.nodes->elementAt(index) : both.nodes->documentNode();
            const XPathTree::Result expected = both.nodes->evaluate(node, split);
            ASSERT_TRUE(expected.evaluated) << expression;
            if (!path)
                continue;
            const std::string answer =
                answerOf(*both.elements, path->firstIn(*both.elements, context));
            ASSERT_EQ(answer, answerOf(*both.nodes, *both.elements, expected.first))
                << expression << "\n"
                << text;
            found += answer != "none";
        }
    }
    EXPECT_GT(found, 40);
}

TEST(XPathAgreement, BothTreesAcceptTheSameDamagedDocuments) {
    std::mt19937 random(77);
    int accepted = 0;
    for (std::size_t round = 0; round < testRounds(200); ++round) {
        std::string text = randomDocument(random);
        for (unsigned changes = random() % 3; changes > 0; --changes)
            text[random() % text.size()] = "<>&;'\" x]/"[random() % 10];
        const BothTrees both = bothTreesOf(text);
        ASSERT_EQ(both.elements.has_value(), both.nodes.has_value()) << text;
        accepted += both.nodes.has_value();
    }
    EXPECT_GT(accepted, 10);
}

TEST(XPathSplitter, SplitsEachTextAsThoughItWereTheFirst) {
    XPathSplitter splitter;
    for (const std::string_view text :
         {"a", "declare namespace o='urn:o'; /o:a", "declare namespace o='urn:o'; /o:b", "b",
          "declare namespace o='urn:o'; declare namespace p='urn:p'; a",
          "declare namespace o='urn:o'; declare namespace p='urn:q'; a",
          "declare namespace o='urn:o';  declare namespace p", "declare namespace o='urn:o';", "",
          "declare namespace o='urn:o';declare namespace p='urn:p';"}) {
        const XPathText expected = splitPrologue(text);
        const XPathText& split = splitter.split(text);
        EXPECT_EQ(split.prologue, expected.prologue) << text;
        EXPECT_EQ(split.bindings, expected.bindings) << text;
        EXPECT_EQ(split.expression, expected.expression) << text;
    }
}

TEST(LocationPath, LeavesEverythingElseToXPath) {
    const LocationPath::Bindings bindings{{"o", "urn:o"}, {"none", ""}};
    for (const std::string_view expression : {"",
                                              "/",
                                              "//a",
                                              "a//b",
                                              "*",
                                              "@*",
                                              ".",
                                              "..",
                                              "a|b",
                                              "a[",
                                              "a[]",
                                              "a[0]",
                                              "a[1",
                                              "a[@id]",
                                              "a[@id='1' or @id='2']",
                                              "a[@o:id='1']",
                                              "a[last()]",
                                              "text()",
                                              "child::a",
                                              "q:a",
                                              "none:a",
                                              "o:",
                                              ":a",
                                              "1a",
                                              "a b",
                                              "@id/a",
                                              "@id[1]",
                                              "@o:id",
                                              "a/",
                                              "a[99999999999]",
                                              "a[@id='\x01']",
                                              "a[@id='\xC3\xA9']",
                                              "\xC3\xA9",
                                              "a.b",
                                              "a[1.5]",
                                              "a[@id='1'']"})
        EXPECT_FALSE(LocationPath::parse(expression, bindings)) << expression;
    using namespace std::string_view_literals;
    EXPECT_FALSE(LocationPath::parse("a\0b"sv, bindings));
    EXPECT_FALSE(LocationPath::parse("a/a/a/a/a/a/a/a/a/a/a/a/a/a/a/a/a", bindings));
    EXPECT_TRUE(LocationPath::parse("/ o:a [1] [ @id = 'x' ] / b / @c ", bindings));
}

}  // namespace
}  // namespace parvel::testing
