#pragma once

#include <string>
#include <string_view>

#include "cli/Result.h"

namespace parvel::cli {

/// What to do about an item, the source, that could not be put where it should go: the place is
/// taken, its folder missing, outside synchronised storage. Empty where nothing more is known.
/// `ifTaken` says what the command has for a place that is taken.
std::string adviceForTransfer(const Result& result, const URL& source, std::string_view ifTaken);

}  // namespace parvel::cli
