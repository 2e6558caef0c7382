#pragma once

#include <optional>
#include <string_view>

#include "parvel/foundation/Value.h"

namespace parvel::host {

/// The value of a JSON text (RFC 8259) that another program sent. None where it is no JSON, is
/// nested deeper than 32 levels or holds more than 200,000 values. A text's bytes are taken as they
/// stand; the last of several entries with one key counts.
[[nodiscard]] std::optional<Value> valueOfJson(std::string_view text);

}  // namespace parvel::host
