#pragma once

#include <memory>
#include <string>
#include <string_view>

#include "cli/Output.h"
#include "cli/ResultFormat.h"

namespace parvel::cli {

/// Prints the results of a command that has them one by one: each on standard output, and a line
/// for each failure on standard error.
class ResultPrinter {
public:
    ResultPrinter(std::string_view command, OutputForm form, MakeResultFormat makeText);

    void print(const Result& result);
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
