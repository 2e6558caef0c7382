#include "parvel/platform/linux/ZlibStream.h"

#include <algorithm>
#include <limits>

namespace parvel {

namespace {

constexpr std::uint32_t kLevel = 1;
constexpr std::size_t kFirstCapacity = 64 * 1024;
/// What the library counts a piece's bytes by.
constexpr std::size_t kLargestPiece = std::numeric_limits<std::uint32_t>::max();

}  // namespace

ZlibStream::ZlibStream(const host::Libisal& library)
    : m_library(library),
      m_stream(std::make_unique_for_overwrite<isal_zstream>()),
      m_levelBuffer(std::make_unique_for_overwrite<std::uint8_t[]>(ISAL_DEF_LVL1_DEFAULT)) {
    m_library.isal_deflate_init(m_stream.get());
    // What was there before is left by that.
    m_stream->next_in = nullptr;
    m_stream->avail_in = 0;
    m_stream->gzip_flag = IGZIP_ZLIB;
    m_stream->level = kLevel;
    m_stream->level_buf = m_levelBuffer.get();
    m_stream->level_buf_size = ISAL_DEF_LVL1_DEFAULT;
}

void ZlibStream::add(std::span<const std::uint8_t> bytes) {
    while (!bytes.empty()) {
        const std::size_t size = std::min(bytes.size(), kLargestPiece);
        // NOLINTNEXTLINE(*-const-cast): the library has no const
        m_stream->next_in = const_cast<std::uint8_t*>(bytes.data());
        m_stream->avail_in = static_cast<std::uint32_t>(size);
        compress();
        bytes = bytes.subspan(size);
    }
}

std::span<const std::uint8_t> ZlibStream::finish() {
    m_stream->end_of_stream = 1;
    compress();
    return {m_out.get(), m_size};
}

/// Until the library asks for no more room.
void ZlibStream::compress() {
    do {
        if (m_size == m_capacity)
            makeRoom();
        const auto room = static_cast<std::uint32_t>(std::min(m_capacity - m_size, kLargestPiece));
        m_stream->next_out = m_out.get() + m_size;
        m_stream->avail_out = room;
        m_library.isal_deflate(m_stream.get());
        m_size += room - m_stream->avail_out;
    } while (m_stream->avail_out == 0 && m_stream->internal_state.state != ZSTATE_END);
}

void ZlibStream::makeRoom() {
    const std::size_t capacity = std::max(2 * m_capacity, kFirstCapacity);
    auto larger = std::make_unique_for_overwrite<std::uint8_t[]>(capacity);
    std::copy(m_out.get(), m_out.get() + m_size, larger.get());
    m_out = std::move(larger);
    m_capacity = capacity;
}

}  // namespace parvel
