#pragma once

#include <string>
#include <string_view>

#include "parvel/foundation/Value.h"

namespace parvel::cli {

/// One "KEY=VALUE" of the command line. KEY is a key of a record's dictionary ("itemName") or a
/// property's own name ("title"); the value has the type that the property stores, and is a string
/// where the key is no property's. A date is "2001-01-01" or "2001-01-01T00:00:00Z", a flag "true"
/// or "false", bytes are base64.
struct PropertyValue {
    std::string key;
    std::string innerKey;  ///< not empty where the property stands in the dictionary under `key`
    Value value;

    /// Throws UsageError, which names the option, where there is no such value.
    static PropertyValue fromText(std::string_view option, std::string_view text);

    /// Stores the value. A dictionary that is none of `changes` yet begins as the record's.
    void storeIn(Dictionary& changes, const Dictionary& record) const;
};

}  // namespace parvel::cli
