#include <gtest/gtest.h>

#include "cli/TerminalText.h"

namespace parvel::testing {
namespace {

using cli::columns;
using cli::cutText;
using cli::safeText;
using cli::wrapped;
using Lines = std::vector<std::string>;

TEST(TerminalText, KeepsOrdinaryTextAsItIs) {
    EXPECT_EQ(safeText("Müller \\ 草枕 🌍"), "Müller \\ 草枕 🌍");
}

TEST(TerminalText, EscapesControlCharacters) {
    EXPECT_EQ(safeText("a\nb\tc\rd\x1b[2J\x7f"), "a\\nb\\tc\\x0dd\\x1b[2J\\x7f");
}

TEST(TerminalText, EscapesControlCharactersBeyondAscii) {
    EXPECT_EQ(safeText("\u0085\u009b31m"), "\\u0085\\u009b31m");
}

TEST(TerminalText, EscapesWhatTurnsTheWritingDirection) {
    EXPECT_EQ(safeText("a\u202egpj.exe\u2066\u061c"), "a\\u202egpj.exe\\u2066\\u061c");
}

TEST(TerminalText, EscapesBytesThatAreNoUTF8) {
    EXPECT_EQ(safeText("a\xff\xc3"), "a\\xff\\xc3");
}

TEST(TerminalText, EscapesANul) {
    EXPECT_EQ(safeText(std::string("a\0b", 3)), "a\\x00b");
}

TEST(TerminalText, CountsWideCharactersTwiceAndCombiningOnesNot) {
    EXPECT_EQ(columns("abc"), 3U);
    EXPECT_EQ(columns("草枕"), 4U);
    EXPECT_EQ(columns("e\u0301"), 1U);
}

TEST(TerminalText, CutsAtWholeCharactersThatFit) {
    EXPECT_EQ(cutText("草枕.epub", 3), "草");
    EXPECT_EQ(cutText("ab\xff", 3), "ab\xff");
    EXPECT_EQ(cutText("abc", 80), "abc");
    EXPECT_EQ(cutText("abc", 0), "");
}

TEST(TerminalText, WrapsBetweenWords) {
    EXPECT_EQ(wrapped("one two three four", 9), (Lines{"one two", "three", "four"}));
}

TEST(TerminalText, FillsALineToItsLastColumn) {
    EXPECT_EQ(wrapped("one two three", 7), (Lines{"one two", "three"}));
}

TEST(TerminalText, TakesAllWhiteSpaceForOneSeparator) {
    EXPECT_EQ(wrapped("\n one \t\r\n two  ", 20), (Lines{"one two"}));
}

TEST(TerminalText, LeavesAWordThatIsLongerThanTheLineWhole) {
    EXPECT_EQ(wrapped("a abcdefghij b", 4), (Lines{"a", "abcdefghij", "b"}));
}

TEST(TerminalText, HasNoLinesForNoWords) {
    EXPECT_EQ(wrapped(" \n ", 10), Lines());
}

}  // namespace
}  // namespace parvel::testing
