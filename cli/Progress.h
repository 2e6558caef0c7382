#pragma once

#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <thread>

#include "cli/CommandLine.h"

namespace parvel::cli {

/// How far the work on one PATH has come, on standard error: a bar on one line, or a line of JSON
/// for each share. One thread at a time.
class Progress {
public:
    enum class Form { Auto, Always, Never, Json };

    /// `Auto` becomes `Never` where standard error is no terminal.
    Progress(Form form, std::string_view path);
    /// Takes the bar away.
    ~Progress();
    Progress(const Progress&) = delete;
    Progress& operator=(const Progress&) = delete;

    /// A share of 0 to 1; of a file that takes no room on the disk it is no such number.
    void report(double share);
    /// The share of the whole work, which has come to that PATH.
    void report(double share, std::string_view path);
    /// Shows the time alone, where the share is not known; nothing in JSON.
    void reportTime();

    [[nodiscard]] Form form() const { return m_form; }

private:
    [[nodiscard]] std::chrono::duration<double> elapsed() const;
    [[nodiscard]] std::string speedAndTimeLeft(double share);
    [[nodiscard]] bool isTooEarly() const;
    void printLine(double share) const;
    /// A bar of which the `filled` share is full behind the `from` share, if there is room for one.
    void draw(double from, double filled, std::string_view words);

    Form m_form;
    std::string m_path;
    std::chrono::steady_clock::time_point m_begin = std::chrono::steady_clock::now();
    std::optional<std::uint64_t> m_size;  ///< bytes of the PATH, once a bar has wanted them
    std::optional<int> m_percentage;      ///< that stands there
    bool m_hasDrawn = false;
};

/// The same for an operation that tells nobody how far it has come: a bar that moves while it
/// lives; in JSON the beginning, and the end once the work is done.
class BusyProgress {
public:
    BusyProgress(Progress::Form form, std::string_view path);
    ~BusyProgress();
    BusyProgress(const BusyProgress&) = delete;
    BusyProgress& operator=(const BusyProgress&) = delete;

    void finish();

private:
    void drawUntilEnd();

    Progress m_progress;
    std::mutex m_mutex;
    std::condition_variable m_end;
    bool m_hasEnded = false;
    std::thread m_thread;
};

/// The option --progress.
class ProgressOption {
public:
    void declare(CommandLine& line);
    /// Throws UsageError.
    [[nodiscard]] Progress::Form form() const;

private:
    std::optional<std::string> m_name;
};

}  // namespace parvel::cli
