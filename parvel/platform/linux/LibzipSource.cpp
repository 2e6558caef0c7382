#include "parvel/platform/linux/LibzipSource.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>

#include "parvel/platform/linux/SystemCall.h"

namespace parvel::host {

LibzipHandle LibzipSource::open(std::uint64_t budget) {
    zip_source_t* source = zip_source_function_create(&LibzipSource::command, this, nullptr);
    if (!source)
        return nullptr;
    m_budget = budget;
    m_isOpening = true;
    LibzipHandle archive(zip_open_from_source(source, ZIP_RDONLY, nullptr));
    m_isOpening = false;
    if (!archive)
        zip_source_free(source);
    return archive;
}

zip_int64_t LibzipSource::command(void* source, void* data, zip_uint64_t length,
                                  zip_source_cmd_t command) {
    auto& self = *static_cast<LibzipSource*>(source);
    switch (command) {
        case ZIP_SOURCE_SUPPORTS:
            return zip_source_make_command_bitmap(ZIP_SOURCE_SUPPORTS, ZIP_SOURCE_OPEN,
                                                  ZIP_SOURCE_READ, ZIP_SOURCE_SEEK, ZIP_SOURCE_TELL,
                                                  ZIP_SOURCE_STAT, ZIP_SOURCE_CLOSE,
                                                  ZIP_SOURCE_ERROR, ZIP_SOURCE_FREE, -1);
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
            zip_stat_init(status);
            status->size = self.m_fileSize;
            status->valid = ZIP_STAT_SIZE;
            return sizeof *status;
        }
        case ZIP_SOURCE_ERROR:
            return zip_error_to_data(&self.m_error, data, length);
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
        zip_source_seek_compute_offset(m_position, m_fileSize, data, length, &m_error);
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
        if (length > m_budget)
            return fail(ZIP_ER_MEMORY, 0);
        m_budget -= length;
    }
    const ssize_t count =
        retried([&] { return ::pread(m_file, data, length, static_cast<off_t>(position)); });
    return count < 0 ? fail(ZIP_ER_READ, errno) : count;
}

zip_int64_t LibzipSource::fail(int zipError, int errnoValue) {
    zip_error_set(&m_error, zipError, errnoValue);
    return -1;
}

}  // namespace parvel::host
