#include "tests/support/ZipBuilder.h"

#include <libdeflate.h>

#include <memory>
#include <stdexcept>

namespace parvel::testing {

namespace {

constexpr std::uint16_t descriptorFlag = 8;
constexpr std::uint16_t storedMethod = 0;
constexpr std::uint16_t deflatedMethod = 8;
constexpr std::uint32_t max32 = 0xFFFFFFFF;

void put16(std::string& out, std::uint64_t value) {
    out += static_cast<char>(value & 0xFF);
    out += static_cast<char>(value >> 8 & 0xFF);
}

void put32(std::string& out, std::uint64_t value) {
    put16(out, value & 0xFFFF);
    put16(out, value >> 16 & 0xFFFF);
}

void put64(std::string& out, std::uint64_t value) {
    put32(out, value & max32);
    put32(out, value >> 32);
}

/// What both headers of an entry say.
struct EntryFacts {
    std::string data;
    std::uint16_t method;
    std::uint16_t flags;
    std::uint32_t crc;
    std::uint64_t compressedSize;
    std::uint64_t size;

    explicit EntryFacts(const ZipEntryPlan& plan)
        : data(plan.rawData ? *plan.rawData
                            : (plan.deflate ? deflatedBytes(plan.content) : plan.content)),
          method(plan.method.value_or(plan.deflate ? deflatedMethod : storedMethod)),
          flags(static_cast<std::uint16_t>(plan.flags | (plan.descriptor ? descriptorFlag : 0))),
          crc(plan.crc.value_or(crc32Of(plan.content))),
          compressedSize(plan.compressedSize.value_or(data.size())),
          size(plan.size.value_or(plan.content.size())) {}
};

std::string zip64Extra(const ZipEntryPlan& plan, const EntryFacts& facts) {
    std::string extra;
    if (plan.zip64) {
        put16(extra, 1);
        put16(extra, 16);
        put64(extra, facts.size);
        put64(extra, facts.compressedSize);
    }
    return extra;
}

void putCommonFields(std::string& out, const ZipEntryPlan& plan, const EntryFacts& facts,
                     bool sizesFollow) {
    put16(out, 20);
    put16(out, facts.flags);
    put16(out, facts.method);
    put16(out, 0);       // time
    put16(out, 0x5A21);  // date
    put32(out, sizesFollow ? 0 : facts.crc);
    put32(out, sizesFollow ? 0 : (plan.zip64 ? max32 : facts.compressedSize));
    put32(out, sizesFollow ? 0 : (plan.zip64 ? max32 : facts.size));
}

void putLocalEntry(std::string& out, const ZipEntryPlan& plan, const EntryFacts& facts) {
    const std::string& name = plan.localName ? *plan.localName : plan.name;
    const std::string extra = zip64Extra(plan, facts) + plan.localExtra;
    out += "PK\x03\x04";
    putCommonFields(out, plan, facts, plan.descriptor);
    put16(out, name.size());
    put16(out, extra.size());
    out += name + extra + facts.data;
    if (plan.descriptor) {
        out += "PK\x07\x08";
        put32(out, facts.crc);
        put32(out, facts.compressedSize);
        put32(out, facts.size);
    }
}

void putDirectoryEntry(std::string& out, const ZipEntryPlan& plan, const EntryFacts& facts,
                       std::uint64_t offset) {
    const std::string extra = zip64Extra(plan, facts) + plan.extra;
    out += "PK\x01\x02";
    put16(out, plan.madeBy);
    putCommonFields(out, plan, facts, false);
    put16(out, plan.name.size());
    put16(out, extra.size());
    put16(out, plan.comment.size());
    put16(out, 0);  // disk
    put16(out, 0);  // internal attributes
    put32(out, plan.externalAttributes);
    put32(out, plan.offset.value_or(offset));
    out += plan.name + extra + plan.comment;
}

}  // namespace

ZipBuilder& ZipBuilder::stored(std::string_view name, std::string_view content) {
    return entry({.name = std::string(name), .content = std::string(content)});
}

ZipBuilder& ZipBuilder::deflated(std::string_view name, std::string_view content) {
    return entry({.name = std::string(name), .content = std::string(content), .deflate = true});
}

ZipBuilder& ZipBuilder::link(std::string_view name, std::string_view target) {
    return entry({.name = std::string(name),
                  .content = std::string(target),
                  .externalAttributes = 0120777U << 16});
}

ZipBuilder& ZipBuilder::entry(ZipEntryPlan plan) {
    m_entries.push_back(std::move(plan));
    return *this;
}

ZipBuilder& ZipBuilder::comment(std::string_view text) {
    m_comment = text;
    return *this;
}

ZipBuilder& ZipBuilder::prefix(std::string_view junk, bool adjusted) {
    m_prefix = junk;
    m_prefixAdjusted = adjusted;
    return *this;
}

ZipBuilder& ZipBuilder::trailer(std::string_view junk) {
    m_trailer = junk;
    return *this;
}

ZipBuilder& ZipBuilder::zip64() {
    m_zip64 = true;
    return *this;
}

ZipBuilder& ZipBuilder::count(std::uint64_t entries) {
    m_count = entries;
    return *this;
}

ZipBuilder& ZipBuilder::directorySizeError(std::int64_t error) {
    m_sizeError = error;
    return *this;
}

ZipBuilder& ZipBuilder::directoryOffsetError(std::int64_t error) {
    m_offsetError = error;
    return *this;
}

ZipBuilder& ZipBuilder::diskNumber(std::uint16_t disk) {
    m_disk = disk;
    return *this;
}

std::string ZipBuilder::bytes() const {
    std::string out = m_prefix;
    const std::uint64_t base = m_prefixAdjusted ? 0 : m_prefix.size();
    std::string directory;
    for (const ZipEntryPlan& plan : m_entries) {
        const EntryFacts facts(plan);
        putDirectoryEntry(directory, plan, facts, out.size() - base);
        putLocalEntry(out, plan, facts);
    }

    const std::uint64_t count = m_count.value_or(m_entries.size());
    const std::uint64_t size = directory.size() + static_cast<std::uint64_t>(m_sizeError);
    const std::uint64_t offset = out.size() - base + static_cast<std::uint64_t>(m_offsetError);
    out += directory;
    if (m_zip64) {
        const std::uint64_t recordOffset = out.size() - base;
        out += "PK\x06\x06";
        put64(out, 44);
        put16(out, 45);
        put16(out, 45);
        put32(out, m_disk);
        put32(out, m_disk);
        put64(out, count);
        put64(out, count);
        put64(out, size);
        put64(out, offset);
        out += "PK\x06\x07";
        put32(out, m_disk);
        put64(out, recordOffset);
        put32(out, 1);
    }
    out += "PK\x05\x06";
    put16(out, m_disk);
    put16(out, m_disk);
    put16(out, count > 0xFFFF ? 0xFFFF : count);
    put16(out, count > 0xFFFF ? 0xFFFF : count);
    put32(out, size > max32 ? max32 : size);
    put32(out, offset > max32 ? max32 : offset);
    put16(out, m_comment.size());
    return out + m_comment + m_trailer;
}

std::string deflatedBytes(std::string_view bytes) {
    const std::unique_ptr<libdeflate_compressor, decltype(&libdeflate_free_compressor)> compressor(
        libdeflate_alloc_compressor(6), &libdeflate_free_compressor);
    std::string out(libdeflate_deflate_compress_bound(compressor.get(), bytes.size()), '\0');
    out.resize(libdeflate_deflate_compress(compressor.get(), bytes.data(), bytes.size(), out.data(),
                                           out.size()));
    if (out.empty())
        throw std::runtime_error("no deflate stream");
    return out;
}

std::uint32_t crc32Of(std::string_view bytes) {
    return libdeflate_crc32(0, bytes.data(), bytes.size());
}

}  // namespace parvel::testing
