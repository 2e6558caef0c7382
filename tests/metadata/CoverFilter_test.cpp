#include "parvel/metadata/CoverFilter.h"

#include <gtest/gtest.h>

#include "tests/support/Records.h"
#include "tests/support/RefusingDigest.h"

namespace parvel::testing {
namespace {

Data coverBytes(std::string_view text) {
    return Data::copyOf(text);
}

/// SHA-256 of "abc" (FIPS 180-4, appendix).
constexpr std::array<std::uint8_t, 32> digestOfABC = {
    0xBA, 0x78, 0x16, 0xBF, 0x8F, 0x01, 0xCF, 0xEA, 0x41, 0x41, 0x40, 0xDE, 0x5D, 0xAE, 0x22, 0x23,
    0xB0, 0x03, 0x61, 0xA3, 0x96, 0x17, 0x7A, 0x9C, 0xB4, 0x10, 0xFF, 0x61, 0xF2, 0x00, 0x15, 0xAD};

class HashOf {
public:
    explicit HashOf(std::uint64_t hash) : m_hash(hash) {}
    std::uint64_t operator()(const Data&) const { return m_hash; }

private:
    std::uint64_t m_hash;
};

TEST(CoverFilter, RefusesNothingAsShipped) {
    const CoverFilter shipped;

    EXPECT_FALSE(shipped.refuses(coverBytes("abc")));
    EXPECT_FALSE(shipped.refuses(Data()));
}

TEST(CoverFilter, RefusesTheImageOfTheRefusedHash) {
    CoverFilter filter;
    filter.hostHash = HashOf(153495661);

    EXPECT_TRUE(filter.refuses(coverBytes("abc")));
}

TEST(CoverFilter, LetsTheImageOfAnyOtherHashPass) {
    CoverFilter filter;
    filter.hostHash = HashOf(153495660);

    EXPECT_FALSE(filter.refuses(coverBytes("abc")));
}

TEST(CoverFilter, NamesTheRefusedHashInHexadecimalToo) {
    EXPECT_EQ(CoverFilter::refusedHash, 0x0926286Du);
}

TEST(CoverFilter, RefusesTheImageOfARefusedDigest) {
    CoverFilter filter;
    filter.refusedImages = {{{}, 3}, {digestOfABC, 3}};

    EXPECT_TRUE(filter.refuses(coverBytes("abc")));
}

TEST(CoverFilter, RefusesAnImageInSeveralRanges) {
    CoverFilter filter;
    filter.refusedImages = {{digestOfABC, 3}};
    const Data parts[] = {coverBytes("a"), coverBytes("bc")};

    EXPECT_TRUE(filter.refuses(Data::joining(parts)));
}

TEST(CoverFilter, LetsTheImageOfAnyOtherDigestPass) {
    CoverFilter filter;
    filter.refusedImages = {{digestOfABC, 3}};

    EXPECT_FALSE(filter.refuses(coverBytes("abd")));
}

TEST(CoverFilter, LetsAnImageOfAnotherSizePass) {
    CoverFilter filter;
    filter.refusedImages = {{digestOfABC, 4}, {{}, 3}};

    EXPECT_FALSE(filter.refuses(coverBytes("abc")));
}

TEST(CoverFilter, AsksForTheHashAndTheDigestsBoth) {
    CoverFilter filter;
    filter.hostHash = HashOf(1);
    filter.refusedImages = {{digestOfABC, 3}};

    EXPECT_TRUE(filter.refuses(coverBytes("abc")));
}

TEST(CoverFilter, RefusesNothingWhereTheHostCannotDigest) {
    const RefusingDigest digest;
    CoverFilter filter;
    filter.refusedImages = {{digestOfABC, 3}};

    EXPECT_FALSE(filter.refuses(coverBytes("abc")));
}

/// Puts a filter in force that refuses one image, and the shipped one back.
class RecordWithCover : public ::testing::Test {
protected:
    RecordWithCover() {
        CoverFilter filter;
        filter.hostHash = [](const Data& data) {
            return data == coverBytes("refused") ? CoverFilter::refusedHash : 0;
        };
        setCoverFilter(filter);
    }
    ~RecordWithCover() override { setCoverFilter({}); }

    Data m_refused = coverBytes("refused");
    Data m_other = coverBytes("other");
};

TEST_F(RecordWithCover, KeepsItsCoverWhenARefusedOneIsSet) {
    const MutableAssetPtr record = emptyRecord();
    record->setCoverImageData(&m_other);

    record->setCoverImageData(&m_refused);

    EXPECT_EQ(valueOf(record->coverImageData()), Value(m_other));
}

TEST_F(RecordWithCover, GetsNoRefusedCoverAsItsFirst) {
    const MutableAssetPtr record = emptyRecord();

    record->setCoverImageData(&m_refused);

    EXPECT_EQ(record->coverImageData(), nullptr);
}

TEST_F(RecordWithCover, LosesItsCoverForNull) {
    const MutableAssetPtr record = emptyRecord();
    record->setCoverImageData(&m_other);

    record->setCoverImageData(nullptr);

    EXPECT_EQ(record->coverImageData(), nullptr);
}

}  // namespace
}  // namespace parvel::testing
