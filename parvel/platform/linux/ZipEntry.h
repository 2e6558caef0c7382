#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>

#include "parvel/foundation/Data.h"

struct libdeflate_decompressor;

namespace parvel::host {

/// What an archive's directory says of one entry.
struct ZipEntry {
    std::uint64_t offset = 0;  ///< of its local header
    std::uint64_t compressedSize = 0;
    std::uint64_t size = 0;
    std::uint32_t crc = 0;
    std::uint32_t externalAttributes = 0;
    std::uint16_t method = 0;
    std::uint8_t hostSystem = 0;
    bool isEncrypted = false;

    /// Too large to be inflated in one piece.
    [[nodiscard]] bool isLarge() const;
    [[nodiscard]] bool hasKnownMethod() const;
    /// Type and permissions as Unix has them; 0 where another system made the entry.
    [[nodiscard]] std::uint32_t unixMode() const;
};

/// Whether what is said of the entry lets it be delivered: a plain, stored or deflated file within
/// the limit, whose size its compressed size can give.
[[nodiscard]] bool canBeDelivered(const ZipEntry& entry, std::uint64_t limit);

/// Turns the stored bytes of entries that are not large into their content.
class ZipDecoder {
public:
    ZipDecoder();
    ~ZipDecoder();
    ZipDecoder(const ZipDecoder&) = delete;
    ZipDecoder& operator=(const ZipDecoder&) = delete;

    /// None when the content is not of the size and checksum that the entry claims.
    [[nodiscard]] std::optional<Data> decode(const ZipEntry& entry, Data::Bytes stored);

private:
    struct Release {
        void operator()(libdeflate_decompressor* decompressor) const;
    };
    std::unique_ptr<libdeflate_decompressor, Release> m_decompressor;
};

}  // namespace parvel::host
