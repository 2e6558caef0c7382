#include "cli/RecordFile.h"

#include <algorithm>
#include <optional>

#include "cli/FileContents.h"
#include "cli/JsonReader.h"
#include "parvel/foundation/PropertyList.h"
#include "parvel/foundation/ValueReadings.h"

namespace parvel::cli {
namespace {

/// No record's file is this long; a device that has no end would be.
constexpr std::size_t kLongestRecordFile = std::size_t{256} << 20;

/// A property list of either form begins with what JSON can't begin with.
bool looksLikePropertyList(std::string_view text) {
    if (text.starts_with("bplist") || text.starts_with("\xFE\xFF") || text.starts_with("\xFF\xFE"))
        return true;
    if (text.starts_with("\xEF\xBB\xBF"))
        text.remove_prefix(3);
    const std::size_t begin = text.find_first_not_of(" \t\r\n");
    return begin != std::string_view::npos && text[begin] == '<';
}

std::optional<Value> valueOf(const std::string& contents, std::string& problem) {
    if (looksLikePropertyList(contents)) {
        std::optional<Value> value = valueFromPropertyList(Data::copyOf(contents));
        if (!value)
            problem = "a damaged property list";
        return value;
    }
    try {
        return valueFromJson(contents);
    } catch (const JsonError& error) {
        problem = std::string("neither a property list nor JSON: ") + error.what();
        return std::nullopt;
    }
}

bool isResult(const Dictionary& dictionary) {
    return dictionary.contains("path") && dictionary.contains("assetType") &&
           (dictionary.contains("record") || dictionary.contains("error"));
}

/// The dictionary, or a result's record; null with the reason.
const Dictionary* recordIn(const Value& value, std::string& problem) {
    const Array* array = value.as<Array>();
    const Value& only = array && array->size() == 1 ? (*array)[0] : value;
    const Dictionary* dictionary = only.as<Dictionary>();
    if (!dictionary)
        problem = "neither one record nor one result";
    if (!dictionary || !isResult(*dictionary))
        return dictionary;
    const Value* record = dictionary->find("record");
    const Dictionary* recorded = record ? record->as<Dictionary>() : nullptr;
    if (!recorded)
        problem = "a result without a record";
    return recorded;
}

/// The values of a text that has one in each line; none where a line has another text. A text
/// of one line is none of these.
std::optional<std::vector<Value>> valuesOfLines(std::string_view text) {
    std::vector<Value> values;
    try {
        while (!text.empty()) {
            const std::string_view line = text.substr(0, text.find('\n'));
            text.remove_prefix(std::min(line.size() + 1, text.size()));
            if (line.find_first_not_of(" \t\r") != std::string_view::npos)
                values.push_back(valueFromJson(line));
        }
    } catch (const JsonError&) {
        return std::nullopt;
    }
    return values;
}

/// What the file holds, one value each; none with the reason.
std::optional<std::vector<Value>> valuesOf(const std::string& contents, std::string& problem) {
    const std::optional<Value> value = valueOf(contents, problem);
    if (!value)
        return looksLikePropertyList(contents) ? std::nullopt : valuesOfLines(contents);
    if (const Array* array = value->as<Array>())
        return std::vector<Value>(array->begin(), array->end());
    return std::vector<Value>{*value};
}

}  // namespace

std::optional<std::vector<Value>> valuesFromFile(const std::string& path, std::string& problem) {
    const auto contents = contentsOfFile(path, kLongestRecordFile, problem);
    return contents ? valuesOf(*contents, problem) : std::nullopt;
}

std::optional<std::vector<StoredRecord>> recordsFromFile(const std::string& path,
                                                         std::string& problem) {
    const auto values = valuesFromFile(path, problem);
    if (!values)
        return std::nullopt;
    std::vector<StoredRecord> records;
    records.reserve(values->size());
    for (const Value& value : *values) {
        const Dictionary* dictionary = value.as<Dictionary>();
        if (!dictionary) {
            problem = "holds something else than records and results";
            return std::nullopt;
        }
        if (!isResult(*dictionary)) {
            records.push_back({*dictionary, std::nullopt});
            continue;
        }
        const Value* record = dictionary->find("record");
        const Value* resultPath = dictionary->find("path");
        if (const Dictionary* recorded = record ? record->as<Dictionary>() : nullptr)
            records.push_back({*recorded, stringForm(resultPath)});
    }
    return records;
}

std::shared_ptr<const Dictionary> dictionaryFromFile(const std::string& path,
                                                     std::string& problem) {
    const auto contents = contentsOfFile(path, kLongestRecordFile, problem);
    if (!contents)
        return nullptr;
    const std::optional<Value> value = valueOf(*contents, problem);
    const Dictionary* dictionary = value ? recordIn(*value, problem) : nullptr;
    return dictionary ? std::make_shared<const Dictionary>(*dictionary) : nullptr;
}

}  // namespace parvel::cli
