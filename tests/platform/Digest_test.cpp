#include "parvel/platform/Digest.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "parvel/platform/linux/DigestOpenSSL.h"
#include "tests/support/AbsentLibrary.h"

namespace parvel::testing {
namespace {

template <std::size_t N>
std::string hexadecimal(const std::optional<std::array<std::uint8_t, N>>& digest) {
    std::string text;
    if (!digest)
        return "none";
    for (std::uint8_t byte : *digest) {
        text += "0123456789abcdef"[byte >> 4];
        text += "0123456789abcdef"[byte & 15];
    }
    return text;
}

TEST(Digest, OfPiecesIsThatOfTheWhole) {
    const std::unique_ptr<Digest::Running> running = Digest::host().beginMD5();
    ASSERT_NE(running, nullptr);
    for (std::string_view piece : {"ab", "", "c"}) {
        const Data data = Data::copyOf(piece);
        std::vector<std::uint8_t> storage;
        running->update(data.contiguous(storage));
    }

    EXPECT_EQ(hexadecimal(running->finish()), "900150983cd24fb0d6963f7d28e17f72");
}

TEST(Digest, OfNothingIsTheStandardOne) {
    EXPECT_EQ(hexadecimal(Digest::host().beginMD5()->finish()), "d41d8cd98f00b204e9800998ecf8427e");
    EXPECT_EQ(hexadecimal(Digest::host().sha256(Data())),
              "e3b0c44298fc1c149afbf4c8996fb92427ae41e4649b934ca495991b7852b855");
}

TEST(Digest, SHA256TakesEveryRange) {
    const Data parts[] = {Data::copyOf("ab"), Data::copyOf("c")};

    EXPECT_EQ(hexadecimal(Digest::host().sha256(Data::joining(parts))),
              "ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad");
}

TEST(Digest, IsNoneWhereItsLibraryIsMissing) {
    const std::unique_ptr<Digest> digest = makeDigestOpenSSL(absentLibrary<host::Libcrypto>);

    EXPECT_EQ(digest->beginMD5(), nullptr);
    EXPECT_EQ(digest->sha256(Data()), std::nullopt);
}

}  // namespace
}  // namespace parvel::testing
