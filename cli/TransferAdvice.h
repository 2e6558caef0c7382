#pragma once

#include <string>
#include <string_view>

#include "cli/Result.h"

namespace parvel::cli {

/// What to do about an item, the source, that could not be put where it should go: the place is
/// taken, its folder missing, outside synchronised storage. Empty where nothing more is known.
/// `ifTaken` says what the command has for a place that is taken.
std::string adviceForTransfer(const Result& result, const URL& source, std::string_view ifTaken);

/// The same about a new version that was to take the place of an existing asset of synchronised
/// storage, and then its own name. `isPlaced` says whether it has left its own place.
std::string adviceForReplacement(const Result& result, const URL& newVersion, const URL& existing,
                                 bool isPlaced);

}  // namespace parvel::cli
