#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>

#include "parvel/foundation/Data.h"
#include "parvel/platform/linux/ZipEntry.h"

namespace parvel::host {

/// Fills the buffer from the file's offset on. False with errno set, which is EBADMSG where the
/// file ends before.
[[nodiscard]] bool readFully(int file, std::uint64_t offset, std::uint8_t* buffer,
                             std::size_t size);

/// Reads what an archive stores of its entries. What one read takes for an entry serves those close
/// behind it too, for a book's documents often stand one after the other. The bytes that it gives
/// are good until the next call.
class ZipWindow {
public:
    /// Borrows the descriptor.
    ZipWindow(int file, std::uint64_t fileSize) : m_file(file), m_fileSize(fileSize) {}

    /// How far an entry goes, but for one with long local extra fields: with the header's own read
    /// comes the data behind it.
    [[nodiscard]] static std::uint64_t usualLength(const ZipEntry& entry, std::size_t nameLength);

    /// The entry's data. Where anything has to be read, it is `ahead` bytes at the least. False
    /// where no local header stands, the file ends before the data does, and for an error.
    [[nodiscard]] bool readStored(const ZipEntry& entry, std::size_t nameLength,
                                  Data::Bytes& stored, std::uint64_t ahead = usualAhead);
    /// Where the entry's data begins, in a file that holds it all; none as above.
    [[nodiscard]] std::optional<std::uint64_t> dataOffset(const ZipEntry& entry,
                                                          std::uint64_t ahead = usualAhead);
    /// From an offset within the file on: what is at hand, or else `size` bytes. None as above.
    [[nodiscard]] Data::Bytes piece(std::uint64_t offset, std::size_t size);
    /// Whether the bytes of that range are at hand.
    [[nodiscard]] bool holds(std::uint64_t offset, std::uint64_t size) const;
    /// The errno value of the last read that failed, which is EBADMSG where the file ended before.
    [[nodiscard]] int readError() const { return m_readError; }

private:
    static constexpr std::uint64_t usualAhead = 4096;

    [[nodiscard]] bool provide(std::uint64_t offset, std::size_t size, std::uint64_t ahead,
                               Data::Bytes& bytes);

    int m_file;
    std::uint64_t m_fileSize;
    std::unique_ptr<std::uint8_t[]> m_bytes;
    std::size_t m_capacity = 0;
    std::size_t m_size = 0;
    std::uint64_t m_offset = 0;
    int m_readError = 0;
};

}  // namespace parvel::host
