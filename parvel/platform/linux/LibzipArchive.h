#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string_view>

#include "parvel/foundation/Data.h"
#include "parvel/platform/linux/LibzipSource.h"
#include "parvel/platform/linux/ZipEntry.h"

namespace parvel::host {

/// Reads any zip archive that libzip opens.
class LibzipArchive {
public:
    /// Borrows the descriptor. Null when the file is no archive, or one whose directory takes more
    /// than a reader of single entries should spend on it.
    [[nodiscard]] static std::unique_ptr<LibzipArchive> open(int file, std::uint64_t fileSize);

    /// The first entry of exactly that name; none when it can't be delivered.
    [[nodiscard]] std::optional<Data> readEntry(std::string_view name, std::uint64_t limit);

private:
    LibzipArchive(int file, std::uint64_t fileSize)
        : m_fileSize(fileSize), m_source(file, fileSize) {}

    [[nodiscard]] std::optional<std::uint64_t> find(std::string_view name) const;
    [[nodiscard]] bool describe(std::uint64_t index, ZipEntry& entry) const;
    [[nodiscard]] std::optional<Data> readWhole(std::uint64_t index, const ZipEntry& entry);
    [[nodiscard]] std::optional<Data> readInPieces(std::uint64_t index, const ZipEntry& entry);

    std::uint64_t m_fileSize;
    LibzipSource m_source;
    LibzipHandle m_archive;
    ZipDecoder m_decoder;
};

}  // namespace parvel::host
