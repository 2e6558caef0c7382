#pragma once

#include <algorithm>
#include <array>
#include <bit>
#include <cstddef>
#include <cstdint>

#include "parvel/platform/linux/BitWriter.h"
#include "parvel/platform/linux/PrefixCode.h"

namespace parvel::deflate {

inline constexpr std::size_t literalSymbols = 286;  ///< literals, the block's end, lengths
inline constexpr std::size_t distanceSymbols = 30;
inline constexpr std::size_t endOfBlock = 256;
inline constexpr std::size_t firstLength = 257;
inline constexpr std::size_t longestMatch = 258;
inline constexpr std::size_t farthestMatch = 32768;

/// A length or distance as a symbol, and the bits that stand behind that.
struct Split {
    unsigned symbol;
    unsigned bits;
    unsigned value;
};

/// Symbols stand for ranges of numbers whose width doubles every 2^kept symbols.
constexpr Split splitNumber(unsigned number, int kept) {
    const int bits = std::max(static_cast<int>(std::bit_width(number)) - kept - 1, 0);
    const unsigned mask = (1U << bits) - 1;
    return {(static_cast<unsigned>(bits) << kept) + (number >> bits), static_cast<unsigned>(bits),
            number & mask};
}

constexpr Split splitLength(std::size_t length) {
    if (length == longestMatch)
        return {28, 0, 0};
    return splitNumber(static_cast<unsigned>(length) - 3, 2);
}

constexpr Split splitDistance(std::size_t distance) {
    return splitNumber(static_cast<unsigned>(distance) - 1, 1);
}

/// How often each symbol of a block occurs.
struct Frequencies {
    std::array<std::uint32_t, literalSymbols> literals{};
    std::array<std::uint32_t, distanceSymbols> distances{};
};

/// The two codes of a block, and what stands at its head: the lengths of these codes, run by run,
/// in a third one.
class BlockCodes {
public:
    explicit BlockCodes(const Frequencies& frequencies);

    /// How many bits the head and all symbols take, without those behind them.
    [[nodiscard]] std::uint64_t bits() const { return m_bits; }
    void writeHead(BitWriter& writer) const;
    void putLiteral(BitWriter& writer, std::size_t symbol) const {
        writer.put(m_literals.codes[symbol], m_literals.lengths[symbol]);
    }
    void putDistance(BitWriter& writer, std::size_t symbol) const {
        writer.put(m_distances.codes[symbol], m_distances.lengths[symbol]);
    }

private:
    /// A symbol of the head, and the value behind it.
    struct Item {
        std::uint8_t symbol;
        std::uint8_t value;
    };

    void addItem(unsigned symbol, std::size_t value);
    void addRun(unsigned length, std::size_t count);
    void addRuns();

    PrefixCode m_literals;
    PrefixCode m_distances;
    PrefixCode m_lengths;
    std::array<Item, literalSymbols + distanceSymbols> m_items;
    std::size_t m_itemCount = 0;
    std::array<std::uint32_t, 19> m_itemFrequencies{};
    std::uint64_t m_bits = 0;
};

}  // namespace parvel::deflate
