#pragma once

#include <cstdint>
#include <limits>
#include <memory>
#include <optional>
#include <string_view>
#include <vector>

#include "parvel/foundation/Data.h"
#include "parvel/platform/linux/ZipEntry.h"
#include "parvel/platform/linux/ZipWindow.h"

namespace parvel::host {

/// Reads the plain zip archives that nearly all books are: one end record at the very end of the
/// file, a directory right before it whose count, size and offset agree, entries that fill the file
/// before it. For any other archive, and wherever a doubt comes up later, it says so and leaves the
/// answer to a full reader; what it does answer, the full reader answers alike. Its memory is
/// bounded however large the directory is.
class PlainZip {
public:
    enum class Answer { Sure, Unsure };

    /// An entry as the directory lists it.
    struct Listed {
        std::string_view name;
        ZipEntry entry;
    };

    /// A directory up to this length is kept; a longer one is read through a window each time.
    static constexpr std::uint64_t largestKeptDirectory = 1ULL << 20;

    /// Borrows the descriptor. Null for an archive that is not plain, or whose directory is larger.
    [[nodiscard]] static std::unique_ptr<PlainZip> open(
        int file, std::uint64_t fileSize,
        std::uint64_t largestDirectory = std::numeric_limits<std::uint64_t>::max());

    /// The entries of a directory that is kept, in its order, their names good as long as the
    /// archive. None for another, and where a full reader might give a name in another form.
    [[nodiscard]] std::optional<std::vector<Listed>> entries() const;

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

    PlainZip(int file, std::uint64_t fileSize)
        : m_file(file), m_fileSize(fileSize), m_window(file, fileSize) {}

    [[nodiscard]] static bool readEndRecord(Data::Bytes tail, std::uint64_t fileSize,
                                            EndRecord& end);
    [[nodiscard]] bool keepDirectory(Buffer tail);
    [[nodiscard]] bool directoryIsPlain() const;
    [[nodiscard]] Search find(std::string_view name, ZipEntry& entry) const;

    int m_file;
    std::uint64_t m_fileSize;
    EndRecord m_end;
    Buffer m_kept;            ///< the piece of the file that holds the directory
    Data::Bytes m_directory;  ///< within it; empty where it is too large to be kept
    ZipWindow m_window;
};

}  // namespace parvel::host
