#include <cmath>
#include <cstring>
#include <limits>

#include <gtest/gtest.h>

#include "parvel/foundation/Error.h"
#include "parvel/platform/MalformedInput.h"
#include "parvel/platform/PropertyList.h"
#include "tests/support/BinaryPropertyListBuilder.h"

namespace parvel::testing {
namespace {

using Builder = BinaryPropertyListBuilder;

std::optional<Value> readBinary(std::string_view bytes) {
    return PropertyListCodec::host().parse(Data::copyOf(bytes), std::nullopt);
}

std::optional<Value> readObject(std::string_view object) {
    return readBinary(Builder{}.add(object).bytes());
}

std::string object(std::initializer_list<int> bytes) {
    std::string text;
    for (const int byte : bytes)
        text += static_cast<char>(byte);
    return text;
}

/// A float or double's bytes, as an integer of its size.
std::string realObject(double value) {
    std::uint64_t bits = 0;
    std::memcpy(&bits, &value, sizeof bits);
    return '\x23' + bigEndianBytes(bits, 8);
}

std::string dateObject(double value) {
    std::string bytes = realObject(value);
    bytes[0] = '\x33';
    return bytes;
}

TEST(BinaryPropertyList, ReadsEveryKindAsAnotherWriterMadeIt) {
    // Made by Python's plistlib.
    constexpr std::string_view hex =
        "62706c6973743030df100f0102030405060708090a0b0c0d0e0f101112131415191a1b1c1d1e1f2021536269"
        "67546461746155656d6f6a6955656d707479546c617465546c697374536d696e556d696e7573526e6f536f6c"
        "64547265616c55736d616c6c5474657874537569645379657314000000000000000080000000000000014400"
        "0102ff63d83dde0000e95033422d63c37f000000a31617181001a0d013800000000000000013ffffffffffff"
        "fffb0833c1f07c65e01000002340145c28f5c28f5c100555412026204280070908292d32383e43484c525559"
        "5e64696d7182878e8f989c9e9fa0a9b2b3bcc5c7cdcf00000000000001010000000000000022000000000000"
        "000000000000000000d0";
    std::string bytes;
    for (std::size_t i = 0; i < hex.size(); i += 2)
        bytes += static_cast<char>(std::stoi(std::string(hex.substr(i, 2)), nullptr, 16));
    const std::uint8_t data[] = {0, 1, 2, 255};

    EXPECT_EQ(readBinary(bytes),
              Value(Dictionary{
                  {"text", "A & B"},
                  {"emoji", "\xF0\x9F\x98\x80\xC3\xA9"},
                  {"yes", Number::boolean(true)},
                  {"no", Number::boolean(false)},
                  {"small", Number::signedInteger(5)},
                  {"minus", Number::signedInteger(-5)},
                  {"big", Number::unsignedInteger((1ULL << 63) + 1)},
                  {"min", Number::signedInteger(std::numeric_limits<std::int64_t>::min())},
                  {"real", Number::real(5.09)},
                  {"old", Date{-4425408001}},
                  {"late", Date{63113904000}},
                  {"data", Data::copyOf(Data::Bytes(data))},
                  {"list", Array{Number::signedInteger(1), Array{}, Dictionary{}}},
                  {"uid", Dictionary{{"CF$UID", Number::signedInteger(7)}}},
                  {"empty", ""},
              }));
}

TEST(BinaryPropertyList, ReadsIntegersOfEverySize) {
    EXPECT_EQ(readObject(object({0x10, 0xFF})), Value(Number::signedInteger(255)));
    EXPECT_EQ(readObject(object({0x11, 0xFF, 0xFE})), Value(Number::signedInteger(65534)));
    EXPECT_EQ(readObject(object({0x12, 0xFF, 0, 0, 0})), Value(Number::signedInteger(4278190080)));
    EXPECT_EQ(readObject('\x13' + bigEndianBytes(~0ULL, 8)), Value(Number::signedInteger(-1)));
    EXPECT_EQ(readObject('\x14' + bigEndianBytes(0, 8) + bigEndianBytes(~0ULL, 8)),
              Value(Number::unsignedInteger(~0ULL)));
    EXPECT_EQ(readObject('\x14' + bigEndianBytes(~0ULL, 8) + bigEndianBytes(1ULL << 63, 8)),
              Value(Number::signedInteger(std::numeric_limits<std::int64_t>::min())));
}

TEST(BinaryPropertyList, RefusesIntegersOutOfRange) {
    EXPECT_FALSE(readObject('\x14' + bigEndianBytes(1, 8) + bigEndianBytes(0, 8)));
    EXPECT_FALSE(readObject('\x14' + bigEndianBytes(~0ULL, 8) + bigEndianBytes(0, 8)));
    EXPECT_FALSE(readObject('\x15' + std::string(32, '\0')));
}

TEST(BinaryPropertyList, ReadsRealsOfBothSizes) {
    EXPECT_EQ(readObject('\x22' + bigEndianBytes(0x3FC00000, 4)), Value(Number::real(1.5)));
    EXPECT_EQ(readObject(realObject(-0.1)), Value(Number::real(-0.1)));
    EXPECT_TRUE(std::isnan(readObject(realObject(std::nan("")))->as<Number>()->doubleValue()));
    EXPECT_FALSE(readObject(object({0x21, 0, 0})));
}

TEST(BinaryPropertyList, ReadsDatesThatATimeCanHold) {
    EXPECT_EQ(readObject(dateObject(-0.5)), Value(Date{-0.5}));
    EXPECT_EQ(readObject(dateObject(1e13)), Value(Date{1e13}));
    EXPECT_FALSE(readObject(dateObject(1.0001e13)));
    EXPECT_FALSE(readObject(dateObject(-1e300)));
    EXPECT_FALSE(readObject(dateObject(std::nan(""))));
    EXPECT_FALSE(readObject(object({0x32, 0, 0, 0, 0})));
}

TEST(BinaryPropertyList, ReplacesLoneHalvesOfSurrogatePairs) {
    EXPECT_EQ(readObject(object({0x62, 0xD8, 0x3D, 0xDE, 0x00})), Value("\xF0\x9F\x98\x80"));
    EXPECT_EQ(readObject(object({0x62, 0xD8, 0x3D, 0, 'a'})), Value("\xEF\xBF\xBD\x61"));
    EXPECT_EQ(readObject(object({0x61, 0xD8, 0x3D})), Value("\xEF\xBF\xBD"));
    EXPECT_EQ(readObject(object({0x62, 0xDE, 0x00, 0xD8, 0x3D})),
              Value("\xEF\xBF\xBD\xEF\xBF\xBD"));
}

TEST(BinaryPropertyList, ReadsSizesThatFollowAsIntegers) {
    EXPECT_EQ(readObject(object({0x5F, 0x10, 3, 'a', 'b', 'c'})), Value("abc"));
    EXPECT_EQ(readObject(object({0x4F, 0x11, 0, 1, 9})), Value(Data::copyOf("\t")));
    EXPECT_EQ(readObject(object({0x5F, 0x13, 0, 0, 0, 0, 0, 0, 0, 1, 'a'})), Value("a"));
    EXPECT_FALSE(readObject(object({0x5F, 0x14, 1, 'a'})));
    EXPECT_FALSE(readObject(object({0x5F, 0x20, 1, 'a'})));
    EXPECT_FALSE(readObject(object({0x5F})));
    EXPECT_FALSE(readObject('\x5F' + object({0x13}) + bigEndianBytes(~0ULL, 8) + "a"));
    EXPECT_FALSE(readObject('\x6F' + object({0x13}) + bigEndianBytes(1ULL << 63, 8) + "ab"));
    EXPECT_FALSE(readObject('\x4F' + object({0x13}) + bigEndianBytes(~0ULL, 8) + "a"));
}

TEST(BinaryPropertyList, ReadsASetAsAList) {
    for (const unsigned kind : {0xA0U, 0xB0U, 0xC0U}) {
        const std::string bytes =
            Builder{}.addContainer(kind, 2, {1, 1}).add(object({0x09})).bytes();
        EXPECT_EQ(readBinary(bytes), Value(Array{Number::boolean(true), Number::boolean(true)}));
    }
}

TEST(BinaryPropertyList, ReadsAUIDOfAnySizeAsADictionary) {
    EXPECT_EQ(readObject('\x87' + bigEndianBytes(~0ULL, 8)),
              Value(Dictionary{{"CF$UID", Number::unsignedInteger(~0ULL)}}));
    EXPECT_EQ(readObject(object({0x82, 1, 0, 0})),
              Value(Dictionary{{"CF$UID", Number::signedInteger(65536)}}));
    EXPECT_FALSE(readObject('\x88' + std::string(9, '\0')));
}

TEST(BinaryPropertyList, TakesTheLastOfSeveralEqualKeys) {
    EXPECT_EQ(readBinary(Builder{}
                             .addContainer(0xD0, 2, {1, 1, 2, 3})
                             .add("\x51k")
                             .add(object({0x08}))
                             .add(object({0x09}))
                             .bytes()),
              Value(Dictionary{{"k", Number::boolean(true)}}));
}

TEST(BinaryPropertyList, RefusesAKeyThatIsNoString) {
    EXPECT_FALSE(readBinary(Builder{}.addContainer(0xD0, 1, {1, 1}).add(object({0x09})).bytes()));
}

TEST(BinaryPropertyList, RefusesObjectsThatTheFormDoesNotHave) {
    for (const int marker : {0x00, 0x01, 0x0F, 0x70, 0x90, 0xE0, 0xF0})
        EXPECT_FALSE(readObject(object({marker, 0, 0}))) << marker;
    EXPECT_FALSE(readObject(object({0x51, 0xE9})));
}

TEST(BinaryPropertyList, ReadsOffsetsAndReferencesOfEverySize) {
    for (std::size_t size = 1; size <= 8; ++size) {
        Builder list{.offsetSize = size, .referenceSize = 9 - size};
        list.addContainer(0xA0, 1, {1}).add("\x51x");
        EXPECT_EQ(readBinary(list.bytes()), Value(Array{"x"})) << size;
    }
}

TEST(BinaryPropertyList, FindsTheTopWhereverItStands) {
    Builder list{.top = 1};
    EXPECT_EQ(readBinary(list.add("\x51x").addContainer(0xA0, 1, {0}).bytes()), Value(Array{"x"}));
}

TEST(BinaryPropertyList, RefusesABrokenTrailer) {
    const std::string good = Builder{}.add("\x51x").bytes();
    ASSERT_TRUE(readBinary(good));
    const auto with = [&](std::size_t place, const std::string& bytes) {
        std::string text = good;
        return text.replace(text.size() - 32 + place, bytes.size(), bytes);
    };

    EXPECT_FALSE(readBinary(with(6, object({0}))));
    EXPECT_FALSE(readBinary(with(6, object({9}))));
    EXPECT_FALSE(readBinary(with(7, object({0}))));
    EXPECT_FALSE(readBinary(with(7, object({255}))));
    EXPECT_FALSE(readBinary(with(8, bigEndianBytes(0, 8))));
    EXPECT_FALSE(readBinary(with(8, bigEndianBytes(2, 8))));
    EXPECT_FALSE(readBinary(with(8, bigEndianBytes(~0ULL, 8))));
    EXPECT_FALSE(readBinary(with(16, bigEndianBytes(1, 8))));
    EXPECT_FALSE(readBinary(with(24, bigEndianBytes(0, 8))));
    EXPECT_FALSE(readBinary(with(24, bigEndianBytes(~0ULL, 8))));
    EXPECT_FALSE(readBinary(with(24, bigEndianBytes(good.size(), 8))));
}

TEST(BinaryPropertyList, RefusesOffsetsAndReferencesThatLeadOutside) {
    std::string text = Builder{.offsetSize = 1}.add("\x51x").bytes();
    for (const int offset : {0, 7, 10, 255}) {
        text[10] = static_cast<char>(offset);
        EXPECT_FALSE(readBinary(text)) << offset;
    }
    EXPECT_FALSE(readBinary(Builder{}.addContainer(0xA0, 1, {1}).bytes()));
    EXPECT_FALSE(readBinary(Builder{}.addContainer(0xA0, 1, {~0U}).bytes()));
}

TEST(BinaryPropertyList, NamesTheURLInItsError) {
    const URL url = URL::fileURLWithPath("/book/Store.plist");
    std::optional<Error> error;

    EXPECT_FALSE(PropertyListCodec::host().parse(Data::copyOf("bplist00"), url, &error));
    EXPECT_EQ(error, makeFileError(PVFileErrorCode::Corrupt, url));
}

}  // namespace
}  // namespace parvel::testing
