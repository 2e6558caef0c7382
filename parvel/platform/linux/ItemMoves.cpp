// How items move. Across file systems, and wherever an item is made anew, in this order:
//   1. the item is copied into a hidden, locked folder beside the target and written to the disk;
//   2. one rename gives it its final name, and the folder is written to the disk;
//   3. only then the source goes. Where it can't, the new item is taken back.
// A failure or a kill before step 2 leaves the source whole and nothing under the final name; after
// it, the new item is whole. What a kill leaves in the hidden folder is cleared by the next
// operation there.

#include "parvel/platform/linux/ItemMoves.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <cerrno>
#include <functional>

#include "parvel/foundation/URL.h"
#include "parvel/platform/ResourceQueries.h"
#include "parvel/platform/Service.h"
#include "parvel/platform/StagingDirectory.h"
#include "parvel/platform/linux/HiddenItem.h"
#include "parvel/platform/linux/ItemInheritance.h"
#include "parvel/platform/linux/ItemRenames.h"
#include "parvel/platform/linux/ItemTree.h"
#include "parvel/platform/linux/Paths.h"
#include "parvel/platform/linux/StagingFolder.h"

namespace parvel::host {

namespace {

int syncParents(const std::string& source, const std::string& destination) {
    const std::string from = parentFolderOf(source);
    const std::string to = parentFolderOf(destination);
    if (const int error = syncFolder(to))
        return error;
    return from == to ? 0 : syncFolder(from);
}

/// A staging folder beside the target with a synced copy of the source in it.
struct StagedCopy {
    StagingFolder folder;
    std::string path;
};

/// Whether the second path leads to the first one's item or below it.
bool leadsInto(const std::string& item, const std::string& path) {
    const auto relationship = Service<ResourceQueries>::current().relationship(
        URL::fileURLWithPath(item), URL::fileURLWithPath(path));
    return relationship == DirectoryRelationship::Contains ||
           relationship == DirectoryRelationship::Same;
}

/// Whether a folder is the item or lies below it: a copy into it would copy itself.
bool liesWithin(const std::string& folder, const std::string& item) {
    struct stat copied {};
    return itemStatus(item, copied) == 0 && S_ISDIR(copied.st_mode) && leadsInto(item, folder);
}

std::optional<StagedCopy> stageCopy(const std::string& source, const std::string& target,
                                    int& error) {
    error = EINVAL;
    if (liesWithin(parentFolderOf(target), source))
        return std::nullopt;
    auto folder = StagingFolder::makeIn(parentFolderOf(target), error);
    if (!folder)
        return std::nullopt;
    std::string path = pathAppending(folder->path(), "item");
    error = copyTree(source, path);
    if (error == 0)
        error = syncItem(path);
    if (error == 0)
        error = syncFolder(folder->path());
    if (error != 0)
        return std::nullopt;
    return StagedCopy{std::move(*folder), std::move(path)};
}

/// Closed again, and hidden still, before it gets its final name.
int publishClosedFolder(const std::string& staged, const std::string& destination) {
    int error = 0;
    const auto beside = HiddenItem::bring(staged, parentFolderOf(destination), error);
    return beside ? renameExclusively(beside->path(), destination) : error;
}

int publish(const StagedCopy& staged, const std::string& destination) {
    int error = isClosedFolder(staged.path) ? publishClosedFolder(staged.path, destination)
                                            : renameExclusively(staged.path, destination);
    if (error != 0)
        return error;
    error = syncFolder(parentFolderOf(destination));
    if (error != 0)
        (void)discardItem(destination);
    return error;
}

/// Removes the item that a copy now stands for. An error means that it still stands whole under its
/// name; what may be left of it elsewhere, hidden, is none.
int discardCopied(const std::string& source) {
    const int error = discardItem(source);
    return error != 0 && itemStandsAt(source) ? error : 0;
}

int moveAcrossFileSystems(const std::string& source, const std::string& destination) {
    if (const int error = copyExclusively(source, destination))
        return error;
    const int error = discardCopied(source);
    if (error != 0)
        (void)discardItem(destination);
    return error;
}

/// What has to be done before a replaced item may go; 0, or the errno value.
using LastStep = std::function<int()>;

int settle(const std::string& existing, const LastStep& lastStep) {
    const int error = syncFolder(parentFolderOf(existing));
    return error != 0 ? error : lastStep();
}

/// A file over a file: one plain rename. Until all is settled the old one keeps a hidden second
/// name, to come back by; where the file system has no such names, the new one stays after a
/// failure.
int takePlaceOfFile(const std::string& existing, const std::string& replacement,
                    const LastStep& lastStep) {
    int error = 0;
    const auto old = HiddenItem::linkTo(existing, error);
    if (!old && !isLinkUnsupported(error))
        return error;
    if ((error = plainRename(replacement, existing)) != 0)
        return error;
    error = settle(existing, lastStep);
    if (error != 0 && old &&
        ::linkat(AT_FDCWD, existing.c_str(), AT_FDCWD, replacement.c_str(), 0) == 0)
        (void)plainRename(old->path(), existing);
    return error;
}

/// Tried once more where a call fails, since until then the old item is hidden.
int renameBack(const std::string& aside, const std::string& existing) {
    const int error = renameExclusively(aside, existing);
    return error == 0 ? 0 : renameExclusively(aside, existing);
}

/// For file systems that can't exchange two names: the old item steps aside, under a hidden name
/// that nobody clears until the new one stands in its place, and comes back on a failure. It stays
/// hidden, whole, where the way back fails twice.
int takePlaceByStepAside(const std::string& existing, const std::string& replacement,
                         const LastStep& lastStep) {
    const std::string aside =
        pathAppending(parentFolderOf(existing), randomName(StagingDirectory::asidePrefix));
    int error = renameExclusively(existing, aside);
    if (error != 0)
        return error;
    if ((error = renameExclusively(replacement, existing)) != 0) {
        (void)renameBack(aside, existing);
        return error;
    }
    auto old = HiddenItem::hide(aside, error);
    if (old)
        error = settle(existing, lastStep);
    if (error == 0 || renameExclusively(existing, replacement) != 0)
        return error;
    if (renameBack(old ? old->path() : aside, existing) == 0 && old)
        old->release();
    return error;
}

/// Folders, or a folder and a file: the two are exchanged in one step, which can be taken back, and
/// the old one is hidden in the next.
int takePlaceByExchange(const std::string& existing, const std::string& replacement,
                        const LastStep& lastStep) {
    int error = exchangeNames(replacement, existing);
    if (isFlagUnsupported(error)) {
        // The kernel says the same of a folder and what lies in it; that may not step aside.
        return liesWithin(parentFolderOf(replacement), existing) ||
                       liesWithin(parentFolderOf(existing), replacement)
                   ? EINVAL
                   : takePlaceByStepAside(existing, replacement, lastStep);
    }
    if (error != 0)
        return error;
    auto old = HiddenItem::hide(replacement, error);
    if (!old) {
        (void)exchangeNames(replacement, existing);
        return error;
    }
    error = settle(existing, lastStep);
    if (error != 0 && renameExclusively(old->path(), replacement) == 0) {
        old->release();
        (void)exchangeNames(replacement, existing);
    }
    return error;
}

/// Puts an item on the same file system in the existing one's place.
int takePlace(const std::string& existing, const std::string& replacement,
              const LastStep& lastStep) {
    return isFolder(existing) || isFolder(replacement)
               ? takePlaceByExchange(existing, replacement, lastStep)
               : takePlaceOfFile(existing, replacement, lastStep);
}

/// Replaces by a staged copy: across file systems, and where the new item has to change before it
/// takes the place, or can't be moved there as it is.
int replaceByCopy(const std::string& existing, const std::string& replacement,
                  ReplaceOptions options) {
    int error = 0;
    const auto staged = stageCopy(replacement, existing, error);
    if (!staged)
        return error;
    if (options == ReplaceOptions::Default) {
        if ((error = inheritMetadata(existing, staged->path)) != 0)
            return error;
    }
    const LastStep discardOriginal = [&replacement] { return discardCopied(replacement); };
    error = takePlace(existing, staged->path, discardOriginal);
    if (error != EACCES || !isFolder(staged->path))
        return error;
    const auto beside = HiddenItem::bring(staged->path, parentFolderOf(existing), error);
    return beside ? takePlace(existing, beside->path(), discardOriginal) : error;
}

/// Two names of one file: a rename of one onto the other would do nothing and leave both.
int replaceByOtherName(const std::string& existing, const std::string& replacement) {
    struct stat oldParent {};
    struct stat newParent {};
    if (::stat(parentFolderOf(existing).c_str(), &oldParent) != 0 ||
        ::stat(parentFolderOf(replacement).c_str(), &newParent) != 0)
        return errno;
    const bool isSameName = isSameItem(oldParent, newParent) &&
                            lastComponentOfPath(existing) == lastComponentOfPath(replacement);
    if (isSameName)
        return 0;
    struct stat item {};
    if (const int error = itemStatus(replacement, item))
        return error;
    // One name in two spellings, on a file system that ignores case: only its spelling changes.
    if (item.st_nlink < 2 || S_ISDIR(item.st_mode))
        return plainRename(replacement, existing);
    return ::unlink(replacement.c_str()) == 0 ? 0 : errno;
}

}  // namespace

int moveExclusively(const std::string& source, const std::string& destination) {
    int error = renameExclusively(source, destination);
    if (error == EXDEV)
        return moveAcrossFileSystems(source, destination);
    if (error != 0)
        return error;
    if ((error = syncParents(source, destination)) != 0)
        (void)renameExclusively(destination, source);
    return error;
}

int copyExclusively(const std::string& source, const std::string& destination) {
    if (itemStandsAt(destination))
        return EEXIST;
    int error = 0;
    const auto staged = stageCopy(source, destination, error);
    return staged ? publish(*staged, destination) : error;
}

bool isLinkInto(const std::string& existing, const std::string& replacement) {
    struct stat oldItem {};
    struct stat newItem {};
    return itemStatus(replacement, newItem) == 0 && S_ISLNK(newItem.st_mode) &&
           itemStatus(existing, oldItem) == 0 && !S_ISLNK(oldItem.st_mode) &&
           leadsInto(existing, replacement);
}

int replace(const std::string& existing, const std::string& replacement, ReplaceOptions options) {
    struct stat oldItem {};
    struct stat newItem {};
    if (const int error = itemStatus(replacement, newItem))
        return error;
    const int existingError = itemStatus(existing, oldItem);
    if (existingError == ENOENT)
        return moveExclusively(replacement, existing);
    if (existingError != 0)
        return existingError;
    if (isSameItem(oldItem, newItem))
        return replaceByOtherName(existing, replacement);
    if (isLinkInto(existing, replacement))
        return EINVAL;

    if (options == ReplaceOptions::Default && hasToInherit(existing, replacement))
        return replaceByCopy(existing, replacement, options);
    // What stands under the final name after a power cut is to be whole, whoever wrote it.
    if (const int error = syncItem(replacement))
        return error;
    const std::string from = parentFolderOf(replacement);
    const int error = takePlace(existing, replacement, [&] {
        return from == parentFolderOf(existing) ? 0 : syncFolder(from);
    });
    // Folders that forbid changes can't be exchanged between two parents.
    const bool isRefused =
        error == EACCES && (isClosedFolder(existing) || isClosedFolder(replacement));
    return error == EXDEV || isRefused ? replaceByCopy(existing, replacement, options) : error;
}

}  // namespace parvel::host
