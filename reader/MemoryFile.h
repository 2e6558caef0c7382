#pragma once

#include <cstdint>
#include <span>

#include "parvel/platform/linux/FileDescriptor.h"

namespace parvel::reader {

/// A file of memory that holds these bytes, sealed as a MemoryFile is; not open when it can't be
/// had.
[[nodiscard]] host::FileDescriptor sealedFileOf(std::span<const std::uint8_t> bytes);

/// A file in memory, written through a mapping and then sealed against any change, to be handed to
/// the library.
class MemoryFile {
public:
    /// Zeros; not open when there is no room for them.
    explicit MemoryFile(std::uint64_t size);
    ~MemoryFile();
    MemoryFile(const MemoryFile&) = delete;
    MemoryFile& operator=(const MemoryFile&) = delete;

    [[nodiscard]] bool isOpen() const { return m_bytes != nullptr; }
    [[nodiscard]] std::span<std::uint8_t> bytes() const { return {m_bytes, m_size}; }
    /// Ends the writing and gives the file away; not open when it can't be sealed.
    [[nodiscard]] host::FileDescriptor seal();

private:
    void unmap();

    host::FileDescriptor m_file;
    std::uint8_t* m_bytes = nullptr;
    std::size_t m_size;
};

}  // namespace parvel::reader
