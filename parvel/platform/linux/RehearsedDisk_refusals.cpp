// Foresees what the acts of ItemMoves.cpp and ItemTree.cpp would be refused with: the questions
// that the kernel asks before it renames, in its order, asked by looking alone.

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>

#include "parvel/foundation/URL.h"
#include "parvel/platform/linux/ItemMoves.h"
#include "parvel/platform/linux/Paths.h"
#include "parvel/platform/linux/RehearsedDisk.h"

namespace parvel::host {

namespace {

bool isDots(std::string_view name) {
    return name == "." || name == ".." || name == "/";
}

int accessError(const std::string& path, int mode) {
    return ::faccessat(AT_FDCWD, path.c_str(), mode, AT_EACCESS) == 0 ? 0 : errno;
}

/// Whether the copy of an item could be begun.
int readError(const std::string& path) {
    struct stat status {};
    if (::lstat(path.c_str(), &status) != 0)
        return errno;
    if (S_ISLNK(status.st_mode))
        return 0;
    if (!S_ISREG(status.st_mode) && !S_ISDIR(status.st_mode))
        return EOPNOTSUPP;
    return accessError(path, S_ISDIR(status.st_mode) ? R_OK | X_OK : R_OK);
}

/// Whether an item could get another parent: a folder has it written into itself, for which its
/// owner opens it.
int parentingError(const std::string& path) {
    struct stat status {};
    const int error = accessError(path, W_OK);
    if (error != EACCES || ::lstat(path.c_str(), &status) != 0)
        return error;
    const bool canBeOpened = status.st_uid == ::geteuid() && (status.st_mode & S_IWUSR) == 0;
    return canBeOpened ? accessError(path, R_OK) : error;
}

/// In a folder with the sticky bit only the owners of the folder and of the item may take it away.
bool isHeldByStickyBit(const std::string& folder, const std::string& item) {
    struct stat above {};
    struct stat status {};
    if (::geteuid() == 0 || ::stat(folder.c_str(), &above) != 0 || (above.st_mode & S_ISVTX) == 0)
        return false;
    return ::lstat(item.c_str(), &status) == 0 && status.st_uid != ::geteuid() &&
           above.st_uid != ::geteuid();
}

/// The mount that a path lies on, which is what the kernel compares before a rename.
std::optional<std::uint64_t> mountOf(const std::string& path) {
    struct statx status {};
    if (::statx(AT_FDCWD, path.c_str(), 0, STATX_MNT_ID, &status) != 0)
        return std::nullopt;
    return status.stx_mnt_id;
}

}  // namespace

/// Whether names can be looked up in the folder.
int RehearsedDisk::folderError(const std::string& folder) const {
    const Entry entry = entryAt(folder);
    if (entry.kind != Kind::Real)
        return entry.kind == Kind::Gone ? ENOENT : entry.kind == Kind::MadeFile ? ENOTDIR : 0;
    struct stat status {};
    if (::stat(entry.real.c_str(), &status) != 0)
        return errno;
    return S_ISDIR(status.st_mode) ? accessError(entry.real, X_OK) : ENOTDIR;
}

/// Whether the name could be made.
int RehearsedDisk::changeError(const std::string& key) const {
    if (key.empty())
        return ENOENT;
    const Entry folder = entryAt(parentFolderOf(key));
    return folder.kind == Kind::Real ? accessError(folder.real, W_OK | X_OK) : 0;
}

int RehearsedDisk::makingErrorByKey(const std::string& key) const {
    if (const int error = folderError(parentFolderOf(key)))
        return error;
    if (const int error = lookUp(key); error != ENOENT)
        return error == 0 ? EEXIST : error;
    return changeError(key);
}

int RehearsedDisk::removalError(const std::string& key) const {
    if (isDots(lastComponentOfPath(key)))
        return EBUSY;
    if (const int error = changeError(key))
        return error;
    const Entry folder = entryAt(parentFolderOf(key));
    const Entry item = entryAt(key);
    const bool isReal = folder.kind == Kind::Real && item.kind == Kind::Real;
    return isReal && isHeldByStickyBit(folder.real, item.real) ? EPERM : 0;
}

bool RehearsedDisk::isSameMount(const std::string& folder, const std::string& other) const {
    const auto mountOfFolder = [this](std::string path) {
        while (entryAt(path).kind == Kind::MadeFolder)
            path = parentFolderOf(path);
        return mountOf(entryAt(path).real);
    };
    return mountOfFolder(folder) == mountOfFolder(other);
}

int RehearsedDisk::renameError(const std::string& source, const std::string& destination) const {
    const std::string from = parentFolderOf(source);
    const std::string to = parentFolderOf(destination);
    if (const int error = folderError(from))
        return error;
    if (const int error = folderError(to))
        return error;
    if (isDots(lastComponentOfPath(source)))
        return EBUSY;
    if (!isSameMount(from, to))
        return EXDEV;
    if (const int error = lookUp(source))
        return error;
    if (const int error = lookUp(destination); error != ENOENT)
        return error == 0 ? EEXIST : error;
    if (isBelow(destination, source))
        return EINVAL;
    if (const int error = removalError(source))
        return error;
    if (const int error = changeError(destination))
        return error;
    const Entry item = entryAt(source);
    return from != to && isFolder(source) && item.kind == Kind::Real ? parentingError(item.real)
                                                                     : 0;
}

int RehearsedDisk::copyError(const std::string& source, const std::string& destination) const {
    if (lookUp(destination) == 0)
        return EEXIST;
    if (isFolder(source) && isBelow(destination, source))
        return EINVAL;
    if (const int error = folderError(parentFolderOf(destination)))
        return error;
    if (const int error = changeError(destination))
        return error;
    const Entry item = entryAt(source);
    if (item.kind == Kind::Gone)
        return ENOENT;
    return item.kind == Kind::Real ? readError(item.real) : 0;
}

int RehearsedDisk::moveError(const std::string& source, const std::string& destination) const {
    const int error = renameError(source, destination);
    if (error != EXDEV)
        return error;
    const int copied = copyError(source, destination);
    return copied != 0 ? copied : removalError(source);
}

/// Where both items stand and are not one file.
int RehearsedDisk::replaceError(const std::string& existing, const std::string& replacement) const {
    if (isBelow(existing, replacement) || isBelow(replacement, existing))
        return EINVAL;
    const Entry item = entryAt(replacement);
    const Entry old = entryAt(existing);
    if (item.kind == Kind::Real && old.kind == Kind::Real && isLinkInto(old.real, item.real))
        return EINVAL;
    if (const int error = removalError(replacement))
        return error;
    if (const int error = removalError(existing))
        return error;
    if (item.kind != Kind::Real)
        return 0;
    if (!isSameMount(parentFolderOf(existing), parentFolderOf(replacement)))
        return readError(item.real);
    const bool changesParent = parentFolderOf(existing) != parentFolderOf(replacement);
    if (!changesParent || !isFolder(replacement))
        return 0;
    const int error = parentingError(item.real);
    // What can't be moved there as it is, is copied.
    return error == 0 && accessError(item.real, W_OK) != 0 ? readError(item.real) : error;
}

}  // namespace parvel::host
