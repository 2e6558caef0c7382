#include "parvel/foundation/PVDigest.h"

#include "parvel/platform/Digest.h"
#include "parvel/platform/Service.h"

#include <gtest/gtest.h>

namespace parvel::testing {
namespace {

/// Takes down what it is fed, and fails where it is told to.
class FakeDigest : public Digest {
public:
    explicit FakeDigest(bool begins) : m_begins(begins) {}

    std::unique_ptr<Running> beginMD5() override {
        return m_begins ? std::make_unique<FakeRunning>(updates) : nullptr;
    }

    std::optional<SHA256> sha256(const Data& data) override { return host().sha256(data); }

    std::vector<std::size_t> updates;

private:
    class FakeRunning : public Running {
    public:
        explicit FakeRunning(std::vector<std::size_t>& updates) : m_updates(updates) {}
        void update(Data::Bytes bytes) override { m_updates.push_back(bytes.size()); }
        std::optional<MD5> finish() override { return std::nullopt; }

    private:
        std::vector<std::size_t>& m_updates;
    };

    bool m_begins;
};

Data cut(std::initializer_list<std::string_view> texts) {
    std::vector<Data> parts;
    for (std::string_view text : texts)
        parts.push_back(Data::copyOf(text));
    return Data::joining(parts);
}

TEST(PVDigest, IsUpperCaseHexadecimal) {
    EXPECT_EQ(parvel_MD5String(Data::copyOf("abc")), "900150983CD24FB0D6963F7D28E17F72");
    EXPECT_EQ(parvel_MD5String(Data::copyOf("a")), "0CC175B9C0F1B6A831C399E269772661");
}

TEST(PVDigest, OfNoBytesIsTheStandardOne) {
    EXPECT_EQ(parvel_MD5String(Data()), "D41D8CD98F00B204E9800998ECF8427E");
}

TEST(PVDigest, OfTwoRangesIsThatOfTheirBytes) {
    EXPECT_EQ(parvel_MD5String(cut({"ab", "c"})), parvel_MD5String(Data::copyOf("abc")));
}

TEST(PVDigest, FeedsEachRangeInOneUpdateInOrder) {
    FakeDigest digest(/*begins=*/true);
    const Service<Digest>::Replacement replacement(digest);
    static_cast<void>(parvel_MD5String(cut({"ab", "c", "defg"})));

    EXPECT_EQ(digest.updates, (std::vector<std::size_t>{2, 1, 4}));
}

TEST(PVDigest, IsNoneWhereTheHostRefusesTheAlgorithm) {
    FakeDigest digest(/*begins=*/false);
    const Service<Digest>::Replacement replacement(digest);

    EXPECT_EQ(parvel_MD5String(Data::copyOf("abc")), std::nullopt);
}

TEST(PVDigest, IsNoneWhereTheHostFailsOnTheWay) {
    FakeDigest digest(/*begins=*/true);
    const Service<Digest>::Replacement replacement(digest);

    EXPECT_EQ(parvel_MD5String(Data::copyOf("abc")), std::nullopt);
}

}  // namespace
}  // namespace parvel::testing
