#include "parvel/platform/linux/cloud/SyncedPlace.h"

#include <fcntl.h>

#include <string_view>
#include <utility>

#include "parvel/platform/linux/DirectoryStream.h"
#include "parvel/platform/linux/ItemTree.h"
#include "parvel/platform/linux/OpenFolder.h"
#include "parvel/platform/linux/Paths.h"
#include "parvel/platform/linux/cloud/SyncthingConfig.h"

namespace parvel::host {

namespace {

/// The names of the journal that Nextcloud's client keeps in each root: `.sync_<12 hex digits>.db`,
/// in older versions `._sync_<hex digits>.db`.
bool isNextcloudJournal(std::string_view name) {
    constexpr std::string_view digits = "0123456789abcdefABCDEF";
    constexpr std::string_view newer = ".sync_";
    constexpr std::string_view older = "._sync_";
    constexpr std::string_view suffix = ".db";
    constexpr std::size_t newerDigits = 12;
    if (!name.ends_with(suffix))
        return false;
    name.remove_suffix(suffix.size());
    if (name.starts_with(older))
        return name.find_first_not_of(digits, older.size()) == std::string_view::npos;
    return name.starts_with(newer) && name.size() == newer.size() + newerDigits &&
           name.find_first_not_of(digits, newer.size()) == std::string_view::npos;
}

std::optional<std::string> nextcloudJournalIn(int folder) {
    DirectoryStream entries(openFolder(folder, ".", O_RDONLY));
    if (!entries.isOpen())
        return std::nullopt;
    while (const dirent* entry = entries.next())
        if (isNextcloudJournal(entry->d_name))
            return entry->d_name;
    return std::nullopt;
}

/// Names the item by its folder's real path; the root lies that many levels above that folder.
bool setItem(SyncedPlace& place, const std::string& path, int levels) {
    auto folder = canonicalPath(parentFolderOf(path));
    if (!folder)
        return false;
    SyncedItem& item = place.item;
    item.root = std::move(*folder);
    item.relative = lastComponentOfPath(path);
    for (; levels > 0; --levels) {
        item.relative = std::string(lastComponentOfPath(item.root)) + "/" + item.relative;
        item.root = parentFolderOf(item.root);
    }
    item.look();
    return true;
}

/// Goes up from the item's folder until `isRoot` has set the mark of the place.
template <class IsRoot>
std::optional<SyncedPlace> placeOf(const std::string& path, const IsRoot& isRoot) {
    SyncedPlace place;
    FileDescriptor folder = openFolder(AT_FDCWD, parentFolderOf(path).c_str(), O_PATH);
    if (!folder || ::fstat(folder.get(), &place.root) != 0)
        return std::nullopt;
    for (int levels = 0;; ++levels) {
        if (isRoot(folder.get(), place))
            return setItem(place, path, levels) ? std::optional(std::move(place)) : std::nullopt;
        FileDescriptor parent = openFolder(folder.get(), "..", O_PATH);
        struct stat above;
        if (!parent || ::fstat(parent.get(), &above) != 0)
            return std::nullopt;
        if (isSameItem(above, place.root))
            return place;
        folder = std::move(parent);
        place.root = above;
    }
}

/// Tells the marks of roots, by a configuration read once.
class Marks {
public:
    /// Whose mark an open folder carries, and its name.
    SyncMark markOf(int folder, const struct stat& status, std::string& name) const {
        for (const SyncthingMark& mark : m_unusual)
            if (isSameItem(mark.root, status) && holds(folder, mark.name.c_str())) {
                name = mark.name;
                return SyncMark::Syncthing;
            }
        if (holds(folder, usualSyncthingMark)) {
            name = usualSyncthingMark;
            return SyncMark::Syncthing;
        }
        auto journal = nextcloudJournalIn(folder);
        if (!journal)
            return SyncMark::None;
        name = std::move(*journal);
        return SyncMark::Nextcloud;
    }

private:
    static bool holds(int folder, const char* name) {
        return ::faccessat(folder, name, F_OK, 0) == 0;
    }

    std::vector<SyncthingMark> m_unusual = unusualSyncthingMarks();
};

}  // namespace

std::optional<SyncedPlace> markedPlaceOf(const std::string& path) {
    const Marks marks;
    return placeOf(path, [&marks](int folder, SyncedPlace& place) {
        place.mark = marks.markOf(folder, place.root, place.markName);
        return place.mark != SyncMark::None;
    });
}

std::optional<SyncedPlace> desktopPlaceOf(const std::string& path,
                                          const std::vector<DesktopRoot>& desktop) {
    return placeOf(path, [&desktop](int, SyncedPlace& place) {
        for (const DesktopRoot& root : desktop) {
            if (!isSameItem(root.status, place.root))
                continue;
            place.mark = SyncMark::Desktop;
            place.client = root.client;
            return true;
        }
        return false;
    });
}

std::optional<std::string> markedRootAbove(const std::string& folder) {
    const Marks marks;
    std::optional<std::string> root;
    std::string name;
    struct stat status {};
    for (std::string path = canonicalPath(folder).value_or("/"); path != "/";
         path = parentFolderOf(path)) {
        const FileDescriptor opened = openFolder(AT_FDCWD, path.c_str(), O_PATH);
        if (opened && ::fstat(opened.get(), &status) == 0 &&
            marks.markOf(opened.get(), status, name) != SyncMark::None)
            root = path;
    }
    return root;
}

}  // namespace parvel::host
