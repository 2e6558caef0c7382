#pragma once

#include <cstdint>

namespace parvel {

/// Writes bits, from the lowest up, into a buffer that is large enough and has eight bytes to
/// spare. To be copied into a local variable where much is written.
class BitWriter {
public:
    /// Goes on in another buffer.
    void moveTo(std::uint8_t* out) { m_out = out; }
    /// Behind the last whole byte.
    [[nodiscard]] std::uint8_t* position() const { return m_out; }

    /// At most 56 bits between two flushes.
    void put(std::uint64_t value, unsigned count) {
        m_bits |= value << m_count;
        m_count += count;
    }
    void flush() {
        for (unsigned i = 0; i < 8; ++i)
            m_out[i] = static_cast<std::uint8_t>(m_bits >> 8 * i);
        m_out += m_count / 8;
        m_bits >>= m_count / 8 * 8;
        m_count %= 8;
    }
    /// Goes on at the next whole byte.
    void align() {
        m_count = (m_count + 7) / 8 * 8;
        flush();
    }

private:
    std::uint8_t* m_out = nullptr;
    std::uint64_t m_bits = 0;
    unsigned m_count = 0;
};

}  // namespace parvel
