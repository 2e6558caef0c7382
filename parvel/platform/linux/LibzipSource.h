#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <utility>

#include "parvel/platform/linux/Libzip.h"

namespace parvel::host {

struct DiscardLibzip {
    const Libzip* libzip = nullptr;
    void operator()(zip_t* archive) const { libzip->zip_discard(archive); }
};
using LibzipHandle = std::unique_ptr<zip_t, DiscardLibzip>;

/// Lets libzip read an open file by its descriptor, which stays its owner's. Opening reads no more
/// than a budget, in bytes: libzip takes the whole directory into memory, in about three times as
/// much of it, and weighs all that looks like one.
class LibzipSource {
public:
    /// Asked while an archive is opened, which ends where it gives an errno value.
    using Interruption = std::function<int()>;

    LibzipSource(const Libzip& libzip, int file, std::uint64_t fileSize, Interruption interruption)
        : m_libzip(libzip),
          m_file(file),
          m_fileSize(fileSize),
          m_interruption(std::move(interruption)) {}
    LibzipSource(const LibzipSource&) = delete;
    LibzipSource& operator=(const LibzipSource&) = delete;

    /// Null when libzip does not take the file for an archive. The source must outlive the handle.
    [[nodiscard]] LibzipHandle open(std::uint64_t budget);
    /// The errno value of the last read that failed; 0 where none has.
    [[nodiscard]] int readError() const { return m_readError; }

private:
    static zip_int64_t command(void* source, void* data, zip_uint64_t length,
                               zip_source_cmd_t command);
    [[nodiscard]] bool endRecordsAreModest(std::uint64_t budget);
    [[nodiscard]] std::uint64_t countOfRecord64(const std::uint8_t* locator);
    [[nodiscard]] zip_int64_t read(std::uint8_t* data, std::uint64_t length);
    [[nodiscard]] zip_int64_t seek(void* data, std::uint64_t length);
    [[nodiscard]] zip_int64_t readAhead();
    [[nodiscard]] zip_int64_t readAt(std::uint64_t position, std::uint8_t* data,
                                     std::uint64_t length);
    [[nodiscard]] zip_int64_t fail(int zipError, int errnoValue);

    const Libzip& m_libzip;
    int m_file;
    std::uint64_t m_fileSize;
    Interruption m_interruption;
    std::uint64_t m_position = 0;
    std::uint64_t m_budget = 0;
    bool m_isOpening = false;
    zip_error_t m_error = {};
    int m_readError = 0;

    std::array<std::uint8_t, 4096> m_ahead;  ///< libzip reads a directory in pieces of a few bytes
    std::uint64_t m_aheadPosition = 0;
    std::size_t m_aheadLength = 0;
};

}  // namespace parvel::host
