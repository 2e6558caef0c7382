#pragma once

#include <optional>
#include <string>

#include "cli/CommandLine.h"
#include "cli/ResultFormat.h"

namespace parvel::cli {

/// Declares --log, which the program has before its command and each command has among its own.
void declareLogOption(CommandLine& line, std::optional<std::string>& target);

/// The options that every command has for what it prints.
struct OutputOptions {
    bool json = false;
    bool jsonLines = false;
    bool propertyList = false;
    std::optional<std::string> log;

    void declare(CommandLine& line);
    [[nodiscard]] OutputForm form() const;
    /// Sets what of the library's log is printed, where the command's own option says so. Throws
    /// UsageError.
    void applyLog() const;
};

}  // namespace parvel::cli
