#pragma once

#include <optional>
#include <vector>

#include "cli/Finding.h"
#include "parvel/platform/ReaderProgram.h"

namespace parvel::cli {

/// What is amiss with the helper program that parses PDF documents and pictures, by how it is
/// confined here; none where it can't be had.
[[nodiscard]] std::vector<Finding> findingsOfReader(
    const std::optional<ReaderConfinement>& confinement);

}  // namespace parvel::cli
