#pragma once

#include <memory>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "cli/CommandLine.h"

namespace parvel::cli {

/// The exit statuses that are the program's own; an interrupt has 130 (Interrupt.h).
enum ExitStatus : int {
    kSuccess = 0,   ///< every PATH gave what was asked for, without an error
    kFailure = 1,   ///< at least one did not
    kUsage = 2,     ///< the command line is wrong, and nothing was touched
    kNoRecord = 3,  ///< `match` alone: a record could not be had
    kFound = 4,     ///< something was found, where the status was asked to tell
};

/// One command of the program. It lives for one run of it.
class Command {
public:
    virtual ~Command() = default;

    /// Declares the command's options.
    virtual void declare(CommandLine& line) = 0;
    /// Does the work and gives the exit status. Throws UsageError before anything is touched.
    virtual int run(std::vector<std::string> operands) = 0;
};

/// A command as the program finds it.
struct CommandEntry {
    std::string_view name;
    std::string_view operands;
    std::string_view summary;
    std::unique_ptr<Command> (*make)();
};

/// All commands, in the order in which the help shows them. A new command is a file with its class
/// and its `make…` function, and a line in Commands.cpp.
std::span<const CommandEntry> commands();

std::unique_ptr<Command> makeAttributesCommand();
std::unique_ptr<Command> makeCheckCommand();
std::unique_ptr<Command> makeCloudCommand();
std::unique_ptr<Command> makeCoverCommand();
std::unique_ptr<Command> makeDoctorCommand();
std::unique_ptr<Command> makeEditCommand();
std::unique_ptr<Command> makeInflateCommand();
std::unique_ptr<Command> makeInspectCommand();
std::unique_ptr<Command> makeInstallCommand();
std::unique_ptr<Command> makeMatchCommand();
std::unique_ptr<Command> makeMoveCommand();
std::unique_ptr<Command> makePackCommand();
std::unique_ptr<Command> makeRedactCommand();
std::unique_ptr<Command> makeRemoveCommand();
std::unique_ptr<Command> makeRenameCommand();
std::unique_ptr<Command> makeTrashCommand();
std::unique_ptr<Command> makeUpdateCommand();

}  // namespace parvel::cli
