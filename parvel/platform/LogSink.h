#pragma once

#include <cstddef>
#include <span>
#include <string>
#include <string_view>

#include "parvel/foundation/PVExport.h"

namespace parvel {

/// Levels from the least telling to the most; Off is above every line.
enum class LogLevel { Debug, Default, Error, Fault, Off };

/// The length of the placeholder that a log text begins with (%@ %d %ld %lu %llu %s), 0 for any
/// other beginning.
constexpr std::size_t placeholderLength(std::string_view text) {
    for (std::string_view placeholder : {"%@", "%d", "%ld", "%lu", "%llu", "%s"}) {
        if (text.starts_with(placeholder))
            return placeholder.size();
    }
    return 0;
}

/// One argument of a log line, described only when somebody asks for the message.
struct LogArgument {
    const void* object;
    std::string (*describe)(const void* object);
};

/// One line on its way to a sink; valid during the call alone.
struct PV_EXPORT LogLine {
    LogLevel level;
    std::string_view subsystem;
    std::string_view category;
    std::string_view text;  ///< as documented, placeholders unfilled: "Getting metadata: %@"
    std::span<const LogArgument> arguments;

    /// The text with its placeholders filled, as valid UTF-8.
    [[nodiscard]] std::string message() const;
};

/// Where log lines go. A sink is called on the thread that logs, from many threads at once, and
/// must not log itself.
class PV_EXPORT LogSink {
public:
    virtual ~LogSink() = default;
    virtual void write(const LogLine& line) = 0;

    /// The systemd journal by its native fields (MESSAGE, PRIORITY, SUBSYSTEM, CATEGORY) where
    /// there is one; else lines go nowhere.
    static LogSink& host();
};

}  // namespace parvel
