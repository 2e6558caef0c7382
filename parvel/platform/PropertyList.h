#pragma once

#include <optional>

#include "parvel/foundation/ErrorOut.h"
#include "parvel/foundation/Value.h"

namespace parvel {

/// Property lists: both forms read (XML as in the PropertyList 1.0 document type, and binary
/// "bplist00"), XML written.
class PropertyListCodec {
public:
    virtual ~PropertyListCodec() = default;

    /// The top-level value. None for bytes that are no property list, with a general error
    /// "corrupt" and the URL where one is given. A UID reads as a dictionary of one key, "CF$UID".
    /// Throws MalformedInput for a binary list that holds itself, or one of either form that is
    /// nested deeper than 512 or has more nodes than its size allows.
    [[nodiscard]] virtual std::optional<Value> parse(const Data& bytes,
                                                     const std::optional<URL>& url,
                                                     ErrorOut error = nullptr) = 0;

    /// The XML form, keys sorted. None for a value that the form can't hold: the null marker, text
    /// with control characters, a date outside the years 1 to 9999, and one nested deeper than 512.
    /// Bytes of text that are no UTF-8 are written as U+FFFD. Dates are cut to whole seconds
    /// (toward the past).
    [[nodiscard]] virtual std::optional<Data> writeXML(const Value& value) = 0;

    static PropertyListCodec& host();
};

}  // namespace parvel
