#include <algorithm>
#include <vector>

#include "cli/JsonMarks.h"
#include "cli/PropertyListText.h"
#include "cli/ResultFormat.h"
#include "cli/Utf8.h"
#include "parvel/foundation/PropertyList.h"

namespace parvel::cli {
namespace {

/// How deep the library writes and reads property lists.
constexpr int kDeepestList = 512;
/// The array that holds the results is the first level.
constexpr int kResultDepth = 2;

bool isNoXmlCharacter(char32_t codePoint) {
    const bool isControl =
        codePoint < 0x20 && codePoint != '\t' && codePoint != '\n' && codePoint != '\r';
    return isControl || codePoint == 0xFFFE || codePoint == 0xFFFF;
}

/// U+FFFD in place of each character that XML has no form for.
std::string writableText(std::string_view text) {
    std::string out;
    out.reserve(text.size());
    for (std::size_t offset = 0; offset < text.size();) {
        const Character character = characterAt(text, offset).value_or(Character{0xFFFE, 1});
        if (isNoXmlCharacter(character.codePoint))
            out += "\uFFFD";
        else
            out += text.substr(offset, character.length);
        offset += character.length;
    }
    return out;
}

std::optional<Value> writable(const Value& value, int depth);

Value writableArray(const Array& array, int depth) {
    std::vector<Value> values;
    for (const Value& value : array) {
        if (std::optional<Value> kept = writable(value, depth + 1))
            values.push_back(std::move(*kept));
    }
    return Array(std::move(values));
}

Value writableDictionary(const Dictionary& dictionary, int depth) {
    std::vector<Dictionary::Entry> entries;
    for (const auto& [key, value] : dictionary) {
        if (std::optional<Value> kept = writable(value, depth + 1))
            entries.push_back({writableText(key), std::move(*kept)});
    }
    return Dictionary(std::move(entries));
}

Value writableDate(const Date& date) {
    if (!isoText(date).empty())
        return date;
    return Dictionary{{std::string(kDateMark), Number::real(date.secondsSinceReferenceDate)}};
}

/// The value as a property list can hold it: without null markers and what is nested too deep, and
/// a date outside the years 1 to 9999 as JSON has it.
std::optional<Value> writable(const Value& value, int depth) {
    const bool isContainer = value.as<Array>() || value.as<Dictionary>() || value.as<Date>();
    if (isContainer && depth > kDeepestList)
        return std::nullopt;
    switch (value.typeID()) {
        case TypeID::Null:
            return std::nullopt;
        case TypeID::String:
            return writableText(*value.as<String>());
        case TypeID::Date:
            return writableDate(*value.as<Date>());
        case TypeID::Array:
            return writableArray(*value.as<Array>(), depth);
        case TypeID::Dictionary:
            return writableDictionary(*value.as<Dictionary>(), depth);
        case TypeID::Number:
        case TypeID::Data:
            break;
    }
    return value;
}

Dictionary dictionaryOf(const Error& error) {
    Dictionary dictionary{{"domain", error.domain()},
                          {"code", Number::signedInteger(error.code())},
                          {"message", error.message()}};
    if (const URL* url = error.url())
        dictionary.set("url", url->absoluteString());
    return dictionary;
}

Dictionary dictionaryOf(const Result& result) {
    Dictionary dictionary{{"path", result.path}, {"assetType", assetTypeName(result.assetType)}};
    if (result.assetID)
        dictionary.set("assetID", *result.assetID);
    if (result.record)
        dictionary.set(result.recordKey, result.record);
    if (result.error)
        dictionary.set("error", dictionaryOf(*result.error));
    for (const auto& [key, value] : result.fields)
        dictionary.set(key, value);
    return dictionary;
}

/// One array, so that the list grows result by result in flat memory: each result is written as a
/// list of its own, and what stands between its <plist> tags is kept.
class PropertyListFormat : public ResultFormat {
public:
    void append(const Result& result, std::string& out) const override {
        // Never none, since all that the form can't hold was taken out.
        const std::optional<Data> list =
            xmlPropertyList(writableDictionary(dictionaryOf(result), kResultDepth));
        if (!list)
            return;
        std::vector<std::uint8_t> storage;
        const std::string_view text = list->text(storage);
        const std::size_t begin = text.find('\n', text.find("<plist")) + 1;
        out += text.substr(begin, text.rfind("</plist>") - begin);
    }
    [[nodiscard]] std::string_view opening() const override {
        return "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
               "<plist version=\"1.0\">\n<array>\n";
    }
    [[nodiscard]] std::string_view closing() const override { return "</array>\n</plist>\n"; }
};

}  // namespace

std::string propertyListText(const Dictionary& dictionary) {
    const std::optional<Data> list = xmlPropertyList(writableDictionary(dictionary, /*depth=*/1));
    std::vector<std::uint8_t> storage;
    return list ? std::string(list->text(storage)) : std::string();
}

std::unique_ptr<ResultFormat> makePropertyListFormat() {
    return std::make_unique<PropertyListFormat>();
}

}  // namespace parvel::cli
