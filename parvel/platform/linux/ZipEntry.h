#pragma once

#include <cstdint>
#include <optional>

#include "parvel/foundation/Data.h"

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
    [[nodiscard]] bool isStored() const;
    [[nodiscard]] bool hasKnownMethod() const;
    /// Type and permissions as Unix has them; 0 where another system made the entry.
    [[nodiscard]] std::uint32_t unixMode() const;
};

/// Whether what is said of the entry lets it be delivered: a plain, stored or deflated file within
/// the limit, whose size its compressed size can give.
[[nodiscard]] bool canBeDelivered(const ZipEntry& entry, std::uint64_t limit);

/// The checksum of content, `before` being that of what comes before it.
[[nodiscard]] std::uint32_t checksum(Data::Bytes content, std::uint32_t before = 0);

/// Inflates an entry that is not large into a buffer of its size. False when that is not what the
/// stored bytes give, or their checksum not what the entry claims.
[[nodiscard]] bool inflateEntry(const ZipEntry& entry, Data::Bytes stored, std::uint8_t* content);

/// The content of an entry that is not large, out of its stored bytes. None when it is not of the
/// size and checksum that the entry claims.
[[nodiscard]] std::optional<Data> decodedEntry(const ZipEntry& entry, Data::Bytes stored);

}  // namespace parvel::host
