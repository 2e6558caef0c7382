#pragma once

#include <cstdint>
#include <functional>
#include <optional>

#include "parvel/foundation/URL.h"

namespace parvel {

/// Visits what lies in a directory, at any depth. Names that begin with a dot, and all below them,
/// are left out; so are links' targets, and, silently, what can't be read or lies deeper than 400
/// folders.
class DirectoryEnumerator {
public:
    /// One item on the way; good during the visit alone. A link is an item of its own.
    class Entry {
    public:
        virtual ~Entry() = default;
        /// None when the query fails.
        [[nodiscard]] virtual std::optional<bool> isDirectory() const = 0;
        /// Bytes on disk in whole allocation blocks; none when the query fails.
        [[nodiscard]] virtual std::optional<std::uint64_t> totalAllocatedSize() const = 0;
        /// Sets the permission bits; false when they could not be set, as those of a link never
        /// can.
        virtual bool setPermissions(unsigned mode) const = 0;
    };

    virtual ~DirectoryEnumerator() = default;
    virtual void enumerate(const URL& directory,
                           const std::function<void(const Entry&)>& visit) = 0;

    static DirectoryEnumerator& host();
};

}  // namespace parvel
