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

TEST(ErrorOut, AssignCanSetNone) {
    std::optional<Error> slot = makeMissingURLError();
    assign(&slot, std::nullopt);
    assign(nullptr, std::nullopt);

    EXPECT_EQ(slot, std::nullopt);
}

TEST(ErrorOut, ASlotIsTheCallersOrItsOwn) {
    std::optional<Error> callers;
    ErrorSlot asked(&callers);
    ErrorSlot unasked(nullptr);
    assign(asked.out(), makeMissingURLError());
    assign(unasked.out(), makeNoIdentityError());

    EXPECT_EQ(callers, makeMissingURLError());
    EXPECT_EQ(asked.value(), makeMissingURLError());
    EXPECT_EQ(unasked.value(), makeNoIdentityError());
}

}  // namespace
}  // namespace parvel::testing
