#pragma once

#include <optional>
#include <string_view>

#include "parvel/foundation/Value.h"

namespace parvel::cli {

/// The date, bytes or real that a dictionary of one mark (JsonMarks.h) stands for; none where the
/// mark's value is of another form.
std::optional<Value> markedValue(std::string_view mark, const Value& value);

/// The exact date of a text as `isoText` writes it, however many fractional digits it has.
std::optional<Date> dateFromIsoText(std::string_view text);

/// The bytes of base64 text (RFC 4648, with padding, nothing between).
std::optional<Data> dataFromBase64(std::string_view text);

}  // namespace parvel::cli
