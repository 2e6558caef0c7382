#pragma once

#include <string>

#include "parvel/foundation/Value.h"

namespace parvel::cli {

/// The dictionary as an XML property list, without what that form can't hold: null markers are left
/// out, characters that XML has no form for become U+FFFD.
std::string propertyListText(const Dictionary& dictionary);

}  // namespace parvel::cli
