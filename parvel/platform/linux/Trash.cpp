#include "parvel/platform/linux/Trash.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "parvel/foundation/URL.h"
#include "parvel/platform/linux/ItemMoves.h"
#include "parvel/platform/linux/ItemRenames.h"
#include "parvel/platform/linux/ItemTree.h"
#include "parvel/platform/linux/Paths.h"
#include "parvel/platform/linux/TrashFolders.h"
#include "parvel/platform/linux/TrashInfo.h"

namespace parvel::host {

namespace {

int makeFolders(const std::string& path) {
    if (::mkdir(path.c_str(), 0700) == 0 || errno == EEXIST)
        return 0;
    if (errno != ENOENT)
        return errno;
    if (const int error = makeFolders(std::string(pathWithoutLastComponent(path))))
        return error;
    return ::mkdir(path.c_str(), 0700) == 0 || errno == EEXIST ? 0 : errno;
}

int makeTrash(const TrashFolder& trash) {
    if (!trash.topDirectory.empty()) {
        if (::mkdir(trash.path.c_str(), 0700) != 0 && errno != EEXIST)
            return errno;
        // Nothing is made in it before it is known to be no link to somewhere else.
        if (!isOwnRealFolder(trash.path))
            return EPERM;
    }
    if (const int error = makeFolders(trash.filesFolder()))
        return error;
    return makeFolders(trash.infoFolder());
}

int moveInto(const TrashFolder& trash, const std::string& item, const std::string& absolute,
             std::string& resulting) {
    for (int attempt = 1; attempt <= kMaximumTrashNames; ++attempt) {
        const std::string name = trashName(lastComponentOfPath(item), attempt);
        const std::string info = infoFileFor(trash.path, name);
        int error = writeTrashInfo(info, trash, absolute);
        if (error == EEXIST)
            continue;
        if (error != 0)
            return error;
        resulting = pathAppending(trash.filesFolder(), name);
        error = syncFolder(trash.infoFolder());
        if (error == 0)
            error = moveExclusively(item, resulting);
        if (error == 0)
            return 0;
        ::unlink(info.c_str());
        if (error != EEXIST)
            return error;
    }
    return EEXIST;
}

/// The item's info file, where it has one. One that can't be looked at counts as there: its rename
/// then tells why.
std::optional<std::string> infoFileThere(const std::string& item) {
    std::optional<std::string> info = infoFileOfTrashed(item);
    struct stat status {};
    if (!info)
        return std::nullopt;
    const bool isFound = ::lstat(info->c_str(), &status) == 0;
    if (isFound ? !S_ISREG(status.st_mode) : errno == ENOENT || errno == ENOTDIR)
        return std::nullopt;
    return info;
}

/// The info file goes first, and comes back when the item can't be renamed.
int renameWithinTrash(const std::string& oldInfo, const std::string& source,
                      const std::string& destination) {
    const std::string newInfo = infoFileOfTrashed(destination).value_or(std::string());
    int error = renameExclusively(oldInfo, newInfo);
    if (error != 0)
        return error;
    error = syncFolder(parentFolderOf(newInfo));
    if (error == 0)
        error = moveExclusively(source, destination);
    if (error != 0)
        (void)renameExclusively(newInfo, oldInfo);
    return error;
}

}  // namespace

int trashItem(const std::string& item, std::string& resulting) {
    struct stat status {};
    if (::lstat(item.c_str(), &status) != 0)
        return errno;
    const auto plan = planTrash(item);
    if (!plan)
        return errno;
    int error = 0;
    for (const TrashFolder& trash : plan->folders) {
        error = makeTrash(trash);
        if (error == 0)
            error = moveInto(trash, item, plan->absolute, resulting);
        if (error == 0)
            return 0;
    }
    return error;
}

bool isTrashed(const std::string& item) {
    return infoFileThere(item).has_value();
}

int moveTrashed(const std::string& source, const std::string& destination) {
    const auto info = infoFileThere(source);
    if (info && pathWithoutLastComponent(source) == pathWithoutLastComponent(destination))
        return renameWithinTrash(*info, source, destination);
    const int error = moveExclusively(source, destination);
    // What has left the trash is no longer listed there; an info file that stays does no harm.
    if (error == 0 && info)
        ::unlink(info->c_str());
    return error;
}

}  // namespace parvel::host
