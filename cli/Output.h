#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace parvel::cli {

/// Standard output, buffered. After the first failed write everything is dropped; `finish` says
/// what happened. One thread at a time.
class Output {
public:
    explicit Output(int descriptor);

    void append(std::string_view text);
    /// Writes what is buffered, but leaves a regular file's bytes for later: nobody waits there.
    void flushForReader();
    void flush();

    [[nodiscard]] bool failed() const { return m_errno != 0; }
    /// Writes the rest. False when any write failed; a reader that went away early (EPIPE) is no
    /// news to anybody, anything else is printed as a message.
    bool finish(std::string_view command);

private:
    int m_descriptor;
    bool m_isRegularFile;
    int m_errno = 0;
    std::string m_buffer;
};

/// Takes the numbers of those standard streams that are closed, so that no file which is opened
/// later is written to, or read, as one of them. Using such a stream goes on failing. Called first
/// of all.
void holdStandardStreams();

/// Writes the whole text; the errno of the write that failed, else 0.
[[nodiscard]] int writeAll(int descriptor, std::string_view text);

/// Writes the whole text to standard error in one call, so that lines of several threads stay
/// whole.
void writeToStandardError(std::string_view text);

}  // namespace parvel::cli
