#pragma once

#include <array>
#include <atomic>
#include <memory>
#include <mutex>
#include <string_view>
#include <vector>

#include "parvel/platform/CloudStore.h"
#include "parvel/platform/linux/cloud/NextcloudClient.h"
#include "parvel/platform/linux/cloud/SyncedPlace.h"
#include "parvel/platform/linux/cloud/SyncthingClient.h"

namespace parvel::host {

/// The host's synchronised storage. Callable from any thread; between calls it keeps the folders
/// that the desktop told of, and which client was silent, each for the time in CloudWaits.
class HostCloudStore final : public CloudStore {
public:
    explicit HostCloudStore(const CloudWaits& waits = {}) : m_waits(waits) {}

    std::optional<bool> isUbiquitous(const URL& url, ErrorOut error) override;
    bool isPromisedItemReachable(const URL& url, ErrorOut error) override;
    bool downloadingStatus(const URL& url, std::optional<DownloadingStatus>& status,
                           ErrorOut error) override;
    std::optional<URL> placeholderFile(const URL& url) override;
    bool lieBelowOneRoot(const URL& left, const URL& right) override;
    bool renamesWhole(const URL& item) override;
    bool isAllHere(const URL& url) override;
    bool fetchContent(const URL& url, ErrorOut error) override;
    std::optional<CloudReport> report(const URL& url, ErrorOut error) override;

private:
    /// A client, and until when it is left alone after a silence.
    struct Asked {
        SyncClient& client;
        std::atomic<Deadline::rep> silentUntil{0};
    };
    struct State {
        std::optional<DownloadingStatus> status;
        std::string_view reason;
        bool isToCome = false;  ///< the item or a part of it, as far as anybody can tell
    };

    [[nodiscard]] Asked& clientOf(SyncMark mark);
    [[nodiscard]] ClientAnswer ask(const SyncedPlace& place);
    [[nodiscard]] State stateOf(const SyncedPlace& place);
    [[nodiscard]] std::optional<SyncedPlace> placeOf(const URL& url);
    [[nodiscard]] std::optional<SyncedPlace> placeToFetch(const URL& url);
    [[nodiscard]] std::shared_ptr<const std::vector<DesktopRoot>> toldRoots();

    CloudWaits m_waits;
    NextcloudClient m_nextcloud;
    SyncthingClient m_syncthing;
    Asked m_askedNextcloud{m_nextcloud};
    Asked m_askedSyncthing{m_syncthing};

    std::mutex m_mutex;  ///< of the two below
    std::shared_ptr<const std::vector<DesktopRoot>> m_roots;
    Deadline m_rootsUntil{};
};

}  // namespace parvel::host
