#include "parvel/platform/linux/PrefixCode.h"

#include <algorithm>

namespace parvel {

namespace {

constexpr unsigned deepest = 31;  ///< of any tree over so few bytes

/// How many codes there are of each length.
using LengthCounts = std::array<unsigned, deepest + 1>;

/// The symbols that get a code, rarest first.
struct UsedSymbols {
    std::array<std::uint16_t, PrefixCode::mostSymbols> symbols;
    std::array<std::uint32_t, PrefixCode::mostSymbols> frequencies;
    std::size_t count = 0;
};

UsedSymbols usedSymbols(std::span<const std::uint32_t> frequencies) {
    UsedSymbols used;
    for (std::size_t symbol = 0; symbol < frequencies.size(); ++symbol) {
        if (frequencies[symbol] > 0)
            used.symbols[used.count++] = static_cast<std::uint16_t>(symbol);
    }
    for (std::uint16_t symbol = 0; used.count < 2; ++symbol) {
        if (frequencies[symbol] == 0)
            used.symbols[used.count++] = symbol;
    }
    std::sort(used.symbols.begin(), used.symbols.begin() + used.count,
              [&](std::uint16_t left, std::uint16_t right) {
                  return frequencies[left] != frequencies[right]
                             ? frequencies[left] < frequencies[right]
                             : left < right;
              });
    for (std::size_t i = 0; i < used.count; ++i)
        used.frequencies[i] = frequencies[used.symbols[i]];
    return used;
}

/// Huffman's tree, joined from the two rarest up. The nodes come into being in order, so that two
/// queues do for a heap.
LengthCounts depthsOfTree(const UsedSymbols& used) {
    std::array<std::uint32_t, PrefixCode::mostSymbols> weights;
    std::array<std::uint16_t, 2 * PrefixCode::mostSymbols> parents;
    const std::size_t leaves = used.count;
    std::size_t leaf = 0;
    std::size_t joined = 0;
    for (std::size_t node = 0; node + 1 < leaves; ++node) {
        weights[node] = 0;
        for (int child = 0; child < 2; ++child) {
            const bool isLeaf =
                joined == node || (leaf < leaves && used.frequencies[leaf] <= weights[joined]);
            weights[node] += isLeaf ? used.frequencies[leaf] : weights[joined];
            parents[isLeaf ? leaf++ : leaves + joined++] = static_cast<std::uint16_t>(node);
        }
    }

    // The last node is the root.
    std::array<std::uint8_t, PrefixCode::mostSymbols> depths{};
    for (std::size_t node = leaves - 2; node-- > 0;)
        depths[node] = static_cast<std::uint8_t>(depths[parents[leaves + node]] + 1);
    LengthCounts counts{};
    for (std::size_t i = 0; i < leaves; ++i)
        ++counts[depths[parents[i]] + 1];
    return counts;
}

/// Makes no code longer than that: as many others become longer as have to.
void limitLengths(LengthCounts& counts, unsigned longest) {
    for (unsigned length = longest + 1; length <= deepest; ++length) {
        counts[longest] += counts[length];
        counts[length] = 0;
    }
    unsigned taken = 0;
    for (unsigned length = 1; length <= longest; ++length)
        taken += counts[length] << (longest - length);
    for (; taken > 1U << longest; --taken) {
        unsigned shorter = longest - 1;
        while (counts[shorter] == 0)
            --shorter;
        --counts[longest];
        --counts[shorter];
        counts[shorter + 1] += 2;
    }
}

std::uint16_t reversed(unsigned code, unsigned length) {
    unsigned result = 0;
    for (; length > 0; --length, code >>= 1)
        result = result << 1 | (code & 1);
    return static_cast<std::uint16_t>(result);
}

}  // namespace

PrefixCode prefixCodeFor(std::span<const std::uint32_t> frequencies, unsigned longest) {
    const UsedSymbols used = usedSymbols(frequencies);
    LengthCounts counts = depthsOfTree(used);
    limitLengths(counts, longest);

    PrefixCode code;
    std::size_t rarest = 0;
    for (unsigned length = longest; length > 0; --length) {
        for (unsigned i = 0; i < counts[length]; ++i)
            code.lengths[used.symbols[rarest++]] = static_cast<std::uint8_t>(length);
    }
    std::array<unsigned, deepest + 1> next{};
    for (unsigned length = 1; length < longest; ++length)
        next[length + 1] = (next[length] + counts[length]) << 1;
    for (std::size_t symbol = 0; symbol < frequencies.size(); ++symbol) {
        if (const unsigned length = code.lengths[symbol])
            code.codes[symbol] = reversed(next[length]++, length);
    }
    return code;
}

}  // namespace parvel
