#include "parvel/foundation/ErrorOut.h"

#include <gtest/gtest.h>

#include <string>

namespace parvel::testing {
namespace {

template <class Result>
Result failing(ErrorOut error) {
    return fail(error, makeMissingURLError());
}

TEST(ErrorOut, FailingSetsTheErrorWhereItIsAskedFor) {
    std::optional<Error> error;

    EXPECT_FALSE(failing<bool>(&error));
    EXPECT_EQ(error, makeMissingURLError());
    EXPECT_FALSE(failing<bool>(nullptr));
}

TEST(ErrorOut, FailingGivesNoneWhateverTheOptionalHolds) {
    EXPECT_EQ(failing<std::optional<bool>>(nullptr), std::nullopt);
    EXPECT_EQ(failing<std::optional<int>>(nullptr), std::nullopt);
    EXPECT_EQ(failing<std::optional<double>>(nullptr), std::nullopt);
    EXPECT_EQ(failing<std::optional<std::string>>(nullptr), std::nullopt);
    EXPECT_EQ(failing<std::shared_ptr<int>>(nullptr), nullptr);
    EXPECT_EQ(failing<std::unique_ptr<int>>(nullptr), nullptr);
}

}  // namespace
}  // namespace parvel::testing
