#include "parvel/platform/linux/RoomAhead.h"

#include <fcntl.h>
#include <linux/magic.h>
#include <sys/stat.h>
#include <sys/vfs.h>
#include <unistd.h>

#include <algorithm>

namespace parvel::host {

namespace {

constexpr std::uint64_t kLeastSize = std::uint64_t{4} << 20;
/// Found in a few milliseconds, so that a cancel has not long to wait.
constexpr std::uint64_t kFoundAtOnce = std::uint64_t{16} << 20;

/// Others gain nothing, or no longer compress what is written there.
bool gainsByIt(int file) {
    struct statfs system {};
    return ::fstatfs(file, &system) == 0 &&
           (system.f_type == EXT4_SUPER_MAGIC || system.f_type == XFS_SUPER_MAGIC);
}

}  // namespace

void RoomAhead::reached(std::uint64_t written) {
    if (!m_isOfUse)
        m_isOfUse = m_size >= kLeastSize && gainsByIt(m_file);
    if (!*m_isOfUse || written < m_found || written >= m_size)
        return;
    const std::uint64_t length = std::min(kFoundAtOnce, m_size - written);
    m_found = written + length;  // some of it also where there is too little
    m_isOfUse = ::fallocate(m_file, FALLOC_FL_KEEP_SIZE, static_cast<off_t>(written),
                            static_cast<off_t>(length)) == 0;
}

void RoomAhead::giveBack() {
    struct stat status {};
    if (m_found > 0 && ::fstat(m_file, &status) == 0)
        static_cast<void>(::ftruncate(m_file, status.st_size) == 0);
}

}  // namespace parvel::host
