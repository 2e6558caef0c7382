#include "cli/ResultPrinter.h"

#include <unistd.h>

#include "cli/Command.h"
#include "cli/Messages.h"

namespace parvel::cli {

ResultPrinter::ResultPrinter(std::string_view command, OutputForm form, MakeResultFormat makeText)
    : m_command(command), m_format(ResultFormat::make(form, makeText)), m_output(STDOUT_FILENO) {
    m_output.append(m_format->opening());
}

void ResultPrinter::print(const Result& result) {
    std::string text;
    m_format->append(result, text);
    if (!text.empty()) {
        if (m_hasResult)
            m_output.append(m_format->separator());
        m_hasResult = true;
        m_output.append(text);
    }
    if (!result.succeeded()) {
        m_hasFailure = true;
        m_output.flushForReader();
        writeToStandardError(failureLine(m_command, result));
    }
}

int ResultPrinter::finish() {
    m_output.append(m_format->closing());
    return m_output.finish(m_command) && !m_hasFailure ? kSuccess : kFailure;
}

}  // namespace parvel::cli
