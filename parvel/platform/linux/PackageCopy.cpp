// Copies a package's folder by descriptors, following no link below it. Folders get their modes and
// attributes last, so that one which forbids changes can be filled. What an edit keeps in the
// package while it works, or left there when it was killed, is no part of it.

#include "parvel/platform/linux/PackageCopy.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <climits>
#include <optional>
#include <string_view>

#include "parvel/foundation/URL.h"
#include "parvel/platform/linux/DirectoryStream.h"
#include "parvel/platform/linux/FileDescriptor.h"
#include "parvel/platform/linux/HiddenItem.h"
#include "parvel/platform/linux/ItemContent.h"
#include "parvel/platform/linux/ItemTree.h"
#include "parvel/platform/linux/OpenFolder.h"
#include "parvel/platform/linux/SystemCall.h"
#include "parvel/platform/linux/WriteBehind.h"

namespace parvel::host {

namespace {

constexpr int kDeepestFolder = 200;  // two descriptors a level

/// Deliberate: a copy takes every item along but the hidden ones of the library's own. They stand
/// where an edit writes, in the package's own folder.
bool isLeftOut(const char* name, int depth) {
    return depth == 0 && isStagingName(name);
}

FileDescriptor openFolderIn(int folder, const char* name) {
    return openFolder(folder, name, O_RDONLY | O_NOFOLLOW);
}

void countFolder(FileDescriptor folder, int depth, const CopierReports& reports,
                 ArchiveCopier::Count& count) {
    if (depth > kDeepestFolder)
        return;
    DirectoryStream stream(std::move(folder));
    while (stream.isOpen() && reports.cancellation() == 0) {
        const dirent* entry = stream.next();
        if (!entry)
            return;
        if (isLeftOut(entry->d_name, depth))
            continue;
        struct stat status {};
        if (::fstatat(stream.descriptor(), entry->d_name, &status, AT_SYMLINK_NOFOLLOW) != 0)
            continue;
        if (S_ISDIR(status.st_mode)) {
            countFolder(openFolderIn(stream.descriptor(), entry->d_name), depth + 1, reports,
                        count);
        } else if (S_ISREG(status.st_mode) || S_ISLNK(status.st_mode)) {
            ++count.files;
            count.bytes += S_ISREG(status.st_mode) ? static_cast<std::uint64_t>(status.st_size) : 0;
        }
    }
}

/// One item of the package: the open folder that it stands in, its name, and where it goes.
struct Item {
    int fromFolder;
    const char* name;
    int toFolder;
    std::string path;  ///< of the copy
    int depth;         ///< of the folder that it stands in
};

class TreeCopy {
public:
    TreeCopy(const struct stat& root, const CopierReports& reports)
        : m_root(root), m_reports(reports) {}

    /// Fills the folder with what the stream's holds, and gives it that one's metadata. 0 or the
    /// errno value, told already.
    int fillFolder(DirectoryStream& from, const struct stat& status, int to,
                   const std::string& path, int depth) {
        while (const dirent* entry = from.next()) {
            if (const int error = m_reports.cancellation())
                return error;
            if (isLeftOut(entry->d_name, depth))
                continue;
            const std::string itemPath = pathAppending(path, entry->d_name);
            if (const int error = copyItem({from.descriptor(), entry->d_name, to, itemPath, depth}))
                return error;
        }
        if (errno != 0)
            return m_reports.failed(path, errno);
        const int error = copyMetadata(from.descriptor(), status, to);
        return error == 0 ? 0 : m_reports.failed(path, error);
    }

    /// Waits until the files' content is on the disk. 0 or the errno value, told already.
    int awaitDisk() { return m_reports.awaited(m_disk); }

private:
    int copyItem(const Item& item) {
        struct stat status {};
        if (::fstatat(item.fromFolder, item.name, &status, AT_SYMLINK_NOFOLLOW) != 0)
            return m_reports.failed(item.path, errno);
        if (S_ISDIR(status.st_mode))
            return copyFolder(item);
        if (S_ISLNK(status.st_mode))
            return copyLink(item, status);
        return S_ISREG(status.st_mode) ? copyFile(item) : m_reports.failed(item.path, EOPNOTSUPP);
    }

    int copyFolder(const Item& item) {
        FileDescriptor from = openFolderIn(item.fromFolder, item.name);
        struct stat status {};
        if (!from || ::fstat(from.get(), &status) != 0)
            return m_reports.failed(item.path, errno);
        if (isSameItem(status, m_root))
            return m_reports.failed(item.path, EINVAL);  // the copy, which would hold itself
        if (item.depth >= kDeepestFolder)
            return m_reports.failed(item.path, ELOOP);
        DirectoryStream stream(std::move(from));
        if (!stream.isOpen() || ::mkdirat(item.toFolder, item.name, 0700) != 0)
            return m_reports.failed(item.path, errno);
        const FileDescriptor to = openFolderIn(item.toFolder, item.name);
        if (!to)
            return m_reports.failed(item.path, errno);
        return fillFolder(stream, status, to.get(), item.path, item.depth + 1);
    }

    int copyLink(const Item& item, const struct stat& status) {
        std::string target(PATH_MAX, '\0');
        const ssize_t length =
            ::readlinkat(item.fromFolder, item.name, target.data(), target.size());
        if (length < 0)
            return m_reports.failed(item.path, errno);
        target.resize(static_cast<std::size_t>(length));
        if (!linkStaysInside(target, item.depth))
            return m_reports.failed(item.path, ELOOP);
        if (::symlinkat(target.c_str(), item.toFolder, item.name) != 0)
            return m_reports.failed(item.path, errno);
        (void)!::fchownat(item.toFolder, item.name, status.st_uid, status.st_gid,
                          AT_SYMLINK_NOFOLLOW);
        m_reports.finished(item.path, ArchiveObjectType::Link, 0);
        return 0;
    }

    int copyFile(const Item& item) {
        const FileDescriptor from(retried([&] {
            return ::openat(item.fromFolder, item.name,
                            O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC);
        }));
        struct stat status {};
        if (!from || ::fstat(from.get(), &status) != 0)
            return m_reports.failed(item.path, errno);
        if (!S_ISREG(status.st_mode))
            return m_reports.failed(item.path, EOPNOTSUPP);
        FileDescriptor to(::openat(item.toFolder, item.name,
                                   O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600));
        if (!to)
            return m_reports.failed(item.path, errno);

        int error = fillFile(from.get(), status, to.get());
        if (error == 0)
            error = m_disk.add(to.get(), static_cast<std::uint64_t>(status.st_size));
        if (error == 0)
            error = to.close();
        if (error == 0) {
            m_reports.finished(item.path, ArchiveObjectType::File,
                               static_cast<std::uint64_t>(status.st_size));
            return 0;
        }
        error = m_reports.failed(item.path, error);
        if (error == 0)
            ::unlinkat(item.toFolder, item.name, 0);  // left out, so not left in part
        return error;
    }

    int fillFile(int from, const struct stat& status, int to) {
        WriteBehind disk(to);
        const auto size = static_cast<std::uint64_t>(status.st_size);
        const int error = copyContent(from, to, size, [&](std::uint64_t copied) {
            const int failure = disk.reached(copied);
            return failure != 0 ? failure : m_reports.cancellation();
        });
        return error != 0 ? error : copyMetadata(from, status, to);
    }

    static int copyMetadata(int from, const struct stat& status, int to) {
        const int error = copyAttributes(from, to);
        return error != 0 ? error : copyStatus(from, status, to);
    }

    const struct stat& m_root;  ///< the copy's own folder
    const CopierReports& m_reports;
    TreeBehind m_disk;
};

}  // namespace

bool linkStaysInside(const std::string& target, int depth) {
    if (target.starts_with('/'))
        return false;
    bool isAtStart = true;
    for (std::string_view rest = target; !rest.empty();) {
        const std::size_t slash = rest.find('/');
        const std::string_view component = rest.substr(0, slash);
        rest.remove_prefix(slash == std::string_view::npos ? rest.size() : slash + 1);
        if (component.empty() || component == ".")
            continue;
        if (component != "..") {
            isAtStart = false;
            continue;
        }
        if (!isAtStart || --depth < 0)
            return false;
    }
    return true;
}

ArchiveCopier::Count countPackage(const std::string& folder, const CopierReports& reports) {
    ArchiveCopier::Count count;
    countFolder(openFolder(AT_FDCWD, folder.c_str(), O_RDONLY), 0, reports, count);
    return count;
}

int copyPackage(const std::string& source, const std::string& destination,
                const CopierReports& reports) {
    FileDescriptor from = openFolder(AT_FDCWD, source.c_str(), O_RDONLY);
    struct stat status {};
    if (!from || ::fstat(from.get(), &status) != 0)
        return reports.fatal(errno);
    DirectoryStream stream(std::move(from));
    if (!stream.isOpen() || ::mkdir(destination.c_str(), 0700) != 0)
        return reports.fatal(errno);
    const FileDescriptor to = openFolderIn(AT_FDCWD, destination.c_str());
    struct stat made {};
    if (!to || ::fstat(to.get(), &made) != 0)
        return reports.fatal(errno);
    TreeCopy copy(made, reports);
    if (const int error = copy.fillFolder(stream, status, to.get(), destination, 0))
        return error;
    return copy.awaitDisk();
}

}  // namespace parvel::host
