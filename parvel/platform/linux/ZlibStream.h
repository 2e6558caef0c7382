#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>

#include "parvel/platform/linux/Libisal.h"

namespace parvel {

/// Compresses bytes that come piece by piece into a zlib stream (RFC 1950), quickly rather than
/// well. Its memory is that of the result and 400 KB.
class ZlibStream {
public:
    /// With a library that is complete.
    explicit ZlibStream(const host::Libisal& library);
    ZlibStream(const ZlibStream&) = delete;
    ZlibStream& operator=(const ZlibStream&) = delete;

    void add(std::span<const std::uint8_t> bytes);
    /// Ends the stream and gives all of it, for as long as this lives.
    [[nodiscard]] std::span<const std::uint8_t> finish();

private:
    void compress();
    void makeRoom();

    const host::Libisal& m_library;
    std::unique_ptr<isal_zstream> m_stream;
    std::unique_ptr<std::uint8_t[]> m_levelBuffer;
    std::unique_ptr<std::uint8_t[]> m_out;
    std::size_t m_capacity = 0;
    std::size_t m_size = 0;
};

}  // namespace parvel
