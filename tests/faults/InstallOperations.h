#pragma once

#include <vector>

#include "tests/faults/Operations.h"

namespace parvel::testing {

/// Installs of every placement, staged and not.
[[nodiscard]] std::vector<Operation> installOperations();

}  // namespace parvel::testing
