#include "parvel/platform/linux/cloud/HostCloudStore.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <string>
#include <string_view>
#include <utility>

#include "parvel/platform/Service.h"
#include "parvel/platform/linux/DirectoryStream.h"
#include "parvel/platform/linux/ItemTree.h"
#include "parvel/platform/linux/OpenFolder.h"
#include "parvel/platform/linux/SystemCall.h"
#include "parvel/platform/linux/cloud/DesktopRoots.h"

namespace parvel {

namespace {

/// A package with more entries or levels than these is taken for one that is not all there, as one
/// that can't be looked through: nobody reads its content then.
constexpr int kMostEntries = 100'000;
constexpr int kMostLevels = 64;

/// Whether a file of that name stands for another that is still to come: Nextcloud's placeholder,
/// or what Syncthing has of a file that is on its way.
bool isStandIn(std::string_view name) {
    return name.ends_with(host::nextcloudPlaceholderSuffix) ||
           (name.starts_with(".syncthing.") && name.ends_with(".tmp"));
}

/// Whether such a file stands anywhere in the folder, no link followed; true where nobody can tell.
bool holdsStandIn(host::FileDescriptor folder, int levels, int& entriesLeft) {
    host::DirectoryStream entries(std::move(folder));
    if (!entries.isOpen() || levels == 0)
        return true;
    while (const dirent* entry = entries.next()) {
        if (--entriesLeft < 0)
            return true;
        bool isFile = entry->d_type == DT_REG;
        if (entry->d_type == DT_DIR || entry->d_type == DT_UNKNOWN) {
            auto inner =
                host::openFolder(entries.descriptor(), entry->d_name, O_RDONLY | O_NOFOLLOW);
            isFile = !inner && errno == ENOTDIR;
            const bool isGone = !inner && errno == ENOENT;
            if (!isFile && !isGone && holdsStandIn(std::move(inner), levels - 1, entriesLeft))
                return true;
        }
        if (isFile && isStandIn(entry->d_name))
            return true;
    }
    return errno != 0;
}

bool isThere(const std::string& path) {
    return host::retried([&] { return ::access(path.c_str(), F_OK); }) == 0;
}

std::string placeholderPath(const std::string& path) {
    return path + std::string(host::nextcloudPlaceholderSuffix);
}

/// As far as the disk shows it: the item stands there, and for no part of it stands another file.
bool hasAllContent(const std::string& path) {
    if (!isThere(path))
        return false;
    int entriesLeft = kMostEntries;
    auto folder = host::openFolder(AT_FDCWD, path.c_str(), O_RDONLY);
    const bool isNoFolder = !folder && errno == ENOTDIR;
    return isNoFolder || !holdsStandIn(std::move(folder), kMostLevels, entriesLeft);
}

std::string parentPath(const URL& url) {
    return std::string(pathWithoutLastComponent(url.path()));
}

/// Whether the item stands there and is no folder. Such a file has its name since it is whole, and
/// a link is moved and removed as a link.
bool isFileOrLink(const URL& url) {
    struct stat status {};
    return ::lstat(url.path().c_str(), &status) == 0 && !S_ISDIR(status.st_mode);
}

std::optional<DownloadingStatus> statusOf(host::ClientWord word, bool stands) {
    using host::ClientWord;
    switch (word) {
        case ClientWord::Unclear:
            return std::nullopt;
        case ClientWord::NotDownloaded:
        case ClientWord::LeftOut:
            return DownloadingStatus::NotDownloaded;
        case ClientWord::Current:
            return stands ? std::optional(DownloadingStatus::Current) : std::nullopt;
        case ClientWord::NotKept:
        case ClientWord::Unknown:
        case ClientWord::Downloaded:
        case ClientWord::Busy:
            break;
    }
    return stands ? std::optional(DownloadingStatus::Downloaded) : std::nullopt;
}

}  // namespace

namespace host {

HostCloudStore::Asked& HostCloudStore::clientOf(SyncMark mark) {
    return mark == SyncMark::Nextcloud ? m_askedNextcloud : m_askedSyncthing;
}

ClientAnswer HostCloudStore::ask(const SyncedPlace& place) {
    Asked& asked = clientOf(place.mark);
    const Deadline now = std::chrono::steady_clock::now();
    if (now.time_since_epoch().count() < asked.silentUntil.load(std::memory_order_relaxed))
        return {ClientWord::Unclear, "the client did not answer a moment ago"};
    const ClientAnswer answer = asked.client.ask(place.item, now + m_waits.answer);
    if (answer.isSilent) {
        const Deadline until = std::chrono::steady_clock::now() + m_waits.rest;
        asked.silentUntil.store(until.time_since_epoch().count(), std::memory_order_relaxed);
    }
    return answer;
}

/// The disk comes first: what stands there as a placeholder is not here, whatever a client says.
HostCloudStore::State HostCloudStore::stateOf(const SyncedPlace& place) {
    const std::string path = place.item.path();
    if (place.mark == SyncMark::Desktop)
        return {std::nullopt, "the desktop tells of the folder and of no single items"};
    if (isThere(path) ? !hasAllContent(path) : isThere(placeholderPath(path)))
        return {DownloadingStatus::NotDownloaded, "a placeholder stands for it or a part of it",
                /*isToCome=*/true};

    const ClientAnswer answer = ask(place);
    const bool isToCome = place.item.stands ? place.item.isFolder && !isSettled(answer.word)
                                            : answer.word == ClientWord::NotDownloaded;
    return {statusOf(answer.word, place.item.stands), answer.reason, isToCome};
}

std::shared_ptr<const std::vector<DesktopRoot>> HostCloudStore::toldRoots() {
    const std::lock_guard lock(m_mutex);
    const Deadline now = std::chrono::steady_clock::now();
    if (!m_roots || now >= m_rootsUntil) {
        m_roots =
            std::make_shared<const std::vector<DesktopRoot>>(desktopRoots(now + m_waits.answer));
        m_rootsUntil = std::chrono::steady_clock::now() + m_waits.roots;
    }
    return m_roots;
}

/// None, with errno set, when the item's folder can't be reached.
std::optional<SyncedPlace> HostCloudStore::placeOf(const URL& url) {
    if (!url.isFileURL()) {
        errno = ENOENT;
        return std::nullopt;
    }
    std::optional<SyncedPlace> place = markedPlaceOf(url.path());
    if (!place || place->mark != SyncMark::None)
        return place;
    const auto roots = toldRoots();
    return roots->empty() ? place : desktopPlaceOf(url.path(), *roots);
}

std::optional<bool> HostCloudStore::isUbiquitous(const URL& url, ErrorOut error) {
    const std::optional<SyncedPlace> place = placeOf(url);
    if (!place)
        return fail(error, makeServiceError(errno, url));
    return place->mark != SyncMark::None;
}

bool HostCloudStore::isPromisedItemReachable(const URL& url, ErrorOut error) {
    if (!url.isFileURL())
        return fail(error, makeServiceError(ENOENT, url));
    if (isThere(url.path()))
        return true;
    const int errnoValue = errno;
    if (isThere(placeholderPath(url.path())))
        return true;
    const std::optional<SyncedPlace> place = markedPlaceOf(url.path());
    const bool isListed = place && place->mark == SyncMark::Syncthing &&
                          ask(*place).word == ClientWord::NotDownloaded;
    return isListed || fail(error, makeServiceError(errnoValue, url));
}

bool HostCloudStore::downloadingStatus(const URL& url, std::optional<DownloadingStatus>& status,
                                       ErrorOut error) {
    status.reset();
    if (!isPromisedItemReachable(url, error))
        return false;
    const std::optional<SyncedPlace> place = markedPlaceOf(url.path());
    if (!place)
        return fail(error, makeServiceError(errno, url));
    if (place->mark != SyncMark::None)
        status = stateOf(*place).status;
    return true;
}

std::optional<URL> HostCloudStore::placeholderFile(const URL& url) {
    const std::string path = placeholderPath(url.path());
    struct stat status {};
    if (!url.isFileURL() || isThere(url.path()) || ::lstat(path.c_str(), &status) != 0 ||
        !S_ISREG(status.st_mode))
        return std::nullopt;
    return URL::fileURLWithPath(path);
}

bool HostCloudStore::lieBelowOneRoot(const URL& left, const URL& right) {
    if (!left.isFileURL() || !right.isFileURL())
        return false;
    const std::optional<SyncedPlace> place = markedPlaceOf(left.path());
    if (!place || place->mark == SyncMark::None)
        return false;
    if (parentPath(left) == parentPath(right))
        return true;
    const std::optional<SyncedPlace> other = markedPlaceOf(right.path());
    return other && other->mark != SyncMark::None && isSameItem(place->root, other->root);
}

bool HostCloudStore::renamesWhole(const URL& item) {
    if (!item.isFileURL() || isFileOrLink(item))
        return true;
    const std::optional<SyncedPlace> place = markedPlaceOf(item.path());
    return !place || place->mark != SyncMark::Syncthing;
}

/// None for an item of which nothing is to come.
std::optional<SyncedPlace> HostCloudStore::placeToFetch(const URL& url) {
    if (!url.isFileURL() || isFileOrLink(url))
        return std::nullopt;
    std::optional<SyncedPlace> place = markedPlaceOf(url.path());
    const bool isToCome = place && place->mark != SyncMark::None && stateOf(*place).isToCome;
    return isToCome ? std::move(place) : std::nullopt;
}

bool HostCloudStore::isAllHere(const URL& url) {
    return !placeToFetch(url);
}

bool HostCloudStore::fetchContent(const URL& url, ErrorOut error) {
    const std::optional<SyncedPlace> place = placeToFetch(url);
    if (!place)
        return true;
    const Deadline deadline = std::chrono::steady_clock::now() + m_waits.download;
    const std::string path = place->item.path();
    return clientOf(place->mark)
               .client.fetch(
                   place->item, [&path] { return hasAllContent(path); }, deadline) ||
           fail(error, makePOSIXError(ETIMEDOUT, url));
}

std::optional<CloudReport> HostCloudStore::report(const URL& url, ErrorOut error) {
    const std::optional<SyncedPlace> place = placeOf(url);
    if (!place)
        return fail(error, makeServiceError(errno, url));
    CloudReport report;
    State state;
    report.reason = "no folder above it is kept in step";
    if (place->mark != SyncMark::None) {
        state = stateOf(*place);
        report = {true,
                  state.status,
                  place->mark == SyncMark::Desktop
                      ? place->client
                      : std::string(clientOf(place->mark).client.name()),
                  place->item.root,
                  place->markName,
                  std::string(state.reason)};
    }
    const bool isPromised = state.status == DownloadingStatus::NotDownloaded;
    if (!isPromised && !isThere(url.path()) && !isThere(placeholderPath(url.path())))
        assign(error, makeServiceError(ENOENT, url));
    return report;
}

}  // namespace host

CloudStore& CloudStore::host() {
    static host::HostCloudStore store;
    return store;
}

std::optional<CloudReport> cloudReportForURL(const URL& url, ErrorOut error) {
    return Service<CloudStore>::current().report(url, error);
}

}  // namespace parvel
