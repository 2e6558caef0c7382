#pragma once

#include <cstddef>
#include <cstdint>
#include <deque>

#include "parvel/platform/linux/FileDescriptor.h"

namespace parvel::host {

/// Has a file that is being written go to the disk while it grows, no more than a few pieces
/// behind, so that neither its last sync nor a cancel has long to wait.
class WriteBehind {
public:
    explicit WriteBehind(int file) : m_file(file) {}

    /// Tells the size that the file has reached. 0, or the errno value of a failed write.
    [[nodiscard]] int reached(std::uint64_t size);

private:
    int m_file;
    std::uint64_t m_started = 0;
    std::uint64_t m_awaited = 0;
};

/// Has the files of a tree go to the disk while further ones are made, but for the first few
/// megabytes of them: what is left to the tree's last sync, which nothing can interrupt, is short.
class TreeBehind {
public:
    /// Tells of a file that is complete. 0, or the errno value of a failed write, its own or that
    /// of an earlier file.
    [[nodiscard]] int add(int file, std::uint64_t size);

    [[nodiscard]] bool isEmpty() const { return m_files.empty(); }
    /// Waits until the file told of first is on the disk. 0, or the errno value of a failed write.
    [[nodiscard]] int awaitOldest();

private:
    struct File {
        FileDescriptor descriptor;
        std::uint64_t behind = 0;
    };

    std::deque<File> m_files;
    std::uint64_t m_behind = 0;
    std::uint64_t m_leftToLastSync = 0;
};

}  // namespace parvel::host
