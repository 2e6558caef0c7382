#include <algorithm>
#include <charconv>
#include <cmath>
#include <string>
#include <vector>

#include "parvel/platform/TextRules.h"
#include "parvel/platform/linux/PropertyListForms.h"

namespace parvel {
namespace {

constexpr std::string_view kHead =
    "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
    "<!DOCTYPE plist PUBLIC \"-//Apple//DTD PLIST 1.0//EN\" "
    "\"http://www.apple.com/DTDs/PropertyList-1.0.dtd\">\n"
    "<plist version=\"1.0\">\n";
constexpr std::string_view kFoot = "</plist>\n";
constexpr std::size_t kBytesPerLine = 57;  ///< 76 characters of base64
constexpr char kBase64[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";

/// Whether XML can't hold the character at the place, not even as a reference.
bool isNoXMLCharacter(std::string_view text, std::size_t place) {
    const auto byte = static_cast<unsigned char>(text[place]);
    if (byte < 0x20)
        return byte != '\t' && byte != '\n' && byte != '\r';
    const std::string_view character = text.substr(place, 3);
    return character == "\xEF\xBF\xBE" || character == "\xEF\xBF\xBF";
}

class XMLWriter {
public:
    /// False for a value that the form can't hold.
    bool write(const Value& value, std::size_t depth);

    std::string text{kHead};

private:
    bool element(std::string_view name, std::string_view content, std::size_t depth);
    bool write(const Number& number, std::size_t depth);
    bool write(const Date& date, std::size_t depth);
    bool write(const Data& data, std::size_t depth);
    bool write(const Array& array, std::size_t depth);
    bool write(const Dictionary& dictionary, std::size_t depth);
    void line(std::string_view markup, std::size_t depth);
    bool escape(std::string_view content);
};

bool XMLWriter::write(const Value& value, std::size_t depth) {
    const bool isContainer = value.as<Array>() || value.as<Dictionary>();
    if (isContainer && depth > kMaximumPropertyListDepth)
        return false;
    switch (value.typeID()) {
        case TypeID::Null:
            return false;
        case TypeID::Number:
            return write(*value.as<Number>(), depth);
        case TypeID::String:
            return element("string", *value.as<String>(), depth);
        case TypeID::Date:
            return write(*value.as<Date>(), depth);
        case TypeID::Data:
            return write(*value.as<Data>(), depth);
        case TypeID::Array:
            return write(*value.as<Array>(), depth);
        case TypeID::Dictionary:
            return write(*value.as<Dictionary>(), depth);
    }
    return false;
}

bool XMLWriter::element(std::string_view name, std::string_view content, std::size_t depth) {
    text.append(depth - 1, '\t').append("<").append(name).append(">");
    const bool isValid =
        isValidUTF8(content) ? escape(content) : escape(withReplacedInvalidUTF8(content));
    text.append("</").append(name).append(">\n");
    return isValid;
}

bool XMLWriter::write(const Number& number, std::size_t depth) {
    switch (number.kind()) {
        case Number::Kind::Boolean:
            line(number.boolValue() ? "<true/>" : "<false/>", depth);
            return true;
        case Number::Kind::Signed:
            return element("integer", std::to_string(number.int64Value()), depth);
        case Number::Kind::Unsigned:
            return element("integer", std::to_string(number.unsignedValue()), depth);
        case Number::Kind::Real:
            break;
    }
    if (std::isnan(number.doubleValue()))
        return element("real", "nan", depth);
    char digits[32];
    const auto end = std::to_chars(digits, digits + sizeof digits, number.doubleValue()).ptr;
    return element("real", {digits, static_cast<std::size_t>(end - digits)}, depth);
}

bool XMLWriter::write(const Date& date, std::size_t depth) {
    const std::string iso = isoText(Date{std::floor(date.secondsSinceReferenceDate)});
    return !iso.empty() && element("date", iso, depth);
}

bool XMLWriter::write(const Data& data, std::size_t depth) {
    std::vector<std::uint8_t> storage;
    Data::Bytes rest = data.contiguous(storage);
    line("<data>", depth);
    while (!rest.empty()) {
        const Data::Bytes row = rest.first(std::min(rest.size(), kBytesPerLine));
        rest = rest.subspan(row.size());
        text.append(depth - 1, '\t');
        for (std::size_t i = 0; i < row.size(); i += 3) {
            const auto byte = [&](std::size_t at) { return at < row.size() ? row[at] : 0U; };
            const unsigned bits = byte(i) << 16 | byte(i + 1) << 8 | byte(i + 2);
            text += kBase64[bits >> 18];
            text += kBase64[bits >> 12 & 0x3F];
            text += i + 1 < row.size() ? kBase64[bits >> 6 & 0x3F] : '=';
            text += i + 2 < row.size() ? kBase64[bits & 0x3F] : '=';
        }
        text += '\n';
    }
    line("</data>", depth);
    return true;
}

bool XMLWriter::write(const Array& array, std::size_t depth) {
    if (array.empty()) {
        line("<array/>", depth);
        return true;
    }
    line("<array>", depth);
    for (const Value& value : array) {
        if (!write(value, depth + 1))
            return false;
    }
    line("</array>", depth);
    return true;
}

bool XMLWriter::write(const Dictionary& dictionary, std::size_t depth) {
    if (dictionary.empty()) {
        line("<dict/>", depth);
        return true;
    }
    line("<dict>", depth);
    for (const auto& [key, value] : dictionary) {
        if (!element("key", key, depth + 1) || !write(value, depth + 1))
            return false;
    }
    line("</dict>", depth);
    return true;
}

void XMLWriter::line(std::string_view markup, std::size_t depth) {
    text.append(depth - 1, '\t').append(markup).append("\n");
}

/// Appends valid UTF-8 as character data.
bool XMLWriter::escape(std::string_view content) {
    for (std::size_t i = 0; i < content.size(); ++i) {
        if (isNoXMLCharacter(content, i))
            return false;
        switch (content[i]) {
            case '&':
                text += "&amp;";
                break;
            case '<':
                text += "&lt;";
                break;
            case '>':
                text += "&gt;";
                break;
            case '\r':
                text += "&#13;";
                break;
            default:
                text += content[i];
        }
    }
    return true;
}

}  // namespace

std::optional<Data> writeXMLPropertyList(const Value& value) {
    XMLWriter writer;
    if (!writer.write(value, 1))
        return std::nullopt;
    writer.text += kFoot;
    return Data::copyOf(writer.text);
}

}  // namespace parvel
