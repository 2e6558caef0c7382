#include "parvel/foundation/PVParvelLog.h"

#include <mutex>
#include <utility>

namespace parvel {
namespace {

constexpr std::size_t kLevels = static_cast<std::size_t>(LogLevel::Off) + 1;

/// What the threshold is made of, changed only under the lock.
struct LogSettings {
    std::mutex lock;
    std::shared_ptr<LogSink> commonSink;
    LogLevel commonLevel = LogLevel::Default;
    std::array<std::size_t, kLevels> threadSinks{};  ///< how many want each level at least

    /// The least level that any sink wants. Called under the lock.
    [[nodiscard]] int leastWanted() const {
        std::size_t level = 0;
        while (level < static_cast<std::size_t>(commonLevel) && threadSinks[level] == 0)
            ++level;
        return static_cast<int>(level);
    }
};

LogSettings& logSettings() {
    static LogSettings settings;
    return settings;
}

std::atomic<LogLevel> s_commonLevel{LogLevel::Default};
std::atomic<bool> s_hasCommonSink{false};
constinit thread_local ThreadLogSink* t_innermostSink = nullptr;

/// Null, and without a lock, where none was set.
std::shared_ptr<LogSink> currentCommonSink() {
    if (!s_hasCommonSink.load(std::memory_order_relaxed))
        return nullptr;
    const std::lock_guard guard(logSettings().lock);
    return logSettings().commonSink;
}

}  // namespace

std::string logText(const URL& url) {
    return url.absoluteString();
}

std::string logText(const Error& error) {
    return "Error Domain=" + error.domain() + " Code=" + std::to_string(error.code()) + " \"" +
           error.message() + "\"";
}

std::string logText(const Value& value) {
    const String* text = value.as<String>();
    return text ? *text : description(value);
}

constinit std::atomic<int> ParvelLog::s_threshold{static_cast<int>(LogLevel::Default)};

void ParvelLog::write(const LogLine& line) {
    if (const ThreadLogSink* scope = t_innermostSink) {
        if (line.level >= scope->m_least)
            scope->m_sink.write(line);
        return;
    }
    if (line.level < s_commonLevel.load(std::memory_order_relaxed))
        return;
    if (const std::shared_ptr<LogSink> sink = currentCommonSink())
        sink->write(line);
    else
        LogSink::host().write(line);
}

const ParvelLog& PVParvelLog() {
    static const ParvelLog log;
    return log;
}

void setLogSink(std::shared_ptr<LogSink> sink) {
    {
        const std::lock_guard guard(logSettings().lock);
        std::swap(logSettings().commonSink, sink);
        s_hasCommonSink.store(logSettings().commonSink != nullptr, std::memory_order_relaxed);
    }
    // The sink before it goes here, outside the lock, unless a line still holds it.
}

void setLogLevel(LogLevel level) {
    const std::lock_guard guard(logSettings().lock);
    logSettings().commonLevel = level;
    s_commonLevel.store(level, std::memory_order_relaxed);
    ParvelLog::s_threshold.store(logSettings().leastWanted(), std::memory_order_relaxed);
}

ThreadLogSink::ThreadLogSink(LogSink& sink, LogLevel least)
    : m_sink(sink), m_least(least), m_outer(t_innermostSink) {
    const std::lock_guard guard(logSettings().lock);
    ++logSettings().threadSinks[static_cast<std::size_t>(m_least)];
    ParvelLog::s_threshold.store(logSettings().leastWanted(), std::memory_order_relaxed);
    t_innermostSink = this;
}

ThreadLogSink::~ThreadLogSink() {
    t_innermostSink = m_outer;
    const std::lock_guard guard(logSettings().lock);
    --logSettings().threadSinks[static_cast<std::size_t>(m_least)];
    ParvelLog::s_threshold.store(logSettings().leastWanted(), std::memory_order_relaxed);
}

}  // namespace parvel
