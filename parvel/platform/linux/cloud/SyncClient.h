#pragma once

#include <sys/stat.h>

#include <chrono>
#include <functional>
#include <string>
#include <string_view>

#include "parvel/platform/linux/cloud/ClientSocket.h"

namespace parvel::host {

/// An item below the root of synchronised storage, links on the way resolved.
struct SyncedItem {
    std::string root;      ///< absolute
    std::string relative;  ///< below the root, no slash at either end
    bool stands = false;   ///< something stands there on this disk
    bool isFolder = false;

    [[nodiscard]] std::string path() const { return root + "/" + relative; }
    /// Finds out what stands there now.
    void look() {
        struct stat status {};
        stands = ::stat(path().c_str(), &status) == 0;
        isFolder = stands && S_ISDIR(status.st_mode);
    }
};

/// What came of asking a client about an item.
enum class ClientWord {
    NotKept,  ///< the client does not run, or does not keep this root: what the disk shows stands
    Unclear,  ///< a wrong answer, or none in time: nothing is known of the item
    Unknown,  ///< the client has no such item, or none yet
    Current,
    Downloaded,  ///< all here, and not what the client holds for current
    Busy,        ///< here, and the client is still at work on it
    LeftOut,     ///< the client does not bring this item, nor does it tell others of it
    NotDownloaded,
};

/// Whether nothing of a folder that stands is still to come. A file has its name once it is whole,
/// with every client; a package fills up file by file.
[[nodiscard]] inline bool isSettled(ClientWord word) {
    switch (word) {
        case ClientWord::NotKept:
        case ClientWord::Unknown:
        case ClientWord::Current:
        case ClientWord::Downloaded:
        case ClientWord::LeftOut:
            return true;
        case ClientWord::Unclear:
        case ClientWord::Busy:
        case ClientWord::NotDownloaded:
            break;
    }
    return false;
}

struct ClientAnswer {
    ClientWord word;
    std::string_view reason;  ///< for a person; a literal
    /// The client runs and did not answer in time.
    bool isSilent = false;
};

/// How long the library waits for other programs.
struct CloudWaits {
    /// For all that one question takes.
    std::chrono::milliseconds answer{1000};
    /// A client that was silent is not asked again for so long.
    std::chrono::milliseconds rest{10'000};
    /// For a download.
    std::chrono::milliseconds download{60'000};
    /// How long the folders that the desktop tells of count.
    std::chrono::milliseconds roots{60'000};
};

/// A sync client that is asked about single items. Its answers come from another process and are
/// believed only where they are whole and make sense. Callable from any thread; a question keeps
/// nothing.
class SyncClient {
public:
    virtual ~SyncClient() = default;

    /// What a person knows the client by.
    [[nodiscard]] virtual std::string_view name() const = 0;
    [[nodiscard]] virtual ClientAnswer ask(const SyncedItem& item, Deadline deadline) = 0;
    /// Has the item downloaded, and gives whether all of it came before the deadline: `isHere`
    /// tells what the disk shows. Gives up at once where the client is not there to do it.
    [[nodiscard]] virtual bool fetch(const SyncedItem& item, const std::function<bool()>& isHere,
                                     Deadline deadline) = 0;
};

}  // namespace parvel::host
