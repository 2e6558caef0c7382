#include "parvel/platform/linux/WriteBehind.h"

#include <fcntl.h>

#include <algorithm>
#include <cerrno>
#include <utility>

namespace parvel::host {

namespace {

constexpr std::uint64_t kLeastStarted = std::uint64_t{1} << 20;
/// What may be written that is not on the disk.
constexpr std::uint64_t kMostBehind = std::uint64_t{8} << 20;
constexpr std::size_t kMostFilesBehind = 32;
constexpr unsigned kStart = SYNC_FILE_RANGE_WRITE;
constexpr unsigned kAwait =
    SYNC_FILE_RANGE_WAIT_BEFORE | SYNC_FILE_RANGE_WRITE | SYNC_FILE_RANGE_WAIT_AFTER;

/// A length of 0 is to the end. A failed write is told once, here or by the last sync; a missing
/// service is no failure.
int syncRange(int file, std::uint64_t from, std::uint64_t length, unsigned flags) {
    const int result =
        ::sync_file_range(file, static_cast<off_t>(from), static_cast<off_t>(length), flags);
    return result != 0 && (errno == EIO || errno == ENOSPC || errno == EDQUOT) ? errno : 0;
}

}  // namespace

int WriteBehind::reached(std::uint64_t size) {
    if (size - m_started < kLeastStarted || size <= kMostBehind)
        return 0;
    if (const int error = syncRange(m_file, m_started, size - m_started, kStart))
        return error;
    m_started = size;
    const std::uint64_t due = size - kMostBehind;
    if (due <= m_awaited)
        return 0;
    const int error = syncRange(m_file, m_awaited, due - m_awaited, kAwait);
    m_awaited = due;
    return error;
}

int TreeBehind::add(int file, std::uint64_t size) {
    const std::uint64_t behind = std::min(size, kMostBehind);
    if (m_leftToLastSync + behind <= kMostBehind) {
        m_leftToLastSync += behind;
        return 0;
    }
    FileDescriptor kept(::fcntl(file, F_DUPFD_CLOEXEC, 0));
    if (!kept)
        return 0;  // left to the last sync, too
    if (const int error = syncRange(file, 0, 0, kStart))
        return error;
    m_files.push_back({std::move(kept), behind});
    m_behind += behind;
    while (m_behind > kMostBehind || m_files.size() > kMostFilesBehind) {
        if (const int error = awaitOldest())
            return error;
    }
    return 0;
}

int TreeBehind::awaitOldest() {
    const File oldest = std::move(m_files.front());
    m_files.pop_front();
    m_behind -= oldest.behind;
    return syncRange(oldest.descriptor.get(), 0, 0, kAwait);
}

}  // namespace parvel::host
