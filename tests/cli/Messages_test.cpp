#include <gtest/gtest.h>

#include "cli/Messages.h"

namespace parvel::testing {
namespace {

using cli::failureLine;
using cli::Result;

/// A result that failed as damaged content, with what the log said about it.
Result damagedResult(Error::UserInfo info = {}) {
    Result result;
    result.path = "a.pdf";
    result.error = Error(PVFileErrorDomain, 259, std::move(info));
    result.reason = "the file is no PDF document, or a damaged one";
    return result;
}

TEST(Messages, OfDamagedContentHaveTheLogsReason) {
    EXPECT_EQ(failureLine("inspect", damagedResult()),
              "parvel: inspect: a.pdf: the file is no PDF document, or a damaged one "
              "(PVFileErrorDomain 259)\n");
}

TEST(Messages, OfAnErrorWithItsOwnReasonHaveThat) {
    EXPECT_EQ(failureLine("inspect", damagedResult({{std::string(PVLocalizedFailureReasonErrorKey),
                                                     "The helper program can't be started."}})),
              "parvel: inspect: a.pdf: The helper program can't be started "
              "(PVFileErrorDomain 259)\n");
}

TEST(Messages, HaveTheCommandsOwnAdvice) {
    Result result = damagedResult();
    result.error = makeNoIdentityError();
    result.advice = "say it";

    EXPECT_TRUE(failureLine("attributes", result).ends_with(" -1006); say it\n"));
}

}  // namespace
}  // namespace parvel::testing
