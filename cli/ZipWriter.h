#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <string_view>
#include <vector>

namespace parvel::cli {

/// Writes a zip archive into an open, empty file: without extra fields, comments and dates, so that
/// the same entries in the same order give the same bytes. At most 65,534 entries and not quite 4
/// GiB, as far as archives go without the format's extensions.
class ZipWriter {
public:
    explicit ZipWriter(int file) : m_file(file) {}

    // Each gives 0 or the errno value: EILSEQ for a name that is no UTF-8, EFBIG where the archive
    // would be too large.

    int addStored(std::string_view name, std::string_view bytes);
    /// What the descriptor has from where it stands to its end. Told after each piece how many
    /// bytes of all such sources have been read, the caller says whether to go on: ECANCELED.
    int addDeflated(std::string_view name, int source,
                    const std::function<bool(std::uint64_t bytesRead)>& goOn);
    /// Writes the directory. The archive is complete, and not yet synced.
    int finish();

private:
    struct Entry {
        std::string name;
        std::uint16_t method = 0;
        std::uint32_t checksum = 0;
        std::uint64_t packedSize = 0;
        std::uint64_t size = 0;
        std::uint64_t offset = 0;
    };

    int begin(Entry& entry, std::string_view name);
    int complete(Entry entry);
    int write(std::string_view bytes);
    int deflate(int source, Entry& entry, const std::function<bool(std::uint64_t)>& goOn);

    int m_file;
    std::uint64_t m_offset = 0;
    std::uint64_t m_bytesRead = 0;
    std::vector<Entry> m_entries;
};

}  // namespace parvel::cli
