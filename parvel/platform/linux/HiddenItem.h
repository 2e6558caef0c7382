#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "parvel/platform/linux/FileDescriptor.h"

namespace parvel::host {

/// A file or folder under a hidden name `.parvel-stage-<random>`, on its way in or out. It is
/// locked while its owner lives, and goes with it; what a killed process left unlocked is cleared
/// by a later one that stages there.
class HiddenItem {
public:
    /// Renames an item within its folder, which needs no right to change the item itself. None,
    /// with errno in `error`, where it can't be.
    static std::optional<HiddenItem> hide(const std::string& item, int& error);
    /// Gives a file a second, hidden name in its folder.
    static std::optional<HiddenItem> linkTo(const std::string& file, int& error);
    /// Moves a staged folder into another parent, also one whose mode forbids that: it is opened
    /// for the step, and has its mode again, written to the disk, when this returns.
    static std::optional<HiddenItem> bring(const std::string& folder, const std::string& parent,
                                           int& error);
    /// Makes a new folder; none, with errno in `error`, where the parent takes none.
    static std::optional<HiddenItem> makeFolderIn(const std::string& parent, int& error);

    HiddenItem(HiddenItem&& other) noexcept;
    HiddenItem& operator=(HiddenItem&&) = delete;
    ~HiddenItem();

    [[nodiscard]] const std::string& path() const { return m_path; }
    [[nodiscard]] int descriptor() const { return m_lock.get(); }
    /// Leaves the item to others: it has a name of its own again, or is gone.
    void release() { m_path.clear(); }

private:
    HiddenItem(std::string path, FileDescriptor lock)
        : m_path(std::move(path)), m_lock(std::move(lock)) {}

    std::string m_path;  ///< empty when it was released
    FileDescriptor m_lock;
};

/// The prefix and twelve letters and digits by chance.
[[nodiscard]] std::string randomName(std::string_view prefix);

/// Whether a name, one path component, is that of a hidden item.
[[nodiscard]] bool isStagingName(std::string_view name);

/// Clears the hidden items in a folder that are the user's own and that nobody holds. Where locks
/// are not seen by other hosts, only those that nobody has touched for a day.
void clearStaleItems(const std::string& folder);

/// Whether a file system of this type (statfs) shows a lock to all that can reach it.
[[nodiscard]] bool isLockSeenByAll(long fileSystemType);

}  // namespace parvel::host
