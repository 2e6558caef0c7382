// Steps: one read of the file's tail gives the end record and, in a small archive, the directory;
// else a second read fetches that. The directory is walked once for everything that makes it plain,
// and again for each name that is sought. One read takes an entry's local header and data together,
// and what follows close behind.

#include "parvel/platform/linux/PlainZip.h"

#include <string.h>

#include <algorithm>
#include <cstring>

#include "parvel/platform/TextRules.h"
#include "parvel/platform/linux/ZipFormat.h"

namespace parvel::host {

namespace {

constexpr std::size_t tailLength = 4096;
/// More than the longest record: 46 bytes and three fields of 65,535.
constexpr std::size_t windowLength = 256U << 10;
/// What an entry may take of the file beside its data and name: local extra fields, alignment, a
/// data descriptor.
constexpr std::uint64_t unlistedPerEntry = 128;

/// One whole record of the directory.
struct DirectoryRecord {
    const std::uint8_t* bytes;

    [[nodiscard]] std::uint16_t flags() const { return zip::get16(bytes + 8); }
    [[nodiscard]] std::uint16_t method() const { return zip::get16(bytes + 10); }
    [[nodiscard]] std::uint32_t compressedSize() const { return zip::get32(bytes + 20); }
    [[nodiscard]] std::uint32_t size() const { return zip::get32(bytes + 24); }
    [[nodiscard]] std::uint32_t offset() const { return zip::get32(bytes + 42); }
    [[nodiscard]] std::size_t nameLength() const { return zip::get16(bytes + 28); }
    [[nodiscard]] std::size_t extraLength() const { return zip::get16(bytes + 30); }
    [[nodiscard]] std::size_t commentLength() const { return zip::get16(bytes + 32); }
    [[nodiscard]] std::uint16_t disk() const { return zip::get16(bytes + 34); }
    [[nodiscard]] std::size_t length() const {
        return zip::directoryHeaderLength + nameLength() + extraLength() + commentLength();
    }

    [[nodiscard]] std::string_view name() const {
        return text(zip::directoryHeaderLength, nameLength());
    }
    [[nodiscard]] Data::Bytes extra() const {
        return {bytes + zip::directoryHeaderLength + nameLength(), extraLength()};
    }
    [[nodiscard]] std::string_view comment() const {
        return text(zip::directoryHeaderLength + nameLength() + extraLength(), commentLength());
    }
    [[nodiscard]] std::string_view text(std::size_t start, std::size_t textLength) const {
        return {reinterpret_cast<const char*>(bytes + start), textLength};
    }
    [[nodiscard]] ZipEntry entry() const {
        return {.offset = offset(),
                .compressedSize = compressedSize(),
                .size = size(),
                .crc = zip::get32(bytes + 16),
                .externalAttributes = zip::get32(bytes + 38),
                .method = method(),
                .hostSystem = bytes[5],
                .isEncrypted = (flags() & zip::encryptedFlag) != 0};
    }
};

/// Gives the records of a directory one after the other, out of memory or through a window.
class DirectoryWalk {
public:
    explicit DirectoryWalk(Data::Bytes directory)
        : m_next(directory.data()), m_available(directory.size()) {}
    DirectoryWalk(int file, std::uint64_t offset, std::uint64_t size)
        : m_file(file),
          m_offset(offset),
          m_unread(size),
          m_window(std::make_unique_for_overwrite<std::uint8_t[]>(windowLength)) {}

    /// The next record, valid until the next call; none at the end, and where none stands.
    std::optional<DirectoryRecord> next() {
        if (!provide(zip::directoryHeaderLength) ||
            std::memcmp(m_next, zip::directorySignature, zip::signatureLength) != 0)
            return std::nullopt;
        const std::size_t length = DirectoryRecord{m_next}.length();
        if (!provide(length))
            return std::nullopt;
        const DirectoryRecord record{m_next};
        m_next += length;
        m_available -= length;
        return record;
    }
    [[nodiscard]] bool isAtEnd() const { return m_available == 0 && m_unread == 0; }

private:
    bool provide(std::size_t length) {
        if (length <= m_available)
            return true;
        if (length - m_available > m_unread)
            return false;
        if (m_available > 0)
            std::memmove(m_window.get(), m_next, m_available);
        m_next = m_window.get();
        const auto count =
            static_cast<std::size_t>(std::min<std::uint64_t>(windowLength - m_available, m_unread));
        if (!readFully(m_file, m_offset, m_window.get() + m_available, count))
            return false;
        m_available += count;
        m_offset += count;
        m_unread -= count;
        return true;
    }

    int m_file = -1;
    std::uint64_t m_offset = 0;
    std::uint64_t m_unread = 0;
    std::unique_ptr<std::uint8_t[]> m_window;
    const std::uint8_t* m_next = nullptr;
    std::size_t m_available = 0;
};

/// Text that a record declares to be UTF-8 and that any reader takes for it.
bool isPlainUTF8(std::string_view text) {
    return std::all_of(text.begin(), text.end(),
                       [](char c) { return static_cast<unsigned char>(c) >= ' '; }) &&
           isValidUTF8(text);
}

/// Extra fields of known form, none of which gives the entry another name, size or method.
bool extraIsPlain(Data::Bytes extra) {
    constexpr std::size_t fieldHeaderLength = 4;
    while (extra.size() >= fieldHeaderLength) {
        const std::uint16_t identifier = zip::get16(extra.data());
        const std::size_t length = zip::get16(extra.data() + 2);
        if (length > extra.size() - fieldHeaderLength || identifier == zip::unicodeNameField ||
            identifier == zip::unicodeCommentField || identifier == zip::strongCipherField)
            return false;
        extra = extra.subspan(fieldHeaderLength + length);
    }
    return extra.empty();
}

bool recordIsPlain(const DirectoryRecord& record) {
    if (record.method() == zip::strongCipherMethod || record.disk() != 0)
        return false;
    if (record.size() == zip::max32 || record.compressedSize() == zip::max32 ||
        record.offset() == zip::max32)
        return false;
    if ((record.flags() & zip::utf8Flag) != 0 &&
        !(isPlainUTF8(record.name()) && isPlainUTF8(record.comment())))
        return false;
    return extraIsPlain(record.extra());
}

/// Whether another end record than the last may stand in the tail. Sought by the signature's third
/// byte: its first two begin every record of a directory.
bool holdsEndRecord(Data::Bytes bytes) {
    constexpr std::size_t ahead = 2;
    const std::uint8_t* const end = bytes.data() + bytes.size();
    const std::uint8_t* from = bytes.data() + std::min(ahead, bytes.size());
    while (from < end) {
        const void* found =
            std::memchr(from, zip::endSignature[ahead], static_cast<std::size_t>(end - from));
        if (!found)
            return false;
        const auto* start = static_cast<const std::uint8_t*>(found) - ahead;
        if (static_cast<std::size_t>(end - start) >= zip::signatureLength &&
            std::memcmp(start, zip::endSignature, zip::signatureLength) == 0)
            return true;
        from = start + ahead + 1;
    }
    return false;
}

bool isSaid(std::uint32_t field, std::uint64_t value) {
    return field == value || field == zip::max32;
}

}  // namespace

std::unique_ptr<PlainZip> PlainZip::open(int file, std::uint64_t fileSize,
                                         std::uint64_t largestDirectory) {
    Buffer tail;
    tail.size = static_cast<std::size_t>(std::min<std::uint64_t>(fileSize, tailLength));
    tail.bytes = std::make_unique_for_overwrite<std::uint8_t[]>(tail.size);
    if (!readFully(file, fileSize - tail.size, tail.bytes.get(), tail.size))
        return nullptr;

    std::unique_ptr<PlainZip> archive(new PlainZip(file, fileSize));
    if (!readEndRecord({tail.bytes.get(), tail.size}, fileSize, archive->m_end) ||
        archive->m_end.directorySize > largestDirectory ||
        !archive->keepDirectory(std::move(tail)) || !archive->directoryIsPlain())
        return nullptr;
    return archive;
}

/// Takes the end record, and the zip64 one where there is one, only where all of their fields agree
/// with each other and with where they stand.
bool PlainZip::readEndRecord(Data::Bytes tail, std::uint64_t fileSize, EndRecord& end) {
    if (tail.size() < zip::endLength)
        return false;
    const std::size_t endStart = tail.size() - zip::endLength;
    const std::uint8_t* record = tail.data() + endStart;
    if (std::memcmp(record, zip::endSignature, zip::signatureLength) != 0 ||
        zip::get16(record + 20) != 0 || holdsEndRecord(tail.first(endStart)))
        return false;
    if (zip::get32(record + 4) != 0 || zip::get16(record + 8) != zip::get16(record + 10))
        return false;

    end.entries = zip::get16(record + 10);
    end.directorySize = zip::get32(record + 12);
    end.directoryOffset = zip::get32(record + 16);
    std::uint64_t directoryEnd = fileSize - zip::endLength;
    if (endStart >= zip::locator64Length &&
        std::memcmp(record - zip::locator64Length, zip::locator64Signature, zip::signatureLength) ==
            0) {
        if (endStart < zip::locator64Length + zip::end64Length)
            return false;
        const std::uint8_t* locator = record - zip::locator64Length;
        const std::uint8_t* record64 = locator - zip::end64Length;
        directoryEnd -= zip::locator64Length + zip::end64Length;
        if (zip::get32(locator + 4) != 0 || zip::get64(locator + 8) != directoryEnd ||
            std::memcmp(record64, zip::end64Signature, zip::signatureLength) != 0 ||
            zip::get64(record64 + 4) != zip::end64Length - 12 || zip::get64(record64 + 16) != 0 ||
            zip::get64(record64 + 24) != zip::get64(record64 + 32))
            return false;
        end.entries = zip::get64(record64 + 32);
        end.directorySize = zip::get64(record64 + 40);
        end.directoryOffset = zip::get64(record64 + 48);
        const std::uint16_t shortCount = zip::get16(record + 10);
        if ((shortCount != end.entries && shortCount != zip::max16) ||
            !isSaid(zip::get32(record + 12), end.directorySize) ||
            !isSaid(zip::get32(record + 16), end.directoryOffset))
            return false;
    }
    return end.directoryOffset <= directoryEnd &&
           end.directorySize == directoryEnd - end.directoryOffset &&
           end.entries <= end.directorySize / zip::directoryHeaderLength;
}

bool PlainZip::keepDirectory(Buffer tail) {
    if (m_end.directorySize > largestKeptDirectory)
        return true;
    const auto size = static_cast<std::size_t>(m_end.directorySize);
    const std::uint64_t tailOffset = m_fileSize - tail.size;
    if (m_end.directoryOffset >= tailOffset) {
        m_kept = std::move(tail);
        m_directory = {m_kept.bytes.get() + (m_end.directoryOffset - tailOffset), size};
        return true;
    }
    m_kept.bytes = std::make_unique_for_overwrite<std::uint8_t[]>(size);
    m_kept.size = size;
    m_directory = {m_kept.bytes.get(), size};
    return readFully(m_file, m_end.directoryOffset, m_kept.bytes.get(), size);
}

/// Walks the whole directory. Beside each record's own plainness, the entries must account for the
/// file before the directory: what none of them covers could be another archive with a directory
/// and end record of its own, which a full reader weighs against this one.
bool PlainZip::directoryIsPlain() const {
    DirectoryWalk walk = m_directory.size() == m_end.directorySize
                             ? DirectoryWalk(m_directory)
                             : DirectoryWalk(m_file, m_end.directoryOffset, m_end.directorySize);
    std::uint64_t entries = 0;
    std::uint64_t listed = 0;
    while (const std::optional<DirectoryRecord> record = walk.next()) {
        if (!recordIsPlain(*record))
            return false;
        ++entries;
        listed += zip::localHeaderLength + record->nameLength() + record->compressedSize();
    }
    return walk.isAtEnd() && entries == m_end.entries && listed <= m_end.directoryOffset &&
           m_end.directoryOffset - listed <= entries * unlistedPerEntry;
}

/// A full reader takes a name for ended by the first NUL in it, or gives another character for it.
std::optional<std::vector<PlainZip::Listed>> PlainZip::entries() const {
    if (m_directory.size() != m_end.directorySize)
        return std::nullopt;
    std::vector<Listed> listed;
    listed.reserve(m_end.entries);
    DirectoryWalk walk(m_directory);
    while (const std::optional<DirectoryRecord> record = walk.next()) {
        if (record->name().find('\0') != std::string_view::npos)
            return std::nullopt;
        listed.push_back({record->name(), record->entry()});
    }
    return listed;
}

PlainZip::Answer PlainZip::readEntry(std::string_view name, std::uint64_t limit,
                                     std::optional<Data>& content) {
    content.reset();
    ZipEntry entry;
    const Search search = find(name, entry);
    if (search == Search::Broken)
        return Answer::Unsure;
    if (search == Search::Absent || !canBeDelivered(entry, limit))
        return Answer::Sure;
    if (entry.isLarge())
        return Answer::Unsure;

    Data::Bytes stored;
    if (!m_window.readStored(entry, name.size(), stored))
        return Answer::Unsure;
    content = decodedEntry(entry, stored);
    return Answer::Sure;
}

PlainZip::Search PlainZip::find(std::string_view name, ZipEntry& entry) const {
    DirectoryWalk walk = m_directory.size() == m_end.directorySize
                             ? DirectoryWalk(m_directory)
                             : DirectoryWalk(m_file, m_end.directoryOffset, m_end.directorySize);
    while (const std::optional<DirectoryRecord> record = walk.next()) {
        if (record->name() != name)
            continue;
        entry = record->entry();
        return Search::Found;
    }
    return walk.isAtEnd() ? Search::Absent : Search::Broken;
}

}  // namespace parvel::host
