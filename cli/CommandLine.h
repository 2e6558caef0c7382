#pragma once

#include <optional>
#include <span>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace parvel::cli {

/// The command line is wrong. Nothing was touched; the exit status is 2.
class UsageError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// The options of one command, each declared once for parsing and for the help text, in the order
/// in which the help shows them. The targets that are given must live until after `parse`.
class CommandLine {
public:
    /// `command` is what stands before the options ("parvel inspect"), `operands` what stands
    /// behind them ("PATH...").
    CommandLine(std::string_view command, std::string_view operands, std::string_view summary);

    /// Begins a group of options with a title of its own in the help.
    void group(std::string_view title);
    /// `names` is "--long" or "-s,--long".
    void flag(std::string_view names, std::string_view help, bool& target);
    void option(std::string_view names, std::string_view value, std::string_view help,
                std::optional<std::string>& target);
    /// An option that may be given many times, each with one value, kept in their order.
    void list(std::string_view names, std::string_view value, std::string_view help,
              std::vector<std::string>& target);
    /// At most one of these long names may be given.
    void exclusive(std::vector<std::string_view> names);
    /// Lines that the help shows below the options.
    void note(std::string_view text);

    /// Fills the targets and gives the operands, every one as it was typed. Behind "--" everything
    /// is an operand. Throws UsageError.
    std::vector<std::string> parse(std::span<const std::string> arguments);

    [[nodiscard]] bool helpAsked() const { return m_help; }
    [[nodiscard]] std::string help() const;

private:
    struct Option {
        std::string names;
        std::string value;
        std::string help;
        bool* flag;
        std::optional<std::string>* text;
        std::vector<std::string>* texts;

        [[nodiscard]] bool takesValue() const { return text || texts; }
    };
    struct Group {
        std::string title;
        std::vector<Option> options;
    };

    [[nodiscard]] const Option* optionOf(std::string_view longName) const;
    [[nodiscard]] std::vector<std::string> withEmptyValuesApart(
        std::span<const std::string> arguments) const;
    [[noreturn]] void throwUnknown(const std::string& argument) const;
    [[nodiscard]] std::vector<std::string> operandsOf(std::vector<std::string> remaining) const;

    std::string m_command;
    std::string m_operands;
    std::string m_summary;
    std::string m_note;
    std::vector<Group> m_groups;
    std::vector<std::vector<std::string_view>> m_exclusive;
    bool m_help = false;
};

}  // namespace parvel::cli
