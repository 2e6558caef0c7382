#include <gtest/gtest.h>

#include <random>
#include <string>
#include <vector>

#include "parvel/platform/linux/PropertyListForms.h"
#include "tests/support/PackageDocuments.h"
#include "tests/support/TestRounds.h"

// Whatever is read of a property list in a plain document, libxml2 reads of it, too.

namespace parvel::testing {
namespace {

using ListPieces = std::vector<std::string_view>;

/// Whether the list is a plain one.
bool readsAlike(std::string_view list) {
    const Data bytes = Data::copyOf(list);
    const std::optional<Value> plain = readPlainXMLPropertyList(bytes);
    if (!plain)
        return false;
    const std::optional<Value> guarded = readGuardedXMLPropertyList(bytes);
    if (!guarded)
        ADD_FAILURE() << "read as plain, though it is none: " << list;
    else
        EXPECT_EQ(description(*plain), description(*guarded)) << list;
    return true;
}

std::string_view pieceOf(std::mt19937& random, const ListPieces& pieces) {
    return pieces[random() % pieces.size()];
}

void appendListValue(std::mt19937& random, std::string& list, int depth) {
    static const ListPieces leaves = {"<string>a &amp; b</string>",
                                      "<string/>",
                                      "<string>\xC3\xA9<!-- c -->\r\n</string>",
                                      "<integer>-12</integer>",
                                      "<integer> 0x1F </integer>",
                                      "<real>1.5e3</real>",
                                      "<date>2020-02-29T12:00:00Z</date>",
                                      "<data>\n\tQUJD\n</data>",
                                      "<true/>",
                                      "<false></false>"};
    const unsigned kind = depth > 0 ? random() % 4 : 3;
    if (kind == 0) {
        list += "<dict>\n";
        for (unsigned count = random() % 4; count > 0; --count) {
            list += pieceOf(random, {"<key>a</key>", "<key>b &lt;</key>\n\t", "<key></key>"});
            appendListValue(random, list, depth - 1);
        }
        list += "</dict>";
    } else if (kind == 1) {
        list += "<array>";
        for (unsigned count = random() % 4; count > 0; --count)
            appendListValue(random, list, depth - 1);
        list += "</array>\r\n";
    } else {
        list += pieceOf(random, leaves);
    }
}

std::string madeList(std::mt19937& random) {
    std::string list(
        pieceOf(random, {"", "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n",
                         "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<!DOCTYPE plist PUBLIC "
                         "\"-//X//DTD PLIST 1.0//EN\" \"http://x/PropertyList-1.0.dtd\">\n"}));
    list += pieceOf(random, {"<plist>", "<plist version=\"1.0\">", "<plist xmlns='urn:p'>\n"});
    appendListValue(random, list, 4);
    return list + "</plist>\n";
}

TEST(PropertyListAgreement, LibxmlReadsTheSameOfMadeLists) {
    std::mt19937 random(31);
    std::size_t plain = 0;
    const std::size_t rounds = testRounds(300);
    for (std::size_t round = 0; round < rounds; ++round)
        plain += readsAlike(madeList(random)) ? 1 : 0;
    EXPECT_EQ(plain, rounds);
}

TEST(PropertyListAgreement, LibxmlReadsTheSameOfDamagedLists) {
    static const ListPieces pieces = {
        "<",     ">",        "&",       "x",         "1",      "</dict>",  "<dict>", "<key>k</key>",
        "\xFF",  "<plist>",  "<true/>", "<p:true/>", "</key>", "-",        "]]>",    "<string>",
        "&#65;", "<array/>", "",        "</plist>",  " a=''",  "<!-- -->", "\x01",   "<integer>"};
    std::mt19937 random(32);
    std::size_t plain = 0;
    const std::size_t rounds = testRounds(2000);
    for (std::size_t round = 0; round < rounds; ++round) {
        std::string list = madeList(random);
        for (unsigned changes = 1 + random() % 2; changes > 0; --changes)
            list.replace(random() % list.size(), random() % 3, pieceOf(random, pieces));
        plain += readsAlike(list) ? 1 : 0;
    }
    EXPECT_GT(plain, rounds / 50);
    EXPECT_LT(plain, rounds * 9 / 10);
}

TEST(PropertyListXML, AStoreFileIsAPlainList) {
    EXPECT_TRUE(readsAlike(storeFileText("<key>itemName</key><string>A &amp; B</string>")));
}

TEST(PropertyListXML, WhatTheFormDoesNotKnowIsNoPlainList) {
    for (const std::string_view list :
         {"<x/>", "<plist><x/></plist>", "<plist/>", "<p:plist xmlns:p='u'><true/></p:plist>",
          "<plist><true a='1'/></plist>", "<dict>x</dict>", "<dict><true/></dict>",
          "<dict><key>a</key></dict>", "<plist><true/><true/></plist>", "<true>x</true>",
          "<string><string/></string>", "<integer>1.5</integer>", "<array>x&amp;</array>"})
        EXPECT_FALSE(readsAlike(list)) << list;
}

}  // namespace
}  // namespace parvel::testing
