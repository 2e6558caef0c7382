#include "parvel/platform/linux/QuickDeflate.h"

#include <algorithm>
#include <cstring>

#include <libdeflate.h>

#include "parvel/platform/linux/DeflateCodes.h"

namespace parvel {

namespace {

using deflate::BlockCodes;
using deflate::Frequencies;
using deflate::Split;
using deflate::splitDistance;
using deflate::splitLength;

constexpr std::size_t shortestMatch = 4;
/// How many bytes of a match are seen again with what follows it.
constexpr std::size_t overlap = 3;
constexpr unsigned storedBlock = 0;
constexpr unsigned dynamicBlock = 2;
/// A stored block's head, what the bit writer needs to spare, and the checksum at the end.
constexpr std::size_t spareRoom = 32;

std::uint32_t fourBytes(const std::uint8_t* from) {
    std::uint32_t bytes;
    std::memcpy(&bytes, from, sizeof bytes);
    return bytes;
}

/// How many bytes are the same here and there, at most that many.
std::size_t equalBytes(const std::uint8_t* here, const std::uint8_t* there, std::size_t most) {
    std::size_t count = 0;
    for (std::uint64_t first, second; count + sizeof first <= most; count += sizeof first) {
        std::memcpy(&first, here + count, sizeof first);
        std::memcpy(&second, there + count, sizeof second);
        if (first != second)
            break;
    }
    while (count < most && here[count] == there[count])
        ++count;
    return count;
}

void writeLiterals(BitWriter& writer, const BlockCodes& codes, const std::uint8_t* bytes,
                   std::size_t count) {
    for (; count >= 3; count -= 3, bytes += 3) {
        codes.putLiteral(writer, bytes[0]);
        codes.putLiteral(writer, bytes[1]);
        codes.putLiteral(writer, bytes[2]);
        writer.flush();
    }
    for (std::size_t i = 0; i < count; ++i)
        codes.putLiteral(writer, bytes[i]);
    writer.flush();
}

}  // namespace

QuickDeflate::QuickDeflate()
    : m_stretch(std::make_unique<std::uint8_t[]>(longestStretch + overlap)) {
    constexpr std::uint16_t zlibHead = 0x0178;  // a window of 32 KiB, compressed quickly
    makeRoom(longestStretch);
    m_writer.put(zlibHead, 16);
    m_writer.flush();
}

void QuickDeflate::add(std::span<const std::uint8_t> bytes) {
    m_checksum = libdeflate_adler32(m_checksum, bytes.data(), bytes.size());
    while (!bytes.empty()) {
        if (m_stretchSize == longestStretch)
            writeStretch(/*isLast=*/false);
        const std::size_t taken = std::min(bytes.size(), longestStretch - m_stretchSize);
        std::memcpy(m_stretch.get() + m_stretchSize, bytes.data(), taken);
        m_stretchSize += taken;
        bytes = bytes.subspan(taken);
    }
}

std::span<const std::uint8_t> QuickDeflate::finish() {
    writeStretch(/*isLast=*/true);
    m_writer.align();
    for (int shift = 24; shift >= 0; shift -= 8)
        m_writer.put(m_checksum >> shift & 0xFF, 8);
    m_writer.flush();
    return {m_out.get(), m_writer.position()};
}

void QuickDeflate::findSequences() {
    constexpr unsigned hurry = 6;
    const std::uint8_t* bytes = m_stretch.get();
    const auto placeOf = [this](std::uint32_t four) -> std::uint16_t& {
        return m_places[four * 0x9E3779B1U >> (32 - tableBits)];
    };
    // A place that was never set is the first one, which is as good a guess as any.
    m_places.fill(0);
    m_sequences.clear();
    std::size_t begin = 0;
    std::size_t here = 1;
    while (here + shortestMatch <= m_stretchSize) {
        const std::uint32_t four = fourBytes(bytes + here);
        std::uint16_t& place = placeOf(four);
        const std::size_t there = place;
        place = static_cast<std::uint16_t>(here);
        if (fourBytes(bytes + there) != four || here - there > deflate::farthestMatch) {
            // Where nothing has repeated for long, it need not be sought at every place.
            here += 1 + ((here - begin) >> hurry);
            continue;
        }
        const std::size_t most = std::min(deflate::longestMatch, m_stretchSize - here);
        const std::size_t length = equalBytes(bytes + here, bytes + there, most);
        m_sequences.push_back({static_cast<std::uint16_t>(here - begin),
                               static_cast<std::uint16_t>(length),
                               static_cast<std::uint16_t>(here - there)});
        here += length;
        begin = here;
        placeOf(fourBytes(bytes + here - overlap)) = static_cast<std::uint16_t>(here - overlap);
    }
    m_lastLiterals = m_stretchSize - begin;
}

void QuickDeflate::writeStretch(bool isLast) {
    findSequences();
    Frequencies frequencies;
    std::uint64_t bitsBehind = 0;
    const std::uint8_t* bytes = m_stretch.get();
    const auto countLiterals = [&](std::size_t count) {
        for (const std::uint8_t* end = bytes + count; bytes != end; ++bytes)
            ++frequencies.literals[*bytes];
    };
    for (const Sequence& sequence : m_sequences) {
        countLiterals(sequence.literals);
        const Split length = splitLength(sequence.length);
        const Split distance = splitDistance(sequence.distance);
        ++frequencies.literals[deflate::firstLength + length.symbol];
        ++frequencies.distances[distance.symbol];
        bitsBehind += length.bits + distance.bits;
        bytes += sequence.length;
    }
    countLiterals(m_lastLiterals);
    frequencies.literals[deflate::endOfBlock] = 1;

    const BlockCodes codes(frequencies);
    const std::uint64_t size = (codes.bits() + bitsBehind) / 8;
    if (size < m_stretchSize)
        writeSequences(codes, size, isLast);
    else
        writeStored(isLast);
    m_stretchSize = 0;
}

void QuickDeflate::writeSequences(const BlockCodes& codes, std::size_t size, bool isLast) {
    makeRoom(size);
    BitWriter writer = m_writer;
    writer.put(isLast ? 1 : 0, 1);
    writer.put(dynamicBlock, 2);
    codes.writeHead(writer);
    const std::uint8_t* bytes = m_stretch.get();
    for (const Sequence& sequence : m_sequences) {
        writeLiterals(writer, codes, bytes, sequence.literals);
        const Split length = splitLength(sequence.length);
        const Split distance = splitDistance(sequence.distance);
        codes.putLiteral(writer, deflate::firstLength + length.symbol);
        writer.put(length.value, length.bits);
        codes.putDistance(writer, distance.symbol);
        writer.put(distance.value, distance.bits);
        writer.flush();
        bytes += sequence.literals + sequence.length;
    }
    writeLiterals(writer, codes, bytes, m_lastLiterals);
    codes.putLiteral(writer, deflate::endOfBlock);
    writer.flush();
    m_writer = writer;
}

void QuickDeflate::writeStored(bool isLast) {
    makeRoom(m_stretchSize);
    m_writer.put(isLast ? 1 : 0, 1);
    m_writer.put(storedBlock, 2);
    m_writer.align();
    m_writer.put(m_stretchSize, 16);
    m_writer.put(m_stretchSize ^ 0xFFFF, 16);
    m_writer.flush();
    std::uint8_t* out = m_writer.position();
    m_writer.moveTo(std::copy_n(m_stretch.get(), m_stretchSize, out));
}

/// For so many bytes more.
void QuickDeflate::makeRoom(std::size_t size) {
    const auto used = static_cast<std::size_t>(m_writer.position() - m_out.get());
    const std::size_t needed = used + size + spareRoom;
    if (needed <= m_capacity)
        return;
    m_capacity = std::max(needed, 2 * m_capacity);
    auto larger = std::make_unique_for_overwrite<std::uint8_t[]>(m_capacity);
    std::copy_n(m_out.get(), used, larger.get());
    m_out = std::move(larger);
    m_writer.moveTo(m_out.get() + used);
}

}  // namespace parvel
