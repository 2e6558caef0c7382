#pragma once

#include <fcntl.h>
#include <libdeflate.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace parvel::bench {

/// A zip file with nothing out of the ordinary, its directory read from the tail.
class Zip {
public:
    struct Entry {
        std::string_view name;
        std::uint32_t method = 0;
        std::uint32_t crc = 0;
        std::uint32_t stored = 0;
        std::uint32_t size = 0;
        std::uint32_t offset = 0;
    };

    explicit Zip(const std::string& path) : m_file(::open(path.c_str(), O_RDONLY | O_CLOEXEC)) {}
    ~Zip() { close(m_file); }
    Zip(const Zip&) = delete;
    Zip& operator=(const Zip&) = delete;

    [[nodiscard]] int file() const { return m_file; }

    [[nodiscard]] bool readDirectory() {
        constexpr std::size_t tailLength = 4096;
        struct stat status {};
        if (fstat(m_file, &status) != 0 || status.st_size < static_cast<off_t>(kEndLength))
            return false;
        const auto size = static_cast<std::size_t>(status.st_size);
        std::uint8_t tail[tailLength];
        const std::size_t length = std::min(size, tailLength);
        if (!readAt(tail, length, size - length))
            return false;
        const std::uint8_t* end = tail + length - kEndLength;
        m_directory.resize(get(end + 12, 4));
        if (m_directory.size() + kEndLength > length)
            return readAt(m_directory.data(), m_directory.size(), get(end + 16, 4));
        std::memcpy(m_directory.data(), end - m_directory.size(), m_directory.size());
        return true;
    }

    /// Calls for each entry in turn until one answers true; tells whether one did.
    template <class Visit>
    bool visit(Visit&& visit) const {
        constexpr std::size_t recordLength = 46;
        for (std::size_t at = 0; at + recordLength <= m_directory.size();) {
            const std::uint8_t* record = m_directory.data() + at;
            const std::uint32_t length = get(record + 28, 2);
            const Entry entry{{reinterpret_cast<const char*>(record) + recordLength, length},
                              get(record + 10, 2),
                              get(record + 16, 4),
                              get(record + 20, 4),
                              get(record + 24, 4),
                              get(record + 42, 4)};
            if (visit(entry))
                return true;
            at += recordLength + length + get(record + 30, 2) + get(record + 32, 2);
        }
        return false;
    }

    [[nodiscard]] bool find(std::string_view name, Entry& found) const {
        return visit([&](const Entry& entry) {
            found = entry;
            return entry.name == name;
        });
    }

    /// What one read has to take of an entry: its local header and data.
    [[nodiscard]] static std::size_t lengthOf(const Entry& entry) {
        constexpr std::size_t extraAllowance = 128;
        return kLocalLength + entry.name.size() + extraAllowance + entry.stored;
    }
    /// As many bytes from the offset on as the file has.
    [[nodiscard]] std::size_t readPiece(std::uint8_t* piece, std::size_t length,
                                        std::size_t offset) const {
        const ssize_t count = pread(m_file, piece, length, static_cast<off_t>(offset));
        return count < 0 ? 0 : static_cast<std::size_t>(count);
    }
    [[nodiscard]] static const std::uint8_t* dataBehind(const std::uint8_t* localHeader) {
        return localHeader + kLocalLength + get(localHeader + 26, 2) + get(localHeader + 28, 2);
    }
    [[nodiscard]] static bool inflate(const Entry& entry, const std::uint8_t* data, void* content) {
        static libdeflate_decompressor* const inflater = libdeflate_alloc_decompressor();
        return libdeflate_deflate_decompress(inflater, data, entry.stored, content, entry.size,
                                             nullptr) == LIBDEFLATE_SUCCESS;
    }
    [[nodiscard]] static bool isWhole(const Entry& entry, const void* content) {
        return libdeflate_crc32(0, content, entry.size) == entry.crc;
    }

    /// Local header and data in one read, inflated and checked.
    [[nodiscard]] bool read(const Entry& entry, std::string& content) {
        const std::size_t wanted = lengthOf(entry);
        if (m_piece.size() < wanted)
            m_piece.resize(wanted);
        if (readPiece(m_piece.data(), wanted, entry.offset) < kLocalLength + entry.stored)
            return false;
        const std::uint8_t* data = dataBehind(m_piece.data());
        content.resize(entry.size);
        if (entry.method == 0)
            std::memcpy(content.data(), data, entry.size);
        else if (!inflate(entry, data, content.data()))
            return false;
        return isWhole(entry, content.data());
    }

private:
    static constexpr std::size_t kEndLength = 22;
    static constexpr std::size_t kLocalLength = 30;

    static std::uint32_t get(const std::uint8_t* bytes, int count) {
        std::uint32_t value = 0;
        for (int i = count - 1; i >= 0; --i)
            value = value << 8 | bytes[i];
        return value;
    }

    bool readAt(std::uint8_t* bytes, std::size_t length, std::size_t offset) const {
        return pread(m_file, bytes, length, static_cast<off_t>(offset)) ==
               static_cast<ssize_t>(length);
    }

    int m_file;
    std::vector<std::uint8_t> m_directory;
    std::vector<std::uint8_t> m_piece;
};

}  // namespace parvel::bench
