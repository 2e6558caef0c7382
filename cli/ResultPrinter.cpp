#include "cli/ResultPrinter.h"

#include <unistd.h>

#include "cli/Command.h"
#include "cli/Messages.h"

namespace parvel::cli {

ResultPrinter::ResultPrinter(std::string_view command, OutputForm form, MakeResultFormat makeText)
    : m_command(command), m_format(ResultFormat::make(form, makeText)), m_output(STDOUT_FILENO) {
    m_output.append(m_format->opening());
}

PrintedResult ResultPrinter::inForm(const Result& result) const {
    PrintedResult printed;
    m_format->append(result, printed.text);
    if (!result.succeeded())
        printed.failure = failureLine(m_command, result);
    return printed;
}

void ResultPrinter::print(const PrintedResult& printed) {
    if (!printed.text.empty()) {
        if (m_hasResult)
            m_output.append(m_format->separator());
        m_hasResult = true;
        m_output.append(printed.text);
    }
    if (!printed.failure.empty()) {
        m_hasFailure = true;
        m_output.flushForReader();
        writeToStandardError(printed.failure);
    }
}

int ResultPrinter::finish() {
    m_output.append(m_format->closing());
    return m_output.finish(m_command) && !m_hasFailure ? kSuccess : kFailure;
}

}  // namespace parvel::cli
