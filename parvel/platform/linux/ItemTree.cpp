#include "parvel/platform/linux/ItemTree.h"

#include <fcntl.h>

#include <array>
#include <climits>
#include <optional>
#include <utility>
#include <vector>

#include "parvel/platform/linux/DirectoryStream.h"
#include "parvel/platform/linux/FileDescriptor.h"
#include "parvel/platform/linux/HiddenItem.h"
#include "parvel/platform/linux/ItemContent.h"
#include "parvel/platform/linux/OpenFolder.h"

namespace parvel::host {

namespace {

constexpr int kMaximumDepth = 200;  // three descriptors a level

// Copying

int copyFile(int from, const struct stat& status, int toFolder, const char* name) {
    FileDescriptor to(
        ::openat(toFolder, name, O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600));
    if (!to)
        return errno;
    if (const int error = copyContent(from, to.get(), static_cast<std::uint64_t>(status.st_size)))
        return error;
    if (const int error = copyAttributes(from, to.get(), /*onlyMissing=*/false))
        return error;
    if (const int error = copyStatus(from, status, to.get()))
        return error;
    return to.close();
}

int copyLink(int fromFolder, const char* fromName, const struct stat& status, int toFolder,
             const char* toName) {
    std::string target(PATH_MAX, '\0');
    const ssize_t length = ::readlinkat(fromFolder, fromName, target.data(), target.size());
    if (length < 0)
        return errno;
    target.resize(static_cast<std::size_t>(length));
    if (::symlinkat(target.c_str(), toFolder, toName) != 0)
        return errno;
    (void)!::fchownat(toFolder, toName, status.st_uid, status.st_gid, AT_SYMLINK_NOFOLLOW);
    const std::array<timespec, 2> times{status.st_atim, status.st_mtim};
    (void)::utimensat(toFolder, toName, times.data(), AT_SYMLINK_NOFOLLOW);
    return 0;
}

int copyEntry(int fromFolder, const char* fromName, int toFolder, const char* toName, int depth);

int copyFolder(int from, const struct stat& status, int toFolder, const char* name, int depth) {
    if (depth >= kMaximumDepth)
        return ELOOP;
    if (::mkdirat(toFolder, name, 0700) != 0)
        return errno;
    const FileDescriptor to = openFolder(toFolder, name, O_RDONLY | O_NOFOLLOW);
    if (!to)
        return errno;
    DirectoryStream entries(openFolder(from, ".", O_RDONLY));
    if (!entries.isOpen())
        return errno;
    while (const dirent* entry = entries.next()) {
        if (const int error = copyEntry(from, entry->d_name, to.get(), entry->d_name, depth + 1))
            return error;
    }
    if (errno != 0)
        return errno;
    if (const int error = copyAttributes(from, to.get(), /*onlyMissing=*/false))
        return error;
    return copyStatus(from, status, to.get());
}

int copyEntry(int fromFolder, const char* fromName, int toFolder, const char* toName, int depth) {
    struct stat status {};
    if (::fstatat(fromFolder, fromName, &status, AT_SYMLINK_NOFOLLOW) != 0)
        return errno;
    if (S_ISLNK(status.st_mode))
        return copyLink(fromFolder, fromName, status, toFolder, toName);
    if (!S_ISREG(status.st_mode) && !S_ISDIR(status.st_mode))
        return EOPNOTSUPP;
    const FileDescriptor from = openItem(fromFolder, fromName);
    if (!from || ::fstat(from.get(), &status) != 0)
        return errno;
    if (S_ISDIR(status.st_mode))
        return copyFolder(from.get(), status, toFolder, toName, depth);
    return S_ISREG(status.st_mode) ? copyFile(from.get(), status, toFolder, toName) : EOPNOTSUPP;
}

// Removing

/// One folder on the way down: its name in the folder above, which item that folder is, and the
/// mode that it had before it was opened up for its removal.
struct Descent {
    std::string name;
    struct stat above;
    std::optional<mode_t> oldMode;
};

/// Steps back up to the folder that the descent came from; closed when that is another folder now.
FileDescriptor folderAbove(int folder, const struct stat& expected) {
    FileDescriptor above = openFolder(folder, "..", O_RDONLY);
    struct stat status {};
    if (above && ::fstat(above.get(), &status) == 0 && !isSameItem(status, expected)) {
        errno = ENOENT;
        return {};
    }
    return above;
}

/// Removes one entry. A folder of our own that forbids it is opened up first, and closed again
/// where that did not help.
int unlinkEntry(int folder, const char* name, int flags) {
    if (::unlinkat(folder, name, flags) == 0)
        return 0;
    struct stat status {};
    if (errno != EACCES)
        return errno;
    if (::fstat(folder, &status) != 0 || ::fchmod(folder, S_IRWXU) != 0)
        return EACCES;
    if (::unlinkat(folder, name, flags) == 0)
        return 0;
    const int error = errno;
    (void)::fchmod(folder, status.st_mode & ALLPERMS);
    return error;
}

/// Opens a folder on the way down, made readable and searchable first where it is our own and was
/// not; then `oldMode` is the mode that it had.
FileDescriptor openForRemoval(int folder, const char* name, std::optional<mode_t>& oldMode) {
    FileDescriptor below = openFolder(folder, name, O_RDONLY | O_NOFOLLOW);
    struct stat status {};
    const bool isUsable = below && ::faccessat(below.get(), ".", X_OK, AT_EACCESS) == 0;
    if (isUsable || errno != EACCES)
        return below;
    if (::fstatat(folder, name, &status, AT_SYMLINK_NOFOLLOW) != 0 ||
        ::fchmodat(folder, name, S_IRWXU, AT_SYMLINK_NOFOLLOW) != 0) {
        errno = EACCES;
        return {};
    }
    oldMode = status.st_mode & ALLPERMS;
    below = openFolder(folder, name, O_RDONLY | O_NOFOLLOW);
    if (!below) {
        const int error = errno;
        (void)::fchmodat(folder, name, *oldMode, AT_SYMLINK_NOFOLLOW);
        errno = error;
    }
    return below;
}

/// Gives the folders of a descent that removed nothing the modes back that they had.
void closeAgain(FileDescriptor folder, std::vector<Descent>& path) {
    for (; !path.empty(); path.pop_back()) {
        const Descent& last = path.back();
        folder = folderAbove(folder.get(), last.above);
        if (!folder)
            return;
        if (last.oldMode)
            (void)::fchmodat(folder.get(), last.name.c_str(), *last.oldMode, AT_SYMLINK_NOFOLLOW);
    }
}

/// Removes the entries of the folder up to one that is a folder itself, which is then the last of
/// the path; at the end of the listing the path stays as it is.
int removeEntries(FileDescriptor& folder, std::vector<Descent>& path, bool& removedAny) {
    DirectoryStream entries(openFolder(folder.get(), ".", O_RDONLY));
    if (!entries.isOpen())
        return errno;
    while (const dirent* entry = entries.next()) {
        const char* name = entry->d_name;
        const int error = unlinkEntry(folder.get(), name, 0);
        if (error == 0) {
            removedAny = true;
            continue;
        }
        if (error != EISDIR && error != EPERM)
            return error;
        Descent descent{name, {}, std::nullopt};
        if (::fstat(folder.get(), &descent.above) != 0)
            return errno;
        FileDescriptor below = openForRemoval(folder.get(), name, descent.oldMode);
        if (!below)
            return errno == ENOTDIR || errno == ELOOP ? error : errno;
        path.push_back(std::move(descent));
        folder = std::move(below);
        return 0;
    }
    return errno;
}

/// Empties a folder with one descriptor at a time, however deep it is.
int emptyFolder(FileDescriptor folder, bool& removedAny) {
    std::vector<Descent> path;
    int error = 0;
    while (error == 0) {
        const std::size_t depth = path.size();
        error = removeEntries(folder, path, removedAny);
        if (error != 0 || path.size() > depth)
            continue;
        if (path.empty())
            return 0;
        FileDescriptor above = folderAbove(folder.get(), path.back().above);
        if (!above) {
            error = errno;
            break;
        }
        folder = std::move(above);
        error = unlinkEntry(folder.get(), path.back().name.c_str(), AT_REMOVEDIR);
        if (error == 0) {
            removedAny = true;
            path.pop_back();
        }
    }
    if (!removedAny)
        closeAgain(std::move(folder), path);
    return error;
}

}  // namespace

int copyTree(const std::string& source, const std::string& destination) {
    return copyEntry(AT_FDCWD, source.c_str(), AT_FDCWD, destination.c_str(), 0);
}

int removeTree(const std::string& path, bool* removedAny) {
    bool any = false;
    struct stat status {};
    if (::lstat(path.c_str(), &status) != 0)
        return errno;
    if (!S_ISDIR(status.st_mode))
        return ::unlink(path.c_str()) == 0 ? 0 : errno;
    std::optional<mode_t> oldMode;
    FileDescriptor folder = openForRemoval(AT_FDCWD, path.c_str(), oldMode);
    int error = folder ? emptyFolder(std::move(folder), any) : errno;
    if (error == 0 && ::rmdir(path.c_str()) != 0)
        error = errno;
    if (error != 0 && !any && oldMode)
        (void)::fchmodat(AT_FDCWD, path.c_str(), *oldMode, AT_SYMLINK_NOFOLLOW);
    if (removedAny)
        *removedAny = any;
    return error;
}

int discardItem(const std::string& path) {
    struct stat status {};
    if (::lstat(path.c_str(), &status) != 0)
        return errno;
    if (!S_ISDIR(status.st_mode))
        return ::unlink(path.c_str()) == 0 ? 0 : errno;
    int error = 0;
    auto hidden = HiddenItem::hide(path, error);
    if (!hidden)
        return error;
    bool removedAny = false;
    error = removeTree(hidden->path(), &removedAny);
    // An item of which nothing could go is whole, and comes back.
    if (error != 0 && !removedAny && ::rename(hidden->path().c_str(), path.c_str()) != 0)
        return error;
    if (error == 0 || !removedAny)
        hidden->release();
    return error;
}

int syncItem(const std::string& path) {
    struct stat status {};
    if (::lstat(path.c_str(), &status) != 0)
        return errno;
    if (!S_ISREG(status.st_mode) && !S_ISDIR(status.st_mode))
        return 0;
    const FileDescriptor item = openItem(AT_FDCWD, path.c_str());
    if (!item)
        return errno == EACCES ? 0 : errno;  // a file that its owner may not read syncs by itself
    const int result = S_ISDIR(status.st_mode) ? ::syncfs(item.get()) : ::fsync(item.get());
    return result == 0 || errno == EINVAL || errno == ENOSYS ? 0 : errno;
}

int syncFolder(const std::string& path) {
    const FileDescriptor folder = openFolder(AT_FDCWD, path.empty() ? "." : path.c_str(), O_RDONLY);
    if (!folder)
        return errno == EACCES ? 0 : errno;
    return ::fsync(folder.get()) == 0 || errno == EINVAL || errno == ENOSYS ? 0 : errno;
}

}  // namespace parvel::host
