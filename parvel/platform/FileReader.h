#pragma once

#include <cstdint>
#include <optional>
#include <string_view>

#include "parvel/foundation/Data.h"
#include "parvel/foundation/ErrorOut.h"
#include "parvel/foundation/URL.h"

namespace parvel {

/// Reads whole files into memory. All errors are those of makeServiceError; a file over the limit,
/// or one that is no regular file, counts as corrupt (EBADMSG), but for a folder in the place of a
/// whole file (EISDIR).
class FileReader {
public:
    virtual ~FileReader() = default;

    /// The file at the URL, links followed.
    [[nodiscard]] virtual std::optional<Data> readFile(const URL& url, std::uint64_t limit,
                                                       ErrorOut error = nullptr) = 0;
    /// The file at a path below a package directory. No link is followed below the package, and a
    /// path that leaves it names no readable file (corrupt); one leading slash of the path is
    /// dropped. The error's URL is the member's.
    [[nodiscard]] virtual std::optional<Data> readMember(const URL& package, std::string_view path,
                                                         std::uint64_t limit,
                                                         ErrorOut error = nullptr) = 0;

    static FileReader& host();
};

/// What a package's documents may take in memory, each counted before it is read.
namespace budget {
inline constexpr std::uint64_t packageDocument = 64ULL << 20;
inline constexpr std::uint64_t storeFile = 16ULL << 20;
inline constexpr std::uint64_t cover = 64ULL << 20;
}  // namespace budget

}  // namespace parvel
