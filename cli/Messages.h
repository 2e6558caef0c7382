#pragma once

#include <string>
#include <string_view>

#include "cli/Result.h"

namespace parvel::cli {

/// A message as a part of a line.
std::string withoutFullStop(std::string words);

/// The one line for a result that failed:
/// `parvel: COMMAND: PATH: what went wrong (DOMAIN CODE)`, and what to do about it where that is
/// known.
std::string failureLine(std::string_view command, const Result& result);

/// `parvel: COMMAND: problem`; without the command where that is empty.
std::string problemLine(std::string_view command, std::string_view problem);

}  // namespace parvel::cli
