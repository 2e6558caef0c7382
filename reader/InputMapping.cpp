#include "reader/InputMapping.h"

#include <sys/mman.h>
#include <sys/stat.h>

#include "parvel/platform/linux/ReaderProtocol.h"

namespace parvel::reader {

InputMapping::InputMapping(int descriptor) {
    struct stat status;
    if (::fstat(descriptor, &status) != 0 || status.st_size <= 0 ||
        static_cast<std::uint64_t>(status.st_size) > longestDocument)
        return;
    const auto size = static_cast<std::size_t>(status.st_size);
    void* bytes = ::mmap(nullptr, size, PROT_READ, MAP_PRIVATE, descriptor, 0);
    if (bytes != MAP_FAILED)
        m_bytes = {static_cast<std::uint8_t*>(bytes), size};
}

InputMapping::~InputMapping() {
    if (!m_bytes.empty())
        ::munmap(m_bytes.data(), m_bytes.size());
}

}  // namespace parvel::reader
