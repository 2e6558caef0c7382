#pragma once

#include <chrono>
#include <optional>
#include <string>
#include <string_view>

#include "cli/CommandLine.h"

namespace parvel::cli {

/// How far the work on one PATH has come, on standard error: a bar on one line, or a line of JSON
/// for each share.
class Progress {
public:
    enum class Form { Auto, Always, Never, Json };

    Progress(Form form, std::string_view path);
    /// Takes the bar away.
    ~Progress();
    Progress(const Progress&) = delete;
    Progress& operator=(const Progress&) = delete;

    /// A share of 0 to 1; of a file that takes no room on the disk it is no such number.
    void report(double share);

private:
    void printLine(double share) const;
    void drawBar(double share);

    Form m_form;
    std::string m_path;
    std::chrono::steady_clock::time_point m_begin = std::chrono::steady_clock::now();
    std::optional<int> m_drawn;  ///< the percentage that stands there
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
