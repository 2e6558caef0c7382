#include "tests/corpus/Expectation.h"

#include <cctype>
#include <fstream>
#include <stdexcept>

#include <nlohmann/json.hpp>

#include "parvel/foundation/PVDigest.h"

namespace parvel::testing {

using nlohmann::json;

namespace {

Data bytesOf(const Value& value) {
    if (const auto* text = value.as<String>())
        return Data::copyOf(*text);
    const auto* data = value.as<Data>();
    return data ? *data : Data();
}

/// Long text or bytes, of which only the digest is kept.
bool matchesDigest(const Value& actual, const json& expected) {
    const bool isData = expected.contains("$data");
    if (actual.typeID() != (isData ? TypeID::Data : TypeID::String))
        return false;
    const Data bytes = bytesOf(actual);
    std::string digest = parvel_MD5String(bytes).value_or("");
    for (char& letter : digest)
        letter = static_cast<char>(std::tolower(static_cast<unsigned char>(letter)));
    return bytes.size() == expected.at("length") && digest == expected.at("$md5");
}

/// A PNG file of that size (ISO/IEC 15948, 5.2 and 11.2.2).
bool matchesImage(const Value& actual, const json& expected) {
    static constexpr std::string_view beginning("\x89PNG\r\n\x1a\n\0\0\0\rIHDR", 16);
    std::vector<std::uint8_t> storage;
    const auto* data = actual.as<Data>();
    const std::string_view bytes = data ? data->text(storage) : std::string_view();
    if (!bytes.starts_with(beginning) || bytes.size() < beginning.size() + 8)
        return false;
    const auto numberAt = [bytes](std::size_t offset) {
        std::uint32_t number = 0;
        for (const char byte : bytes.substr(offset, 4))
            number = number << 8 | static_cast<unsigned char>(byte);
        return number;
    };
    return numberAt(16) == expected.at(0) && numberAt(20) == expected.at(1);
}

bool matchesDate(const Value& actual, const json& expected) {
    const auto* date = actual.as<Date>();
    return date && isoText(*date) == expected.get<std::string>();
}

bool matchesNumber(const Value& actual, const json& expected) {
    const auto* number = actual.as<Number>();
    if (!number)
        return false;
    if (expected.is_boolean())
        return *number == Number::boolean(expected);
    if (expected.is_number_integer())
        return *number == Number::signedInteger(expected);
    return *number == Number::real(expected);
}

std::string expectedText(const json& expected, const std::string& root) {
    const auto text = expected.get<std::string>();
    return text.rfind("@/", 0) == 0 ? root + text.substr(1) : text;
}

void compare(const Value& actual, const json& expected, const std::string& root,
             const std::string& place, std::vector<std::string>& lines);

void compareEntries(const Dictionary& actual, const json& expected, const std::string& root,
                    const std::string& place, std::vector<std::string>& lines) {
    for (const auto& [key, value] : expected.items()) {
        const Value* found = actual.find(key);
        if (found)
            compare(*found, value, root, place + key, lines);
        else
            lines.push_back(place + key + ": missing; expected " + value.dump());
    }
    for (const auto& [key, value] : actual) {
        if (!expected.contains(key))
            lines.push_back(place + key + ": unexpected " + description(value));
    }
}

bool compareItems(const Value& actual, const json& expected, const std::string& root,
                  const std::string& place, std::vector<std::string>& lines) {
    const auto* array = actual.as<Array>();
    if (!array || array->size() != expected.size())
        return false;
    for (std::size_t index = 0; index < array->size(); ++index)
        compare((*array)[index], expected[index], root, place + "." + std::to_string(index), lines);
    return true;
}

bool matchesLeaf(const Value& actual, const json& expected, const std::string& root) {
    if (expected.contains("$md5"))
        return matchesDigest(actual, expected);
    if (expected.contains("$png"))
        return matchesImage(actual, expected.at("$png"));
    if (expected.contains("$date"))
        return matchesDate(actual, expected.at("$date"));
    if (!expected.is_string())
        return matchesNumber(actual, expected);
    const auto* text = actual.as<String>();
    return text && *text == expectedText(expected, root);
}

void compare(const Value& actual, const json& expected, const std::string& root,
             const std::string& place, std::vector<std::string>& lines) {
    const bool isLeaf =
        expected.contains("$md5") || expected.contains("$png") || expected.contains("$date");
    const auto* dictionary = actual.as<Dictionary>();
    if (expected.is_object() && !isLeaf && dictionary)
        return compareEntries(*dictionary, expected, root, place + ".", lines);
    const bool same = expected.is_array() ? compareItems(actual, expected, root, place, lines)
                                          : matchesLeaf(actual, expected, root);
    if (!same)
        lines.push_back(place + ": " + description(actual) + "; expected " + expected.dump());
}

}  // namespace

Expectation::Expectation(json row) : m_row(std::make_shared<const json>(std::move(row))) {}

std::vector<Expectation> Expectation::all() {
    std::ifstream file(PARVEL_CORPUS_TESTS "/expected.json");
    std::vector<Expectation> expectations;
    for (json& row : json::parse(file))
        expectations.push_back(Expectation(std::move(row)));
    return expectations;
}

std::string Expectation::file() const {
    return m_row->at("file");
}

std::string Expectation::testName() const {
    std::string name = file();
    for (char& letter : name) {
        if (!std::isalnum(static_cast<unsigned char>(letter)))
            letter = '_';
    }
    return name;
}

PVAssetType Expectation::type() const {
    return static_cast<PVAssetType>(m_row->at("type").get<int>());
}

bool Expectation::hasRecord(bool keepsIdentity) const {
    return m_row->contains("record") && (keepsIdentity || !m_row->contains("error"));
}

bool Expectation::isDisputed() const {
    return m_row->contains("either");
}

std::optional<Error> Expectation::error(const URL& url) const {
    const json& error = m_row->at("error");
    if (error.is_null())
        return std::nullopt;
    Error::UserInfo info;
    if (error.at("url"))
        info.emplace(PVURLErrorKey, url);
    return Error(error.at("domain").get<std::string>(), error.at("code"), std::move(info));
}

json Expectation::record(bool withCover) const {
    json entries = m_row->at("record");
    if (withCover)
        entries.update(m_row->at("withCover"));
    return entries;
}

std::vector<std::string> differences(const Dictionary& actual, const json& expected,
                                     const std::string& root) {
    std::vector<std::string> lines;
    compareEntries(actual, expected, root, "", lines);
    return lines;
}

}  // namespace parvel::testing
