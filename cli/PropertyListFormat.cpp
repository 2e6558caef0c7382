#include <algorithm>
#include <vector>

#include "cli/JsonMarks.h"
#include "cli/ResultFormat.h"
#include "parvel/foundation/PropertyList.h"

namespace parvel::cli {
namespace {

/// U+FFFD in place of each control character that XML has no form for.
std::string withoutControls(std::string_view text) {
    std::string out;
    for (const char c : text) {
        const bool refused =
            static_cast<unsigned char>(c) < 0x20 && c != '\t' && c != '\n' && c != '\r';
        out += refused ? std::string_view("\uFFFD") : std::string_view(&c, 1);
    }
    return out;
}

std::optional<Value> writable(const Value& value);

Value writableArray(const Array& array) {
    std::vector<Value> values;
    for (const Value& value : array) {
        if (std::optional<Value> kept = writable(value))
            values.push_back(std::move(*kept));
    }
    return Array(std::move(values));
}

Value writableDictionary(const Dictionary& dictionary) {
    std::vector<Dictionary::Entry> entries;
    for (const auto& [key, value] : dictionary) {
        if (std::optional<Value> kept = writable(value))
            entries.push_back({withoutControls(key), std::move(*kept)});
    }
    return Dictionary(std::move(entries));
}

/// The value as a property list can hold it: without null markers, and a date outside the years 1
/// to 9999 as JSON has it.
std::optional<Value> writable(const Value& value) {
    switch (value.typeID()) {
        case TypeID::Null:
            return std::nullopt;
        case TypeID::String:
            return withoutControls(*value.as<String>());
        case TypeID::Date: {
            const Date date = *value.as<Date>();
            if (!isoText(date).empty())
                return value;
            return Dictionary{
                {std::string(kDateMark), Number::real(date.secondsSinceReferenceDate)}};
        }
        case TypeID::Array:
            return writableArray(*value.as<Array>());
        case TypeID::Dictionary:
            return writableDictionary(*value.as<Dictionary>());
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
        dictionary.set("record", result.record);
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
        const std::optional<Data> list = xmlPropertyList(writableDictionary(dictionaryOf(result)));
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

std::unique_ptr<ResultFormat> makePropertyListFormat() {
    return std::make_unique<PropertyListFormat>();
}

}  // namespace parvel::cli
