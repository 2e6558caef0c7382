#include <gtest/gtest.h>

#include "cli/CommandLine.h"

namespace parvel::testing {
namespace {

using cli::CommandLine;
using cli::UsageError;
using Words = std::vector<std::string>;

struct Parsed {
    bool flag = false;
    std::optional<std::string> value;
    Words list;
    Words operands;

    explicit Parsed(const Words& words) {
        CommandLine line("parvel try", "PATH...", "Tries.");
        line.group("Options");
        line.flag("-f,--flag", "a flag", flag);
        line.option("-v,--value", "TEXT", "a value", value);
        line.list("--list", "TEXT", "many values", list);
        operands = line.parse(words);
    }
};

TEST(CommandLine, KeepsOperandsAsTheyWereTyped) {
    const Words words{"[a,b]", "{x}", "%%", "", "-", "++", "a=b", "/f", "a b"};
    EXPECT_EQ(Parsed(words).operands, words);
}

TEST(CommandLine, TakesEverythingBehindTwoDashesForOperands) {
    const Parsed parsed({"a", "--", "-f", "--", "--value"});
    EXPECT_EQ(parsed.operands, (Words{"a", "-f", "--", "--value"}));
    EXPECT_FALSE(parsed.flag);
}

TEST(CommandLine, KeepsAllValuesOfAListInOrderAsTheyWereTyped) {
    const Parsed parsed(
        {"--list", "b", "x", "--list=[a,b]", "--list", "", "--list=", "--list", "b"});
    EXPECT_EQ(parsed.list, (Words{"b", "[a,b]", "", "", "b"}));
    EXPECT_EQ(parsed.operands, Words{"x"});
}

TEST(CommandLine, TakesOptionsAmongOperands) {
    const Parsed parsed({"a", "-f", "b", "--value", "v", "c"});
    EXPECT_EQ(parsed.operands, (Words{"a", "b", "c"}));
    EXPECT_TRUE(parsed.flag);
    EXPECT_EQ(parsed.value, "v");
}

TEST(CommandLine, TakesAValueInEveryForm) {
    for (const Words& words : {Words{"-vx"}, Words{"-v", "x"}, Words{"--value=x"}, Words{"-fvx"}})
        EXPECT_EQ(Parsed(words).value, "x");
}

TEST(CommandLine, TakesAnEmptyValue) {
    EXPECT_EQ(Parsed({"--value=", "a"}).value, "");
    EXPECT_EQ(Parsed({"--value=", "a"}).operands, Words{"a"});
    EXPECT_EQ(Parsed({"--value", "", "a"}).value, "");
}

TEST(CommandLine, TakesAValueThatLooksLikeAnOption) {
    EXPECT_EQ(Parsed({"--value", "-1"}).value, "-1");
    EXPECT_EQ(Parsed({"--value=[a,b]"}).value, "[a,b]");
}

TEST(CommandLine, LetsTheLastOfSeveralValuesCount) {
    EXPECT_EQ(Parsed({"-v", "x", "--value", "y"}).value, "y");
}

TEST(CommandLine, LeavesAValueThatIsNotGivenAbsent) {
    EXPECT_EQ(Parsed({"a"}).value, std::nullopt);
}

TEST(CommandLine, RefusesUnknownOptions) {
    EXPECT_THROW(Parsed({"--flaggy"}), UsageError);
    EXPECT_THROW(Parsed({"-x"}), UsageError);
    EXPECT_THROW(Parsed({"-5"}), UsageError);
    EXPECT_THROW(Parsed({"--value"}), UsageError);
}

}  // namespace
}  // namespace parvel::testing
