#include "parvel/platform/linux/TrashFolders.h"

#include <fcntl.h>
#include <mntent.h>
#include <pwd.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <climits>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <memory>

#include "parvel/foundation/URL.h"
#include "parvel/platform/linux/MountPlace.h"
#include "parvel/platform/linux/Paths.h"

namespace parvel::host {

namespace {

/// The place that a folder has, or would have once it is made.
std::optional<MountPlace> placeOfFolder(std::string path) {
    std::optional<MountPlace> place = mountPlaceOf(path);
    while (!place && errno == ENOENT && path != "/") {
        path = parentFolderOf(path);
        place = mountPlaceOf(path);
    }
    return place;
}

std::string homeDirectory() {
    if (const char* home = std::getenv("HOME"); home && *home)
        return home;
    std::array<char, 4096> buffer{};
    passwd entry{};
    passwd* found = nullptr;
    ::getpwuid_r(::geteuid(), &entry, buffer.data(), buffer.size(), &found);
    return found && found->pw_dir ? found->pw_dir : "/";
}

TrashFolder homeTrash() {
    // An empty or relative value counts as none (XDG Base Directory specification).
    const char* data = std::getenv("XDG_DATA_HOME");
    const std::string base =
        data && *data == '/' ? data : pathAppending(homeDirectory(), ".local/share");
    return {pathAppending(base, "Trash"), ""};
}

/// The topmost folder of the mount that the item lies on; none where the way up can't be followed.
std::optional<std::string> topDirectoryOf(const std::string& parent, const MountPlace& place) {
    std::string top = parent;
    while (top != "/") {
        std::string above = parentFolderOf(top);
        const auto placeAbove = mountPlaceOf(above);
        if (!placeAbove)
            return std::nullopt;
        if (*placeAbove != place)
            break;
        top = std::move(above);
    }
    return top;
}

/// A volume's own trash: the administrator's `.Trash/$uid` where that is safe, and `.Trash-$uid`.
std::vector<TrashFolder> volumeTrashes(const std::string& topDirectory) {
    const std::string number = std::to_string(::geteuid());
    const std::string shared = pathAppending(topDirectory, ".Trash");
    std::vector<TrashFolder> folders;
    struct stat status {};
    if (::lstat(shared.c_str(), &status) == 0 && S_ISDIR(status.st_mode) &&
        (status.st_mode & S_ISVTX) != 0)
        folders.push_back({pathAppending(shared, number), topDirectory});
    folders.push_back({pathAppending(topDirectory, ".Trash-" + number), topDirectory});
    return folders;
}

/// The item's path with its folder's links resolved: what the info file names.
std::optional<std::string> resolvedPath(const std::string& item) {
    const auto folder = canonicalPath(parentFolderOf(item));
    if (!folder)
        return std::nullopt;
    return pathAppending(*folder, lastComponentOfPath(item));
}

/// Where file systems are mounted, each once. To look at one that mounts itself would mount it.
std::vector<std::string> mountedFolders() {
    const std::unique_ptr<FILE, int (*)(FILE*)> table(::setmntent("/proc/self/mounts", "re"),
                                                      &::endmntent);
    std::vector<std::string> folders;
    std::array<char, 3 * PATH_MAX> buffer{};
    mntent entry{};
    while (table && ::getmntent_r(table.get(), &entry, buffer.data(), buffer.size()))
        if (std::string_view(entry.mnt_type) != "autofs")
            folders.emplace_back(entry.mnt_dir);
    std::sort(folders.begin(), folders.end());
    folders.erase(std::unique(folders.begin(), folders.end()), folders.end());
    return folders;
}

}  // namespace

std::string TrashFolder::filesFolder() const {
    return pathAppending(path, "files");
}

std::string TrashFolder::infoFolder() const {
    return pathAppending(path, "info");
}

std::optional<TrashPlan> planTrash(const std::string& item) {
    auto absolute = resolvedPath(item);
    if (!absolute)
        return std::nullopt;
    const auto place = mountPlaceOf(*absolute);
    if (!place)
        return std::nullopt;
    const TrashFolder home = homeTrash();
    TrashPlan plan{{}, std::move(*absolute)};
    // An item may be the top of its own mount; then only a copy can trash it.
    const std::string folder = parentFolderOf(plan.absolute);
    if (placeOfFolder(home.path) != place && mountPlaceOf(folder) == place) {
        if (const auto top = topDirectoryOf(folder, *place))
            plan.folders = volumeTrashes(*top);
    }
    plan.folders.push_back(home);
    return plan;
}

std::vector<TrashFolder> existingTrashFolders() {
    std::vector<TrashFolder> folders{homeTrash()};
    for (const std::string& top : mountedFolders()) {
        for (TrashFolder& trash : volumeTrashes(top)) {
            if (isOwnRealFolder(trash.path))
                folders.push_back(std::move(trash));
        }
    }
    return folders;
}

bool isOwnRealFolder(const std::string& path) {
    struct stat status {};
    return ::lstat(path.c_str(), &status) == 0 && S_ISDIR(status.st_mode) &&
           status.st_uid == ::geteuid();
}

std::string trashName(std::string_view name, int attempt) {
    constexpr std::size_t infoSuffix = sizeof(".trashinfo") - 1;
    const std::string_view extension = extensionOfPath(name);
    std::string tail = attempt == 1 ? "" : "." + std::to_string(attempt);
    std::string stem(name);
    if (!extension.empty() && extension.size() + 1 < name.size()) {
        stem = name.substr(0, name.size() - extension.size() - 1);
        tail += "." + std::string(extension);
    }
    if (stem.size() + tail.size() + infoSuffix > NAME_MAX && tail.size() + infoSuffix < NAME_MAX) {
        std::size_t room = NAME_MAX - tail.size() - infoSuffix;
        while (room > 1 && (static_cast<unsigned char>(stem[room]) & 0xC0) == 0x80)
            --room;
        stem.resize(room);
    }
    return stem + tail;
}

std::string infoFileFor(const std::string& trash, std::string_view name) {
    return pathAppending(pathAppending(trash, "info"), std::string(name) + ".trashinfo");
}

std::optional<std::string> infoFileOfTrashed(const std::string& item) {
    const std::string_view files = pathWithoutLastComponent(item);
    if (lastComponentOfPath(files) != "files")
        return std::nullopt;
    return infoFileFor(std::string(pathWithoutLastComponent(files)), lastComponentOfPath(item));
}

}  // namespace parvel::host
