#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>

namespace parvel {

/// A prefix code of the format deflate (RFC 1951, 3.2.2): for each symbol its code, as it goes into
/// the stream from the lowest bit up, and how many bits it has; none for a symbol that never
/// occurs.
struct PrefixCode {
    static constexpr std::size_t mostSymbols = 288;

    std::array<std::uint16_t, mostSymbols> codes{};
    std::array<std::uint8_t, mostSymbols> lengths{};
};

/// The code that makes the symbols shortest that occur this often, none of them longer than
/// `longest` bits. It has two codes at least, for not every reader takes a code of one.
[[nodiscard]] PrefixCode prefixCodeFor(std::span<const std::uint32_t> frequencies,
                                       unsigned longest);

}  // namespace parvel
