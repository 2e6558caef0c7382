#pragma once

#include <fcntl.h>
#include <sys/stat.h>

#include <cstdint>
#include <optional>
#include <string>

namespace parvel::host {

/// Which mount and file system something lies on.
struct MountPlace {
    std::uint64_t mount;
    std::uint32_t major;
    std::uint32_t minor;
    friend bool operator==(const MountPlace&, const MountPlace&) = default;
};

/// None, with errno set, for an item that can't be reached. A link is an item of its own.
inline std::optional<MountPlace> mountPlaceOf(const std::string& path) {
    struct statx status {};
    if (::statx(AT_FDCWD, path.c_str(), AT_SYMLINK_NOFOLLOW, STATX_MNT_ID, &status) != 0)
        return std::nullopt;
    return MountPlace{status.stx_mnt_id, status.stx_dev_major, status.stx_dev_minor};
}

}  // namespace parvel::host
