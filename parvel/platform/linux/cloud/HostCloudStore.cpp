#include "parvel/platform/CloudStore.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <string>
#include <string_view>
#include <utility>

#include "parvel/platform/Service.h"
#include "parvel/platform/linux/DirectoryStream.h"
#include "parvel/platform/linux/FileDescriptor.h"
#include "parvel/platform/linux/ItemTree.h"
#include "parvel/platform/linux/SystemCall.h"
#include "parvel/platform/linux/cloud/DesktopRoots.h"
#include "parvel/platform/linux/cloud/HostCloudStore.h"

namespace parvel {

namespace {

/// A package with more entries or levels than these is taken for one that is not all there: nobody
/// reads its content then.
constexpr int mostEntries = 100'000;
constexpr int mostLevels = 64;

host::FileDescriptor openFolder(int parent, const char* name, int flags) {
    return host::FileDescriptor(
        host::retried([&] { return ::openat(parent, name, O_DIRECTORY | O_CLOEXEC | flags); }));
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
        } else if (std::string_view(entry->d_name).ends_with(host::nextcloudPlaceholderSuffix) &&
                   (entry->d_type == DT_REG || entry->d_type == DT_UNKNOWN)) {
            return true;
        }
    }
    return false;
}

bool isThere(const std::string& path) {
    return host::retried([&] { return ::access(path.c_str(), F_OK); }) == 0;
}

std::string placeholderPath(const std::string& path) {
    return path + std::string(host::nextcloudPlaceholderSuffix);
}

/// As far as the disk shows it: the item stands there, and no part of it as a placeholder.
bool hasAllContent(const std::string& path) {
    if (!isThere(path))
        return false;
    int entriesLeft = mostEntries;
    return !holdsPlaceholder(openFolder(AT_FDCWD, path.c_str(), O_RDONLY), mostLevels, entriesLeft);
}

std::string parentPath(const URL& url) {
    return std::string(pathWithoutLastComponent(url.path()));
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
        return {DownloadingStatus::NotDownloaded, "a placeholder stands for it or a part of it"};

    const ClientAnswer answer = ask(place);
    const auto onDisk = [&place](DownloadingStatus status) {
        return place.item.stands ? std::optional(status) : std::nullopt;
    };
    switch (answer.word) {
        case ClientWord::Unclear:
            break;
        case ClientWord::NotKept:
        case ClientWord::Unknown:
        case ClientWord::Downloaded:
            return {onDisk(DownloadingStatus::Downloaded), answer.reason};
        case ClientWord::Current:
            return {onDisk(DownloadingStatus::Current), answer.reason};
        case ClientWord::NotDownloaded:
            return {DownloadingStatus::NotDownloaded, answer.reason};
    }
    return {std::nullopt, answer.reason};
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

bool HostCloudStore::fetchContent(const URL& url, ErrorOut error) {
    const std::optional<SyncedPlace> place =
        url.isFileURL() ? markedPlaceOf(url.path()) : std::nullopt;
    if (!place || place->mark == SyncMark::None)
        return true;
    if (stateOf(*place).status != DownloadingStatus::NotDownloaded)
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
