#pragma once

#include <stdexcept>
#include <string_view>

#include "parvel/foundation/Value.h"

namespace parvel::cli {

/// Text that is no JSON, or holds a mark with something else than what belongs there. The message
/// begins with the place: "line 3, column 7: …".
class JsonError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// The value of a JSON text (RFC 8259), with the forms of JsonWriter.h read back as what they stand
/// for. Lone escapes `\udc80` to `\udcff`, which stand for bytes that are no UTF-8, are the reason
/// that a general JSON reader doesn't serve: those refuse them. Whole numbers are exact over the
/// signed and unsigned 64-bit range and reals beyond it; the last of several entries with one key
/// counts. Throws JsonError, for nesting deeper than 512 too.
Value valueFromJson(std::string_view text);

}  // namespace parvel::cli
