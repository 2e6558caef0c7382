#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace parvel::host {

/// One trash folder, and the folder that its info files' paths are relative to (empty: absolute).
struct TrashFolder {
    std::string path;
    std::string topDirectory;

    [[nodiscard]] std::string filesFolder() const;
    [[nodiscard]] std::string infoFolder() const;
};

/// Where an item is to be trashed: the first of these that can be made and takes it.
struct TrashPlan {
    std::vector<TrashFolder> folders;
    std::string absolute;  ///< the item's path with its folder's links resolved
};

/// The home trash alone for an item on that trash's file system, else its volume's own trash
/// folders before it. None with errno set where the item's folder can't be reached. Nothing is
/// made.
[[nodiscard]] std::optional<TrashPlan> planTrash(const std::string& item);

/// Every trash folder of the user that is there: the home trash and those of the mounted volumes.
[[nodiscard]] std::vector<TrashFolder> existingTrashFolders();

/// Whether it is a folder of the user's own, and no link.
[[nodiscard]] bool isOwnRealFolder(const std::string& path);

/// "Guide.pdf", "Guide.2.pdf", "Guide.3.pdf", … cut so that the info file's name fits too.
[[nodiscard]] std::string trashName(std::string_view name, int attempt);
/// How many names are tried.
inline constexpr int kMaximumTrashNames = 100000;

/// The info file of a name in a trash folder.
[[nodiscard]] std::string infoFileFor(const std::string& trash, std::string_view name);
/// Where the item's info file belongs, when it lies where a trash keeps its items; none elsewhere.
[[nodiscard]] std::optional<std::string> infoFileOfTrashed(const std::string& item);

}  // namespace parvel::host
