#include "cli/PathSource.h"

#include <cerrno>
#include <cstring>
#include <utility>

#include <fcntl.h>
#include <unistd.h>

#include "cli/Interrupt.h"
#include "cli/Result.h"

namespace parvel::cli {
namespace {

/// No path is longer (PATH_MAX is 4096). What is longer in a file of PATHs is cut here, so that it
/// fails as a name that is too long and not for want of memory.
constexpr std::size_t kLongestPath = 64 * 1024;

int openedForReading(const std::string& name) {
    if (name == "-")
        return STDIN_FILENO;
    const int descriptor = open(name.c_str(), O_RDONLY | O_CLOEXEC);
    if (descriptor < 0)
        throw UsageError("--files-from " + name + ": " + strerrordesc_np(errno));
    return descriptor;
}

}  // namespace

void PathOptions::declare(CommandLine& line) {
    declareSources(line);
    line.flag("-r,--recursive", "take every asset below a PATH that is a folder", recursive);
}

void PathOptions::declareSources(CommandLine& line) {
    line.group("Which assets");
    line.option("--files-from", "FILE",
                "read PATHs from FILE (\"-\" is standard input), a line each", filesFrom);
    line.flag("-0,--null", "the PATHs of --files-from end with a NUL", nulEnded);
}

PathFile::PathFile(const std::string& name, bool nulEnded)
    : m_name(name), m_descriptor(openedForReading(name)), m_separator(nulEnded ? '\0' : '\n') {}

PathFile::~PathFile() {
    if (m_descriptor != STDIN_FILENO)
        close(m_descriptor);
}

/// Reads on behind what is buffered; false at the end of the file, after an interrupt and after an
/// error.
bool PathFile::fill() {
    m_buffer.erase(0, m_offset);
    m_offset = 0;
    const std::size_t size = m_buffer.size();
    m_buffer.resize(size + kLongestPath);
    ssize_t count = -1;
    do {
        if (!waitForInput(m_descriptor))
            break;
        count = read(m_descriptor, m_buffer.data() + size, kLongestPath);
    } while (count < 0 && errno == EINTR);
    if (count < 0 && !interrupted())
        m_errno = errno;
    m_buffer.resize(size + (count > 0 ? static_cast<std::size_t>(count) : 0));
    m_ended = count <= 0;
    return !m_ended;
}

std::optional<FoundPath> PathFile::next() {
    std::string path;
    while (true) {
        const std::size_t end = m_buffer.find(m_separator, m_offset);
        const std::size_t stop = std::min(end, m_buffer.size());
        path.append(m_buffer, m_offset, std::min(stop - m_offset, kLongestPath - path.size()));
        m_offset = stop;
        if (end != std::string::npos) {
            ++m_offset;
            if (!path.empty())
                return FoundPath{std::move(path)};
        } else if (m_ended || !fill()) {
            break;
        }
    }
    if (m_errno != 0)
        return FoundPath{m_name, std::exchange(m_errno, 0)};
    // A last line needs no separator; one that an interrupt cut short is no PATH.
    if (path.empty() || interrupted())
        return std::nullopt;
    return FoundPath{std::move(path)};
}

PathSource::PathSource(std::vector<std::string> operands, const PathOptions& options)
    : m_operands(std::make_move_iterator(operands.begin()),
                 std::make_move_iterator(operands.end())),
      m_recursive(options.recursive),
      m_walksFirst(options.walksFirst),
      m_target(options.target) {
    if (options.nulEnded && !options.filesFrom)
        throw UsageError("-0 says how the PATHs of --files-from end, and that is not given");
    if (options.filesFrom)
        m_file = std::make_unique<PathFile>(*options.filesFrom, options.nulEnded);
    else if (m_operands.empty())
        throw UsageError("no PATH is given");
}

std::optional<std::size_t> PathSource::count() const {
    if (m_file || m_recursive)
        return std::nullopt;
    return m_operands.size();
}

std::optional<FoundPath> PathSource::nextGiven() {
    if (m_operands.empty())
        return m_file ? m_file->next() : std::nullopt;
    FoundPath path{std::move(m_operands.front())};
    m_operands.pop_front();
    return path;
}

std::optional<FoundPath> PathSource::nextFound() {
    if (!m_found.empty()) {
        FoundPath found = std::move(m_found.front());
        m_found.pop_front();
        return found;
    }
    return m_walk ? m_walk->next() : std::nullopt;
}

void PathSource::begin(std::string folder) {
    m_walk = std::make_unique<AssetWalk>(std::move(folder));
    if (!m_walksFirst)
        return;
    const std::optional<URL> target =
        m_target ? std::optional(m_target->standardized()) : std::nullopt;
    while (std::optional<FoundPath> found = m_walk->next()) {
        if (interrupted())
            break;
        const URL parent = urlOfPath(found->path).deletingLastPathComponent();
        if (!target || parent.standardized() != *target)
            m_found.push_back(std::move(*found));
    }
}

std::optional<FoundPath> PathSource::next() {
    while (true) {
        if (std::optional<FoundPath> found = nextFound())
            return found;
        std::optional<FoundPath> given = nextGiven();
        if (!given || given->readErrno != 0 || !m_recursive || !isPlainFolder(given->path))
            return given;
        begin(std::move(given->path));
    }
}

}  // namespace parvel::cli
