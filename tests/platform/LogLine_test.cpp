#include "parvel/platform/LogSink.h"
#include "parvel/platform/linux/JournalFields.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <vector>

namespace parvel::testing {
namespace {

using ::testing::ElementsAre;

LogLine lineOf(LogLevel level, std::string_view text, std::span<const LogArgument> arguments = {}) {
    return {level, "subsystem", "category", text, arguments};
}

/// The message of a text whose arguments are the given texts.
std::string messageOf(std::string_view text, const std::vector<std::string>& texts) {
    std::vector<LogArgument> arguments;
    for (const std::string& argument : texts)
        arguments.push_back({&argument, [](const void* object) {
                                 return *static_cast<const std::string*>(object);
                             }});
    return lineOf(LogLevel::Default, text, arguments).message();
}

TEST(LogLine, FillsEveryPlaceholderInOrder) {
    EXPECT_EQ(messageOf("%@ %d %ld %lu %llu %s.", {"1", "2", "3", "4", "5", "6"}), "1 2 3 4 5 6.");
    EXPECT_EQ(messageOf("%@%@", {"a", "b"}), "ab");
}

TEST(LogLine, PrintsADoubledPercentSignAsOne) {
    EXPECT_EQ(messageOf("%%", {}), "%");
    EXPECT_EQ(messageOf("%%@ %@ %%%@", {"a", "b"}), "%@ a %b");
}

TEST(LogLine, LeavesEverythingElseAsItStands) {
    EXPECT_EQ(messageOf("50% %x %l %llx %", {}), "50% %x %l %llx %");
    EXPECT_EQ(messageOf("%@ %@", {"a"}), "a %@");
    EXPECT_EQ(messageOf("plain", {"unused"}), "plain");
}

TEST(LogLine, FillsNoPlaceholderWithinAnArgument) {
    EXPECT_EQ(messageOf("%@ %@", {"%@", "%%"}), "%@ %%");
}

TEST(LogLine, IsValidUTF8WhateverItsArgumentsAre) {
    EXPECT_EQ(messageOf("a %@", {"\xFF"}), "a \uFFFD");
}

TEST(PlaceholderLength, IsThatOfTheSixPlaceholdersAlone) {
    EXPECT_EQ(placeholderLength("%@x"), 2U);
    EXPECT_EQ(placeholderLength("%llu"), 4U);
    EXPECT_EQ(placeholderLength("%ld"), 3U);
    EXPECT_EQ(placeholderLength("%%"), 0U);
    EXPECT_EQ(placeholderLength("%l"), 0U);
    EXPECT_EQ(placeholderLength(""), 0U);
}

TEST(JournalFields, HoldMessagePrioritySubsystemAndCategory) {
    EXPECT_THAT(journalFields(lineOf(LogLevel::Default, "100%%\nline")),
                ElementsAre("MESSAGE=100%\nline", "PRIORITY=5", "SUBSYSTEM=subsystem",
                            "CATEGORY=category"));
}

TEST(JournalFields, HoldThePriorityOfEachLevel) {
    EXPECT_EQ(journalFields(lineOf(LogLevel::Debug, ""))[1], "PRIORITY=7");
    EXPECT_EQ(journalFields(lineOf(LogLevel::Error, ""))[1], "PRIORITY=3");
    EXPECT_EQ(journalFields(lineOf(LogLevel::Fault, ""))[1], "PRIORITY=2");
}

TEST(LogSink, OfTheHostTakesALine) {
    errno = EBUSY;
    LogSink::host().write(lineOf(LogLevel::Debug, "a line of the tests"));

    EXPECT_EQ(errno, EBUSY);
}

}  // namespace
}  // namespace parvel::testing
