#include "parvel/platform/TrashedItems.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <cstdint>
#include <string_view>
#include <tuple>

#include "parvel/platform/linux/DirectoryStream.h"
#include "parvel/platform/linux/OpenFolder.h"
#include "parvel/platform/linux/Paths.h"
#include "parvel/platform/linux/TrashFolders.h"
#include "parvel/platform/linux/TrashInfo.h"

namespace parvel {

namespace {

constexpr std::string_view kInfoExtension = ".trashinfo";

/// An item and the time to tell those of one second apart by.
struct Found {
    TrashedItem item;
    std::int64_t seconds;
    std::int64_t nanoseconds;

    [[nodiscard]] bool isBefore(const Found& other) const {
        return std::tie(item.trashedAt, seconds, nanoseconds) <
               std::tie(other.item.trashedAt, other.seconds, other.nanoseconds);
    }
};

void appendItemsOf(const host::TrashFolder& trash, std::vector<Found>& items) {
    const std::string folder = trash.infoFolder();
    host::DirectoryStream entries(host::openFolder(AT_FDCWD, folder.c_str(), O_RDONLY));
    while (const dirent* entry = entries.isOpen() ? entries.next() : nullptr) {
        std::string_view name = entry->d_name;
        if (!name.ends_with(kInfoExtension))
            continue;
        const std::string file = pathAppending(folder, name);
        const auto info = host::readTrashInfo(file, trash);
        name.remove_suffix(kInfoExtension.size());
        const std::string place = pathAppending(trash.filesFolder(), name);
        struct stat status {};
        if (!info || !info->isOurs || !host::itemStandsAt(place) ||
            ::lstat(file.c_str(), &status) != 0)
            continue;
        items.push_back({{URL::fileURLWithPath(place), URL::fileURLWithPath(info->original),
                          info->deletionDate},
                         status.st_mtim.tv_sec,
                         status.st_mtim.tv_nsec});
    }
}

}  // namespace

std::vector<TrashedItem> trashedItems() {
    std::vector<Found> found;
    for (const host::TrashFolder& trash : host::existingTrashFolders())
        appendItemsOf(trash, found);
    // Times of one form are in order as texts.
    std::sort(found.begin(), found.end(),
              [](const Found& left, const Found& right) { return left.isBefore(right); });
    std::vector<TrashedItem> items;
    items.reserve(found.size());
    for (Found& each : found)
        items.push_back(std::move(each.item));
    return items;
}

}  // namespace parvel
