#pragma once

#include <optional>
#include <string>

#include "parvel/foundation/ErrorOut.h"
#include "parvel/foundation/PVExport.h"
#include "parvel/foundation/URL.h"

namespace parvel {

/// What an item in cloud-synchronised storage has on this device.
enum class DownloadingStatus { Current, Downloaded, NotDownloaded };

/// What is known of an item's synchronised storage, for a person.
struct CloudReport {
    bool isUbiquitous = false;
    std::optional<DownloadingStatus> status;  ///< none where nobody can tell, and outside
    std::string client;                       ///< the sync client's name; empty outside
    std::string root;    ///< the path of the synchronised folder; empty outside
    std::string mark;    ///< the name in that folder that marks it; empty where the desktop tells
    std::string reason;  ///< for the status, in a few English words
};

/// Says what the library takes an item's synchronised storage for, and why. None when the folder
/// that it stands in can't be reached, with an error of makeServiceError; such an error comes
/// beside the report of an item that is not reachable, even as a promise.
PV_EXPORT std::optional<CloudReport> cloudReportForURL(const URL& url, ErrorOut error = nullptr);

}  // namespace parvel
