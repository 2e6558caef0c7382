#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <vector>

#include "parvel/platform/linux/PrefixCode.h"

namespace parvel::testing {
namespace {

using ::testing::ElementsAre;

std::vector<int> codeLengths(const std::vector<std::uint32_t>& frequencies, unsigned longest) {
    const PrefixCode code = prefixCodeFor(frequencies, longest);
    return {code.lengths.begin(),
            code.lengths.begin() + static_cast<std::ptrdiff_t>(frequencies.size())};
}

/// How much of all codes that are possible is taken; 1 for a complete code.
double sharesTaken(const std::vector<int>& lengths) {
    double taken = 0;
    for (const int length : lengths)
        taken += length == 0 ? 0 : 1.0 / (1 << length);
    return taken;
}

TEST(PrefixCode, IsShorterForWhatOccursMoreOften) {
    EXPECT_THAT(codeLengths({45, 13, 12, 16, 9, 5}, 15), ElementsAre(1, 3, 3, 3, 4, 4));
}

TEST(PrefixCode, LeavesOutWhatNeverOccurs) {
    EXPECT_THAT(codeLengths({0, 3, 0, 3, 1}, 15), ElementsAre(0, 2, 0, 1, 2));
}

TEST(PrefixCode, NumbersTheCodesOfOneLengthInOrderFromTheHighestBit) {
    const PrefixCode code = prefixCodeFor(std::vector<std::uint32_t>{1, 4, 2, 1}, 15);

    EXPECT_THAT(std::vector<int>(code.codes.begin(), code.codes.begin() + 4),
                ElementsAre(0b011, 0b0, 0b01, 0b111));
}

TEST(PrefixCode, HasTwoCodesWhereLessOccurs) {
    EXPECT_THAT(codeLengths({0, 0, 0}, 15), ElementsAre(1, 1, 0));
    EXPECT_THAT(codeLengths({0, 0, 9}, 15), ElementsAre(1, 0, 1));
    EXPECT_THAT(codeLengths({9, 0, 0}, 15), ElementsAre(1, 1, 0));
}

TEST(PrefixCode, IsCompleteAndNoLongerThanTheLimit) {
    std::vector<std::uint32_t> doubling;
    for (int i = 0; i < 19; ++i)
        doubling.push_back(1U << i);

    for (const unsigned limit : {5U, 7U, 15U}) {
        const std::vector<int> lengths = codeLengths(doubling, limit);
        EXPECT_LE(*std::max_element(lengths.begin(), lengths.end()), static_cast<int>(limit));
        EXPECT_EQ(sharesTaken(lengths), 1);
    }
}

TEST(PrefixCode, HoldsEverySymbolThatThereMayBe) {
    EXPECT_EQ(sharesTaken(codeLengths(std::vector<std::uint32_t>(288, 200), 15)), 1);
}

}  // namespace
}  // namespace parvel::testing
