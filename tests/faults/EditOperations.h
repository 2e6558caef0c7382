#pragma once

#include <vector>

#include "tests/faults/Operations.h"

namespace parvel::testing {

/// Edits, expansions in place, new versions and renames.
[[nodiscard]] std::vector<Operation> editOperations();

}  // namespace parvel::testing
