#include "cli/Progress.h"

#include <algorithm>
#include <array>
#include <cmath>

#include <unistd.h>

#include "cli/JsonWriter.h"
#include "cli/Output.h"
#include "cli/TerminalText.h"
#include "parvel/foundation/URL.h"

namespace parvel::cli {
namespace {

using namespace std::chrono_literals;

/// Shorter work needs no bar.
constexpr auto kShortWork = 500ms;
constexpr int kBarWidth = 30;
constexpr std::string_view kClearLine = "\r\x1b[K";

struct FormName {
    std::string_view name;
    Progress::Form form;
};

constexpr std::array kForms{
    FormName{"auto", Progress::Form::Auto},
    FormName{"always", Progress::Form::Always},
    FormName{"never", Progress::Form::Never},
    FormName{"json", Progress::Form::Json},
};

}  // namespace

Progress::Progress(Form form, std::string_view path) : m_form(form), m_path(path) {
    if (form == Form::Auto && isatty(STDERR_FILENO) == 0)
        m_form = Form::Never;
}

Progress::~Progress() {
    if (m_drawn)
        writeToStandardError(kClearLine);
}

void Progress::report(double share) {
    if (m_form == Form::Json)
        printLine(share);
    else if (m_form != Form::Never)
        drawBar(share);
}

void Progress::printLine(double share) const {
    std::string line = "{\"path\":";
    appendJsonString(m_path, line);
    line += ",\"percentComplete\":";
    appendJson(Value(Number::real(share)), line);
    writeToStandardError(line + "}\n");
}

void Progress::drawBar(double share) {
    if (m_form == Form::Auto && std::chrono::steady_clock::now() - m_begin < kShortWork)
        return;
    const int percentage =
        std::isfinite(share) ? static_cast<int>(std::clamp(share, 0.0, 1.0) * 100) : 100;
    if (m_drawn == percentage)
        return;
    m_drawn = percentage;
    const int filled = percentage * kBarWidth / 100;
    std::string line(kClearLine);
    line += "[" + std::string(static_cast<std::size_t>(filled), '#') +
            std::string(static_cast<std::size_t>(kBarWidth - filled), ' ') + "] ";
    line += std::to_string(percentage) + " % " + safeText(lastComponentOfPath(m_path));
    writeToStandardError(line);
}

void ProgressOption::declare(CommandLine& line) {
    line.option("--progress", "WHEN",
                "show on standard error how far a copy has come: auto\n"
                "(at a terminal, where it takes long), always, never or\n"
                "json",
                m_name);
}

Progress::Form ProgressOption::form() const {
    if (!m_name)
        return Progress::Form::Auto;
    const auto found = std::find_if(kForms.begin(), kForms.end(),
                                    [this](const FormName& form) { return form.name == *m_name; });
    if (found == kForms.end())
        throw UsageError("--progress " + *m_name + ": not one of auto, always, never, json");
    return found->form;
}

}  // namespace parvel::cli
