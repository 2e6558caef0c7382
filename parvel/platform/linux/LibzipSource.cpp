#include "parvel/platform/linux/LibzipSource.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <vector>

#include "parvel/platform/linux/SystemCall.h"
#include "parvel/platform/linux/ZipFormat.h"

namespace parvel::host {

namespace {

/// libzip reads a whole directory for each place near the end that looks like an end record. An
/// honest archive has one, and those of the archives stored in it.
constexpr int mostEndRecords = 64;

}  // namespace

LibzipHandle LibzipSource::open(std::uint64_t budget) {
    if (!endRecordsAreModest(budget))
        return nullptr;
    zip_source_t* source =
        m_libzip.zip_source_function_create(&LibzipSource::command, this, nullptr);
    if (!source)
        return nullptr;
    m_budget = budget;
    m_isOpening = true;
    LibzipHandle archive(m_libzip.zip_open_from_source(source, ZIP_RDONLY, nullptr),
                         DiscardLibzip{&m_libzip});
    m_isOpening = false;
    if (!archive)
        m_libzip.zip_source_free(source);
    return archive;
}

/// libzip takes memory for as many entries as a zip64 end record tells before it reads the first,
/// so whatever could be such a record must tell a number that the budget lets it read.
bool LibzipSource::endRecordsAreModest(std::uint64_t budget) {
    std::vector<std::uint8_t> tail(std::min<std::uint64_t>(m_fileSize, zip::longestEnd));
    const zip_int64_t read = readAt(m_fileSize - tail.size(), tail.data(), tail.size());
    if (read != static_cast<zip_int64_t>(tail.size()))
        return false;
    int found = 0;
    const std::uint8_t* end = tail.data() + tail.size();
    for (const std::uint8_t* next = tail.data();; ++next) {
        next = static_cast<const std::uint8_t*>(::memmem(next, static_cast<std::size_t>(end - next),
                                                         zip::endSignature, zip::signatureLength));
        if (!next)
            return true;
        const auto before = static_cast<std::size_t>(next - tail.data());
        if (++found > mostEndRecords ||
            (before >= zip::locator64Length &&
             countOfRecord64(next - zip::locator64Length) > budget / zip::directoryHeaderLength))
            return false;
    }
}

/// The number of entries that the zip64 end record of a locator tells; 0 where there is none.
std::uint64_t LibzipSource::countOfRecord64(const std::uint8_t* locator) {
    std::array<std::uint8_t, zip::end64Length> record;
    const std::uint64_t offset = zip::get64(locator + 8);
    if (std::memcmp(locator, zip::locator64Signature, zip::signatureLength) != 0 ||
        offset > m_fileSize ||
        readAt(offset, record.data(), record.size()) != static_cast<zip_int64_t>(record.size()))
        return 0;
    return zip::get64(record.data() + 24);
}

zip_int64_t LibzipSource::command(void* source, void* data, zip_uint64_t length,
                                  zip_source_cmd_t command) {
    auto& self = *static_cast<LibzipSource*>(source);
    switch (command) {
        case ZIP_SOURCE_SUPPORTS:
            return self.m_libzip.zip_source_make_command_bitmap(
                ZIP_SOURCE_SUPPORTS, ZIP_SOURCE_OPEN, ZIP_SOURCE_READ, ZIP_SOURCE_SEEK,
                ZIP_SOURCE_TELL, ZIP_SOURCE_STAT, ZIP_SOURCE_CLOSE, ZIP_SOURCE_ERROR,
                ZIP_SOURCE_FREE, -1);
        case ZIP_SOURCE_OPEN:
            self.m_position = 0;
            return 0;
        case ZIP_SOURCE_READ:
            return self.read(static_cast<std::uint8_t*>(data), length);
        case ZIP_SOURCE_SEEK:
            return self.seek(data, length);
        case ZIP_SOURCE_TELL:
            return static_cast<zip_int64_t>(self.m_position);
        case ZIP_SOURCE_STAT: {
            auto* status = static_cast<zip_stat_t*>(data);
            self.m_libzip.zip_stat_init(status);
            status->size = self.m_fileSize;
            status->valid = ZIP_STAT_SIZE;
            return sizeof *status;
        }
        case ZIP_SOURCE_ERROR:
            return self.m_libzip.zip_error_to_data(&self.m_error, data, length);
        case ZIP_SOURCE_CLOSE:
        case ZIP_SOURCE_FREE:
            return 0;
        default:
            return self.fail(ZIP_ER_OPNOTSUPP, 0);
    }
}

zip_int64_t LibzipSource::read(std::uint8_t* data, std::uint64_t length) {
    length = std::min(length, m_fileSize - std::min(m_position, m_fileSize));
    std::uint64_t done = 0;
    while (done < length) {
        if (length - done >= m_ahead.size()) {
            const zip_int64_t count = readAt(m_position, data + done, length - done);
            if (count <= 0)
                return count < 0 ? count : static_cast<zip_int64_t>(done);
            done += static_cast<std::uint64_t>(count);
            m_position += static_cast<std::uint64_t>(count);
            continue;
        }
        if (m_position < m_aheadPosition || m_position >= m_aheadPosition + m_aheadLength) {
            const zip_int64_t count = readAhead();
            if (count <= 0)
                return count < 0 ? count : static_cast<zip_int64_t>(done);
        }
        const std::uint64_t skip = m_position - m_aheadPosition;
        const std::uint64_t count = std::min(length - done, m_aheadLength - skip);
        std::memcpy(data + done, m_ahead.data() + skip, count);
        done += count;
        m_position += count;
    }
    return static_cast<zip_int64_t>(done);
}

zip_int64_t LibzipSource::seek(void* data, std::uint64_t length) {
    const zip_int64_t position =
        m_libzip.zip_source_seek_compute_offset(m_position, m_fileSize, data, length, &m_error);
    if (position < 0)
        return -1;
    m_position = static_cast<std::uint64_t>(position);
    return 0;
}

zip_int64_t LibzipSource::readAhead() {
    m_aheadLength = 0;
    const zip_int64_t count = readAt(m_position, m_ahead.data(), m_ahead.size());
    if (count > 0) {
        m_aheadPosition = m_position;
        m_aheadLength = static_cast<std::size_t>(count);
    }
    return count;
}

zip_int64_t LibzipSource::readAt(std::uint64_t position, std::uint8_t* data, std::uint64_t length) {
    if (m_isOpening) {
        if (const int error = m_interruption ? m_interruption() : 0)
            return fail(ZIP_ER_READ, error);
        if (length > m_budget)
            return fail(ZIP_ER_MEMORY, 0);
        m_budget -= length;
    }
    const ssize_t count =
        retried([&] { return ::pread(m_file, data, length, static_cast<off_t>(position)); });
    return count < 0 ? fail(ZIP_ER_READ, errno) : count;
}

zip_int64_t LibzipSource::fail(int zipError, int errnoValue) {
    if (errnoValue != 0)
        m_readError = errnoValue;
    m_libzip.zip_error_set(&m_error, zipError, errnoValue);
    return -1;
}

}  // namespace parvel::host
