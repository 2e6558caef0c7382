#pragma once

#include <cstdint>
#include <optional>

#include "parvel/foundation/ErrorOut.h"
#include "parvel/foundation/URL.h"

namespace parvel {

enum class DirectoryRelationship { Contains, Same, Other };

/// What the host knows of the item at a file URL. A link's target is what counts. All errors are
/// those of makeServiceError.
class ResourceQueries {
public:
    virtual ~ResourceQueries() = default;

    [[nodiscard]] virtual bool isReachable(const URL& url, ErrorOut error = nullptr) = 0;
    /// None when the query fails.
    [[nodiscard]] virtual std::optional<bool> isDirectory(const URL& url,
                                                          ErrorOut error = nullptr) = 0;
    /// Bytes on disk in whole allocation blocks.
    [[nodiscard]] virtual std::optional<std::uint64_t> totalAllocatedSize(
        const URL& url, ErrorOut error = nullptr) = 0;
    /// How the item lies to the directory, at any depth, by what they are on disk and not by their
    /// paths' text.
    [[nodiscard]] virtual std::optional<DirectoryRelationship> relationship(
        const URL& directory, const URL& item, ErrorOut error = nullptr) = 0;

    static ResourceQueries& host();
};

}  // namespace parvel
