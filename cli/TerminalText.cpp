#include "cli/TerminalText.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cstdlib>

#include <sys/ioctl.h>
#include <unistd.h>

#include "cli/Utf8.h"

namespace parvel::cli {
namespace {

struct Range {
    char32_t first;
    char32_t last;
};

/// Characters that act on a terminal or on the order of what is shown.
constexpr std::array<Range, 8> kUnsafe{{{0x00, 0x1F},
                                        {0x7F, 0x9F},
                                        {0x061C, 0x061C},
                                        {0x200E, 0x200F},
                                        {0x2028, 0x202E},
                                        {0x2066, 0x2069},
                                        {0xFEFF, 0xFEFF},
                                        {0xFFF9, 0xFFFB}}};

/// Two columns wide: East Asian scripts and the pictographs (Unicode Standard Annex #11).
constexpr std::array<Range, 12> kWide{{{0x1100, 0x115F},
                                       {0x2E80, 0x303E},
                                       {0x3041, 0xA4CF},
                                       {0xA960, 0xA97C},
                                       {0xAC00, 0xD7A3},
                                       {0xF900, 0xFAFF},
                                       {0xFE30, 0xFE6F},
                                       {0xFF00, 0xFF60},
                                       {0xFFE0, 0xFFE6},
                                       {0x1F300, 0x1F64F},
                                       {0x1F900, 0x1F9FF},
                                       {0x20000, 0x3FFFD}}};

constexpr std::array<Range, 7> kCombining{{{0x0300, 0x036F},
                                           {0x0483, 0x0489},
                                           {0x0591, 0x05BD},
                                           {0x064B, 0x065F},
                                           {0x200B, 0x200D},
                                           {0x20D0, 0x20F0},
                                           {0xFE00, 0xFE0F}}};

template <std::size_t N>
bool isIn(const std::array<Range, N>& ranges, char32_t codePoint) {
    return std::any_of(ranges.begin(), ranges.end(), [codePoint](const Range& range) {
        return codePoint >= range.first && codePoint <= range.last;
    });
}

void appendHex(char32_t number, std::size_t digits, std::string& out) {
    static constexpr std::string_view names = "0123456789abcdef";
    for (std::size_t i = digits; i > 0; --i)
        out.push_back(names[number >> (4 * (i - 1)) & 0xF]);
}

void appendEscaped(char32_t codePoint, std::string& out) {
    if (codePoint == '\n') {
        out += "\\n";
    } else if (codePoint == '\t') {
        out += "\\t";
    } else {
        out += codePoint < 0x80 ? "\\x" : "\\u";
        appendHex(codePoint, codePoint < 0x80 ? 2 : 4, out);
    }
}

std::size_t columnsFromEnvironment() {
    const char* text = std::getenv("COLUMNS");
    std::size_t width = 0;
    if (text)
        std::from_chars(text, text + std::char_traits<char>::length(text), width);
    return width;
}

}  // namespace

std::string safeText(std::string_view text) {
    std::string out;
    out.reserve(text.size());
    for (std::size_t offset = 0; offset < text.size();) {
        const std::optional<Character> character = characterAt(text, offset);
        if (!character) {
            out += "\\x";
            appendHex(static_cast<unsigned char>(text[offset]), 2, out);
            ++offset;
            continue;
        }
        if (isIn(kUnsafe, character->codePoint))
            appendEscaped(character->codePoint, out);
        else
            out += text.substr(offset, character->length);
        offset += character->length;
    }
    return out;
}

std::size_t columns(std::string_view text) {
    std::size_t count = 0;
    for (std::size_t offset = 0; offset < text.size();) {
        const Character character = characterAt(text, offset).value_or(Character{'?', 1});
        if (character.codePoint < 0x300 || !isIn(kCombining, character.codePoint))
            count += character.codePoint >= 0x1100 && isIn(kWide, character.codePoint) ? 2 : 1;
        offset += character.length;
    }
    return count;
}

std::string_view cutText(std::string_view text, std::size_t width) {
    std::size_t used = 0;
    std::size_t offset = 0;
    while (offset < text.size()) {
        const std::size_t length = characterAt(text, offset).value_or(Character{'?', 1}).length;
        used += columns(text.substr(offset, length));
        if (used > width)
            break;
        offset += length;
    }
    return text.substr(0, offset);
}

std::size_t terminalWidth(int descriptor) {
    winsize size{};
    std::size_t width = columnsFromEnvironment();
    if (width == 0 && isatty(descriptor) == 1 && ioctl(descriptor, TIOCGWINSZ, &size) == 0)
        width = size.ws_col;
    return width == 0 ? Terminal().width : width;
}

std::vector<std::string> wrapped(std::string_view text, std::size_t width) {
    static constexpr std::string_view space = " \t\r\n\f\v";
    std::vector<std::string> lines;
    std::size_t used = 0;
    for (std::size_t begin = text.find_first_not_of(space); begin < text.size();) {
        const std::size_t end = std::min(text.find_first_of(space, begin), text.size());
        const std::string word = safeText(text.substr(begin, end - begin));
        const std::size_t taken = columns(word);
        if (lines.empty() || used + 1 + taken > width) {
            lines.push_back(word);
            used = taken;
        } else {
            lines.back() += " " + word;
            used += 1 + taken;
        }
        begin = text.find_first_not_of(space, end);
    }
    return lines;
}

void appendField(std::string_view label, std::string_view text, std::size_t labelWidth,
                 std::size_t width, std::string& out) {
    static constexpr std::size_t indent = 2;
    std::string left = std::string(indent, ' ') + std::string(label);
    for (const std::string& line : wrapped(text, width - labelWidth - indent)) {
        left.resize(labelWidth + indent, ' ');
        out += left + line + "\n";
        left.clear();
    }
}

bool isCapableTerminal(int descriptor) {
    const char* kind = std::getenv("TERM");
    return isatty(descriptor) == 1 && !(kind && std::string_view(kind) == "dumb");
}

Terminal Terminal::ofStandardOutput() {
    Terminal terminal;
    terminal.width = std::clamp<std::size_t>(terminalWidth(STDOUT_FILENO), 40, 120);
    const char* noColor = std::getenv("NO_COLOR");
    terminal.hasStyles = isCapableTerminal(STDOUT_FILENO) && !(noColor && *noColor);
    return terminal;
}

}  // namespace parvel::cli
