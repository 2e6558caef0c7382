#include "parvel/platform/linux/LibzipArchive.h"

#include <algorithm>

#include "parvel/platform/linux/ZipFormat.h"

namespace parvel::host {

namespace {

/// What opening may read: a directory of some 90,000 entries with names of the usual length, which
/// libzip keeps in about three times as much memory.
constexpr std::uint64_t openingBudget = 8ULL << 20;
constexpr std::uint64_t pieceLength = 1ULL << 20;

struct CloseEntry {
    void operator()(zip_file_t* entry) const { zip_fclose(entry); }
};
using EntryHandle = std::unique_ptr<zip_file_t, CloseEntry>;

/// Reads until the buffer is full. False for an entry that ends before, and for an error.
bool readFully(zip_file_t* entry, std::uint8_t* buffer, std::uint64_t size) {
    while (size > 0) {
        const zip_int64_t count = zip_fread(entry, buffer, std::min(size, pieceLength));
        if (count <= 0)
            return false;
        buffer += count;
        size -= static_cast<std::uint64_t>(count);
    }
    return true;
}

}  // namespace

std::unique_ptr<LibzipArchive> LibzipArchive::open(int file, std::uint64_t fileSize) {
    if (fileSize < zip::endLength)  // libzip takes an empty file for an empty archive
        return nullptr;
    std::unique_ptr<LibzipArchive> archive(new LibzipArchive(file, fileSize));
    archive->m_archive = archive->m_source.open(openingBudget);
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
    const zip_int64_t count = zip_get_num_entries(m_archive.get(), 0);
    for (zip_int64_t i = 0; i < count; ++i) {
        const auto index = static_cast<std::uint64_t>(i);
        const char* stored = zip_get_name(m_archive.get(), index, ZIP_FL_ENC_RAW);
        if (stored && stored == name)
            return index;
    }
    return std::nullopt;
}

bool LibzipArchive::describe(std::uint64_t index, ZipEntry& entry) const {
    zip_stat_t status;
    zip_uint8_t system = 0;
    zip_uint32_t attributes = 0;
    if (zip_stat_index(m_archive.get(), index, ZIP_FL_ENC_RAW, &status) != 0 ||
        zip_file_get_external_attributes(m_archive.get(), index, 0, &system, &attributes) != 0)
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

std::optional<Data> LibzipArchive::readWhole(std::uint64_t index, const ZipEntry& entry) {
    if (entry.compressedSize > m_fileSize)
        return std::nullopt;
    const EntryHandle file(zip_fopen_index(m_archive.get(), index, ZIP_FL_COMPRESSED));
    const auto size = static_cast<std::size_t>(entry.compressedSize);
    const auto stored = std::make_unique_for_overwrite<std::uint8_t[]>(size);
    if (!file || !readFully(file.get(), stored.get(), size))
        return std::nullopt;
    return m_decoder.decode(entry, {stored.get(), size});
}

/// libzip checks the checksum when it meets the end, so the end is read too.
std::optional<Data> LibzipArchive::readInPieces(std::uint64_t index, const ZipEntry& entry) {
    if (entry.compressedSize > m_fileSize)
        return std::nullopt;
    const EntryHandle file(zip_fopen_index(m_archive.get(), index, 0));
    auto content = std::make_unique_for_overwrite<std::uint8_t[]>(entry.size);
    std::uint8_t beyond;
    if (!file || !readFully(file.get(), content.get(), entry.size) ||
        zip_fread(file.get(), &beyond, 1) != 0)
        return std::nullopt;
    return Data::adopt(std::move(content), entry.size);
}

}  // namespace parvel::host
