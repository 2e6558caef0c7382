#pragma once

#include <optional>
#include <string>

#include "parvel/foundation/ErrorOut.h"
#include "parvel/foundation/PVExport.h"
#include "parvel/foundation/URL.h"

namespace parvel {

/// What an item in cloud-synchronised storage has on this device.
enum class DownloadingStatus { Current, Downloaded, NotDownloaded };

/// A folder that a sync client keeps in step with other places.
struct CloudRoot {
    std::string client;  ///< the client's name
    URL folder;
    std::string mark;  ///< the name in the folder that tells
};

/// Cloud-synchronised storage, as far as the disk shows it: the marks of Nextcloud's client and of
/// Syncthing in a folder above, and Nextcloud's placeholder files. No client is asked, so no item
/// is known to be Current. All errors are those of makeServiceError.
class PV_EXPORT CloudStore {
public:
    virtual ~CloudStore() = default;

    /// Whether the item lies in storage that a sync client keeps in step; none when the folder that
    /// it stands in can't be reached.
    [[nodiscard]] virtual std::optional<bool> isUbiquitous(const URL& url,
                                                           ErrorOut error = nullptr) = 0;
    /// Whether the item, or what stands for it until it is downloaded, exists.
    [[nodiscard]] virtual bool isPromisedItemReachable(const URL& url,
                                                       ErrorOut error = nullptr) = 0;
    /// False when the query fails, also for an item that is not reachable even as a promise. The
    /// status is none for an item that is in no such storage.
    [[nodiscard]] virtual bool downloadingStatus(const URL& url,
                                                 std::optional<DownloadingStatus>& status,
                                                 ErrorOut error = nullptr) = 0;
    /// The file that stands for an item whose content is not on this device; none for any other
    /// item.
    [[nodiscard]] virtual std::optional<URL> placeholderFile(const URL& url) = 0;

    static CloudStore& host();
};

/// The root of the synchronised storage that the item lies in; none where it lies in no such
/// storage. None with an error of makeServiceError when the folder that it stands in can't be
/// reached.
[[nodiscard]] PV_EXPORT std::optional<CloudRoot> cloudRootHolding(const URL& url,
                                                                  ErrorOut error = nullptr);

}  // namespace parvel
