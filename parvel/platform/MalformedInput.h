#pragma once

#include <stdexcept>
#include <string>

#include "parvel/foundation/PVExport.h"

namespace parvel {

/// Raised by the XML, property-list and archive readers for what they meet inside an input that
/// they had accepted (a property list's cycle, depth or node budget). It is caught exactly where an
/// operation documents that; no other exception is.
class PV_EXPORT MalformedInput : public std::runtime_error {
public:
    explicit MalformedInput(const std::string& what) : std::runtime_error(what) {}
};

}  // namespace parvel
