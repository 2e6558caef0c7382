#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <vector>

#include "parvel/platform/linux/BitWriter.h"

namespace parvel {

namespace deflate {
class BlockCodes;
}

/// Compresses bytes that come piece by piece into a zlib stream (RFC 1950), quickly rather than
/// well. Made for the rows of an image, where much repeats at once and at length: each stretch of
/// 60 KiB is compressed by itself, with one guess a place at what came before.
class QuickDeflate {
public:
    QuickDeflate();
    QuickDeflate(const QuickDeflate&) = delete;
    QuickDeflate& operator=(const QuickDeflate&) = delete;

    void add(std::span<const std::uint8_t> bytes);
    /// Ends the stream and gives all of it, for as long as this lives.
    [[nodiscard]] std::span<const std::uint8_t> finish();

private:
    /// Bytes as they are, and then some that stood there before.
    struct Sequence {
        std::uint16_t literals;
        std::uint16_t length;
        std::uint16_t distance;
    };

    void findSequences();
    void writeStretch(bool isLast);
    void writeSequences(const deflate::BlockCodes& codes, std::size_t size, bool isLast);
    void writeStored(bool isLast);
    void makeRoom(std::size_t size);

    static constexpr std::size_t longestStretch = 60 * 1024;
    static constexpr unsigned tableBits = 13;

    std::unique_ptr<std::uint8_t[]> m_stretch;
    std::size_t m_stretchSize = 0;
    std::array<std::uint16_t, 1U << tableBits> m_places;  ///< where some four bytes stood last
    std::vector<Sequence> m_sequences;
    std::size_t m_lastLiterals = 0;  ///< behind the last sequence

    std::unique_ptr<std::uint8_t[]> m_out;
    std::size_t m_capacity = 0;
    BitWriter m_writer;
    std::uint32_t m_checksum = 1;
};

}  // namespace parvel
