#pragma once

#include <optional>

#include "parvel/foundation/ErrorOut.h"
#include "parvel/foundation/PVExport.h"
#include "parvel/foundation/URL.h"
#include "parvel/foundation/Value.h"

namespace parvel {

/// The value that a property list holds, XML or binary, whichever the bytes are. None, with the
/// general error 259 and the URL where one is given, for bytes that are no property list, for a
/// binary list that holds itself, and for one nested too deep or larger than its size allows.
PV_EXPORT std::optional<Value> valueFromPropertyList(const Data& bytes,
                                                     const std::optional<URL>& url = std::nullopt,
                                                     ErrorOut error = nullptr);

/// The value as an XML property list, keys in byte order. None for a value that the form can't
/// hold: the null marker, text with control characters, a date outside the years 1 to 9999. Bytes
/// of text that are no UTF-8 become U+FFFD, and dates whole seconds.
PV_EXPORT std::optional<Data> xmlPropertyList(const Value& value);

}  // namespace parvel
