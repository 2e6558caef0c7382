#pragma once

#include <cstddef>
#include <optional>
#include <string_view>

#include "parvel/foundation/Data.h"
#include "parvel/foundation/Value.h"

namespace parvel {

/// How deep lists and dictionaries may stand in each other.
inline constexpr std::size_t kMaximumPropertyListDepth = 512;
/// How many values and keys a property list may have, whatever its size.
inline constexpr std::size_t kMaximumPropertyListNodes = 500'000;

/// None for what is no property list of the form; both throw MalformedInput as PropertyListCodec
/// says.
[[nodiscard]] std::optional<Value> readXMLPropertyList(const Data& bytes);
[[nodiscard]] std::optional<Value> readBinaryPropertyList(Data::Bytes bytes);
/// The XML form in a document of the plain kind; none for any other.
[[nodiscard]] std::optional<Value> readPlainXMLPropertyList(const Data& bytes);
/// The XML form in any document, by libxml2.
[[nodiscard]] std::optional<Value> readGuardedXMLPropertyList(const Data& bytes);

/// None for a value that the form can't hold.
[[nodiscard]] std::optional<Data> writeXMLPropertyList(const Value& value);

/// The readings of the XML form's leaves; none for any other text.
[[nodiscard]] std::optional<Number> integerFromText(std::string_view text);
[[nodiscard]] std::optional<Number> realFromText(std::string_view text);
[[nodiscard]] std::optional<Date> dateFromText(std::string_view text);
[[nodiscard]] std::optional<Data> dataFromBase64(std::string_view text);

}  // namespace parvel
