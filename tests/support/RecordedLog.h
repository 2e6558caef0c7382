#pragma once

#include <string>
#include <vector>

#include "parvel/foundation/PVParvelLog.h"

namespace parvel::testing {

/// Records every line of the calling thread, from debug up, as "level message" while it lives.
class RecordedLog : private LogSink {
public:
    RecordedLog() : m_scope(*this, LogLevel::Debug) {}

    [[nodiscard]] const std::vector<std::string>& lines() const { return m_lines; }
    void clear() { m_lines.clear(); }

private:
    void write(const LogLine& line) override {
        static constexpr const char* names[] = {"debug", "default", "error", "fault"};
        m_lines.push_back(std::string(names[static_cast<int>(line.level)]) + " " + line.message());
    }

    std::vector<std::string> m_lines;
    ThreadLogSink m_scope;
};

}  // namespace parvel::testing
