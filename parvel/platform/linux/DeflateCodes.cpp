#include "parvel/platform/linux/DeflateCodes.h"

namespace parvel::deflate {

namespace {

constexpr unsigned longestCode = 15;
constexpr unsigned longestLengthCode = 7;
/// The symbols of the head beside the lengths themselves: the one before again, and zeros.
constexpr unsigned again = 16;
constexpr unsigned fewZeros = 17;
constexpr unsigned manyZeros = 18;
constexpr std::array<std::uint8_t, 19> lengthOrder{16, 17, 18, 0, 8,  7, 9,  6, 10, 5,
                                                   11, 4,  12, 3, 13, 2, 14, 1, 15};

constexpr unsigned bitsBehind(unsigned symbol) {
    switch (symbol) {
        case again:
            return 2;
        case fewZeros:
            return 3;
        case manyZeros:
            return 7;
        default:
            return 0;
    }
}

template <std::size_t size>
std::uint64_t bitsOf(const std::array<std::uint32_t, size>& frequencies, const PrefixCode& code) {
    std::uint64_t bits = 0;
    for (std::size_t symbol = 0; symbol < size; ++symbol)
        bits += std::uint64_t{frequencies[symbol]} * code.lengths[symbol];
    return bits;
}

}  // namespace

BlockCodes::BlockCodes(const Frequencies& frequencies)
    : m_literals(prefixCodeFor(frequencies.literals, longestCode)),
      m_distances(prefixCodeFor(frequencies.distances, longestCode)) {
    addRuns();
    m_lengths = prefixCodeFor(m_itemFrequencies, longestLengthCode);
    constexpr unsigned counts = 5 + 5 + 4;
    m_bits = counts + 3 * lengthOrder.size() + bitsOf(m_itemFrequencies, m_lengths) +
             bitsOf(frequencies.literals, m_literals) + bitsOf(frequencies.distances, m_distances);
    for (std::size_t i = 0; i < m_itemCount; ++i)
        m_bits += bitsBehind(m_items[i].symbol);
}

void BlockCodes::addItem(unsigned symbol, std::size_t value) {
    m_items[m_itemCount++] = {static_cast<std::uint8_t>(symbol), static_cast<std::uint8_t>(value)};
    ++m_itemFrequencies[symbol];
}

/// The same length so often.
void BlockCodes::addRun(unsigned length, std::size_t count) {
    constexpr std::size_t shortestRun = 3;
    constexpr std::size_t shortestLong = 11;
    if (length != 0) {
        addItem(length, 0);
        --count;
    }
    while (count >= shortestRun) {
        const std::size_t taken = std::min<std::size_t>(count, length == 0 ? 138 : 6);
        if (length != 0)
            addItem(again, taken - shortestRun);
        else if (taken < shortestLong)
            addItem(fewZeros, taken - shortestRun);
        else
            addItem(manyZeros, taken - shortestLong);
        count -= taken;
    }
    for (; count > 0; --count)
        addItem(length, 0);
}

void BlockCodes::addRuns() {
    std::array<std::uint8_t, literalSymbols + distanceSymbols> lengths;
    std::copy_n(m_distances.lengths.begin(), distanceSymbols,
                std::copy_n(m_literals.lengths.begin(), literalSymbols, lengths.begin()));
    for (std::size_t begin = 0, end = 0; begin < lengths.size(); begin = end) {
        while (end < lengths.size() && lengths[end] == lengths[begin])
            ++end;
        addRun(lengths[begin], end - begin);
    }
}

void BlockCodes::writeHead(BitWriter& writer) const {
    writer.put(literalSymbols - 257, 5);
    writer.put(distanceSymbols - 1, 5);
    writer.put(lengthOrder.size() - 4, 4);
    writer.flush();
    for (const std::uint8_t length : lengthOrder) {
        writer.put(m_lengths.lengths[length], 3);
        writer.flush();
    }
    for (std::size_t i = 0; i < m_itemCount; ++i) {
        const auto [symbol, value] = m_items[i];
        writer.put(m_lengths.codes[symbol], m_lengths.lengths[symbol]);
        writer.put(value, bitsBehind(symbol));
        writer.flush();
    }
}

}  // namespace parvel::deflate
