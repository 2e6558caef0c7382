#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace parvel::cli {

/// The text as one line that a terminal can be trusted with: control characters and the characters
/// that turn the writing direction are written as escapes (`\n`, `\x1b`, `\u202e`), and so is a
/// byte that is no UTF-8 (`\xff`). Texts come out of books, and books from strangers.
std::string safeText(std::string_view text);

/// How many columns the text takes; wide characters take two and combining ones none.
std::size_t columns(std::string_view text);

/// The beginning of the text that takes at most `width` columns; all of it where it does.
std::string_view cutText(std::string_view text, std::size_t width);

/// How wide the terminal behind the descriptor is, or COLUMNS says; 80 where nobody does.
std::size_t terminalWidth(int descriptor);

/// The words of the text in lines of at most `width` columns, where a word is not longer by itself.
/// White space, line breaks too, only separates words.
std::vector<std::string> wrapped(std::string_view text, std::size_t width);

/// Appends the label and, beside it, the text below each other in lines of `width` columns. The
/// label takes `labelWidth` columns.
void appendField(std::string_view label, std::string_view text, std::size_t labelWidth,
                 std::size_t width, std::string& out);

/// Whether the descriptor is a terminal that knows more than lines of text (TERM is not "dumb").
bool isCapableTerminal(int descriptor);

/// What is known of the place that standard output goes to.
struct Terminal {
    std::size_t width = 80;
    bool hasStyles = false;  ///< a capable terminal, and NO_COLOR is not set

    static Terminal ofStandardOutput();
};

}  // namespace parvel::cli
