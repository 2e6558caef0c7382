#include "parvel/platform/linux/HiddenItem.h"

#include <dirent.h>
#include <fcntl.h>
#include <stdio.h>
#include <sys/file.h>
#include <sys/random.h>
#include <sys/stat.h>
#include <sys/vfs.h>
#include <time.h>

#include <algorithm>
#include <array>
#include <vector>

#include "parvel/foundation/URL.h"
#include "parvel/platform/StagingDirectory.h"
#include "parvel/platform/linux/DirectoryStream.h"
#include "parvel/platform/linux/ItemTree.h"
#include "parvel/platform/linux/Paths.h"

namespace parvel::host {

namespace {

constexpr int kStagingAttempts = 100;
constexpr time_t kDay = 24 * 60 * 60;

/// File systems of this machine alone, by the kernel's numbers: ext2 to ext4, XFS, Btrfs, tmpfs,
/// F2FS, overlayfs, FAT, exFAT, NTFS, bcachefs, ZFS.
constexpr std::array<long, 11> kLocalTypes = {0xEF53,     0x58465342, 0x9123683E, 0x01021994,
                                              0xF2F52010, 0x794C7630, 0x4D44,     0x2011BAB0,
                                              0x7366746E, 0xCA451A4E, 0x2FC12FC1};

/// Opens and locks an item; closed when another holds it, it is gone, or it can't be read.
FileDescriptor lockedItem(const std::string& path) {
    FileDescriptor item(::open(path.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
    if (!item || ::flock(item.get(), LOCK_EX | LOCK_NB) != 0)
        return {};
    struct stat mine {};
    struct stat named {};
    const bool isStillThere = ::fstat(item.get(), &mine) == 0 &&
                              ::lstat(path.c_str(), &named) == 0 && isSameItem(mine, named);
    return isStillThere ? std::move(item) : FileDescriptor{};
}

std::string hiddenPathIn(const std::string& folder) {
    return pathAppending(folder, randomName(StagingDirectory::namePrefix));
}

void clearIfStale(const std::string& path, bool isLockSeen) {
    struct stat status {};
    if (::lstat(path.c_str(), &status) != 0 || status.st_uid != ::geteuid())
        return;
    if (!isLockSeen && ::time(nullptr) - status.st_ctime < kDay)
        return;
    // A folder that its owner may not read can't be locked; hidden, it has no more use for its
    // mode.
    if (S_ISDIR(status.st_mode) && (status.st_mode & S_IRUSR) == 0)
        (void)::fchmodat(AT_FDCWD, path.c_str(), S_IRWXU, AT_SYMLINK_NOFOLLOW);
    // A link can't be locked at all: it is the second name of one.
    const FileDescriptor lock = lockedItem(path);
    if (lock || S_ISLNK(status.st_mode))
        (void)removeTree(path);
}

}  // namespace

std::string randomName(std::string_view prefix) {
    static constexpr std::string_view letters = "abcdefghijklmnopqrstuvwxyz234567";
    std::array<unsigned char, 12> bytes{};
    // Twelve bytes come whole; a name that is taken all the same is only tried again.
    if (::getrandom(bytes.data(), bytes.size(), 0) < 0)
        bytes.fill(static_cast<unsigned char>(::getpid()));
    std::string name(prefix);
    for (const unsigned char byte : bytes)
        name += letters[byte % letters.size()];
    return name;
}

bool isStagingName(std::string_view name) {
    return name.starts_with(StagingDirectory::namePrefix);
}

bool isLockSeenByAll(long fileSystemType) {
    // The kernel's number is 32 bits wide, and some hosts extend its sign.
    const long type = fileSystemType & 0xFFFFFFFFL;
    return std::find(kLocalTypes.begin(), kLocalTypes.end(), type) != kLocalTypes.end();
}

void clearStaleItems(const std::string& folder) {
    DirectoryStream entries(
        FileDescriptor(::open(folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC)));
    if (!entries.isOpen())
        return;
    std::vector<std::string> found;
    while (const dirent* entry = entries.next()) {
        if (isStagingName(entry->d_name))
            found.push_back(pathAppending(folder, entry->d_name));
    }
    struct statfs system {};
    if (found.empty() || ::fstatfs(entries.descriptor(), &system) != 0)
        return;
    for (const std::string& path : found)
        clearIfStale(path, isLockSeenByAll(system.f_type));
}

std::optional<HiddenItem> HiddenItem::hide(const std::string& item, int& error) {
    std::string path = hiddenPathIn(parentFolderOf(item));
    if (::rename(item.c_str(), path.c_str()) != 0) {
        error = errno;
        return std::nullopt;
    }
    FileDescriptor lock = lockedItem(path);
    return HiddenItem(std::move(path), std::move(lock));
}

std::optional<HiddenItem> HiddenItem::linkTo(const std::string& file, int& error) {
    FileDescriptor lock = lockedItem(file);
    std::string path = hiddenPathIn(parentFolderOf(file));
    if (::linkat(AT_FDCWD, file.c_str(), AT_FDCWD, path.c_str(), 0) != 0) {
        error = errno;
        return std::nullopt;
    }
    return HiddenItem(std::move(path), std::move(lock));
}

std::optional<HiddenItem> HiddenItem::bring(const std::string& folder, const std::string& parent,
                                            int& error) {
    errno = 0;
    FileDescriptor lock = lockedItem(folder);
    struct stat status {};
    std::string path = hiddenPathIn(parent);
    if (!lock || ::fstat(lock.get(), &status) != 0 ||
        ::fchmod(lock.get(), (status.st_mode & ALLPERMS) | S_IRWXU) != 0 ||
        ::rename(folder.c_str(), path.c_str()) != 0) {
        error = errno != 0 ? errno : EBUSY;  // the folder was taken away before it was locked
        return std::nullopt;
    }
    HiddenItem brought(std::move(path), std::move(lock));
    if (::fchmod(brought.descriptor(), status.st_mode & ALLPERMS) != 0 ||
        (::fsync(brought.descriptor()) != 0 && errno != EINVAL)) {
        error = errno;
        return std::nullopt;
    }
    return brought;
}

std::optional<HiddenItem> HiddenItem::makeFolderIn(const std::string& parent, int& error) {
    for (int attempt = 0; attempt < kStagingAttempts; ++attempt) {
        std::string path = hiddenPathIn(parent);
        if (::mkdir(path.c_str(), 0700) != 0) {
            if (errno == EEXIST)
                continue;
            error = errno;
            return std::nullopt;
        }
        // Another process may have cleared the folder before it was locked; then the next name.
        if (FileDescriptor lock = lockedItem(path))
            return HiddenItem(std::move(path), std::move(lock));
        ::rmdir(path.c_str());
    }
    error = EBUSY;
    return std::nullopt;
}

HiddenItem::HiddenItem(HiddenItem&& other) noexcept
    : m_path(std::exchange(other.m_path, {})), m_lock(std::move(other.m_lock)) {}

HiddenItem::~HiddenItem() {
    if (!m_path.empty())
        (void)removeTree(m_path);
}

}  // namespace parvel::host
