#pragma once

#include <memory>
#include <string>

#include "parvel/foundation/Value.h"

namespace parvel::cli {

/// The record dictionary in a file: a property list (XML or binary) or JSON, holding the dictionary
/// itself or one result as `inspect` prints it (an array of one result too). Null where there is
/// none, with the reason in `problem`.
std::shared_ptr<const Dictionary> dictionaryFromFile(const std::string& path, std::string& problem);

}  // namespace parvel::cli
