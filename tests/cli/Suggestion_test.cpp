#include <gtest/gtest.h>

#include "cli/Suggestion.h"

namespace parvel::testing {
namespace {

using cli::suggestionFor;
using Known = std::vector<std::string_view>;

TEST(Suggestion, IsTheWordASlipOrTwoAway) {
    const Known known{"move", "remove", "inspect"};
    EXPECT_EQ(suggestionFor("remoev", known), "; do you mean remove?");
    EXPECT_EQ(suggestionFor("inspct", known), "; do you mean inspect?");
    EXPECT_EQ(suggestionFor("imspetc", known), "; do you mean inspect?");
}

TEST(Suggestion, IsTheNearestOfSeveral) {
    EXPECT_EQ(suggestionFor("emove", {"move", "remove"}), "; do you mean move?");
    EXPECT_EQ(suggestionFor("rmove", {"move", "remove"}), "; do you mean move?");
    EXPECT_EQ(suggestionFor("removee", {"move", "remove"}), "; do you mean remove?");
}

TEST(Suggestion, IsTheWordThatIsBegun) {
    EXPECT_EQ(suggestionFor("attr", {"trash", "attributes"}), "; do you mean attributes?");
}

TEST(Suggestion, IsNoneForWordsThatOnlyResembleOneAnother) {
    EXPECT_EQ(suggestionFor("list", {"edit", "pack"}), "");
    EXPECT_EQ(suggestionFor("rm", {"remove"}), "");
    EXPECT_EQ(suggestionFor("frob", {"inspect"}), "");
}

TEST(Suggestion, IsNoneForATextOfAnyLength) {
    EXPECT_EQ(suggestionFor(std::string(1'000'000, 'a'), {"attributes"}), "");
    EXPECT_EQ(suggestionFor("", {"attributes"}), "");
}

}  // namespace
}  // namespace parvel::testing
