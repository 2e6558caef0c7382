#include "parvel/platform/linux/LibzipArchive.h"

#include <algorithm>
#include <cerrno>
#include <vector>

#include "parvel/platform/linux/ZipFormat.h"

namespace parvel::host {

namespace {

/// Up to here an entry is inflated in one piece also where a cancel may come in between.
constexpr std::uint64_t largestDeliveredWhole = 8ULL << 20;
constexpr std::uint64_t pieceLength = 1ULL << 20;

}  // namespace

std::unique_ptr<LibzipArchive> LibzipArchive::open(int file, std::uint64_t fileSize,
                                                   std::uint64_t budget,
                                                   LibzipSource::Interruption interruption,
                                                   const Libzip& libzip) {
    // libzip takes an empty file for an empty archive.
    if (fileSize < zip::endLength || !libzip.isComplete())
        return nullptr;
    std::unique_ptr<LibzipArchive> archive(
        new LibzipArchive(libzip, file, fileSize, std::move(interruption)));
    archive->m_archive = archive->m_source.open(budget);
    if (!archive->m_archive)
        return nullptr;
    return archive;
}

std::optional<Data> LibzipArchive::readEntry(std::string_view name, std::uint64_t limit) {
    const std::optional<std::uint64_t> index = find(name);
    ZipEntry entry;
    if (!index || !describe(*index, entry) || !canBeDelivered(entry, limit))
        return std::nullopt;
    return entry.isLarge() ? readInPieces(*index, entry) : readWhole(*index, entry);
}

/// Compares one name after the other: libzip's own search compares names as it decodes them. What
/// it gives as the stored bytes has a space for each NUL, and is the name of the Unicode field
/// where an entry has one.
std::optional<std::uint64_t> LibzipArchive::find(std::string_view name) const {
    const std::uint64_t count = entryCount();
    for (std::uint64_t index = 0; index < count; ++index) {
        const char* stored = this->name(index);
        if (stored && stored == name)
            return index;
    }
    return std::nullopt;
}

std::uint64_t LibzipArchive::entryCount() const {
    return static_cast<std::uint64_t>(m_libzip.zip_get_num_entries(m_archive.get(), 0));
}

const char* LibzipArchive::name(std::uint64_t index) const {
    return m_libzip.zip_get_name(m_archive.get(), index, ZIP_FL_ENC_RAW);
}

bool LibzipArchive::describe(std::uint64_t index, ZipEntry& entry) const {
    zip_stat_t status;
    zip_uint8_t system = 0;
    zip_uint32_t attributes = 0;
    if (m_libzip.zip_stat_index(m_archive.get(), index, ZIP_FL_ENC_RAW, &status) != 0 ||
        m_libzip.zip_file_get_external_attributes(m_archive.get(), index, 0, &system,
                                                  &attributes) != 0)
        return false;
    entry.size = status.size;
    entry.compressedSize = status.comp_size;
    entry.crc = status.crc;
    entry.method = status.comp_method;
    entry.externalAttributes = attributes;
    entry.hostSystem = system;
    entry.isEncrypted = status.encryption_method != ZIP_EM_NONE;
    return true;
}

LibzipArchive::EntryHandle LibzipArchive::openEntry(std::uint64_t index, zip_flags_t flags) const {
    return EntryHandle(m_libzip.zip_fopen_index(m_archive.get(), index, flags),
                       CloseEntry{m_libzip});
}

/// Reads until the buffer is full. False for an entry that ends before, and for an error.
bool LibzipArchive::readFully(zip_file_t* entry, std::uint8_t* buffer, std::uint64_t size) const {
    while (size > 0) {
        const zip_int64_t count = m_libzip.zip_fread(entry, buffer, std::min(size, pieceLength));
        if (count <= 0)
            return false;
        buffer += count;
        size -= static_cast<std::uint64_t>(count);
    }
    return true;
}

std::optional<Data> LibzipArchive::readWhole(std::uint64_t index, const ZipEntry& entry) {
    if (entry.compressedSize > m_fileSize)
        return std::nullopt;
    const EntryHandle file = openEntry(index, ZIP_FL_COMPRESSED);
    const auto size = static_cast<std::size_t>(entry.compressedSize);
    const auto stored = std::make_unique_for_overwrite<std::uint8_t[]>(size);
    if (!file || !readFully(file.get(), stored.get(), size))
        return std::nullopt;
    return decodedEntry(entry, {stored.get(), size});
}

/// libzip checks the checksum when it meets the end, so the end is read too.
std::optional<Data> LibzipArchive::readInPieces(std::uint64_t index, const ZipEntry& entry) {
    if (entry.compressedSize > m_fileSize)
        return std::nullopt;
    const EntryHandle file = openEntry(index, 0);
    auto content = std::make_unique_for_overwrite<std::uint8_t[]>(entry.size);
    std::uint8_t beyond;
    if (!file || !readFully(file.get(), content.get(), entry.size) ||
        m_libzip.zip_fread(file.get(), &beyond, 1) != 0)
        return std::nullopt;
    return Data::adopt(std::move(content), entry.size);
}

int LibzipArchive::deliver(std::uint64_t index, const ZipEntry& entry, const Sink& sink) {
    if (std::max(entry.size, entry.compressedSize) > largestDeliveredWhole)
        return deliverInPieces(index, entry, sink);
    const std::optional<Data> content = readWhole(index, entry);
    if (!content)
        return readError();
    std::vector<std::uint8_t> storage;
    return sink(content->contiguous(storage));
}

/// The end is read too: libzip checks size and checksum when it meets it.
int LibzipArchive::deliverInPieces(std::uint64_t index, const ZipEntry& entry, const Sink& sink) {
    const EntryHandle file = openEntry(index, 0);
    if (!file)
        return readError();
    const auto piece = std::make_unique_for_overwrite<std::uint8_t[]>(pieceLength);
    for (std::uint64_t delivered = 0;;) {
        const zip_int64_t count = m_libzip.zip_fread(file.get(), piece.get(), pieceLength);
        if (count < 0)
            return readError();
        if (count == 0)
            return delivered == entry.size ? 0 : EBADMSG;
        delivered += static_cast<std::uint64_t>(count);
        if (delivered > entry.size)
            return EBADMSG;
        if (const int error = sink({piece.get(), static_cast<std::size_t>(count)}))
            return error;
    }
}

int LibzipArchive::readError() const {
    return m_source.readError() != 0 ? m_source.readError() : EBADMSG;
}

}  // namespace parvel::host
