#pragma once

#include <array>
#include <atomic>
#include <concepts>
#include <cstddef>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <type_traits>

#include "parvel/foundation/Error.h"
#include "parvel/foundation/PVExport.h"
#include "parvel/foundation/URL.h"
#include "parvel/foundation/Value.h"
#include "parvel/platform/LogSink.h"

namespace parvel {

/// How an argument prints in a log line. Absent ones print as "(null)".
inline std::string logText(std::string_view text) {
    return std::string(text);
}
inline std::string logText(const std::string& text) {
    return text;
}
inline std::string logText(const char* text) {
    return text ? text : "(null)";
}
/// Flags as 1 and 0.
template <std::integral T>
std::string logText(T number) {
    return std::to_string(number);
}
/// The absolute string.
PV_EXPORT std::string logText(const URL& url);
/// `Error Domain=D Code=N "reason or description"`.
PV_EXPORT std::string logText(const Error& error);
/// A string as it is, any other value as its description.
PV_EXPORT std::string logText(const Value& value);
template <class T>
std::string logText(const T* object) {
    return object ? logText(*object) : "(null)";
}
template <class T>
std::string logText(const std::optional<T>& object) {
    return object ? logText(*object) : "(null)";
}
template <class T>
std::string logText(const std::shared_ptr<T>& object) {
    return object ? logText(*object) : "(null)";
}

/// A log line's text: a literal with as many placeholders (%@ %d %ld %lu %llu %s; %% is none) as
/// the call has arguments, counted while compiling.
template <class... Arguments>
class LogFormat {
public:
    consteval LogFormat(const char* text) : m_text(text) {
        if (placeholders(m_text) != sizeof...(Arguments))
            throw "the number of placeholders and of arguments differ";
    }
    [[nodiscard]] constexpr std::string_view text() const { return m_text; }

private:
    static consteval std::size_t placeholders(std::string_view text) {
        std::size_t count = 0;
        for (; !text.empty(); text.remove_prefix(text.starts_with("%%") ? 2 : 1)) {
            if (placeholderLength(text) > 0)
                ++count;
        }
        return count;
    }

    std::string_view m_text;
};

/// The library's log handle: subsystem "com.kestrel.PVAgentService", category "Parvel". The level
/// is tested before any argument is described; a level that is off costs one relaxed load.
class ParvelLog {
public:
    static constexpr std::string_view subsystem = "com.kestrel.PVAgentService";
    static constexpr std::string_view category = "Parvel";

    [[nodiscard]] bool isEnabled(LogLevel level) const {
        return static_cast<int>(level) >= s_threshold.load(std::memory_order_relaxed);
    }

    template <class... A>
    void debug(LogFormat<std::type_identity_t<A>...> format, const A&... arguments) const {
        log(LogLevel::Debug, format.text(), arguments...);
    }
    /// At level default, the level of progress lines and of most failures.
    template <class... A>
    void info(LogFormat<std::type_identity_t<A>...> format, const A&... arguments) const {
        log(LogLevel::Default, format.text(), arguments...);
    }
    template <class... A>
    void error(LogFormat<std::type_identity_t<A>...> format, const A&... arguments) const {
        log(LogLevel::Error, format.text(), arguments...);
    }
    template <class... A>
    void fault(LogFormat<std::type_identity_t<A>...> format, const A&... arguments) const {
        log(LogLevel::Fault, format.text(), arguments...);
    }

private:
    friend class ThreadLogSink;
    friend void setLogLevel(LogLevel level);

    template <class... A>
    void log(LogLevel level, std::string_view text, const A&... arguments) const {
        if (!isEnabled(level))
            return;
        const std::array<LogArgument, sizeof...(A)> list{LogArgument{
            &arguments,
            [](const void* object) { return logText(*static_cast<const A*>(object)); }}...};
        write(LogLine{level, subsystem, category, text, list});
    }
    PV_EXPORT static void write(const LogLine& line);

    /// The least level that any sink wants.
    PV_EXPORT static std::atomic<int> s_threshold;
};

/// The library's one log handle.
PV_EXPORT const ParvelLog& PVParvelLog();

/// Sends the lines of all threads to this sink; null goes back to the host's. Lines being written
/// meanwhile may still reach the sink before it, which is kept until they are done.
PV_EXPORT void setLogSink(std::shared_ptr<LogSink> sink);
/// The least level that reaches the common sink: Default at first, Off for none.
PV_EXPORT void setLogLevel(LogLevel level);

/// While it lives, the lines of the thread that made it go to this sink alone, from the given level
/// up, whatever the common level is. Scopes nest; the innermost receives the lines.
class PV_EXPORT ThreadLogSink {
public:
    ThreadLogSink(LogSink& sink, LogLevel least);
    ~ThreadLogSink();
    ThreadLogSink(const ThreadLogSink&) = delete;
    ThreadLogSink& operator=(const ThreadLogSink&) = delete;

private:
    friend class ParvelLog;

    LogSink& m_sink;
    LogLevel m_least;
    ThreadLogSink* m_outer;
};

}  // namespace parvel
