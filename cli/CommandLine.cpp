#include "cli/CommandLine.h"

#include <algorithm>
#include <filesystem>
#include <system_error>

#include <CLI/CLI.hpp>

#include "cli/Suggestion.h"

namespace parvel::cli {
namespace {

constexpr std::string_view kHelpNames = "-h,--help";

bool standsOnDisk(const std::string& path) {
    std::error_code unknown;
    return std::filesystem::exists(std::filesystem::symlink_status(path, unknown));
}

std::string_view longNameOf(std::string_view names) {
    return names.substr(names.find("--"));
}

/// The lines of one option, its help beginning in a column that all options share.
std::string optionHelp(std::string_view names, std::string_view value, std::string_view help) {
    static constexpr std::size_t column = 28;
    std::string text = names.starts_with("--") ? "      " : "  ";
    for (const char c : names)
        text += c == ',' ? std::string(", ") : std::string(1, c);
    if (!value.empty())
        text.append(" ").append(value);
    text += text.size() < column ? std::string(column - text.size(), ' ')
                                 : "\n" + std::string(column, ' ');
    for (const char c : help)
        text += c == '\n' ? "\n" + std::string(column, ' ') : std::string(1, c);
    return text + "\n";
}

}  // namespace

CommandLine::CommandLine(std::string_view command, std::string_view operands,
                         std::string_view summary)
    : m_command(command), m_operands(operands), m_summary(summary) {}

void CommandLine::group(std::string_view title) {
    m_groups.push_back({std::string(title), {}});
}

void CommandLine::flag(std::string_view names, std::string_view help, bool& target) {
    m_groups.back().options.push_back(
        {std::string(names), {}, std::string(help), &target, nullptr, nullptr});
}

void CommandLine::option(std::string_view names, std::string_view value, std::string_view help,
                         std::optional<std::string>& target) {
    m_groups.back().options.push_back(
        {std::string(names), std::string(value), std::string(help), nullptr, &target, nullptr});
}

void CommandLine::list(std::string_view names, std::string_view value, std::string_view help,
                       std::vector<std::string>& target) {
    m_groups.back().options.push_back(
        {std::string(names), std::string(value), std::string(help), nullptr, nullptr, &target});
}

void CommandLine::exclusive(std::vector<std::string_view> names) {
    m_exclusive.push_back(std::move(names));
}

void CommandLine::note(std::string_view text) {
    m_note = text;
}

const CommandLine::Option* CommandLine::optionOf(std::string_view longName) const {
    for (const Group& group : m_groups) {
        for (const Option& option : group.options) {
            if (longNameOf(option.names) == longName)
                return &option;
        }
    }
    return nullptr;
}

/// The parser takes "--name=" as a name whose value is the next argument. Here it is the empty
/// text. Nor does a flag have a value here.
std::vector<std::string> CommandLine::withEmptyValuesApart(
    std::span<const std::string> arguments) const {
    std::vector<std::string> out;
    const auto end = std::find(arguments.begin(), arguments.end(), "--");
    for (auto argument = arguments.begin(); argument != end; ++argument) {
        const std::size_t sign = argument->find('=');
        const std::string name = argument->substr(0, sign);
        const Option* option = sign != argument->npos ? optionOf(name) : nullptr;
        if (option && !option->takesValue())
            throw UsageError(name + " takes no value");
        if (option && sign + 1 == argument->size())
            out.insert(out.end(), {name, std::string()});
        else
            out.push_back(*argument);
    }
    out.insert(out.end(), end, arguments.end());
    return out;
}

void CommandLine::throwUnknown(const std::string& argument) const {
    if (standsOnDisk(argument))
        throw UsageError("unknown option " + argument + "; for the file of that name, type ./" +
                         argument);
    std::vector<std::string_view> names;
    for (const Group& group : m_groups) {
        for (const Option& option : group.options)
            names.push_back(longNameOf(option.names));
    }
    throw UsageError("unknown option " + argument +
                     suggestionFor(argument.substr(0, argument.find('=')), names));
}

/// The operands among what the parser did not know; anything else there is no option of ours.
std::vector<std::string> CommandLine::operandsOf(std::vector<std::string> remaining) const {
    std::vector<std::string> operands;
    bool onlyOperands = false;
    for (std::string& argument : remaining) {
        if (!onlyOperands && argument == "--")
            onlyOperands = true;
        else if (!onlyOperands && argument.size() > 1 && argument.front() == '-')
            throwUnknown(argument);
        else
            operands.push_back(std::move(argument));
    }
    return operands;
}

std::vector<std::string> CommandLine::parse(std::span<const std::string> arguments) {
    // Operands are what the parser leaves over: as a list option of its own they would not stay as
    // they were typed ("[a,b]" would be two).
    CLI::App parser;
    parser.set_help_flag();
    parser.allow_extras();
    parser.add_flag(std::string(kHelpNames), m_help);
    std::string lastOfList;
    for (const Group& group : m_groups) {
        for (const Option& option : group.options) {
            if (option.flag)
                parser.add_flag(option.names, *option.flag);
            else if (option.text)
                parser.add_option(option.names, *option.text)->take_last();
            else
                parser.add_option(option.names, lastOfList)
                    ->take_last()
                    ->each([&texts = *option.texts](const std::string& text) {
                        texts.push_back(text);
                    });
        }
    }
    for (const auto& names : m_exclusive) {
        for (std::string_view name : names) {
            for (std::string_view other : names) {
                if (name != other)
                    parser.get_option(std::string(name))
                        ->excludes(parser.get_option(std::string(other)));
            }
        }
    }

    std::vector<std::string> reversed = withEmptyValuesApart(arguments);
    std::reverse(reversed.begin(), reversed.end());
    try {
        parser.parse(reversed);
    } catch (const CLI::ArgumentMismatch& error) {
        const std::string_view words = error.what();  // "--name: 1 required TEXT missing"
        throw UsageError(std::string(words.substr(0, words.find(':'))) + " needs a value");
    } catch (const CLI::ParseError& error) {
        throw UsageError(error.what());
    }
    return m_help ? std::vector<std::string>() : operandsOf(parser.remaining());
}

std::string CommandLine::help() const {
    std::string text = "Usage: " + m_command + " [OPTIONS]";
    text += m_operands.empty() ? "\n\n" : " " + m_operands + "\n\n";
    text += m_summary + "\n";
    for (const Group& group : m_groups) {
        text += "\n" + group.title + ":\n";
        for (const Option& option : group.options)
            text += optionHelp(option.names, option.value, option.help);
    }
    text += optionHelp(kHelpNames, {}, "print this help");
    return m_note.empty() ? text : text + "\n" + m_note + "\n";
}

}  // namespace parvel::cli
