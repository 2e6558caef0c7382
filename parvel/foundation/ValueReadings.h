#pragma once

#include <cstdint>
#include <optional>
#include <string_view>

#include "parvel/foundation/PVExport.h"
#include "parvel/foundation/Value.h"

namespace parvel {

/// How a stored value reads as text, number or boolean, whatever kind it is of. A null pointer is
/// an absent value.

/// A string as it is, a number's decimal form; none for any other kind and for an absent value.
PV_EXPORT std::optional<String> stringForm(const Value* value);

/// Leading white space, a sign and decimal digits up to the first other character, saturating at
/// the limits of the signed 64-bit range; no digits give 0 ("4 stars" is 4).
PV_EXPORT std::int64_t int64Reading(std::string_view text);
/// A number or string through its string form (so 1.5 reads 1 and 0.1 reads 0); 0 for anything
/// else.
PV_EXPORT std::int64_t int64Reading(const Value* value);

/// True when the text, after leading white space, an optional sign and leading zeros, begins with
/// "Y", "y", "T", "t" or a digit 1 to 9.
PV_EXPORT bool boolReading(std::string_view text);
/// Of a number, whether it is not zero; of a string, as above; false for anything else.
PV_EXPORT bool boolReading(const Value* value);

/// Of a number, its value (a negative one wraps); of a string, its 64-bit reading; else 0.
PV_EXPORT std::uint64_t unsignedReading(const Value* value);

/// Of a number, its value; of a string, its leading decimal number after white space and a sign, 0
/// where there is none and infinity where it is larger than any real; else 0.
PV_EXPORT double doubleReading(const Value* value);

}  // namespace parvel
