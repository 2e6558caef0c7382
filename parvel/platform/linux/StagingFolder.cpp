#include "parvel/platform/linux/StagingFolder.h"

#include <sys/stat.h>

#include <chrono>
#include <map>
#include <mutex>
#include <tuple>

#include "parvel/platform/linux/MountPlace.h"
#include "parvel/platform/linux/Paths.h"
#include "parvel/platform/linux/cloud/SyncedPlace.h"

namespace parvel::host {

namespace {

using Clock = std::chrono::steady_clock;

constexpr auto kTimeKnown = std::chrono::hours(1);
constexpr std::size_t kMostFoldersKnown = 1000;

/// Where items for a folder are staged, as it was found out at a time.
struct KnownPlace {
    std::string path;
    Clock::time_point since;
};

/// Beside the root of the synchronised storage that the folder lies in, else the folder.
std::string findPlaceFor(const std::string& folder) {
    const auto root = markedRootAbove(folder);
    if (!root)
        return folder;
    std::string beside = parentFolderOf(*root);
    return mountPlaceOf(beside) == mountPlaceOf(folder) ? beside : folder;
}

/// The only thing that is remembered between two calls: finding out lists the folder and those
/// above, which takes long where they are large.
std::string placeFor(const std::string& folder) {
    using Key = std::tuple<std::string, dev_t, ino_t>;
    static std::mutex mutex;
    static std::map<Key, KnownPlace> known;

    struct stat status {};
    if (::stat(folder.c_str(), &status) != 0)
        return folder;
    const Key key{folder, status.st_dev, status.st_ino};
    const Clock::time_point now = Clock::now();
    {
        const std::lock_guard lock(mutex);
        const auto found = known.find(key);
        if (found != known.end() && now - found->second.since < kTimeKnown)
            return found->second.path;
    }
    std::string place = findPlaceFor(folder);
    clearStaleItems(folder);
    if (place != folder)
        clearStaleItems(place);
    const std::lock_guard lock(mutex);
    if (known.size() >= kMostFoldersKnown)
        known.clear();
    known[key] = {place, now};
    return place;
}

}  // namespace

std::optional<StagingFolder> StagingFolder::makeIn(const std::string& parent, int& error) {
    const std::string place = placeFor(parent);
    if (place != parent) {
        if (auto beside = HiddenItem::makeFolderIn(place, error))
            return StagingFolder(std::move(*beside));
    }
    auto item = HiddenItem::makeFolderIn(parent, error);
    if (!item)
        return std::nullopt;
    return StagingFolder(std::move(*item));
}

}  // namespace parvel::host
