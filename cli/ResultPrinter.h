#pragma once

#include <memory>
#include <string>
#include <string_view>

#include "cli/Output.h"
#include "cli/ResultFormat.h"

namespace parvel::cli {

/// A result as it is printed: on standard output, and a line on standard error where it failed.
struct PrintedResult {
    std::string text;
    std::string failure;
};

/// Prints the results of a command. One thread at a time, but for `inForm`.
class ResultPrinter {
public:
    ResultPrinter(std::string_view command, OutputForm form, MakeResultFormat makeText);

    /// Whether results stand in the order of their PATHs.
    [[nodiscard]] bool keepsOrder() const { return m_format->keepsOrder(); }
    /// Callable from many threads at once.
    [[nodiscard]] PrintedResult inForm(const Result& result) const;

    void print(const PrintedResult& printed);
    void print(const Result& result) { print(inForm(result)); }
    /// Lets whoever reads along see what is printed.
    void flushForReader() { m_output.flushForReader(); }
    /// Whether nothing can be printed any more.
    [[nodiscard]] bool hasLostOutput() const { return m_output.failed(); }
    /// Ends the list; the exit status.
    [[nodiscard]] int finish();

private:
    std::string m_command;
    std::unique_ptr<ResultFormat> m_format;
    Output m_output;
    bool m_hasResult = false;
    bool m_hasFailure = false;
};

}  // namespace parvel::cli
