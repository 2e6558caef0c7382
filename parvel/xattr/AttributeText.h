#pragma once

#include <optional>
#include <string_view>

#include "parvel/foundation/Value.h"
#include "parvel/platform/TextRules.h"

namespace parvel {

/// What an attribute's bytes read as: the text up to the first NUL. None when they are no UTF-8, be
/// it behind the NUL.
inline std::optional<String> attributeText(std::string_view bytes) {
    return isValidUTF8(bytes) ? std::optional<String>(bytes.substr(0, bytes.find('\0')))
                              : std::nullopt;
}

}  // namespace parvel
