#include "parvel/platform/CloudStore.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <string>
#include <string_view>

#include "parvel/platform/linux/DirectoryStream.h"
#include "parvel/platform/linux/FileDescriptor.h"
#include "parvel/platform/linux/SystemCall.h"

namespace parvel {

namespace {

/// What Syncthing keeps in the root of each folder that it synchronises.
constexpr const char* syncthingMark = ".stfolder";
/// What Nextcloud's client appends to the name of a file that it has not downloaded.
constexpr std::string_view placeholderSuffix = ".nextcloud";

/// A package with more entries or levels than these is taken for one that is not all there: nobody
/// reads its content then.
constexpr int mostEntries = 100'000;
constexpr int mostLevels = 64;

/// The names of the journal that Nextcloud's client keeps in each root: `.sync_<12 hex digits>.db`,
/// in older versions `._sync_<hex digits>.db`.
bool isNextcloudJournal(std::string_view name) {
    constexpr std::string_view digits = "0123456789abcdefABCDEF";
    constexpr std::string_view newer = ".sync_";
    constexpr std::string_view older = "._sync_";
    constexpr std::string_view suffix = ".db";
    constexpr std::size_t newerDigits = 12;
    if (!name.ends_with(suffix))
        return false;
    name.remove_suffix(suffix.size());
    if (name.starts_with(older))
        return name.find_first_not_of(digits, older.size()) == std::string_view::npos;
    return name.starts_with(newer) && name.size() == newer.size() + newerDigits &&
           name.find_first_not_of(digits, newer.size()) == std::string_view::npos;
}

host::FileDescriptor openFolder(int parent, const char* name, int flags) {
    return host::FileDescriptor(
        host::retried([&] { return ::openat(parent, name, O_DIRECTORY | O_CLOEXEC | flags); }));
}

bool holdsNextcloudJournal(int folder) {
    host::DirectoryStream entries(openFolder(folder, ".", O_RDONLY));
    if (!entries.isOpen())
        return false;
    while (const dirent* entry = entries.next())
        if (isNextcloudJournal(entry->d_name))
            return true;
    return false;
}

bool isSyncedRoot(int folder) {
    return ::faccessat(folder, syncthingMark, F_OK, 0) == 0 || holdsNextcloudJournal(folder);
}

/// Whether the folder or one above it is the root of synchronised storage. None, with errno set,
/// when the way up can't be followed.
std::optional<bool> liesBelowSyncedRoot(host::FileDescriptor folder) {
    struct stat status;
    if (::fstat(folder.get(), &status) != 0)
        return std::nullopt;
    for (;;) {
        if (isSyncedRoot(folder.get()))
            return true;
        host::FileDescriptor parent = openFolder(folder.get(), "..", O_PATH);
        struct stat above;
        if (!parent || ::fstat(parent.get(), &above) != 0)
            return std::nullopt;
        if (above.st_dev == status.st_dev && above.st_ino == status.st_ino)
            return false;
        folder = std::move(parent);
        status = above;
    }
}

/// Whether a placeholder file stands anywhere in the folder, no link followed.
bool holdsPlaceholder(host::FileDescriptor folder, int levels, int& entriesLeft) {
    host::DirectoryStream entries(std::move(folder));
    if (!entries.isOpen())
        return false;
    if (levels == 0)
        return true;
    while (const dirent* entry = entries.next()) {
        if (--entriesLeft < 0)
            return true;
        host::FileDescriptor inner;
        if (entry->d_type == DT_DIR || entry->d_type == DT_UNKNOWN)
            inner = openFolder(entries.descriptor(), entry->d_name, O_RDONLY | O_NOFOLLOW);
        if (inner) {
            if (holdsPlaceholder(std::move(inner), levels - 1, entriesLeft))
                return true;
        } else if (std::string_view(entry->d_name).ends_with(placeholderSuffix) &&
                   (entry->d_type == DT_REG || entry->d_type == DT_UNKNOWN)) {
            return true;
        }
    }
    return false;
}

bool isThere(const std::string& path) {
    return host::retried([&] { return ::access(path.c_str(), F_OK); }) == 0;
}

/// The folder that the item stands in, which is not the one that a link leads to.
std::string parentFolderOf(const std::string& path) {
    const std::size_t slash = path.rfind('/');
    if (slash == std::string::npos)
        return ".";
    return path.substr(0, std::max<std::size_t>(slash, 1));
}

std::string placeholderPath(const URL& url) {
    return url.path() + std::string(placeholderSuffix);
}

class HostCloudStore final : public CloudStore {
public:
    std::optional<bool> isUbiquitous(const URL& url, ErrorOut error) override {
        const std::optional<bool> synced = liesInSyncedStorage(url);
        if (!synced)
            return fail(error, makeServiceError(errno, url));
        return synced;
    }

    bool isPromisedItemReachable(const URL& url, ErrorOut error) override {
        if (!url.isFileURL())
            return fail(error, makeServiceError(ENOENT, url));
        if (isThere(url.path()))
            return true;
        const int errnoValue = errno;
        return isThere(placeholderPath(url)) || fail(error, makeServiceError(errnoValue, url));
    }

    bool downloadingStatus(const URL& url, std::optional<DownloadingStatus>& status,
                           ErrorOut error) override {
        status.reset();
        if (!isPromisedItemReachable(url, error))
            return false;
        const std::optional<bool> synced = isUbiquitous(url, error);
        if (synced.value_or(false))
            status = hasAllContent(url) ? DownloadingStatus::Downloaded
                                        : DownloadingStatus::NotDownloaded;
        return synced.has_value();
    }

    std::optional<URL> placeholderFile(const URL& url) override {
        if (!url.isFileURL() || isThere(url.path()) || !isThere(placeholderPath(url)))
            return std::nullopt;
        return URL::fileURLWithPath(placeholderPath(url));
    }

private:
    /// None, with errno set, when the item's folder can't be reached.
    static std::optional<bool> liesInSyncedStorage(const URL& url) {
        if (!url.isFileURL()) {
            errno = ENOENT;
            return std::nullopt;
        }
        host::FileDescriptor folder =
            openFolder(AT_FDCWD, parentFolderOf(url.path()).c_str(), O_PATH);
        if (!folder)
            return std::nullopt;
        return liesBelowSyncedRoot(std::move(folder));
    }

    static bool hasAllContent(const URL& url) {
        if (!isThere(url.path()))
            return false;
        int entriesLeft = mostEntries;
        return !holdsPlaceholder(openFolder(AT_FDCWD, url.path().c_str(), O_RDONLY), mostLevels,
                                 entriesLeft);
    }
};

}  // namespace

CloudStore& CloudStore::host() {
    static HostCloudStore store;
    return store;
}

}  // namespace parvel
