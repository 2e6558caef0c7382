#pragma once

#include <optional>
#include <string>
#include <utility>

#include "parvel/platform/linux/HiddenItem.h"

namespace parvel::host {

/// A hidden, locked folder on a target's file system, in which an item is made before it gets its
/// final name. It goes with its owner, with what is left in it.
class StagingFolder {
public:
    /// Makes one for items that will stand in `parent`: there or, where that is synchronised
    /// storage, beside the storage's root if that lies on the same file system and can be written,
    /// so that no client sees it. What killed processes left in the place is cleared before, by a
    /// process once an hour. None, with errno in `error`.
    static std::optional<StagingFolder> makeIn(const std::string& parent, int& error);

    [[nodiscard]] const std::string& path() const { return m_item.path(); }
    [[nodiscard]] int descriptor() const { return m_item.descriptor(); }

private:
    explicit StagingFolder(HiddenItem item) : m_item(std::move(item)) {}

    HiddenItem m_item;
};

}  // namespace parvel::host
