#include "cli/JsonReader.h"

#include <algorithm>
#include <charconv>
#include <limits>
#include <optional>
#include <string>
#include <vector>

#include "cli/JsonMarks.h"
#include "cli/MarkedValues.h"
#include "cli/Utf8.h"

namespace parvel::cli {
namespace {

constexpr int kDeepest = 512;

class JsonReader {
public:
    explicit JsonReader(std::string_view text) : m_text(text) {
        if (m_text.starts_with("\xEF\xBB\xBF"))
            m_offset = 3;
    }

    Value document() {
        Value value = readValue();
        skipSpace();
        if (m_offset != m_text.size())
            fail("something follows the value");
        return value;
    }

private:
    [[noreturn]] void fail(std::string_view problem) const {
        const std::string_view before = m_text.substr(0, m_offset);
        const auto line = 1 + std::count(before.begin(), before.end(), '\n');
        const std::size_t lineStart = before.rfind('\n') + 1;
        throw JsonError("line " + std::to_string(line) + ", column " +
                        std::to_string(m_offset - lineStart + 1) + ": " + std::string(problem));
    }

    void skipSpace() {
        m_offset = std::min(m_text.find_first_not_of(" \t\r\n", m_offset), m_text.size());
    }
    [[nodiscard]] char peek() const { return m_offset < m_text.size() ? m_text[m_offset] : '\0'; }
    bool take(char c) {
        skipSpace();
        if (m_offset == m_text.size() || m_text[m_offset] != c)
            return false;
        ++m_offset;
        return true;
    }
    void expect(char c) {
        if (!take(c))
            fail(std::string("'") + c + "' is missing");
    }
    bool takeWord(std::string_view word) {
        if (!m_text.substr(m_offset).starts_with(word))
            return false;
        m_offset += word.size();
        return true;
    }

    Value readValue() {
        if (take('{'))
            return nested([this] { return readDictionary(); });
        if (take('['))
            return nested([this] { return readArray(); });
        if (take('"'))
            return readString();
        if (takeWord("true"))
            return Number::boolean(true);
        if (takeWord("false"))
            return Number::boolean(false);
        if (takeWord("null"))
            return Null{};
        return readNumber();
    }

    template <class Read>
    Value nested(const Read& read) {
        if (++m_depth > kDeepest)
            fail("nested too deep");
        Value value = read();
        --m_depth;
        return value;
    }

    Value readArray() {
        std::vector<Value> values;
        if (take(']'))
            return Array();
        do {
            values.push_back(readValue());
        } while (take(','));
        expect(']');
        return Array(std::move(values));
    }

    Value readDictionary() {
        std::vector<Dictionary::Entry> entries;
        if (take('}'))
            return Dictionary();
        do {
            expect('"');
            std::string key = readString();
            expect(':');
            entries.push_back({std::move(key), readValue()});
        } while (take(','));
        expect('}');
        if (entries.size() == 1 && isMarkOrEscapedMark(entries.front().key))
            return unmarked(std::move(entries.front()));
        return Dictionary(std::move(entries));
    }

    Value unmarked(Dictionary::Entry entry) {
        if (entry.key.starts_with("$$"))
            return Dictionary{{entry.key.substr(1), std::move(entry.value)}};
        std::optional<Value> value = markedValue(entry.key, entry.value);
        if (!value)
            fail("no value of the kind that \"" + entry.key + "\" stands for");
        return std::move(*value);
    }

    std::string readString() {
        std::string out;
        while (true) {
            const std::size_t end = std::min(m_text.find_first_of("\"\\", m_offset), m_text.size());
            appendPlain(end, out);
            if (m_offset == m_text.size())
                fail("a text has no end");
            if (m_text[m_offset++] == '"')
                return out;
            readEscape(out);
        }
    }

    void appendPlain(std::size_t end, std::string& out) {
        const std::size_t begin = m_offset;
        while (m_offset < end) {
            if (static_cast<unsigned char>(peek()) < 0x20)
                fail("a control character stands in a text");
            const std::optional<Character> character = characterAt(m_text, m_offset);
            if (!character)
                fail("a byte is no UTF-8");
            m_offset += character->length;
        }
        out += m_text.substr(begin, end - begin);
    }

    void readEscape(std::string& out) {
        static constexpr std::string_view names = "\"\\/bfnrtu";
        static constexpr std::string_view characters = "\"\\/\b\f\n\r\t";
        const std::size_t which =
            m_offset < m_text.size() ? names.find(m_text[m_offset]) : std::string_view::npos;
        if (which == std::string_view::npos)
            fail("an escape is unknown");
        ++m_offset;
        if (which < characters.size())
            out.push_back(characters[which]);
        else
            readUnicodeEscape(out);
    }

    void readUnicodeEscape(std::string& out) {
        const char32_t unit = readHexUnit();
        const bool high = unit >= 0xD800 && unit <= 0xDBFF;
        const bool low = unit >= 0xDC00 && unit <= 0xDFFF;
        if (unit >= 0xDC80 && unit <= 0xDCFF) {
            out.push_back(static_cast<char>(unit & 0xFF));
            return;
        }
        if (low)
            fail("an escape is half of a pair");
        if (!high) {
            appendUtf8(unit, out);
            return;
        }
        if (!takeWord("\\u"))
            fail("an escape is half of a pair");
        const char32_t second = readHexUnit();
        if (second < 0xDC00 || second > 0xDFFF)
            fail("an escape is half of a pair");
        appendUtf8(0x10000 + ((unit & 0x3FF) << 10 | (second & 0x3FF)), out);
    }

    char32_t readHexUnit() {
        unsigned unit = 0;
        const std::string_view digits = m_text.substr(m_offset, 4);
        const char* end = digits.data() + digits.size();
        if (digits.size() < 4 || std::from_chars(digits.data(), end, unit, 16).ptr != end)
            fail("an escape is unknown");
        m_offset += 4;
        return unit;
    }

    std::size_t skipDigits(std::size_t offset) const {
        return std::min(m_text.find_first_not_of("0123456789", offset), m_text.size());
    }

    /// The text of a number in the grammar of RFC 8259, with whether it is whole.
    std::string_view numberText(bool& whole) const {
        const std::size_t digits = m_offset + (peek() == '-' ? 1 : 0);
        std::size_t end = skipDigits(digits);
        if (end == digits || (m_text[digits] == '0' && end > digits + 1))
            fail("a value is missing");
        whole = true;
        if (end < m_text.size() && m_text[end] == '.') {
            whole = false;
            const std::size_t fraction = end + 1;
            end = skipDigits(fraction);
            if (end == fraction)
                fail("a number has no digit after its point");
        }
        if (end < m_text.size() && (m_text[end] == 'e' || m_text[end] == 'E')) {
            whole = false;
            std::size_t exponent = end + 1;
            if (exponent < m_text.size() && (m_text[exponent] == '+' || m_text[exponent] == '-'))
                ++exponent;
            end = skipDigits(exponent);
            if (end == exponent)
                fail("a number has no digit in its exponent");
        }
        return m_text.substr(m_offset, end - m_offset);
    }

    Value readNumber() {
        skipSpace();
        bool whole = false;
        const std::string_view text = numberText(whole);
        const char* begin = text.data();
        const char* end = begin + text.size();
        std::int64_t integer = 0;
        std::uint64_t natural = 0;
        double real = 0;
        m_offset += text.size();
        if (whole && std::from_chars(begin, end, integer).ec == std::errc())
            return Number::signedInteger(integer);
        if (whole && std::from_chars(begin, end, natural).ec == std::errc())
            return Number::unsignedInteger(natural);
        if (std::from_chars(begin, end, real).ec != std::errc())
            fail("a number is too large or too small");
        return Number::real(real);
    }

    std::string_view m_text;
    std::size_t m_offset = 0;
    int m_depth = 0;
};

}  // namespace

Value valueFromJson(std::string_view text) {
    return JsonReader(text).document();
}

}  // namespace parvel::cli
