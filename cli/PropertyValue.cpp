#include "cli/PropertyValue.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <optional>

#include "cli/CommandLine.h"
#include "cli/MarkedValues.h"
#include "cli/Utf8.h"
#include "parvel/metadata/PVAssetMetadataKeys.h"

namespace parvel::cli {
namespace {

/// A text is UTF-8, a path any bytes.
enum class Type { Text, Path, Flag, Count, WholeNumber, Real, Number, Date, DateAsSeconds, Bytes };

struct Property {
    std::string_view name;  ///< the property's own, where it is not the key
    std::string_view key;
    Type type;
};

/// Properties whose key says nothing of their type, or that have a name beside it. All others store
/// a string under their name.
constexpr std::array kProperties{
    Property{"url", key::path, Type::Path},
    Property{"sourceURL", key::sourcePath, Type::Path},
    Property{"previousURL", key::previousPath, Type::Path},
    Property{"trashedURL", key::trashedPath, Type::Path},
    Property{"generatedID", key::generatedID, Type::Text},
    Property{"displayName", key::displayName, Type::Text},
    Property{"format", key::format, Type::Text},
    Property{"producer", key::producer, Type::Text},
    Property{"generationCount", key::generationCount, Type::Count},
    Property{"isPreview", key::isPreview, Type::Flag},
    Property{"hasPendingUpdates", key::hasPendingUpdates, Type::Flag},
    Property{"wasRedacted", key::wasRedacted, Type::Flag},
    Property{"isLocked", key::isLocked, Type::Flag},
    Property{"isExplicit", key::isExplicit, Type::Flag},
    Property{"permlink", key::permlink, Type::Text},
    Property{"storeID", key::storeID, Type::Text},
    Property{"title", key::itemName, Type::Text},
    Property{"author", key::artistName, Type::Text},
    Property{"shouldDisableOptimizeSpeed", key::shouldDisableOptimizeSpeed, Type::Flag},
    Property{"shouldDisableTouchEmulation", key::shouldDisableTouchEmulation, Type::Flag},
    Property{"pageCount", key::pageCount, Type::Count},
    Property{"updateDate", key::updateDate, Type::Date},
    Property{"modificationDate", key::modificationDate, Type::Date},
    Property{"releaseDate", key::releaseDate, Type::Date},
    Property{"insertionDate", key::insertionDate, Type::DateAsSeconds},
    Property{"assetDescription", key::assetDescription, Type::Text},
    Property{"packageHash", key::packageHash, Type::Text},
    Property{"coverImagePath", key::coverImagePath, Type::Text},
    Property{"mimeType", key::mimeType, Type::Text},
    Property{"allocatedSize", key::allocatedSize, Type::Count},
    Property{"percentComplete", key::percentComplete, Type::Real},
    Property{"coverImageData", key::coverImageData, Type::Bytes},
    Property{"coverImageDataReplaced", key::coverImageDataReplaced, Type::Bytes},
    Property{"uploadErrorCode", key::uploadErrorCode, Type::WholeNumber},
    Property{"uploadErrorDomain", key::uploadErrorDomain, Type::Text},
    Property{"sortTitle", key::sortTitle, Type::Text},
    Property{"sortAuthor", key::sortAuthor, Type::Text},
    Property{"lastOpenDate", key::lastOpenDate, Type::Date},
    Property{"purchaseDate", key::purchaseDate, Type::Date},
    Property{"rating", key::rating, Type::Number},
};

constexpr std::array kBookInfoKeys{key::packageHash, key::coverImagePath, key::mimeType};

template <class T>
std::optional<T> parsed(std::string_view text) {
    T number{};
    const char* end = text.data() + text.size();
    const auto result = std::from_chars(text.data(), end, number);
    const bool isWhole = result.ec == std::errc() && result.ptr == end;
    return isWhole ? std::optional(number) : std::nullopt;
}

std::optional<Value> utf8OfText(std::string_view text) {
    for (std::size_t at = 0; at < text.size();) {
        const std::optional<Character> character = characterAt(text, at);
        if (!character)
            return std::nullopt;
        at += character->length;
    }
    return Value(text);
}

std::optional<Value> flagOfText(std::string_view text) {
    if (text == "true" || text == "yes" || text == "1")
        return Number::boolean(true);
    if (text == "false" || text == "no" || text == "0")
        return Number::boolean(false);
    return std::nullopt;
}

std::optional<Value> realOfText(std::string_view text) {
    const auto real = parsed<double>(text);
    return real && std::isfinite(*real) ? std::optional<Value>(Number::real(*real)) : std::nullopt;
}

std::optional<Value> wholeNumberOfText(std::string_view text) {
    if (const auto number = parsed<std::int64_t>(text))
        return Number::signedInteger(*number);
    return std::nullopt;
}

std::optional<Value> countOfText(std::string_view text) {
    if (const auto number = parsed<std::uint64_t>(text))
        return Number::unsignedInteger(*number);
    return std::nullopt;
}

std::optional<Date> dateOfText(std::string_view text) {
    static constexpr std::size_t dayLength = 10;
    return dateFromIsoText(text.size() == dayLength ? std::string(text) + "T00:00:00Z"
                                                    : std::string(text));
}

std::optional<Value> secondsOfText(std::string_view text) {
    const std::optional<Date> date = dateOfText(text);
    if (!date)
        return wholeNumberOfText(text);
    return Number::signedInteger(static_cast<std::int64_t>(date->secondsSinceReferenceDate));
}

std::optional<Value> valueOfText(Type type, std::string_view text) {
    switch (type) {
        case Type::Text:
            return utf8OfText(text);
        case Type::Path:
            return Value(text);
        case Type::Flag:
            return flagOfText(text);
        case Type::Count:
            return countOfText(text);
        case Type::WholeNumber:
            return wholeNumberOfText(text);
        case Type::Real:
            return realOfText(text);
        case Type::Number: {
            std::optional<Value> whole = wholeNumberOfText(text);
            return whole ? whole : realOfText(text);
        }
        case Type::Date: {
            const std::optional<Date> date = dateOfText(text);
            return date ? std::optional<Value>(*date) : std::nullopt;
        }
        case Type::DateAsSeconds:
            return secondsOfText(text);
        case Type::Bytes: {
            const std::optional<Data> data = dataFromBase64(text);
            return data ? std::optional<Value>(*data) : std::nullopt;
        }
    }
    return std::nullopt;
}

std::string_view wordsFor(Type type) {
    switch (type) {
        case Type::Text:
            return "a text in UTF-8";
        case Type::Path:
            return "a path";
        case Type::Flag:
            return "true or false";
        case Type::Count:
            return "a whole number that is not negative";
        case Type::WholeNumber:
            return "a whole number";
        case Type::Real:
        case Type::Number:
            return "a number";
        case Type::Date:
        case Type::DateAsSeconds:
            return "a date such as 2001-01-31 or 2001-01-31T12:00:00Z";
        case Type::Bytes:
            return "base64";
    }
    return {};
}

Property propertyOfName(std::string_view name) {
    const auto found = std::find_if(
        kProperties.begin(), kProperties.end(),
        [name](const Property& property) { return property.name == name || property.key == name; });
    return found == kProperties.end() ? Property{name, name, Type::Text} : *found;
}

}  // namespace

PropertyValue PropertyValue::fromText(std::string_view option, std::string_view text) {
    const std::size_t sign = text.find('=');
    if (sign == std::string_view::npos || sign == 0)
        throw UsageError(std::string(option) + " " + std::string(text) + ": not KEY=VALUE");
    const Property property = propertyOfName(text.substr(0, sign));
    std::optional<Value> value = valueOfText(property.type, text.substr(sign + 1));
    if (!value)
        throw UsageError(std::string(option) + " " + std::string(text) + ": " +
                         std::string(text.substr(0, sign)) + " is " +
                         std::string(wordsFor(property.type)));
    const bool isInner =
        std::find(kBookInfoKeys.begin(), kBookInfoKeys.end(), property.key) != kBookInfoKeys.end();
    const std::string ownKey(property.key);
    return {isInner ? std::string(key::bookInfo) : ownKey, isInner ? ownKey : std::string(),
            *std::move(value)};
}

void PropertyValue::storeIn(Dictionary& changes, const Dictionary& record) const {
    if (innerKey.empty()) {
        changes.set(key, value);
        return;
    }
    const Value* outer = changes.contains(key) ? changes.find(key) : record.find(key);
    const Dictionary* present = outer ? outer->as<Dictionary>() : nullptr;
    Dictionary inner = present ? *present : Dictionary();
    inner.set(innerKey, value);
    changes.set(key, std::move(inner));
}

}  // namespace parvel::cli
