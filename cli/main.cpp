#include <algorithm>
#include <string>
#include <vector>

#include <unistd.h>

#include "cli/CallLog.h"
#include "cli/Command.h"
#include "cli/Interrupt.h"
#include "cli/Messages.h"
#include "cli/Output.h"
#include "cli/OutputOptions.h"
#include "cli/Suggestion.h"
#include "parvel/platform/ReaderProgram.h"

namespace parvel::cli {
namespace {

constexpr std::string_view kVersion = PARVEL_VERSION;

/// The options that stand before the command.
struct ProgramOptions {
    bool version = false;
    bool json = false;
    std::optional<std::string> log;

    void declare(CommandLine& line) {
        line.group("Options");
        declareLogOption(line, log);
        line.flag("--version", "print the version", version);
        line.flag("--json", "with --version: print it as JSON", json);
    }
};

std::string commandList() {
    std::string text = "Commands:\n";
    for (const CommandEntry& command : commands()) {
        std::string left = "  " + std::string(command.name);
        left.resize(std::max<std::size_t>(left.size() + 2, 14), ' ');
        text += left + std::string(command.summary) + "\n";
    }
    return text + "\n\"parvel COMMAND --help\" tells more of each.";
}

int printText(std::string_view text) {
    Output output(STDOUT_FILENO);
    output.append(text);
    return output.finish("") ? kSuccess : kFailure;
}

/// How the helper program is confined here, as JSON; null where it can't be had.
std::string readerAsJson() {
    const std::optional<ReaderConfinement> reader = readerConfinement();
    if (!reader)
        return "null";
    const auto word = [](bool flag) { return std::string(flag ? "true" : "false"); };
    return "{\"landlock\":" + word(reader->hasNoFiles) +
           ",\"seccomp\":" + word(reader->hasSystemCallFilter) + "}";
}

int printVersion(bool asJson) {
    const std::string version(kVersion);
    return printText(asJson
                         ? "{\"version\":\"" + version + "\",\"reader\":" + readerAsJson() + "}\n"
                         : "parvel " + version + "\n");
}

/// Where the command stands: the first argument that is no option, nor the value of one.
std::size_t commandIndex(const std::vector<std::string>& arguments) {
    std::size_t index = 0;
    while (index < arguments.size() && arguments[index].starts_with('-'))
        index += arguments[index] == "--log" ? 2 : 1;
    return std::min(index, arguments.size());
}

const CommandEntry& commandOfName(const std::string& name) {
    for (const CommandEntry& command : commands()) {
        if (command.name == name)
            return command;
    }
    std::vector<std::string_view> names;
    for (const CommandEntry& command : commands())
        names.push_back(command.name);
    throw UsageError("unknown command \"" + name + "\"" + suggestionFor(name, names));
}

int runCommand(const CommandEntry& entry, std::span<const std::string> arguments) {
    const std::unique_ptr<Command> command = entry.make();
    CommandLine line("parvel " + std::string(entry.name), entry.operands, entry.summary);
    command->declare(line);
    std::vector<std::string> operands = line.parse(arguments);
    if (line.helpAsked())
        return printText(line.help());
    watchForInterrupts();
    const int status = command->run(std::move(operands));
    return interrupted() ? kInterruptedExit : status;
}

int reportUsage(std::string_view command, const UsageError& error) {
    const std::string name = command.empty() ? "" : " " + std::string(command);
    writeToStandardError(problemLine(command, error.what()) + "Try \"parvel" + name +
                         " --help\".\n");
    return kUsage;
}

int run(const std::vector<std::string>& arguments) {
    const std::size_t index = commandIndex(arguments);
    const std::span<const std::string> all(arguments);
    std::string_view command;
    try {
        CommandLine line("parvel", "COMMAND", "Reads and keeps a library of e-books.");
        ProgramOptions options;
        options.declare(line);
        line.note(commandList());
        line.parse(all.first(index));
        if (line.helpAsked())
            return printText(line.help());
        if (options.version)
            return printVersion(options.json || std::count(all.begin(), all.end(), "--json") > 0);
        if (options.json)
            throw UsageError("--json goes with --version, or behind the command");
        printLogLines(logLevelOfName(options.log.value_or("off")));
        if (index == arguments.size())
            throw UsageError("no command is given");
        const CommandEntry& entry = commandOfName(arguments[index]);
        command = entry.name;
        return runCommand(entry, all.subspan(index + 1));
    } catch (const UsageError& error) {
        // What an interrupt kept from being read is nobody's slip.
        return interrupted() ? kInterruptedExit : reportUsage(command, error);
    }
}

}  // namespace
}  // namespace parvel::cli

int main(int argc, char** argv) {
    parvel::cli::holdStandardStreams();
    return parvel::cli::run({argv + std::min(argc, 1), argv + argc});
}
