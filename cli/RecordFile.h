#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "parvel/foundation/Value.h"

namespace parvel::cli {

/// The record dictionary in a file: a property list (XML or binary) or JSON, holding the dictionary
/// itself or one result as `inspect` prints it (an array of one result too). Null where there is
/// none, with the reason in `problem`.
std::shared_ptr<const Dictionary> dictionaryFromFile(const std::string& path, std::string& problem);

/// What a file of the same forms holds: an array's values, lines of JSON one by one, or one value.
std::optional<std::vector<Value>> valuesFromFile(const std::string& path, std::string& problem);

/// A record out of a file of many.
struct StoredRecord {
    Dictionary record;
    std::optional<std::string> path;  ///< the PATH of the result that it stood in
};

/// The records in a file: a property list (XML or binary) or JSON, holding an array of record
/// dictionaries or of results as `inspect` prints them, or one result a line. Results without a
/// record are left out. None where the file holds anything else, with the reason in `problem`.
std::optional<std::vector<StoredRecord>> recordsFromFile(const std::string& path,
                                                         std::string& problem);

}  // namespace parvel::cli
