#pragma once

#include <optional>
#include <string_view>

#include "parvel/foundation/Value.h"
#include "parvel/platform/TextRules.h"

namespace parvel {

/// What an attribute's bytes read as: the text up to the first NUL. None when the bytes, those
/// behind the NUL included, are no valid UTF-8.
inline std::optional<String> attributeText(std::string_view bytes) {
    return isValidUTF8(bytes) ? std::optional<String>(bytes.substr(0, bytes.find('\0')))
                              : std::nullopt;
}

}  // namespace parvel
