#include "parvel/platform/linux/ItemRenames.h"

#include <fcntl.h>
#include <stdio.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "parvel/platform/linux/FileDescriptor.h"
#include "parvel/platform/linux/ItemTree.h"
#include "parvel/platform/linux/OpenFolder.h"

namespace parvel::host {

namespace {

int renameWithFlags(const std::string& source, const std::string& destination, unsigned flags) {
    return ::renameat2(AT_FDCWD, source.c_str(), AT_FDCWD, destination.c_str(), flags) == 0 ? 0
                                                                                            : errno;
}

/// Takes a free name by an exclusively made file, which the rename then replaces in one step.
int renameOntoPlaceholder(const std::string& source, const std::string& destination) {
    struct stat made {};
    struct stat named {};
    const FileDescriptor placeholder(
        ::open(destination.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600));
    if (!placeholder)
        return errno;
    int error = ::fstat(placeholder.get(), &made) == 0 ? 0 : errno;
    const bool isKnown = error == 0;
    if (error == 0)
        error = plainRename(source, destination);
    if (error != 0 && (!isKnown || itemStatus(destination, named) != 0 || isSameItem(made, named)))
        ::unlink(destination.c_str());
    return error;
}

/// For file systems whose rename can't refuse a taken name.
int renameWithoutFlag(const std::string& source, const std::string& destination) {
    struct stat item {};
    if (const int error = itemStatus(source, item))
        return error;
    if (S_ISDIR(item.st_mode)) {
        if (::mkdir(destination.c_str(), 0700) != 0)
            return errno;
        const int error = plainRename(source, destination);
        if (error != 0)
            ::rmdir(destination.c_str());
        return error;
    }
    if (::linkat(AT_FDCWD, source.c_str(), AT_FDCWD, destination.c_str(), 0) != 0)
        return isLinkUnsupported(errno) ? renameOntoPlaceholder(source, destination) : errno;
    if (::unlink(source.c_str()) == 0)
        return 0;
    const int error = errno;
    ::unlink(destination.c_str());
    return error;
}

int renameAsItIs(const std::string& source, const std::string& destination) {
    const int error = renameWithFlags(source, destination, RENAME_NOREPLACE);
    return isFlagUnsupported(error) ? renameWithoutFlag(source, destination) : error;
}

bool isClosed(const struct stat& folder) {
    return (folder.st_mode & S_IWUSR) == 0 && folder.st_uid == ::geteuid();
}

/// A folder gets its parent written into it, which one without the owner's right to write refuses
/// even him. EACCES where that is not what stood in the way.
int renameClosedFolder(const std::string& source, const std::string& destination) {
    const FileDescriptor folder = openFolder(AT_FDCWD, source.c_str(), O_RDONLY | O_NOFOLLOW);
    struct stat item {};
    if (!folder || ::fstat(folder.get(), &item) != 0 || !isClosed(item))
        return EACCES;
    const mode_t mode = item.st_mode & ALLPERMS;
    const auto open = [&] { return ::fchmod(folder.get(), mode | S_IWUSR) == 0; };
    const auto close = [&] {
        const bool isClosed = ::fchmod(folder.get(), mode) == 0 &&
                              (::fsync(folder.get()) == 0 || errno == EINVAL || errno == ENOSYS);
        return isClosed ? 0 : errno;
    };

    if (!open())
        return EACCES;
    int error = renameAsItIs(source, destination);
    const int closing = close();
    if (closing == 0)
        return error;
    if (error == 0) {
        error = closing;
        if (open())
            (void)renameAsItIs(destination, source);
    }
    (void)close();
    return error;
}

}  // namespace

int renameExclusively(const std::string& source, const std::string& destination) {
    const int error = renameAsItIs(source, destination);
    return error == EACCES ? renameClosedFolder(source, destination) : error;
}

int plainRename(const std::string& source, const std::string& destination) {
    return ::rename(source.c_str(), destination.c_str()) == 0 ? 0 : errno;
}

int exchangeNames(const std::string& left, const std::string& right) {
    return renameWithFlags(left, right, RENAME_EXCHANGE);
}

bool isFlagUnsupported(int error) {
    return error == EINVAL || error == ENOSYS || error == ENOTSUP;
}

bool isLinkUnsupported(int error) {
    return error == EPERM || error == ENOTSUP || error == ENOSYS || error == EMLINK;
}

bool isFolder(const std::string& path) {
    struct stat item {};
    return itemStatus(path, item) == 0 && S_ISDIR(item.st_mode);
}

bool isClosedFolder(const std::string& path) {
    struct stat item {};
    return itemStatus(path, item) == 0 && S_ISDIR(item.st_mode) && isClosed(item);
}

int itemStatus(const std::string& path, struct stat& result) {
    return ::lstat(path.c_str(), &result) == 0 ? 0 : errno;
}

}  // namespace parvel::host
