#pragma once

#include <optional>
#include <vector>

#include "parvel/metadata/PVMutableAssetMetadata.h"

namespace parvel::testing {

/// A record over the dictionary as it stands, without validation.
inline MutableAssetPtr recordOver(const Dictionary& dictionary) {
    return PVMutableAssetMetadata::initWithURL_dictionary_validate(std::nullopt, &dictionary,
                                                                   /*validate=*/false);
}

inline MutableAssetPtr emptyRecord() {
    return recordOver({});
}

/// What a getter or a dictionary gave, as a value that can be compared with what was expected.
inline std::optional<Value> valueOf(const Value* value) {
    return value ? std::optional<Value>(*value) : std::nullopt;
}

inline Value integerValue(std::int64_t integer) {
    return Number::signedInteger(integer);
}

inline Value realValue(double real) {
    return Number::real(real);
}

inline Value booleanValue(bool boolean) {
    return Number::boolean(boolean);
}

/// A value of each kind that a hostile dictionary can hold.
inline std::vector<Value> valuesOfEveryKind() {
    return {Value(),
            booleanValue(true),
            integerValue(-7),
            Number::unsignedInteger(UINT64_MAX),
            realValue(1e300),
            "text",
            "",
            String("\0\xFF./", 4),
            Date{-1e18},
            Data::copyOf(std::string_view("bytes")),
            Array{"a", Value()},
            Dictionary{{"key", "value"}}};
}

}  // namespace parvel::testing
