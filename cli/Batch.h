#pragma once

#include <functional>
#include <optional>
#include <string>
#include <string_view>

#include "cli/CallLog.h"
#include "cli/PathSource.h"
#include "cli/ResultFormat.h"

namespace parvel::cli {

/// What a command does with one PATH. It is called on several threads at once.
using PathWork = std::function<Result(const std::string& path)>;

/// How a command goes over its PATHs.
struct BatchOptions {
    std::string_view command;
    OutputForm form = OutputForm::Text;
    MakeResultFormat makeText = makeTextFormat;
    unsigned jobs = 1;
    LogLevel reasonLevel = LogLevel::Default;  ///< the least level that may hold a failure's reason
};

/// The number of -j, or that of the cores where it is not given. Throws UsageError.
unsigned jobsFromOption(const std::optional<std::string>& option);

/// Does the work for every PATH, several at once, prints each result and a line for each failure,
/// and gives the exit status. Results keep the order of their PATHs where the form asks for that.
/// Memory is bounded however many PATHs there are. After an interrupt, or when nobody reads the
/// results any more, no further PATH is begun, and what was begun is printed.
int runOverPaths(const BatchOptions& options, PathSource& source, const PathWork& work);

}  // namespace parvel::cli
