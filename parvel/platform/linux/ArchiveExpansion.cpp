// Expands an archive that is hostile until read. Its claims are weighed before anything is made;
// then each entry in the directory's order: its name is checked, its folder opened, or made, one
// component at a time without following a link, its file made exclusively there, and its content
// held to the claimed size and checksum.

#include "parvel/platform/linux/ArchiveExpansion.h"

#include <fcntl.h>
#include <sys/statvfs.h>

#include <algorithm>
#include <limits>
#include <optional>
#include <string>
#include <string_view>

#include "parvel/foundation/URL.h"
#include "parvel/platform/linux/ArchiveOwner.h"
#include "parvel/platform/linux/FoldersBelow.h"
#include "parvel/platform/linux/ItemTree.h"
#include "parvel/platform/linux/Paths.h"
#include "parvel/platform/linux/SystemCall.h"
#include "parvel/platform/linux/WriteBehind.h"
#include "parvel/platform/linux/ZipFormat.h"

namespace parvel::host {

namespace {

/// A directory of some 350,000 entries; libzip takes about 100 MB for it.
constexpr std::uint64_t kDirectoryBudget = 32ULL << 20;
constexpr std::size_t kLongestPath = 4095;
constexpr std::size_t kLongestComponent = 255;
constexpr int kMostComponents = 200;
constexpr std::uint64_t kMostNewFolders = 100'000;
constexpr std::uint64_t kFolderBytes = 4096;
constexpr std::size_t kWrittenAtOnce = std::size_t{1} << 20;

std::uint64_t saturatingSum(std::uint64_t left, std::uint64_t right) {
    return left > std::numeric_limits<std::uint64_t>::max() - right
               ? std::numeric_limits<std::uint64_t>::max()
               : left + right;
}

bool isFolder(std::string_view name, const ZipEntry& entry) {
    return name.ends_with('/') || S_ISDIR(entry.unixMode());
}

/// 0 for a name that stays below the folder, one component after the other.
int checkName(std::string_view name) {
    if (name.size() > kLongestPath)
        return ENAMETOOLONG;
    for (int count = 1;; ++count) {
        const std::size_t slash = name.find('/');
        const std::string_view component = name.substr(0, slash);
        if (component.empty() || component == "." || component == "..")
            return EPERM;
        if (component.size() > kLongestComponent || count > kMostComponents)
            return ENAMETOOLONG;
        if (slash == std::string_view::npos)
            return 0;
        name.remove_prefix(slash + 1);
    }
}

/// 0 for a kind of entry that is expanded.
int checkKind(const ZipEntry& entry) {
    const mode_t type = entry.unixMode() & S_IFMT;
    if (type == S_IFLNK)
        return ELOOP;
    return type == 0 || type == S_IFREG || type == S_IFDIR ? 0 : EOPNOTSUPP;
}

int checkContent(const ZipEntry& entry) {
    if (entry.isEncrypted)
        return EACCES;
    if (!entry.hasKnownMethod())
        return EOPNOTSUPP;
    return canBeDelivered(entry, std::numeric_limits<std::uint64_t>::max()) ? 0 : EBADMSG;
}

class Expansion {
public:
    Expansion(ArchiveEntries& entries, const ArchiveOwner& owner, FileDescriptor root,
              const std::string& destination, const CopierReports& reports)
        : m_entries(entries),
          m_owner(owner),
          m_folders(std::move(root), owner),
          m_destination(destination),
          m_reports(reports) {}

    /// 0 or the errno value, told already.
    int run() {
        const std::uint64_t count = m_entries.count();
        for (std::uint64_t index = 0; index < count; ++index) {
            if (const int error = m_reports.cancellation())
                return error;
            if (const int error = expandEntry(index))
                return error;
        }
        return m_reports.awaited(m_disk);
    }

private:
    int expandEntry(std::uint64_t index) {
        const std::string_view name = m_entries.name(index).value_or("");
        const std::string path = pathAppending(m_destination, name);
        ZipEntry entry;
        if (!m_entries.describe(index, entry))
            return m_reports.failed(path, EBADMSG);
        const std::string_view item = name.ends_with('/') ? name.substr(0, name.size() - 1) : name;
        int error = checkName(item);
        if (error == 0)
            error = checkKind(entry);
        if (error == 0 && isFolder(name, entry))
            return m_folders.open(item) < 0 ? m_reports.failed(path, errno) : 0;
        if (error == 0)
            error = checkContent(entry);
        return error == 0 ? expandFile(index, entry, name, path) : m_reports.failed(path, error);
    }

    int expandFile(std::uint64_t index, const ZipEntry& entry, std::string_view name,
                   const std::string& path) {
        const std::size_t slash = name.rfind('/');
        const bool isAtTop = slash == std::string_view::npos;
        const std::string last(isAtTop ? name : name.substr(slash + 1));
        const int folder = m_folders.open(isAtTop ? "" : name.substr(0, slash));
        FileDescriptor file;
        if (folder >= 0)
            file = FileDescriptor(::openat(
                folder, last.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600));
        if (!file)
            return m_reports.failed(path, errno);

        int error = m_owner.give(file.get());
        if (error == 0)
            error = deliver(index, entry, file.get());
        if (error == 0)
            error = m_disk.add(file.get(), entry.size);
        if (error == 0)
            error = file.close();
        if (error == 0) {
            m_reports.finished(path, ArchiveObjectType::File, entry.size);
            return 0;
        }
        error = m_reports.failed(path, error);
        if (error == 0)
            ::unlinkat(folder, last.c_str(), 0);  // left out, so not left in part
        return error;
    }

    int deliver(std::uint64_t index, const ZipEntry& entry, int file) {
        WriteBehind disk(file);
        std::uint64_t size = 0;
        return m_entries.deliver(index, entry, [&](Data::Bytes piece) {
            while (!piece.empty()) {
                if (const int error = m_reports.cancellation())
                    return error;
                const ssize_t written = retried([&] {
                    return ::write(file, piece.data(), std::min(piece.size(), kWrittenAtOnce));
                });
                if (written < 0)
                    return errno;
                piece = piece.subspan(static_cast<std::size_t>(written));
                size += static_cast<std::uint64_t>(written);
                if (const int error = disk.reached(size))
                    return error;
            }
            return m_reports.cancellation();
        });
    }

    ArchiveEntries& m_entries;
    const ArchiveOwner& m_owner;
    FoldersBelow m_folders;
    const std::string& m_destination;
    const CopierReports& m_reports;
    TreeBehind m_disk;
};

/// The folders that a name asks for beyond those of the entry before it.
std::uint64_t newFolders(std::string_view before, std::string_view name) {
    const auto* const parting =
        std::mismatch(name.begin(), name.end(), before.begin(), before.end()).first;
    return static_cast<std::uint64_t>(std::count(parting, name.end(), '/'));
}

/// Entries that share their bytes make a small archive expand without end: together they must fit
/// into the file. So do long names, by the folders that they ask for. What is made must fit on the
/// disk.
int checkClaims(SourceArchive& source, const std::string& destination,
                const CopierReports& reports) {
    std::uint64_t stored = 0;
    std::uint64_t content = 0;
    std::uint64_t folders = 0;
    std::string_view before;
    const std::uint64_t count = source.entries().count();
    for (std::uint64_t index = 0; index < count; ++index) {
        if (const int error = reports.cancellation())
            return error;
        if (const std::optional<std::string_view> name = source.entries().name(index)) {
            folders += newFolders(before, *name);
            before = *name;
        }
        ZipEntry entry;
        if (!source.entries().describe(index, entry))
            continue;
        stored = saturatingSum(stored, entry.compressedSize);
        stored = saturatingSum(stored, zip::localHeaderLength + zip::directoryHeaderLength);
        if (checkContent(entry) == 0)
            content = saturatingSum(content, entry.size);
    }
    if (stored > source.size() || folders > kMostNewFolders)
        return EBADMSG;
    content = saturatingSum(content, folders * kFolderBytes);
    struct statvfs room {};
    const bool isKnown = ::statvfs(parentFolderOf(destination).c_str(), &room) == 0 &&
                         room.f_frsize > 0 && room.f_blocks > 0;
    return isKnown && content / room.f_frsize > room.f_bavail ? ENOSPC : 0;
}

}  // namespace

std::unique_ptr<SourceArchive> SourceArchive::open(const std::string& path,
                                                   const CopierReports& reports, int& error) {
    auto source = std::make_unique<SourceArchive>();
    source->m_file = FileDescriptor(retried(
        [&] { return ::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY); }));
    if (!source->m_file || ::fstat(source->m_file.get(), &source->m_status) != 0) {
        error = errno;
        return nullptr;
    }
    if (S_ISREG(source->m_status.st_mode))
        source->m_entries =
            ArchiveEntries::open(source->m_file.get(), source->size(), kDirectoryBudget,
                                 [reports] { return reports.cancellation(); });
    if (source->m_entries)
        return source;
    error = reports.cancellation();
    if (error == 0)
        error = S_ISDIR(source->m_status.st_mode) ? EISDIR : EBADMSG;
    return nullptr;
}

bool SourceArchive::isStillAt(const std::string& path) const {
    const auto isSameTime = [](const timespec& left, const timespec& right) {
        return left.tv_sec == right.tv_sec && left.tv_nsec == right.tv_nsec;
    };
    struct stat now {};
    return ::stat(path.c_str(), &now) == 0 && isSameItem(now, m_status) &&
           now.st_size == m_status.st_size && isSameTime(now.st_mtim, m_status.st_mtim) &&
           isSameTime(now.st_ctim, m_status.st_ctim);
}

ArchiveCopier::Count countArchiveEntries(SourceArchive& source, const CopierReports& reports) {
    ArchiveCopier::Count result;
    const std::uint64_t count = source.entries().count();
    for (std::uint64_t index = 0; index < count && reports.cancellation() == 0; ++index) {
        const std::optional<std::string_view> name = source.entries().name(index);
        ZipEntry entry;
        if (!name || !source.entries().describe(index, entry) || isFolder(*name, entry))
            continue;
        ++result.files;
        result.bytes = saturatingSum(result.bytes, entry.size);
    }
    return result;
}

int expandArchive(SourceArchive& source, const std::string& destination,
                  const CopierReports& reports) {
    if (const int error = checkClaims(source, destination, reports))
        return reports.fatal(error);
    if (::mkdir(destination.c_str(), 0700) != 0)
        return reports.fatal(errno);
    FileDescriptor root(::open(destination.c_str(), O_PATH | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
    if (!root)
        return reports.fatal(errno);
    const ArchiveOwner owner(source.status(), root.get());
    if (const int error = owner.give(root.get()))
        return reports.fatal(error);
    return Expansion(source.entries(), owner, std::move(root), destination, reports).run();
}

}  // namespace parvel::host
