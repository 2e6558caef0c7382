#pragma once

#include <array>
#include <cstdint>
#include <functional>
#include <vector>

#include "parvel/foundation/Data.h"
#include "parvel/foundation/PVExport.h"

namespace parvel {

/// Which cover images `setCoverImageData` refuses: those whose host content hash is 153495661, and
/// those in a list of digests. As shipped neither the hash nor a digest is known, so nothing is
/// refused until the embedding application supplies one of them.
struct PV_EXPORT CoverFilter {
    struct RefusedImage {
        std::array<std::uint8_t, 32> sha256;
        std::uint64_t size;  ///< bytes
    };
    using HostHash = std::function<std::uint64_t(const Data&)>;

    static constexpr std::uint64_t refusedHash = 153495661;

    std::vector<RefusedImage> refusedImages;
    HostHash hostHash;  ///< the host's standard hash of a byte buffer, where there is one

    [[nodiscard]] bool refuses(const Data& data) const;
};

/// Sets the filter of the whole process; call it before records are made, never beside another
/// thread that makes them.
PV_EXPORT void setCoverFilter(CoverFilter filter);
/// The filter in force.
[[nodiscard]] PV_EXPORT const CoverFilter& coverFilter();

}  // namespace parvel
