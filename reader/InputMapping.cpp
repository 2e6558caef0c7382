#include "reader/InputMapping.h"

#include <sys/mman.h>

namespace parvel::reader {

InputMapping::InputMapping(const Received& received) {
    const std::uint64_t size = received.request.size;
    if (size == 0 || size > longestDocument)
        return;
    void* bytes = ::mmap(nullptr, size, PROT_READ, MAP_PRIVATE, received.input.get(), 0);
    if (bytes != MAP_FAILED)
        m_bytes = std::span(static_cast<std::uint8_t*>(bytes), size);
}

InputMapping::~InputMapping() {
    if (!m_bytes.empty())
        ::munmap(m_bytes.data(), m_bytes.size());
}

}  // namespace parvel::reader
