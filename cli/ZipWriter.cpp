#include "cli/ZipWriter.h"

#include <array>
#include <cerrno>
#include <limits>
#include <memory>

#include <unistd.h>
#include <zlib.h>

#include "cli/Utf8.h"

namespace parvel::cli {
namespace {

constexpr std::uint16_t kFormatVersion = 20;  // deflate and folders: 2.0
constexpr std::uint16_t kUtf8Names = 0x0800;
constexpr std::uint16_t kDeflated = 8;
constexpr std::uint16_t kFirstDay = 0x0021;  // 1 January 1980, the first that the format can say
constexpr std::uint64_t kLargest = std::numeric_limits<std::uint32_t>::max() - 1;
constexpr std::size_t kMostEntries = std::numeric_limits<std::uint16_t>::max() - 1;
constexpr std::size_t kPiece = std::size_t{256} << 10;

void append16(std::string& out, std::uint64_t number) {
    for (int shift = 0; shift < 16; shift += 8)
        out += static_cast<char>(number >> shift);
}

void append32(std::string& out, std::uint64_t number) {
    append16(out, number);
    append16(out, number >> 16);
}

bool isUtf8(std::string_view text) {
    for (std::size_t i = 0; i < text.size();) {
        const auto character = characterAt(text, i);
        if (!character)
            return false;
        i += character->length;
    }
    return true;
}

std::uint16_t flagsFor(std::string_view name) {
    for (const char byte : name) {
        if (static_cast<unsigned char>(byte) >= 0x80)
            return kUtf8Names;
    }
    return 0;
}

int writeAt(int file, std::string_view bytes, off_t offset) {
    while (!bytes.empty()) {
        const ssize_t written = pwrite(file, bytes.data(), bytes.size(), offset);
        if (written < 0 && errno != EINTR)
            return errno;
        if (written > 0) {
            bytes.remove_prefix(static_cast<std::size_t>(written));
            offset += written;
        }
    }
    return 0;
}

/// What the local header and the directory say of an entry alike.
template <class Entry>
void appendCommon(std::string& out, const Entry& entry) {
    append16(out, kFormatVersion);
    append16(out, flagsFor(entry.name));
    append16(out, entry.method);
    append16(out, 0);
    append16(out, kFirstDay);
    append32(out, entry.checksum);
    append32(out, entry.packedSize);
    append32(out, entry.size);
    append16(out, entry.name.size());
    append16(out, 0);
}

template <class Entry>
std::string localHeader(const Entry& entry) {
    std::string header = "PK\x03\x04";
    appendCommon(header, entry);
    return header + entry.name;
}

}  // namespace

int ZipWriter::write(std::string_view bytes) {
    if (m_offset + bytes.size() > kLargest)
        return EFBIG;
    const int error = writeAt(m_file, bytes, static_cast<off_t>(m_offset));
    m_offset += bytes.size();
    return error;
}

int ZipWriter::begin(Entry& entry, std::string_view name) {
    if (m_entries.size() == kMostEntries || name.size() > std::numeric_limits<std::uint16_t>::max())
        return EFBIG;
    if (!isUtf8(name))
        return EILSEQ;
    entry.name = name;
    entry.offset = m_offset;
    return write(localHeader(entry));
}

/// The header is written again: only now are the sizes known.
int ZipWriter::complete(Entry entry) {
    const int error = writeAt(m_file, localHeader(entry), static_cast<off_t>(entry.offset));
    m_entries.push_back(std::move(entry));
    return error;
}

int ZipWriter::addStored(std::string_view name, std::string_view bytes) {
    Entry entry;
    if (const int error = begin(entry, name))
        return error;
    if (const int error = write(bytes))
        return error;
    entry.size = entry.packedSize = bytes.size();
    entry.checksum = static_cast<std::uint32_t>(
        crc32_z(0, reinterpret_cast<const Bytef*>(bytes.data()), bytes.size()));
    return complete(std::move(entry));
}

int ZipWriter::addDeflated(std::string_view name, int source,
                           const std::function<bool(std::uint64_t)>& goOn) {
    Entry entry;
    entry.method = kDeflated;
    if (const int error = begin(entry, name))
        return error;
    if (const int error = deflate(source, entry, goOn))
        return error;
    return complete(std::move(entry));
}

int ZipWriter::deflate(int source, Entry& entry, const std::function<bool(std::uint64_t)>& goOn) {
    z_stream stream{};
    if (deflateInit2(&stream, Z_DEFAULT_COMPRESSION, Z_DEFLATED, -MAX_WBITS, MAX_MEM_LEVEL,
                     Z_DEFAULT_STRATEGY) != Z_OK)
        return ENOMEM;
    const std::unique_ptr<z_stream, int (*)(z_stream*)> owner(&stream, &deflateEnd);
    const auto in = std::make_unique<std::array<Bytef, kPiece>>();
    const auto out = std::make_unique<std::array<Bytef, kPiece>>();
    bool isEnd = false;
    while (!isEnd) {
        const ssize_t count = read(source, in->data(), in->size());
        if (count < 0 && errno == EINTR)
            continue;
        if (count < 0)
            return errno;
        isEnd = count == 0;
        entry.size += static_cast<std::uint64_t>(count);
        entry.checksum =
            static_cast<std::uint32_t>(crc32(entry.checksum, in->data(), static_cast<uInt>(count)));
        if (entry.size > kLargest)
            return EFBIG;
        stream.next_in = in->data();
        stream.avail_in = static_cast<uInt>(count);
        do {
            stream.next_out = out->data();
            stream.avail_out = static_cast<uInt>(out->size());
            ::deflate(&stream, isEnd ? Z_FINISH : Z_NO_FLUSH);
            const std::size_t made = out->size() - stream.avail_out;
            entry.packedSize += made;
            if (const int error = write({reinterpret_cast<const char*>(out->data()), made}))
                return error;
        } while (stream.avail_out == 0);
        m_bytesRead += static_cast<std::uint64_t>(count);
        if (count > 0 && !goOn(m_bytesRead))
            return ECANCELED;
    }
    return 0;
}

int ZipWriter::finish() {
    const std::uint64_t start = m_offset;
    for (const Entry& entry : m_entries) {
        std::string header = "PK\x01\x02";
        append16(header, kFormatVersion);
        appendCommon(header, entry);
        append16(header, 0);  // no comment
        append16(header, 0);  // the first disk
        append16(header, 0);
        append32(header, 0);
        append32(header, entry.offset);
        if (const int error = write(header + entry.name))
            return error;
    }
    std::string end = "PK\x05\x06";
    append32(end, 0);
    append16(end, m_entries.size());
    append16(end, m_entries.size());
    append32(end, m_offset - start);
    append32(end, start);
    append16(end, 0);
    return write(end);
}

}  // namespace parvel::cli
