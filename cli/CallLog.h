#pragma once

#include <string>
#include <string_view>

#include "parvel/foundation/PVParvelLog.h"

namespace parvel::cli {

/// "off", "fault", "error", "default" or "debug" as a level; throws UsageError for anything else.
LogLevel logLevelOfName(std::string_view name);

/// From here on the library's lines at that level and above go to standard error as they are made.
void printLogLines(LogLevel least);

/// Listens to the library on one thread while it lives: prints what is to be printed, and keeps the
/// line that tells best why the call that runs yields nothing.
class CallLog : private LogSink {
public:
    /// `least` is the least level that may hold the reason.
    explicit CallLog(LogLevel least = LogLevel::Default);

    /// Forgets the last call.
    void clear();
    /// Why the call yielded nothing, in words for a person; empty when nothing was said.
    [[nodiscard]] const std::string& reason() const { return m_reason; }
    /// Whether a step failed that is known for what it means to a person.
    [[nodiscard]] bool hasKnownReason() const;

private:
    void write(const LogLine& line) override;

    std::string m_reason;
    int m_rank = 0;
    ThreadLogSink m_scope;
};

}  // namespace parvel::cli
