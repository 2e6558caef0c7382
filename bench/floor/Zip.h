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

    /// Local header and data in one read, inflated and checked.
    [[nodiscard]] bool read(const Entry& entry, std::string& content) {
        constexpr std::size_t localLength = 30;
        constexpr std::size_t extraAllowance = 128;
        const std::size_t wanted = localLength + entry.name.size() + extraAllowance + entry.stored;
        if (m_piece.size() < wanted)
            m_piece.resize(wanted);
        if (pread(m_file, m_piece.data(), wanted, entry.offset) <
            static_cast<ssize_t>(localLength + entry.stored))
            return false;
        const std::uint8_t* data = m_piece.data() + localLength + get(m_piece.data() + 26, 2) +
                                   get(m_piece.data() + 28, 2);
        static libdeflate_decompressor* const inflater = libdeflate_alloc_decompressor();
        content.resize(entry.size);
        if (entry.method == 0)
            std::memcpy(content.data(), data, entry.size);
        else if (libdeflate_deflate_decompress(inflater, data, entry.stored, content.data(),
                                               entry.size, nullptr) != LIBDEFLATE_SUCCESS)
            return false;
        return libdeflate_crc32(0, content.data(), content.size()) == entry.crc;
    }

private:
    static constexpr std::size_t kEndLength = 22;

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
