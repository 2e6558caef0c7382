#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string_view>

#include "parvel/foundation/Data.h"
#include "parvel/platform/linux/ZipEntry.h"

namespace parvel::host {

/// Reads the plain zip archives that nearly all books are: one end record at the very end of the
/// file, a directory right before it whose count, size and offset agree, entries that fill the file
/// before it. For any other archive, and wherever a doubt comes up later, it says so and leaves the
/// answer to a full reader; what it does answer, the full reader answers alike. Its memory is
/// bounded however large the directory is.
class PlainZip {
public:
    enum class Answer { Sure, Unsure };

    /// Borrows the descriptor. Null for an archive that is not plain.
    [[nodiscard]] static std::unique_ptr<PlainZip> open(int file, std::uint64_t fileSize);

    /// The entry's content; none, when the answer is sure, for one that can't be delivered.
    [[nodiscard]] Answer readEntry(std::string_view name, std::uint64_t limit,
                                   std::optional<Data>& content);

private:
    struct Buffer {
        std::unique_ptr<std::uint8_t[]> bytes;
        std::size_t size = 0;
    };
    struct EndRecord {
        std::uint64_t entries = 0;
        std::uint64_t directorySize = 0;
        std::uint64_t directoryOffset = 0;
    };
    enum class Search { Found, Absent, Broken };

    PlainZip(int file, std::uint64_t fileSize) : m_file(file), m_fileSize(fileSize) {}

    [[nodiscard]] static bool readEndRecord(Data::Bytes tail, std::uint64_t fileSize,
                                            EndRecord& end);
    [[nodiscard]] bool keepDirectory(Buffer tail);
    [[nodiscard]] bool directoryIsPlain() const;
    [[nodiscard]] Search find(std::string_view name, ZipEntry& entry) const;
    [[nodiscard]] bool readStored(const ZipEntry& entry, std::size_t nameLength,
                                  Data::Bytes& stored);
    [[nodiscard]] bool provide(std::uint64_t offset, std::size_t size, Data::Bytes& bytes);

    int m_file;
    std::uint64_t m_fileSize;
    EndRecord m_end;
    Buffer m_kept;            ///< the piece of the file that holds the directory
    Data::Bytes m_directory;  ///< within it; empty where it is too large to be kept
    Buffer m_window;          ///< what was read last of the entries, served from while it lasts
    std::uint64_t m_windowOffset = 0;
};

}  // namespace parvel::host
