#include "cli/Output.h"

#include <cerrno>
#include <cstring>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "cli/Command.h"
#include "cli/Messages.h"

namespace parvel::cli {
namespace {

constexpr std::size_t kFull = 64 * 1024;

bool isRegularFile(int descriptor) {
    struct stat status {};
    return fstat(descriptor, &status) == 0 && S_ISREG(status.st_mode);
}

}  // namespace

Output::Output(int descriptor)
    : m_descriptor(descriptor), m_isRegularFile(isRegularFile(descriptor)) {}

void Output::append(std::string_view text) {
    if (failed())
        return;
    m_buffer += text;
    if (m_buffer.size() >= kFull)
        flush();
}

void Output::flushForReader() {
    if (!m_isRegularFile)
        flush();
}

void Output::flush() {
    if (!failed())
        m_errno = writeAll(m_descriptor, m_buffer);
    m_buffer.clear();
}

bool Output::finish(std::string_view command) {
    flush();
    if (failed() && m_errno != EPIPE)
        writeToStandardError(
            problemLine(command, std::string("standard output: ") + strerrordesc_np(m_errno)));
    return !failed();
}

void holdStandardStreams() {
    // A file gets the lowest number that is free, which is the stream's own.
    for (const int stream : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
        const int wrongWay = stream == STDIN_FILENO ? O_WRONLY : O_RDONLY;
        if (fcntl(stream, F_GETFD) < 0 && open("/dev/null", wrongWay) < 0)
            _exit(kFailure);
    }
}

int writeAll(int descriptor, std::string_view text) {
    while (!text.empty()) {
        const ssize_t written = write(descriptor, text.data(), text.size());
        if (written >= 0)
            text.remove_prefix(static_cast<std::size_t>(written));
        else if (errno != EINTR)
            return errno;
    }
    return 0;
}

void writeToStandardError(std::string_view text) {
    // Nobody is left to tell when standard error itself fails.
    (void)writeAll(STDERR_FILENO, text);
}

}  // namespace parvel::cli
