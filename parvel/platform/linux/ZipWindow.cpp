#include "parvel/platform/linux/ZipWindow.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>

#include "parvel/platform/linux/SystemCall.h"
#include "parvel/platform/linux/ZipFormat.h"

namespace parvel::host {

namespace {

/// Local extra fields of this length still come with the header's own read.
constexpr std::uint64_t usualExtraLength = 64;

}  // namespace

bool readFully(int file, std::uint64_t offset, std::uint8_t* buffer, std::size_t size) {
    while (size > 0) {
        const ssize_t count =
            retried([&] { return ::pread(file, buffer, size, static_cast<off_t>(offset)); });
        if (count == 0)
            errno = EBADMSG;
        if (count <= 0)
            return false;
        buffer += count;
        offset += static_cast<std::uint64_t>(count);
        size -= static_cast<std::size_t>(count);
    }
    return true;
}

std::uint64_t ZipWindow::usualLength(const ZipEntry& entry, std::size_t nameLength) {
    return zip::localHeaderLength + nameLength + usualExtraLength + entry.compressedSize;
}

bool ZipWindow::readStored(const ZipEntry& entry, std::size_t nameLength, Data::Bytes& stored,
                           std::uint64_t ahead) {
    const std::optional<std::uint64_t> start =
        dataOffset(entry, std::max(ahead, usualLength(entry, nameLength)));
    return start && provide(*start, static_cast<std::size_t>(entry.compressedSize), ahead, stored);
}

std::optional<std::uint64_t> ZipWindow::dataOffset(const ZipEntry& entry, std::uint64_t ahead) {
    Data::Bytes header;
    if (entry.offset > m_fileSize || m_fileSize - entry.offset < zip::localHeaderLength ||
        !provide(entry.offset, zip::localHeaderLength, ahead, header) ||
        std::memcmp(header.data(), zip::localSignature, zip::signatureLength) != 0)
        return std::nullopt;
    const std::uint64_t start =
        entry.offset + zip::localHeaderLength + zip::get16(&header[26]) + zip::get16(&header[28]);
    if (start > m_fileSize || entry.compressedSize > m_fileSize - start)
        return std::nullopt;
    return start;
}

Data::Bytes ZipWindow::piece(std::uint64_t offset, std::size_t size) {
    Data::Bytes bytes;
    if (holds(offset, 1))
        size = std::min(size, static_cast<std::size_t>(m_offset + m_size - offset));
    static_cast<void>(provide(offset, size, 0, bytes));
    return bytes;
}

bool ZipWindow::holds(std::uint64_t offset, std::uint64_t size) const {
    return offset >= m_offset && size <= m_size && offset - m_offset <= m_size - size;
}

bool ZipWindow::provide(std::uint64_t offset, std::size_t size, std::uint64_t ahead,
                        Data::Bytes& bytes) {
    if (!holds(offset, size)) {
        const std::size_t length =
            std::max(size, static_cast<std::size_t>(std::min(m_fileSize - offset, ahead)));
        m_size = 0;
        if (length > m_capacity) {
            m_capacity = 0;
            m_bytes.reset();  // before the next is taken
            m_bytes = std::make_unique_for_overwrite<std::uint8_t[]>(length);
            m_capacity = length;
        }
        if (!readFully(m_file, offset, m_bytes.get(), length)) {
            m_readError = errno;
            return false;
        }
        m_size = length;
        m_offset = offset;
    }
    bytes = {m_bytes.get() + (offset - m_offset), size};
    return true;
}

}  // namespace parvel::host
