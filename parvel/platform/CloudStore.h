#pragma once

#include <optional>

#include "parvel/foundation/ErrorOut.h"
#include "parvel/foundation/URL.h"
#include "parvel/platform/CloudReport.h"

namespace parvel {

/// Cloud-synchronised storage: the folders that Nextcloud's client or Syncthing have marked on the
/// disk, and those that the desktop's other clients announce. A client is asked about an item only
/// where its mark stands in a folder above, for at most a second; where it does not run, what the
/// disk shows stands. The announced folders are asked for once in a minute, and tell of no single
/// items. All errors are those of makeServiceError.
class CloudStore {
public:
    virtual ~CloudStore() = default;

    /// Whether the item lies in storage that a sync client keeps in step; none when the folder that
    /// it stands in can't be reached.
    [[nodiscard]] virtual std::optional<bool> isUbiquitous(const URL& url,
                                                           ErrorOut error = nullptr) = 0;
    /// Whether the item exists, or what stands for it until it is downloaded, or its client lists
    /// it for download.
    [[nodiscard]] virtual bool isPromisedItemReachable(const URL& url,
                                                       ErrorOut error = nullptr) = 0;
    /// False when the query fails, also for an item that is not reachable even as a promise. The
    /// status is none for an item that is in no such storage, and where its client gives no answer
    /// or one that makes no sense.
    [[nodiscard]] virtual bool downloadingStatus(const URL& url,
                                                 std::optional<DownloadingStatus>& status,
                                                 ErrorOut error = nullptr) = 0;
    /// The file that stands for an item whose content is not on this device; none for any other
    /// item.
    [[nodiscard]] virtual std::optional<URL> placeholderFile(const URL& url) = 0;
    /// Whether two items lie below the same root.
    [[nodiscard]] virtual bool lieBelowOneRoot(const URL& left, const URL& right) = 0;
    /// Whether a rename within its root takes along what is still to come of the item. Syncthing
    /// knows of files alone: it would tear a package apart, on all devices.
    [[nodiscard]] virtual bool renamesWhole(const URL& item) = 0;
    /// Whether nothing of the item is still to come, so that moving it away moves the whole of it.
    /// A file is whole once it has its name; a package is not while its client gives no clear
    /// answer.
    [[nodiscard]] virtual bool isAllHere(const URL& url) = 0;
    /// Has the client download an item that is not all here, and waits for it. True at once for any
    /// other item. ETIMEDOUT, with nothing touched, where it is not here within a minute, or no
    /// client is there to fetch it.
    [[nodiscard]] virtual bool fetchContent(const URL& url, ErrorOut error = nullptr) = 0;
    /// What cloudReportForURL gives.
    [[nodiscard]] virtual std::optional<CloudReport> report(const URL& url,
                                                            ErrorOut error = nullptr) = 0;

    static CloudStore& host();
};

}  // namespace parvel
