#include "parvel/foundation/Data.h"

#include <gtest/gtest.h>

#include <cstring>
#include <string>

namespace parvel::testing {
namespace {

Data joined(std::initializer_list<std::string_view> texts) {
    std::vector<Data> parts;
    for (std::string_view text : texts)
        parts.push_back(Data::copyOf(text));
    return Data::joining(parts);
}

std::string textOf(const Data& data) {
    std::vector<std::uint8_t> storage;
    return std::string(data.text(storage));
}

TEST(Data, HoldsNoBytesAtFirst) {
    const Data data;

    EXPECT_TRUE(data.empty());
    EXPECT_EQ(data.size(), 0U);
    EXPECT_TRUE(data.ranges().empty());
    EXPECT_EQ(textOf(data), "");
}

TEST(Data, CopiesTheBytesThatItIsGiven) {
    std::string bytes("a\0b", 3);
    const Data data = Data::copyOf(bytes);
    bytes[0] = 'x';

    EXPECT_EQ(textOf(data), std::string("a\0b", 3));
}

TEST(Data, AdoptsABufferWithoutACopy) {
    auto buffer = std::make_unique<std::uint8_t[]>(8);
    std::memcpy(buffer.get(), "abcdefgh", 8);
    const std::uint8_t* address = buffer.get();
    const Data data = Data::adopt(std::move(buffer), 3);

    EXPECT_EQ(textOf(data), "abc");
    EXPECT_EQ(data.ranges().front().data(), address);
}

TEST(Data, AdoptsAnEmptyBufferAsNoBytes) {
    EXPECT_TRUE(Data::adopt(nullptr, 0).ranges().empty());
}

TEST(Data, JoinsPartsInOrderAndSharesTheirRanges) {
    const Data parts[] = {Data::copyOf("ab"), Data(), joined({"c", "d"})};
    const Data data = Data::joining(parts);

    ASSERT_EQ(data.ranges().size(), 3U);
    EXPECT_EQ(data.size(), 4U);
    EXPECT_EQ(data.ranges()[0].data(), parts[0].ranges()[0].data());
    EXPECT_EQ(data.ranges()[2].data(), parts[2].ranges()[1].data());
    EXPECT_EQ(textOf(data), "abcd");
}

TEST(Data, OneRangeIsContiguousWithoutACopy) {
    const Data data = Data::copyOf("abc");
    std::vector<std::uint8_t> storage;

    EXPECT_EQ(data.contiguous(storage).data(), data.ranges().front().data());
    EXPECT_TRUE(storage.empty());
}

TEST(Data, SeveralRangesAreCopiedTogetherEachTime) {
    std::vector<std::uint8_t> storage{1, 2, 3};

    EXPECT_EQ(joined({"ab", "c"}).text(storage), "abc");
    EXPECT_EQ(joined({"d", "e"}).text(storage), "de");
}

TEST(Data, IsEqualHoweverItIsCut) {
    const Data whole = Data::copyOf("abcdef");

    EXPECT_EQ(joined({"ab", "cdef"}), whole);
    EXPECT_EQ(joined({"abcd", "ef"}), joined({"a", "bcde", "f"}));
    EXPECT_EQ(joined({"ab", "cdef"}).hash(), whole.hash());
    EXPECT_EQ(Data(), Data::copyOf(""));
}

TEST(Data, IsNotEqualToOtherBytes) {
    EXPECT_NE(Data::copyOf("abc"), Data::copyOf("abd"));
    EXPECT_NE(Data::copyOf("abc"), Data::copyOf("ab"));
    EXPECT_NE(joined({"ab", "c"}), joined({"a", "bd"}));
}

TEST(Data, HashesLongDataAlikeHoweverItIsCut) {
    const std::string text(1000, 'x');

    EXPECT_EQ(joined({text, "end"}).hash(), Data::copyOf(text + "end").hash());
    EXPECT_NE(Data::copyOf(text).hash(), Data::copyOf(text + "x").hash());
}

}  // namespace
}  // namespace parvel::testing
