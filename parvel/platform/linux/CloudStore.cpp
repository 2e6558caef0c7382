#include "parvel/platform/CloudStore.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <climits>
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

/// What marks a folder as the root of synchronised storage, and whose mark it is.
struct RootMark {
    std::string_view client;
    std::string name;
};

std::optional<std::string> nextcloudJournalIn(int folder) {
    host::DirectoryStream entries(openFolder(folder, ".", O_RDONLY));
    if (!entries.isOpen())
        return std::nullopt;
    while (const dirent* entry = entries.next())
        if (isNextcloudJournal(entry->d_name))
            return entry->d_name;
    return std::nullopt;
}

std::optional<RootMark> markIn(int folder) {
    if (::faccessat(folder, syncthingMark, F_OK, 0) == 0)
        return RootMark{"Syncthing", syncthingMark};
    if (auto journal = nextcloudJournalIn(folder))
        return RootMark{"Nextcloud", std::move(*journal)};
    return std::nullopt;
}

/// The root of synchronised storage on the way up from a folder.
struct FoundRoot {
    host::FileDescriptor folder;
    RootMark mark;
};

/// The folder or the first one above it that is such a root; `found` is none where there is none.
/// False, with errno set, when the way up can't be followed.
bool findSyncedRoot(host::FileDescriptor folder, std::optional<FoundRoot>& found) {
    struct stat status;
    if (::fstat(folder.get(), &status) != 0)
        return false;
    for (;;) {
        if (auto mark = markIn(folder.get())) {
            found = FoundRoot{std::move(folder), std::move(*mark)};
            return true;
        }
        host::FileDescriptor parent = openFolder(folder.get(), "..", O_PATH);
        struct stat above;
        if (!parent || ::fstat(parent.get(), &above) != 0)
            return false;
        if (above.st_dev == status.st_dev && above.st_ino == status.st_ino)
            return true;
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

/// As findSyncedRoot, from the folder that the item stands in.
bool findRootHolding(const URL& url, std::optional<FoundRoot>& found) {
    if (!url.isFileURL()) {
        errno = ENOENT;
        return false;
    }
    host::FileDescriptor folder = openFolder(AT_FDCWD, parentFolderOf(url.path()).c_str(), O_PATH);
    return folder && findSyncedRoot(std::move(folder), found);
}

/// The path of an open folder.
std::string pathOf(const host::FileDescriptor& folder) {
    std::string path(PATH_MAX, '\0');
    const std::string link = "/proc/self/fd/" + std::to_string(folder.get());
    const ssize_t length = ::readlink(link.c_str(), path.data(), path.size());
    path.resize(length > 0 ? static_cast<std::size_t>(length) : 0);
    return path;
}

class HostCloudStore final : public CloudStore {
public:
    std::optional<bool> isUbiquitous(const URL& url, ErrorOut error) override {
        std::optional<FoundRoot> root;
        if (!findRootHolding(url, root))
            return fail(error, makeServiceError(errno, url));
        return root.has_value();
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

std::optional<CloudRoot> cloudRootHolding(const URL& url, ErrorOut error) {
    std::optional<FoundRoot> root;
    if (!findRootHolding(url, root))
        return fail(error, makeServiceError(errno, url));
    if (!root)
        return std::nullopt;
    return CloudRoot{std::string(root->mark.client), URL::fileURLWithPath(pathOf(root->folder)),
                     std::move(root->mark.name)};
}

}  // namespace parvel
