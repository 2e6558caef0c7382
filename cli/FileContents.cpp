#include "cli/FileContents.h"

#include <cerrno>
#include <cstring>

#include <fcntl.h>
#include <unistd.h>

#include "cli/Interrupt.h"

namespace parvel::cli {
namespace {

/// Standard input may be shared with others, and blocks.
int openedForReading(const std::string& path, bool& blocks) {
    blocks = path == "-";
    return blocks ? fcntl(STDIN_FILENO, F_DUPFD_CLOEXEC, STDERR_FILENO + 1)
                  : open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY);
}

/// As `read`, but waits for a pipe's writer, and no longer than until an interrupt.
ssize_t readWaiting(int descriptor, bool blocks, char* bytes, std::size_t size) {
    bool mayRead = !blocks || waitForInput(descriptor);
    while (mayRead) {
        const ssize_t count = read(descriptor, bytes, size);
        if (count >= 0 || (errno != EAGAIN && errno != EINTR))
            return count;
        mayRead = waitForInput(descriptor);
    }
    errno = EINTR;
    return -1;
}

}  // namespace

// A pipe that nobody writes to is empty.
std::optional<std::string> contentsOfFile(const std::string& path, std::size_t longest,
                                          std::string& problem) {
    static constexpr std::size_t piece = 256 * 1024;
    bool blocks = false;
    const int descriptor = openedForReading(path, blocks);
    if (descriptor < 0) {
        problem = strerrordesc_np(errno);
        return std::nullopt;
    }
    std::string contents;
    ssize_t count = 0;
    do {
        const std::size_t size = contents.size();
        contents.resize(size + piece);
        count = readWaiting(descriptor, blocks, contents.data() + size, piece);
        contents.resize(size + (count > 0 ? static_cast<std::size_t>(count) : 0));
        if (contents.size() > longest) {
            count = -1;
            errno = EFBIG;
        }
    } while (count > 0);
    if (count < 0)
        problem = strerrordesc_np(errno);
    close(descriptor);
    return count < 0 ? std::nullopt : std::optional(std::move(contents));
}

}  // namespace parvel::cli
