#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string_view>

#include "parvel/foundation/Data.h"
#include "parvel/foundation/ErrorOut.h"
#include "parvel/foundation/URL.h"

namespace parvel {

/// A zip archive (APPNOTE 6.3) opened for reading. For one thread.
class ZipArchive {
public:
    virtual ~ZipArchive() = default;

    /// The whole uncompressed bytes of the first entry whose stored name equals the given one
    /// exactly (bytes compared, no leading slash added or dropped). None when there is no such
    /// entry or it can't be delivered whole: encrypted, of an unknown method, a link or a folder,
    /// over the limit, of another size or checksum than it claims, or claiming more than 1032 times
    /// its stored size.
    [[nodiscard]] virtual std::optional<Data> readEntry(std::string_view name,
                                                        std::uint64_t limit) = 0;
};

/// Opens zip archives.
class ZipReader {
public:
    virtual ~ZipReader() = default;

    /// None when the file can't be opened (makeServiceError) or is no zip archive (a general error
    /// "corrupt" with the URL).
    [[nodiscard]] virtual std::unique_ptr<ZipArchive> open(const URL& url,
                                                           ErrorOut error = nullptr) = 0;

    static ZipReader& host();
};

}  // namespace parvel
