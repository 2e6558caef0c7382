#include "parvel/platform/linux/ArchiveEntries.h"

#include <algorithm>
#include <cerrno>
#include <utility>

namespace parvel::host {

namespace {

/// Of one read over entries that stand one behind the other: a cache of the processor's holds it.
constexpr std::uint64_t readAtOnce = 256ULL << 10;
/// Up to here an entry is inflated in one piece also where a cancel may come in between.
constexpr std::uint64_t largestInflatedWhole = 8ULL << 20;

std::uint64_t usualEnd(const PlainZip::Listed& listed) {
    return listed.entry.offset + ZipWindow::usualLength(listed.entry, listed.name.size());
}

}  // namespace

ArchiveEntries::ArchiveEntries(int file, std::uint64_t fileSize, std::uint64_t budget,
                               LibzipSource::Interruption interruption)
    : m_file(file),
      m_fileSize(fileSize),
      m_budget(budget),
      m_interruption(std::move(interruption)),
      m_window(file, fileSize) {}

std::unique_ptr<ArchiveEntries> ArchiveEntries::open(int file, std::uint64_t fileSize,
                                                     std::uint64_t budget,
                                                     LibzipSource::Interruption interruption) {
    std::unique_ptr<ArchiveEntries> archive(
        new ArchiveEntries(file, fileSize, budget, std::move(interruption)));
    if (archive->m_interruption && archive->m_interruption() != 0)
        return nullptr;
    archive->m_plain = PlainZip::open(file, fileSize, PlainZip::largestKeptDirectory);
    auto listed = archive->m_plain ? archive->m_plain->entries() : std::nullopt;
    if (!listed)
        return archive->openFully() ? std::move(archive) : nullptr;
    archive->m_listed = std::move(*listed);
    archive->m_isListed = archive->m_isSure = true;
    return archive;
}

bool ArchiveEntries::openFully() {
    if (!m_full)
        m_full = LibzipArchive::open(m_file, m_fileSize, m_budget, m_interruption);
    return m_full != nullptr;
}

std::uint64_t ArchiveEntries::count() const {
    return m_isListed ? m_listed.size() : m_full->entryCount();
}

std::optional<std::string_view> ArchiveEntries::name(std::uint64_t index) const {
    if (m_isListed)
        return m_listed[index].name;
    const char* name = m_full->name(index);
    return name ? std::optional<std::string_view>(name) : std::nullopt;
}

bool ArchiveEntries::describe(std::uint64_t index, ZipEntry& entry) const {
    if (!m_isListed)
        return m_full->describe(index, entry);
    entry = m_listed[index].entry;
    return true;
}

int ArchiveEntries::deliver(std::uint64_t index, const ZipEntry& entry, const Sink& sink) {
    const bool isInPieces =
        !entry.isStored() && std::max(entry.size, entry.compressedSize) > largestInflatedWhole;
    if (m_isSure && !isInPieces) {
        if (const std::optional<int> result = deliverPlainly(m_listed[index], sink))
            return *result;
        m_isSure = false;
    }
    if (openFully())
        return m_full->deliver(index, entry, sink);
    const int interruption = m_interruption ? m_interruption() : 0;
    return interruption != 0 ? interruption : EBADMSG;
}

/// None where libzip is to be asked, before anything is given.
std::optional<int> ArchiveEntries::deliverPlainly(const PlainZip::Listed& listed,
                                                  const Sink& sink) {
    const std::uint64_t length = usualEnd(listed) - listed.entry.offset;
    const std::uint64_t ahead =
        m_window.holds(listed.entry.offset, length) ? length : readAhead(listed);
    return listed.entry.isStored() ? deliverStored(listed.entry, ahead, sink)
                                   : deliverInflated(listed, ahead, sink);
}

/// The length from the entry on that takes as many of those behind it as come in turn and fit.
std::uint64_t ArchiveEntries::readAhead(const PlainZip::Listed& first) const {
    const std::uint64_t start = first.entry.offset;
    std::uint64_t end = std::min(usualEnd(first), start + readAtOnce);
    for (const auto* next = &first + 1; next < m_listed.data() + m_listed.size(); ++next) {
        if (usualEnd(*next) < end || usualEnd(*next) - start > readAtOnce)
            break;
        end = usualEnd(*next);
    }
    return end - start;
}

/// The checksum of one that comes in several pieces is known when the last is read.
std::optional<int> ArchiveEntries::deliverStored(const ZipEntry& entry, std::uint64_t ahead,
                                                 const Sink& sink) {
    const std::optional<std::uint64_t> start = m_window.dataOffset(entry, ahead);
    if (!start)
        return std::nullopt;
    std::uint32_t sum = 0;
    for (std::uint64_t given = 0; given < entry.size;) {
        const std::uint64_t wanted = std::min(entry.size - given, readAtOnce);
        const Data::Bytes piece = m_window.piece(*start + given, static_cast<std::size_t>(wanted));
        if (piece.empty())
            return given == 0 ? std::nullopt : std::optional(m_window.readError());
        sum = checksum(piece, sum);
        given += piece.size();
        if (given == entry.size && sum != entry.crc)
            return EBADMSG;
        if (const int error = sink(piece))
            return error;
    }
    return sum == entry.crc ? 0 : EBADMSG;
}

std::optional<int> ArchiveEntries::deliverInflated(const PlainZip::Listed& listed,
                                                   std::uint64_t ahead, const Sink& sink) {
    const ZipEntry& entry = listed.entry;
    Data::Bytes stored;
    if (!m_window.readStored(entry, listed.name.size(), stored, ahead))
        return std::nullopt;
    const auto size = static_cast<std::size_t>(entry.size);
    if (size > m_roomSize || !m_room) {
        m_roomSize = 0;
        m_room.reset();  // before the next is taken
        m_room = std::make_unique_for_overwrite<std::uint8_t[]>(size);
        m_roomSize = size;
    }
    return inflateEntry(entry, stored, m_room.get()) ? sink({m_room.get(), size}) : EBADMSG;
}

}  // namespace parvel::host
