#pragma once

#include <cstddef>
#include <deque>
#include <string>
#include <string_view>
#include <utility>

#include "parvel/platform/linux/ArchiveOwner.h"
#include "parvel/platform/linux/FileDescriptor.h"

namespace parvel::host {

/// The folders below one that holds all, made where they are missing, for the archive's owner. No
/// link is followed on the way to them. Some that were asked for last stay open, for files of
/// several folders often take turns.
class FoldersBelow {
public:
    FoldersBelow(FileDescriptor root, const ArchiveOwner& owner)
        : m_root(std::move(root)), m_owner(owner) {}

    /// The open folder of that path, whose components are names, made with those on the way to it;
    /// good until the next call. Negative with errno set.
    [[nodiscard]] int open(std::string_view path);

private:
    struct Folder {
        std::string path;
        FileDescriptor descriptor;
    };

    [[nodiscard]] int find(std::string_view path) const;
    [[nodiscard]] int makeAll(std::string_view path);
    [[nodiscard]] int make(int above, std::string_view path, std::size_t nameStart);
    [[nodiscard]] int keep(std::string_view path, FileDescriptor folder);

    FileDescriptor m_root;
    const ArchiveOwner& m_owner;
    std::deque<Folder> m_kept;
};

}  // namespace parvel::host
