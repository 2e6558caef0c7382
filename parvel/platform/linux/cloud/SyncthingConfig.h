#pragma once

#include <sys/socket.h>
#include <sys/stat.h>

#include <optional>
#include <string>
#include <vector>

namespace parvel::host {

/// What Syncthing keeps in the root of each folder that it synchronises, unless it is told another.
inline constexpr const char* usualSyncthingMark = ".stfolder";

/// What Syncthing's configuration says of one of its folders, and where its REST interface is.
struct SyncthingFolder {
    std::string id;
    /// Of the loopback interface; length 0 where the interface is off, is only to be had with TLS
    /// or at an address that other machines share.
    sockaddr_storage address{};
    socklen_t addressLength = 0;
    std::string apiKey;
};

/// A folder that Syncthing tells by another mark than its usual one, as it may be configured.
struct SyncthingMark {
    struct stat root;
    std::string name;
};

/// Those of this user's configuration whose root stands; the mark itself need not.
[[nodiscard]] std::vector<SyncthingMark> unusualSyncthingMarks();

/// The folder with that root in the configuration of this user's Syncthing. None where there is no
/// configuration, or none that holds such a folder.
[[nodiscard]] std::optional<SyncthingFolder> syncthingFolderAt(const std::string& root);

}  // namespace parvel::host
