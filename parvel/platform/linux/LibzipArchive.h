#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string_view>
#include <utility>

#include "parvel/foundation/Data.h"
#include "parvel/platform/linux/LibzipSource.h"
#include "parvel/platform/linux/ZipEntry.h"

namespace parvel::host {

/// Reads any zip archive that libzip opens.
class LibzipArchive {
public:
    /// Takes a piece of an entry's content; ends the delivery with anything but 0.
    using Sink = std::function<int(Data::Bytes piece)>;

    /// What opening may read: a directory of some 90,000 entries with names of the usual length,
    /// which libzip keeps in about three times as much memory.
    static constexpr std::uint64_t readingBudget = 8ULL << 20;

    /// Borrows the descriptor. Null when the file is no archive, or one whose directory takes more
    /// than the budget, where the opening is interrupted, and where there is no libzip.
    [[nodiscard]] static std::unique_ptr<LibzipArchive> open(
        int file, std::uint64_t fileSize, std::uint64_t budget = readingBudget,
        LibzipSource::Interruption interruption = nullptr, const Libzip& libzip = Libzip::host());

    /// The first entry of exactly that name; none when it can't be delivered.
    [[nodiscard]] std::optional<Data> readEntry(std::string_view name, std::uint64_t limit);

    [[nodiscard]] std::uint64_t entryCount() const;
    /// The name as it is stored; null where there is none.
    [[nodiscard]] const char* name(std::uint64_t index) const;
    [[nodiscard]] bool describe(std::uint64_t index, ZipEntry& entry) const;
    /// Gives the content of an entry that can be delivered, in pieces of at most 8 MiB, with no
    /// more of it in memory. 0, the sink's answer, the errno value of a failed read, or EBADMSG for
    /// content that is not of the size and checksum that the entry claims.
    [[nodiscard]] int deliver(std::uint64_t index, const ZipEntry& entry, const Sink& sink);

private:
    struct CloseEntry {
        const Libzip& libzip;
        void operator()(zip_file_t* entry) const { libzip.zip_fclose(entry); }
    };
    using EntryHandle = std::unique_ptr<zip_file_t, CloseEntry>;

    LibzipArchive(const Libzip& libzip, int file, std::uint64_t fileSize,
                  LibzipSource::Interruption interruption)
        : m_libzip(libzip),
          m_fileSize(fileSize),
          m_source(libzip, file, fileSize, std::move(interruption)) {}

    [[nodiscard]] std::optional<std::uint64_t> find(std::string_view name) const;
    [[nodiscard]] EntryHandle openEntry(std::uint64_t index, zip_flags_t flags) const;
    [[nodiscard]] bool readFully(zip_file_t* entry, std::uint8_t* buffer, std::uint64_t size) const;
    [[nodiscard]] std::optional<Data> readWhole(std::uint64_t index, const ZipEntry& entry);
    [[nodiscard]] std::optional<Data> readInPieces(std::uint64_t index, const ZipEntry& entry);
    [[nodiscard]] int deliverInPieces(std::uint64_t index, const ZipEntry& entry, const Sink& sink);
    /// Why a read of the archive failed.
    [[nodiscard]] int readError() const;

    const Libzip& m_libzip;
    std::uint64_t m_fileSize;
    LibzipSource m_source;
    LibzipHandle m_archive;
};

}  // namespace parvel::host
