#include "cli/JsonWriter.h"

#include <array>
#include <charconv>
#include <cmath>
#include <cstdint>
#include <vector>

#include "cli/JsonMarks.h"
#include "cli/Utf8.h"

namespace parvel::cli {
namespace {

constexpr std::string_view kHexDigits = "0123456789abcdef";

/// Whether the byte stands in a JSON text as it is, whatever follows it.
constexpr std::array<bool, 256> kPlain = [] {
    std::array<bool, 256> plain{};
    for (unsigned c = 0x20; c < 0x7F; ++c)
        plain[c] = c != '"' && c != '\\';
    return plain;
}();

void appendEscape(char32_t unit, std::string& out) {
    out += "\\u";
    for (int shift = 12; shift >= 0; shift -= 4)
        out.push_back(kHexDigits[unit >> shift & 0xF]);
}

void appendAscii(char c, std::string& out) {
    switch (c) {
        case '"':
            out += "\\\"";
            break;
        case '\\':
            out += "\\\\";
            break;
        case '\n':
            out += "\\n";
            break;
        case '\t':
            out += "\\t";
            break;
        case '\r':
            out += "\\r";
            break;
        default:
            appendEscape(static_cast<unsigned char>(c), out);
    }
}

bool needsEscape(char32_t codePoint) {
    return codePoint < 0xA0 || codePoint == 0x2028 || codePoint == 0x2029;
}

/// Appends the character or the stray byte at the offset, and gives the offset behind it.
std::size_t appendBeyondAscii(std::string_view text, std::size_t offset, std::string& out) {
    const std::optional<Character> character = characterAt(text, offset);
    if (!character) {
        appendEscape(0xDC00U | static_cast<unsigned char>(text[offset]), out);
        return offset + 1;
    }
    if (needsEscape(character->codePoint))
        appendEscape(character->codePoint, out);
    else
        out += text.substr(offset, character->length);
    return offset + character->length;
}

template <class T>
void appendNumberText(T number, std::string& out) {
    std::array<char, 32> text{};
    const auto end = std::to_chars(text.data(), text.data() + text.size(), number).ptr;
    out.append(text.data(), end);
}

void appendReal(double real, std::string& out) {
    if (!std::isfinite(real)) {
        out += R"({"$real":")";
        out += std::isnan(real) ? "nan" : real < 0 ? "-inf" : "inf";
        out += "\"}";
        return;
    }
    const std::size_t begin = out.size();
    appendNumberText(real, out);
    if (out.find_first_of(".e", begin) == std::string::npos)
        out += ".0";
}

void append(const Number& number, std::string& out) {
    switch (number.kind()) {
        case Number::Kind::Boolean:
            out += number.boolValue() ? "true" : "false";
            break;
        case Number::Kind::Signed:
            appendNumberText(number.int64Value(), out);
            break;
        case Number::Kind::Unsigned:
            appendNumberText(number.unsignedValue(), out);
            break;
        case Number::Kind::Real:
            appendReal(number.doubleValue(), out);
            break;
    }
}

void append(const Date& date, std::string& out) {
    out += R"({"$date":)";
    if (const std::string text = isoText(date); !text.empty())
        appendJsonString(text, out);
    else
        appendReal(date.secondsSinceReferenceDate, out);
    out.push_back('}');
}

void append(const Data& data, std::string& out) {
    static constexpr std::string_view digits =
        "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
    std::vector<std::uint8_t> storage;
    const Data::Bytes bytes = data.contiguous(storage);
    out += R"({"$data":")";
    out.reserve(out.size() + (bytes.size() + 2) / 3 * 4 + 2);
    for (std::size_t i = 0; i < bytes.size(); i += 3) {
        const std::size_t count = std::min<std::size_t>(3, bytes.size() - i);
        std::uint32_t group = 0;
        for (std::size_t k = 0; k < 3; ++k)
            group = group << 8 | (k < count ? bytes[i + k] : 0U);
        for (std::size_t k = 0; k < 4; ++k)
            out.push_back(k <= count ? digits[group >> (18 - 6 * k) & 0x3F] : '=');
    }
    out += "\"}";
}

void append(const Array& array, std::string& out) {
    char separator = '[';
    for (const Value& value : array) {
        out.push_back(separator);
        appendJson(value, out);
        separator = ',';
    }
    out += array.empty() ? "[]" : "]";
}

}  // namespace

void appendJsonString(std::string_view text, std::string& out) {
    out.push_back('"');
    std::size_t offset = 0;
    while (offset < text.size()) {
        std::size_t end = offset;
        while (end < text.size() && kPlain[static_cast<unsigned char>(text[end])])
            ++end;
        out += text.substr(offset, end - offset);
        offset = end;
        if (offset == text.size())
            break;
        if (static_cast<unsigned char>(text[offset]) < 0x80)
            appendAscii(text[offset++], out);
        else
            offset = appendBeyondAscii(text, offset, out);
    }
    out.push_back('"');
}

void appendJson(const Dictionary& dictionary, std::string& out) {
    const bool readsAsMark = dictionary.size() == 1 && isMarkOrEscapedMark(dictionary.begin()->key);
    char separator = '{';
    for (const auto& [key, value] : dictionary) {
        out.push_back(separator);
        appendJsonString(readsAsMark ? "$" + key : key, out);
        out.push_back(':');
        appendJson(value, out);
        separator = ',';
    }
    out += dictionary.empty() ? "{}" : "}";
}

void appendJson(const Value& value, std::string& out) {
    switch (value.typeID()) {
        case TypeID::Null:
            out += "null";
            break;
        case TypeID::Number:
            append(*value.as<Number>(), out);
            break;
        case TypeID::String:
            appendJsonString(*value.as<String>(), out);
            break;
        case TypeID::Date:
            append(*value.as<Date>(), out);
            break;
        case TypeID::Data:
            append(*value.as<Data>(), out);
            break;
        case TypeID::Array:
            append(*value.as<Array>(), out);
            break;
        case TypeID::Dictionary:
            appendJson(*value.as<Dictionary>(), out);
            break;
    }
}

}  // namespace parvel::cli
