#include "cli/Progress.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <filesystem>
#include <system_error>

#include <unistd.h>

#include "cli/JsonWriter.h"
#include "cli/Output.h"
#include "cli/Result.h"
#include "cli/TerminalText.h"

namespace parvel::cli {
namespace {

using namespace std::chrono_literals;

/// Shorter work needs no bar.
constexpr auto kShortWork = 500ms;
/// Before that a speed is a guess.
constexpr auto kMeasurable = 1s;
constexpr auto kStep = 100ms;
constexpr std::size_t kBarWidth = 30;
constexpr std::size_t kNarrowestBar = 5;
constexpr double kMovingShare = 0.2;
constexpr double kWayInSeconds = 2.4;
constexpr double kLongestLeft = 100 * 3600;
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

/// The bytes of a file or of all files in a folder; as far as they can be seen.
std::uint64_t sizeOfItem(const std::string& path) {
    namespace fs = std::filesystem;
    std::error_code unknown;
    if (fs::is_regular_file(path, unknown))
        return fs::file_size(path, unknown);
    std::uint64_t size = 0;
    fs::recursive_directory_iterator entries(path, unknown);
    for (; !unknown && entries != fs::recursive_directory_iterator(); entries.increment(unknown)) {
        std::error_code gone;
        const std::uint64_t bytes = entries->is_regular_file(gone) ? entries->file_size(gone) : 0;
        size += gone ? 0 : bytes;
    }
    return size;
}

/// "1:05", "2:00:00".
std::string clockText(double seconds) {
    const auto whole = static_cast<int>(std::clamp(seconds, 0.0, kLongestLeft));
    const auto twoDigits = [](int number) {
        return (number < 10 ? "0" : "") + std::to_string(number);
    };
    const int minutes = whole / 60;
    const std::string end = ":" + twoDigits(whole % 60);
    if (minutes < 60)
        return std::to_string(minutes) + end;
    return std::to_string(minutes / 60) + ":" + twoDigits(minutes % 60) + end;
}

/// "12.3 MB/s"
std::string speedText(double bytesPerSecond) {
    const auto tenths = static_cast<std::uint64_t>(std::clamp(bytesPerSecond / 1e5, 0.0, 1e9));
    return std::to_string(tenths / 10) + "." + std::to_string(tenths % 10) + " MB/s";
}

/// A bar for a line of which so much is free, with its brackets and the space behind it; empty
/// where that is too little.
std::string barText(double from, double filled, std::size_t free) {
    constexpr std::size_t around = 3;
    if (free < around + kNarrowestBar)
        return {};
    const std::size_t width = std::min(kBarWidth, free - around);
    const auto begin = static_cast<std::size_t>(from * static_cast<double>(width));
    const auto full = static_cast<std::size_t>(filled * static_cast<double>(width));
    return "[" + std::string(begin, ' ') + std::string(full, '#') +
           std::string(width - begin - full, ' ') + "] ";
}

}  // namespace

Progress::Progress(Form form, std::string_view path) : m_form(form), m_path(path) {
    if (form == Form::Auto && !isCapableTerminal(STDERR_FILENO))
        m_form = Form::Never;
}

Progress::~Progress() {
    if (m_hasDrawn)
        writeToStandardError(kClearLine);
}

std::chrono::duration<double> Progress::elapsed() const {
    return std::chrono::steady_clock::now() - m_begin;
}

bool Progress::isTooEarly() const {
    return m_form == Form::Auto && elapsed() < kShortWork;
}

void Progress::report(double share) {
    if (m_form == Form::Json)
        printLine(share);
    if (m_form == Form::Json || m_form == Form::Never || isTooEarly())
        return;
    const double known = std::isfinite(share) ? std::clamp(share, 0.0, 1.0) : 1.0;
    const int percentage = static_cast<int>(known * 100);
    if (m_percentage == percentage)
        return;
    m_percentage = percentage;
    draw(0, percentage / 100.0, std::to_string(percentage) + " %" + speedAndTimeLeft(known));
}

void Progress::report(double share, std::string_view path) {
    m_path = path;
    m_size = 0;  // that of the whole work is not known
    report(share);
}

void Progress::reportTime() {
    if (m_form == Form::Json || m_form == Form::Never || isTooEarly())
        return;
    const double seconds = elapsed().count();
    const double way = std::fmod(seconds / kWayInSeconds, 2);
    const double from = (way < 1 ? way : 2 - way) * (1 - kMovingShare);
    draw(from, kMovingShare, clockText(seconds));
}

void Progress::printLine(double share) const {
    std::string line = "{\"path\":";
    appendJsonString(m_path, line);
    line += ",\"percentComplete\":";
    appendJson(Value(Number::real(share)), line);
    writeToStandardError(line + "}\n");
}

std::string Progress::speedAndTimeLeft(double share) {
    const double seconds = elapsed().count();
    if (elapsed() < kMeasurable || share <= 0 || share >= 1)
        return {};
    if (!m_size)
        m_size = sizeOfItem(urlOfPath(m_path).path());
    const std::string left = " " + clockText(seconds * (1 - share) / share) + " left";
    return *m_size == 0 ? left
                        : " " + speedText(static_cast<double>(*m_size) * share / seconds) + left;
}

void Progress::draw(double from, double filled, std::string_view words) {
    m_hasDrawn = true;
    // A line that is full would go on in the next one, and stay there.
    const std::size_t width = terminalWidth(STDERR_FILENO) - 1;
    std::string line(cutText(words, width));
    line.insert(0, barText(from, filled, width - line.size()));
    line += " " + safeText(lastComponentOfPath(m_path));
    writeToStandardError(std::string(kClearLine) + std::string(cutText(line, width)));
}

BusyProgress::BusyProgress(Progress::Form form, std::string_view path) : m_progress(form, path) {
    if (m_progress.form() == Progress::Form::Json)
        m_progress.report(0);
    if (m_progress.form() != Progress::Form::Auto && m_progress.form() != Progress::Form::Always)
        return;
    try {
        m_thread = std::thread([this] { drawUntilEnd(); });
    } catch (const std::system_error&) {
        return;  // the system has no more threads; the work does without a bar
    }
}

BusyProgress::~BusyProgress() {
    {
        const std::lock_guard lock(m_mutex);
        m_hasEnded = true;
    }
    m_end.notify_one();
    if (m_thread.joinable())
        m_thread.join();
}

void BusyProgress::drawUntilEnd() {
    std::unique_lock lock(m_mutex);
    do {
        m_progress.reportTime();
    } while (!m_end.wait_for(lock, kStep, [this] { return m_hasEnded; }));
}

void BusyProgress::finish() {
    if (m_progress.form() == Progress::Form::Json)
        m_progress.report(1);
}

void ProgressOption::declare(CommandLine& line) {
    line.option("--progress", "WHEN",
                "show on standard error how far the work has come: auto\n"
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
