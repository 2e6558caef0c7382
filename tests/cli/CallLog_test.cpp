#include <gtest/gtest.h>

#include "cli/CallLog.h"

namespace parvel::testing {
namespace {

using cli::CallLog;

TEST(CallLog, SaysNothingWhereNothingFailed) {
    CallLog log;

    PVParvelLog().info("Parsed Metadata: %@", std::string_view("{}"));

    EXPECT_EQ(log.reason(), "");
}

TEST(CallLog, PutsTheStepThatFailedIntoWords) {
    CallLog log;

    PVParvelLog().info("Failed to create opf document");
    PVParvelLog().info("Failed to create dictionary from opf");
    PVParvelLog().info("Failed to create aggregated metadata");

    EXPECT_EQ(log.reason(), "the package document is damaged");
}

TEST(CallLog, TellsTheTwoShapesOfABookApart) {
    CallLog log;
    PVParvelLog().info("Failed to get opf data");
    EXPECT_EQ(log.reason(), "the book has no container document (META-INF/container.xml)");

    log.clear();
    PVParvelLog().info("Failed to get opf data");
    PVParvelLog().info("Failed to get opf data. url: %@ error: %@", std::string_view("u"),
                       std::string_view("e"));
    EXPECT_EQ(log.reason(), "the package document can't be read");
}

TEST(CallLog, TakesALineWithoutWordsOfOurOwnAsItIs) {
    CallLog log;

    PVParvelLog().error("Failed to generate %@", std::string_view("PDF ID"));
    PVParvelLog().info("later");

    EXPECT_EQ(log.reason(), "Failed to generate PDF ID");
}

TEST(CallLog, PrefersAFailureToTheStepsBeforeIt) {
    CallLog log;

    PVParvelLog().info("Rename: Move without replacement");
    PVParvelLog().error("Failed to generate %@", std::string_view("PDF ID"));

    EXPECT_EQ(log.reason(), "Failed to generate PDF ID");
}

TEST(CallLog, TakesNoBeginningForAReason) {
    CallLog log;

    PVParvelLog().info("OrphanAssets: start {assets: %ld}", 3);

    EXPECT_EQ(log.reason(), "");
}

TEST(CallLog, PrefersKnownWordsToALineAsItIs) {
    CallLog log;

    PVParvelLog().info("something else");
    PVParvelLog().info("Failed to make zipArchive");

    EXPECT_EQ(log.reason(), "the file is no zip archive, or a damaged one");
}

TEST(CallLog, ForgetsTheLastCall) {
    CallLog log;
    PVParvelLog().info("Failed to make zipArchive");

    log.clear();

    EXPECT_EQ(log.reason(), "");
}

TEST(CallLog, HearsDetailOnlyWhereItMayHoldTheReason) {
    {
        CallLog log;
        PVParvelLog().debug("BazaarMetadata: fail");
        EXPECT_EQ(log.reason(), "");
    }
    CallLog log(LogLevel::Debug);
    PVParvelLog().debug("BazaarMetadata: start {data: %d, url: %d}", true, true);
    PVParvelLog().debug("BazaarMetadata: fail");
    EXPECT_EQ(log.reason(), "the file is no property list");
}

}  // namespace
}  // namespace parvel::testing
