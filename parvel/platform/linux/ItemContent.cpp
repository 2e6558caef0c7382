#include "parvel/platform/linux/ItemContent.h"

#include <fcntl.h>
#include <linux/fs.h>
#include <sys/ioctl.h>
#include <sys/sendfile.h>
#include <sys/vfs.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "parvel/platform/linux/RoomAhead.h"
#include "parvel/platform/linux/SystemCall.h"

namespace parvel::host {

namespace {

constexpr std::size_t kCopyPiece = std::size_t{1} << 20;
/// Shared in less time than a piece is copied.
constexpr std::uint64_t kSharedPiece = std::uint64_t{16} << 20;
constexpr int kMostTries = 100;
constexpr long kFuseMagic = 0x65735546;
constexpr std::string_view kUserAttributes = "user.";
constexpr const char* kAccessList = "system.posix_acl_access";

/// The ways to copy a piece, best first: blocks are shared, or copied by the kernel, or by us.
enum class PieceWay { Share, Range, Sendfile, Buffer };

/// Copies a file of a given size, and what it has grown by.
class PieceCopy {
public:
    PieceCopy(int from, int to, std::uint64_t size)
        : m_from(from), m_to(to), m_size(size), m_room(to, size) {}

    /// The length copied; 0 at the end of the file, and negative with errno set.
    ssize_t next() {
        for (;;) {
            const ssize_t length = retried([&] { return copyPiece(); });
            if (length > 0)
                m_copied += static_cast<std::uint64_t>(length);
            if (length > 0 || m_way == PieceWay::Buffer || (length < 0 && !canFallBack(errno)))
                return length;
            if (m_way == PieceWay::Share) {
                if (!startBehindShared())
                    return -1;
                continue;
            }
            // Some file systems answer 0 early, so reading alone shows the end.
            m_way = length < 0 && m_way == PieceWay::Range ? PieceWay::Sendfile : PieceWay::Buffer;
        }
    }

    /// For a copy that does not come to its end.
    void giveRoomBack() { m_room.giveBack(); }

private:
    static bool canFallBack(int error) {
        return error == EXDEV || error == EINVAL || error == ENOSYS || error == EOPNOTSUPP ||
               error == EBADF || error == ENOTTY;
    }

    /// Sharing leaves the positions of the files where they are.
    bool startBehindShared() {
        m_way = PieceWay::Range;
        const auto shared = static_cast<off_t>(m_copied);
        return m_copied == 0 || (::lseek(m_from, shared, SEEK_SET) == shared &&
                                 ::lseek(m_to, shared, SEEK_SET) == shared);
    }

    ssize_t sharePiece() {
        const std::uint64_t length = std::min(kSharedPiece, m_size - m_copied);
        file_clone_range range{};
        range.src_fd = m_from;
        range.src_offset = range.dest_offset = m_copied;
        range.src_length = length;
        if (length == 0 || ::ioctl(m_to, FICLONERANGE, &range) != 0)
            return length == 0 ? 0 : -1;
        return static_cast<ssize_t>(length);
    }

    ssize_t copyPiece() {
        if (m_way != PieceWay::Share)
            m_room.reached(m_copied);
        switch (m_way) {
            case PieceWay::Share:
                return sharePiece();
            case PieceWay::Range:
                return ::copy_file_range(m_from, nullptr, m_to, nullptr, kCopyPiece, 0);
            case PieceWay::Sendfile:
                return ::sendfile(m_to, m_from, nullptr, kCopyPiece);
            case PieceWay::Buffer:
                break;
        }
        if (!m_buffer)
            m_buffer = std::make_unique_for_overwrite<char[]>(kCopyPiece);
        const ssize_t length = ::read(m_from, m_buffer.get(), kCopyPiece);
        for (ssize_t at = 0; at < length;) {
            const ssize_t written = retried([&] {
                return ::write(m_to, m_buffer.get() + at, static_cast<std::size_t>(length - at));
            });
            if (written < 0)
                return written;
            at += written;
        }
        return length;
    }

    int m_from;
    int m_to;
    std::uint64_t m_size;
    std::uint64_t m_copied = 0;
    PieceWay m_way = PieceWay::Share;
    RoomAhead m_room;
    std::unique_ptr<char[]> m_buffer;
};

/// 0 or the errno value.
int copyAll(PieceCopy& pieces, std::uint64_t size, const PieceReport& report) {
    std::uint64_t copied = 0;
    for (;;) {
        const ssize_t length = pieces.next();
        if (length < 0)
            return errno;
        copied += static_cast<std::uint64_t>(length);
        // Cut short, or grown, while it was copied.
        if (copied > size || (length == 0 && copied < size))
            return EIO;
        if (length == 0)
            return 0;
        if (const int error = report ? report(copied) : 0)
            return error;
    }
}

/// What a call gives that tells the size where it has no room: asked again where the content has
/// grown in between. None with errno set.
template <class Call>
std::optional<std::string> wholeContent(const Call& call) {
    for (int tries = 0; tries < kMostTries; ++tries) {
        const ssize_t size = call(nullptr, 0);
        if (size == 0)
            return std::string();
        if (size < 0)
            return std::nullopt;
        std::string content(static_cast<std::size_t>(size), '\0');
        const ssize_t length = call(content.data(), content.size());
        if (length >= 0) {
            content.resize(static_cast<std::size_t>(length));
            return content;
        }
        if (errno != ERANGE)
            return std::nullopt;
    }
    return std::nullopt;
}

std::optional<std::vector<std::string>> userAttributeNames(int file) {
    const auto list = wholeContent(
        [file](char* room, std::size_t size) { return ::flistxattr(file, room, size); });
    if (!list)
        return std::nullopt;
    std::vector<std::string> names;
    for (std::size_t at = 0; at < list->size();) {
        const std::string name = list->c_str() + at;
        at += name.size() + 1;
        if (name.starts_with(kUserAttributes))
            names.push_back(name);
    }
    return names;
}

/// A file system that keeps no attributes has none to be lost; some FUSE mounts say EIO for that.
bool hasNoAttributes(int error, int file) {
    struct statfs system {};
    return error == ENOTSUP ||
           (error == EIO && ::fstatfs(file, &system) == 0 && system.f_type == kFuseMagic);
}

/// Where attributes can't be set at all, they are lost silently.
bool isLossTolerated(int error, int file) {
    return error == EPERM || error == EACCES || hasNoAttributes(error, file);
}

int copyAttribute(int from, int to, const std::string& name, int flags) {
    const auto value = wholeContent(
        [&](char* room, std::size_t size) { return ::fgetxattr(from, name.c_str(), room, size); });
    if (!value)
        return errno == ENODATA ? 0 : errno;
    if (::fsetxattr(to, name.c_str(), value->data(), value->size(), flags) == 0)
        return 0;
    const int error = errno;
    return isLossTolerated(error, to) ? 0 : error;
}

/// What a file has beyond its mode; empty where there is nothing. None with errno set.
std::optional<std::string> accessListOf(int file) {
    auto list = wholeContent([file](char* room, std::size_t size) {
        return ::fgetxattr(file, kAccessList, room, size);
    });
    const int error = errno;
    if (!list && (error == ENODATA || hasNoAttributes(error, file)))
        return std::string();
    errno = error;
    return list;
}

/// `isKept` tells whether the list is the other's afterwards. One may also have come from the
/// folder, as the default for what is made there. A list is not given to another group, which it
/// would let in.
int copyAccessList(int from, int to, bool hasGroup, bool& isKept) {
    const auto wanted = accessListOf(from);
    const auto present = wanted ? accessListOf(to) : std::nullopt;
    if (!present)
        return errno;
    isKept = *wanted == *present;
    if (isKept || (!hasGroup && !wanted->empty()))
        return 0;
    const int result = wanted->empty()
                           ? ::fremovexattr(to, kAccessList)
                           : ::fsetxattr(to, kAccessList, wanted->data(), wanted->size(), 0);
    isKept = result == 0;
    if (isKept)
        return 0;
    const int error = errno;
    // A list of users that are unknown here is invalid.
    return error == EINVAL || isLossTolerated(error, to) ? 0 : error;
}

/// Network and other foreign file systems have their own words for it.
bool isOwnerRefused(int error) {
    return error == EPERM || error == EACCES || error == EINVAL || error == ENOTSUP ||
           error == ENOSYS;
}

/// What can be kept of a mode, so that it lets nobody in whom it kept out.
mode_t modeWithout(mode_t mode, bool hasGroup, bool hasAccessList) {
    if (!hasAccessList)
        return mode & (S_ISVTX | S_IRWXU);
    const mode_t both = mode & (mode >> 3) & S_IRWXO;
    return hasGroup ? mode & 01777 : (mode & (S_ISVTX | S_IRWXU)) | (both << 3) | both;
}

}  // namespace

int copyContent(int from, int to, std::uint64_t size, const PieceReport& report) {
    PieceCopy pieces(from, to, size);
    const int error = copyAll(pieces, size, report);
    if (error != 0)
        pieces.giveRoomBack();
    return error;
}

int copyAttributes(int from, int to, bool onlyMissing) {
    const auto names = userAttributeNames(from);
    if (!names) {
        const int error = errno;
        return hasNoAttributes(error, from) ? 0 : error;
    }
    for (const std::string& name : *names) {
        const int error = copyAttribute(from, to, name, onlyMissing ? XATTR_CREATE : 0);
        if (error != 0 && !(onlyMissing && error == EEXIST))
            return error;
    }
    return 0;
}

bool hasAttributesOf(int from, int to) {
    const auto wanted = userAttributeNames(from);
    const auto present = userAttributeNames(to);
    return wanted && present &&
           std::all_of(wanted->begin(), wanted->end(), [&](const std::string& name) {
               return std::find(present->begin(), present->end(), name) != present->end();
           });
}

bool haveSameAccessList(int left, int right) {
    const auto list = accessListOf(left);
    return list && accessListOf(right) == list;
}

int copyOwner(const struct stat& status, int to) {
    const auto give = [&](uid_t owner) {
        return ::fchownat(to, "", owner, status.st_gid, AT_EMPTY_PATH) == 0 ? 0 : errno;
    };
    int error = give(status.st_uid);
    if (isOwnerRefused(error))
        error = give(static_cast<uid_t>(-1));
    return isOwnerRefused(error) ? 0 : error;
}

/// The owner first, whose change drops bits of the mode; the mode last, which opens it.
int copyAccess(int from, const struct stat& status, int to) {
    if (const int error = copyOwner(status, to))
        return error;
    struct stat given {};
    if (::fstat(to, &given) != 0)
        return errno;
    const bool hasGroup = given.st_gid == status.st_gid;
    bool hasAccessList = false;
    if (const int error = copyAccessList(from, to, hasGroup, hasAccessList))
        return error;
    const mode_t mode = modeWithout(status.st_mode, hasGroup, hasAccessList);
    return ::fchmod(to, mode) == 0 || errno == EPERM || errno == ENOTSUP ? 0 : errno;
}

int copyStatus(int from, const struct stat& status, int to) {
    if (const int error = copyAccess(from, status, to))
        return error;
    const std::array<timespec, 2> times{status.st_atim, status.st_mtim};
    if (::futimens(to, times.data()) != 0 && errno != EPERM && errno != ENOTSUP)
        return errno;
    return 0;
}

}  // namespace parvel::host
