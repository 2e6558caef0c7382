#include "parvel/platform/linux/cloud/JsonText.h"

#include <algorithm>
#include <charconv>
#include <string>
#include <utility>
#include <vector>

#include "parvel/platform/TextRules.h"

namespace parvel::host {

namespace {

constexpr int kDeepest = 32;
constexpr int kMostValues = 200'000;

bool isControl(char character) {
    return static_cast<unsigned char>(character) < 0x20;
}

/// Whether a number has digits where JSON wants some, and no zero before them.
bool hasDigits(std::string_view number) {
    const auto isDigitAt = [number](std::size_t offset) {
        return offset < number.size() && number[offset] >= '0' && number[offset] <= '9';
    };
    const std::size_t first = number.starts_with('-') ? 1 : 0;
    const std::size_t point = number.find('.');
    return isDigitAt(first) && !(number[first] == '0' && isDigitAt(first + 1)) &&
           (point == number.npos || isDigitAt(point + 1));
}

/// Every read gives none, and stays where it is, at what does not belong there.
class JsonText {
public:
    explicit JsonText(std::string_view text) : m_rest(text) {}

    std::optional<Value> document() {
        std::optional<Value> value = readValue();
        skipSpace();
        return m_rest.empty() ? std::move(value) : std::nullopt;
    }

private:
    void skipSpace() {
        m_rest.remove_prefix(std::min(m_rest.find_first_not_of(" \t\r\n"), m_rest.size()));
    }
    bool take(char expected) {
        skipSpace();
        if (!m_rest.starts_with(expected))
            return false;
        m_rest.remove_prefix(1);
        return true;
    }
    bool takeWord(std::string_view word) {
        if (!m_rest.starts_with(word))
            return false;
        m_rest.remove_prefix(word.size());
        return true;
    }

    std::optional<Value> readValue() {
        if (--m_valuesLeft < 0)
            return std::nullopt;
        if (take('{'))
            return nested(&JsonText::readDictionary);
        if (take('['))
            return nested(&JsonText::readArray);
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

    std::optional<Value> nested(std::optional<Value> (JsonText::*read)()) {
        if (m_depth == kDeepest)
            return std::nullopt;
        ++m_depth;
        std::optional<Value> value = (this->*read)();
        --m_depth;
        return value;
    }

    std::optional<Value> readArray() {
        std::vector<Value> values;
        if (take(']'))
            return Array();
        do {
            std::optional<Value> value = readValue();
            if (!value)
                return std::nullopt;
            values.push_back(std::move(*value));
        } while (take(','));
        return take(']') ? std::optional<Value>(Array(std::move(values))) : std::nullopt;
    }

    std::optional<Value> readDictionary() {
        std::vector<Dictionary::Entry> entries;
        if (take('}'))
            return Dictionary();
        do {
            std::optional<String> key = take('"') ? readString() : std::nullopt;
            std::optional<Value> value = key && take(':') ? readValue() : std::nullopt;
            if (!value)
                return std::nullopt;
            entries.push_back({std::move(*key), std::move(*value)});
        } while (take(','));
        return take('}') ? std::optional<Value>(Dictionary(std::move(entries))) : std::nullopt;
    }

    std::optional<String> readString() {
        String text;
        for (;;) {
            const std::size_t plain = std::min(m_rest.find_first_of("\"\\"), m_rest.size());
            if (std::any_of(m_rest.begin(), m_rest.begin() + static_cast<std::ptrdiff_t>(plain),
                            isControl))
                return std::nullopt;
            text += m_rest.substr(0, plain);
            m_rest.remove_prefix(plain);
            if (takeWord("\""))
                return text;
            if (!takeWord("\\") || !readEscape(text))
                return std::nullopt;
        }
    }

    bool readEscape(String& text) {
        static constexpr std::string_view names = "\"\\/bfnrt";
        static constexpr std::string_view characters = "\"\\/\b\f\n\r\t";
        if (takeWord("u"))
            return readUnicodeEscape(text);
        const std::size_t which = m_rest.empty() ? names.npos : names.find(m_rest.front());
        if (which == names.npos)
            return false;
        text.push_back(characters[which]);
        m_rest.remove_prefix(1);
        return true;
    }

    bool readUnicodeEscape(String& text) {
        const std::optional<char32_t> unit = readHexUnit();
        if (!unit || (*unit >= 0xDC00 && *unit <= 0xDFFF))
            return false;
        if (*unit < 0xD800 || *unit > 0xDBFF) {
            appendUTF8(text, *unit);
            return true;
        }
        const std::optional<char32_t> low = takeWord("\\u") ? readHexUnit() : std::nullopt;
        if (!low || *low < 0xDC00 || *low > 0xDFFF)
            return false;
        appendUTF8(text, 0x10000 + ((*unit & 0x3FF) << 10 | (*low & 0x3FF)));
        return true;
    }

    std::optional<char32_t> readHexUnit() {
        unsigned unit = 0;
        const std::string_view digits = m_rest.substr(0, 4);
        const char* end = digits.data() + digits.size();
        if (digits.size() < 4 || std::from_chars(digits.data(), end, unit, 16).ptr != end)
            return std::nullopt;
        m_rest.remove_prefix(4);
        return unit;
    }

    std::optional<Value> readNumber() {
        const std::size_t length =
            std::min(m_rest.find_first_not_of("+-.0123456789eE"), m_rest.size());
        const char* end = m_rest.data() + length;
        double number = 0;
        const auto read = std::from_chars(m_rest.data(), end, number);
        if (!hasDigits(m_rest.substr(0, length)) || read.ptr != end || read.ec != std::errc())
            return std::nullopt;
        m_rest.remove_prefix(length);
        return Number::real(number);
    }

    std::string_view m_rest;
    int m_depth = 0;
    int m_valuesLeft = kMostValues;
};

}  // namespace

std::optional<Value> valueOfJson(std::string_view text) {
    return JsonText(text).document();
}

}  // namespace parvel::host
