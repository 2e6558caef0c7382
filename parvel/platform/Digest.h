#pragma once

#include <array>
#include <cstdint>
#include <memory>
#include <optional>

#include "parvel/foundation/Data.h"

namespace parvel {

/// MD5 (RFC 1321) over bytes that come in pieces, and SHA-256 (FIPS 180-4) over bytes at hand.
class Digest {
public:
    using MD5 = std::array<std::uint8_t, 16>;
    using SHA256 = std::array<std::uint8_t, 32>;

    /// One digest in the making, for one thread.
    class Running {
    public:
        virtual ~Running() = default;
        virtual void update(Data::Bytes bytes) = 0;
        /// None when any step failed. Called once.
        [[nodiscard]] virtual std::optional<MD5> finish() = 0;
    };

    virtual ~Digest() = default;
    /// None where the host refuses the algorithm.
    [[nodiscard]] virtual std::unique_ptr<Running> beginMD5() = 0;
    /// None when any step failed.
    [[nodiscard]] virtual std::optional<SHA256> sha256(const Data& data) = 0;

    static Digest& host();
};

}  // namespace parvel
