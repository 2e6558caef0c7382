#include "parvel/platform/linux/ZipEntry.h"

#include <libdeflate.h>
#include <sys/stat.h>

#include <algorithm>
#include <memory>
#include <new>

namespace parvel::host {

namespace {

constexpr std::uint16_t storedMethod = 0;
constexpr std::uint16_t deflatedMethod = 8;
/// Made-by systems whose external attributes hold a Unix mode in their upper half.
constexpr std::uint8_t unixSystem = 3;
constexpr std::uint8_t darwinSystem = 19;
constexpr int modeShift = 16;

constexpr std::uint64_t largestWholeEntry = 32ULL << 20;
/// A deflate stream gives at most 258 bytes for two of its bits, so no honest entry claims more;
/// tiny ones need no allowance.
constexpr std::uint64_t mostBytesPerByte = 1032;

bool isLinkOrFolder(const ZipEntry& entry) {
    return S_ISLNK(entry.unixMode()) || S_ISDIR(entry.unixMode());
}

struct FreeDecompressor {
    void operator()(libdeflate_decompressor* decompressor) const {
        libdeflate_free_decompressor(decompressor);
    }
};

/// Kept until the thread ends: making one takes as long as inflating a container document.
libdeflate_decompressor* threadDecompressor() {
    thread_local std::unique_ptr<libdeflate_decompressor, FreeDecompressor> decompressor;
    if (!decompressor)
        decompressor.reset(libdeflate_alloc_decompressor());
    if (!decompressor)
        throw std::bad_alloc();
    return decompressor.get();
}

bool canGiveItsSize(const ZipEntry& entry) {
    if (entry.isStored())
        return entry.size == entry.compressedSize;
    return entry.method == deflatedMethod &&
           entry.size / mostBytesPerByte <= entry.compressedSize &&
           entry.size <= entry.compressedSize * mostBytesPerByte;
}

}  // namespace

bool ZipEntry::isLarge() const {
    return size > largestWholeEntry || compressedSize > largestWholeEntry;
}

bool ZipEntry::isStored() const {
    return method == storedMethod;
}

bool ZipEntry::hasKnownMethod() const {
    return isStored() || method == deflatedMethod;
}

std::uint32_t ZipEntry::unixMode() const {
    const bool isUnix = hostSystem == unixSystem || hostSystem == darwinSystem;
    return isUnix ? externalAttributes >> modeShift : 0;
}

bool canBeDelivered(const ZipEntry& entry, std::uint64_t limit) {
    return !entry.isEncrypted && !isLinkOrFolder(entry) && entry.size <= limit &&
           canGiveItsSize(entry);
}

std::uint32_t checksum(Data::Bytes content, std::uint32_t before) {
    return libdeflate_crc32(before, content.data(), content.size());
}

bool inflateEntry(const ZipEntry& entry, Data::Bytes stored, std::uint8_t* content) {
    // No place for the actual size: anything but the whole size is a failure.
    if (!stored.empty() &&
        libdeflate_deflate_decompress(threadDecompressor(), stored.data(), stored.size(), content,
                                      entry.size, nullptr) != LIBDEFLATE_SUCCESS)
        return false;
    return checksum({content, static_cast<std::size_t>(entry.size)}) == entry.crc;
}

std::optional<Data> decodedEntry(const ZipEntry& entry, Data::Bytes stored) {
    if (entry.isStored())
        return checksum(stored) == entry.crc ? std::optional(Data::copyOf(stored)) : std::nullopt;
    auto content = std::make_unique_for_overwrite<std::uint8_t[]>(entry.size);
    if (!inflateEntry(entry, stored, content.get()))
        return std::nullopt;
    return Data::adopt(std::move(content), entry.size);
}

}  // namespace parvel::host
