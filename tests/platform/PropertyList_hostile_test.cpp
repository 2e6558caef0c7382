#include <gtest/gtest.h>
#include <sys/resource.h>

#include "parvel/platform/MalformedInput.h"
#include "parvel/platform/PropertyList.h"
#include "tests/support/BinaryPropertyListBuilder.h"
#include "tests/support/TestRounds.h"

namespace parvel::testing {
namespace {

enum class Outcome { Value, None, Malformed };

Outcome outcomeOf(std::string_view bytes) {
    try {
        const auto value = PropertyListCodec::host().parse(Data::copyOf(bytes), std::nullopt);
        return value ? Outcome::Value : Outcome::None;
    } catch (const MalformedInput&) {
        return Outcome::Malformed;
    }
}

std::string repeated(std::size_t count, std::string_view piece) {
    std::string text;
    text.reserve(count * piece.size());
    for (std::size_t i = 0; i < count; ++i)
        text += piece;
    return text;
}

std::string nestedXML(std::size_t levels) {
    return "<plist>" + repeated(levels, "<array>") + repeated(levels, "</array>") + "</plist>";
}

std::string nestedBinary(std::size_t levels) {
    BinaryPropertyListBuilder list;
    for (std::size_t level = 1; level < levels; ++level)
        list.addContainer(0xA0, 1, {level});
    return list.addContainer(0xA0, 0, {}).bytes();
}

/// Each list holds the next several times.
std::string sharedLists(std::size_t levels, std::size_t times, std::string_view leaf) {
    BinaryPropertyListBuilder list;
    for (std::size_t level = 1; level <= levels; ++level)
        list.addContainer(0xA0, times, std::vector<std::uint64_t>(times, level));
    return list.add(leaf).bytes();
}

TEST(HostilePropertyList, NestingIsReadUpToTheLimit) {
    EXPECT_EQ(outcomeOf(nestedXML(512)), Outcome::Value);
    EXPECT_EQ(outcomeOf(nestedXML(513)), Outcome::Malformed);
    EXPECT_EQ(outcomeOf(nestedXML(200'000)), Outcome::Malformed);
    EXPECT_EQ(outcomeOf(nestedBinary(512)), Outcome::Value);
    EXPECT_EQ(outcomeOf(nestedBinary(513)), Outcome::Malformed);
    EXPECT_EQ(outcomeOf(nestedBinary(60'000)), Outcome::Malformed);
}

TEST(HostilePropertyList, AListThatHoldsItselfIsMalformed) {
    EXPECT_EQ(outcomeOf(BinaryPropertyListBuilder{}.addContainer(0xA0, 1, {0}).bytes()),
              Outcome::Malformed);
    EXPECT_EQ(outcomeOf(BinaryPropertyListBuilder{}
                            .addContainer(0xA0, 3, {1, 1, 1})
                            .addContainer(0xD0, 2, {2, 2, 0, 1})
                            .add("\x51k")
                            .bytes()),
              Outcome::Malformed);
}

TEST(HostilePropertyList, SharedListsAreBounded) {
    EXPECT_EQ(outcomeOf(sharedLists(3, 2, "\x51x")), Outcome::Value);
    EXPECT_EQ(outcomeOf(sharedLists(60, 2, "\x51x")), Outcome::Malformed);
    EXPECT_EQ(outcomeOf(sharedLists(4, 1'000, "\x51x")), Outcome::Malformed);
    EXPECT_EQ(outcomeOf(sharedLists(1, 400'000, "\x51x")), Outcome::Value);
    EXPECT_EQ(outcomeOf(sharedLists(1, 600'000, "\x51x")), Outcome::Malformed);
}

TEST(HostilePropertyList, SharedTextIsBounded) {
    const std::string text =
        "\x5F\x12" + bigEndianBytes(1'000'000, 4) + std::string(1'000'000, 'x');
    EXPECT_EQ(outcomeOf(sharedLists(1, 4, text)), Outcome::Value);
    EXPECT_EQ(outcomeOf(sharedLists(1, 100'000, text)), Outcome::Malformed);
}

TEST(HostilePropertyList, ManySmallValuesAreBounded) {
    EXPECT_EQ(outcomeOf("<array>" + repeated(499'999, "<true/>") + "</array>"), Outcome::Value);
    EXPECT_EQ(outcomeOf("<array>" + repeated(500'000, "<true/>") + "</array>"), Outcome::Malformed);
}

TEST(HostilePropertyList, EntityBombsAreRefused) {
    std::string bomb = "<!DOCTYPE plist [<!ENTITY e0 'lol'>";
    for (int i = 1; i < 20; ++i)
        bomb += "<!ENTITY e" + std::to_string(i) + " '" +
                repeated(10, "&e" + std::to_string(i - 1) + ";") + "'>";
    EXPECT_EQ(outcomeOf(bomb + "]><string>&e19;</string>"), Outcome::None);
    EXPECT_EQ(outcomeOf(bomb + "]><string x='&e19;'/>"), Outcome::None);
    EXPECT_EQ(outcomeOf("<!DOCTYPE plist [<!ENTITY e '" + repeated(50'000, "x") + "'>]><string>" +
                        repeated(100'000, "&e;") + "</string>"),
              Outcome::None);
    EXPECT_EQ(outcomeOf("<!DOCTYPE plist [<!ENTITY e '&f;'><!ENTITY f '&e;&e;'>]>"
                        "<string>&e;</string>"),
              Outcome::None);
}

TEST(HostilePropertyList, VeryManyAttributesAreRefused) {
    std::string attributes;
    for (int i = 0; i < 100'000; ++i)
        attributes += " a" + std::to_string(i) + "=''";
    EXPECT_EQ(outcomeOf("<dict" + attributes + "/>"), Outcome::None);
    EXPECT_EQ(outcomeOf("<!DOCTYPE plist [<!ATTLIST dict" + attributes + ">]><dict/>"),
              Outcome::None);
}

TEST(HostilePropertyList, LargeTextIsNoReasonToRefuse) {
    EXPECT_EQ(outcomeOf("<string>" + std::string(15'000'000, 'x') + "</string>"), Outcome::Value);
    EXPECT_EQ(outcomeOf("<data>" + std::string(12'000'000, 'A') + "</data>"), Outcome::Value);
}

TEST(HostilePropertyList, BombsTakeLittleMemory) {
    const auto peakKilobytes = [] {
        rusage usage{};
        getrusage(RUSAGE_SELF, &usage);
        return usage.ru_maxrss;
    };
    const std::string text =
        "\x5F\x12" + bigEndianBytes(1'000'000, 4) + std::string(1'000'000, 'x');
    const std::string shared = sharedLists(1, 200'000, text);
    const std::string nested = sharedLists(60, 60, "\x09");
    const long before = peakKilobytes();

    EXPECT_EQ(outcomeOf(shared), Outcome::Malformed);
    EXPECT_EQ(outcomeOf(nested), Outcome::Malformed);

    EXPECT_LT(peakKilobytes() - before, 128 * 1024);
}

constexpr std::string_view kSmallXML =
    "<?xml version=\"1.0\" encoding=\"UTF-8\"?><!DOCTYPE plist PUBLIC \"-//Apple//DTD PLIST 1.0//EN\""
    " \"http://www.apple.com/DTDs/PropertyList-1.0.dtd\" [<!ENTITY e \"x\">]><plist version=\"1.0\">"
    "<dict><key>a&e;&#233;</key><array><integer>-0x1F</integer><real>1.5e3</real><true/>"
    "<date>2001-01-01T00:00:00Z</date><data>TWE=</data><string><![CDATA[<]]></string></array>"
    "</dict><!-- end --></plist>";

std::string smallBinary() {
    return BinaryPropertyListBuilder{.offsetSize = 1, .referenceSize = 1}
        .add("\xD2\x01\x02\x03\x04")
        .add(
            "\x51"
            "a")
        .add(std::string("\x61\x00\xE9", 3))
        .add("\xA6\x05\x06\x07\x08\x09\x0A")
        .add("\x81\x01\x02")
        .add("\x10\x05")
        .add("\x13" + bigEndianBytes(~0ULL, 8))
        .add("\x23" + bigEndianBytes(0x3FF8000000000000, 8))
        .add("\x33" + bigEndianBytes(0x41B0000000000000, 8))
        .add("\x43xyz")
        .add(
            "\x5F\x10\x10"
            "0123456789ABCDEF")
        .bytes();
}

/// Ends in a value, none or MalformedInput, whatever becomes of the bytes; a sanitizer sees the
/// rest. Returns how many gave a value.
int mutate(const std::string& good, std::size_t rounds) {
    int values = 0;
    for (std::size_t size = 0; size < good.size(); ++size)
        values += outcomeOf(good.substr(0, size)) == Outcome::Value;
    for (std::size_t place = 0; place < good.size(); ++place) {
        for (const int change : {0x01, 0x20, 0x80, 0xFF}) {
            std::string bad = good;
            bad[place] = static_cast<char>(bad[place] ^ change);
            values += outcomeOf(bad) == Outcome::Value;
        }
    }
    std::uint32_t random = 1;
    const auto next = [&](std::size_t limit) {
        random = random * 1664525 + 1013904223;
        return (random >> 8) % limit;
    };
    for (std::size_t round = 0; round < rounds; ++round) {
        std::string bad = good;
        for (std::size_t changes = 1 + next(4); changes > 0; --changes)
            bad[next(bad.size())] = static_cast<char>(next(256));
        if (next(4) == 0)
            bad.erase(next(bad.size()), 1 + next(8));
        values += outcomeOf(bad) == Outcome::Value;
    }
    return values;
}

TEST(HostilePropertyList, DamagedXMLEndsWell) {
    ASSERT_EQ(outcomeOf(kSmallXML), Outcome::Value);

    const int values = mutate(std::string(kSmallXML), testRounds(2'000));

    EXPECT_GT(values, 0);
}

TEST(HostilePropertyList, DamagedBinaryEndsWell) {
    ASSERT_EQ(outcomeOf(smallBinary()), Outcome::Value);

    const int values = mutate(smallBinary(), testRounds(20'000));

    EXPECT_GT(values, 0);
}

}  // namespace
}  // namespace parvel::testing
