#include "reader/MemoryFile.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <unistd.h>

#include <utility>

namespace parvel::reader {

MemoryFile::MemoryFile(std::uint64_t size)
    : m_file(::memfd_create("parvel-reader", MFD_CLOEXEC | MFD_ALLOW_SEALING)), m_size(size) {
    if (!m_file || ::ftruncate(m_file.get(), static_cast<off_t>(size)) != 0)
        return;
    void* bytes = ::mmap(nullptr, size, PROT_READ | PROT_WRITE, MAP_SHARED, m_file.get(), 0);
    if (bytes != MAP_FAILED)
        m_bytes = static_cast<std::uint8_t*>(bytes);
}

MemoryFile::~MemoryFile() {
    unmap();
}

host::FileDescriptor MemoryFile::seal() {
    unmap();
    constexpr int seals = F_SEAL_SHRINK | F_SEAL_GROW | F_SEAL_WRITE | F_SEAL_SEAL;
    if (::fcntl(m_file.get(), F_ADD_SEALS, seals) != 0)
        return host::FileDescriptor();
    return std::move(m_file);
}

void MemoryFile::unmap() {
    if (m_bytes)
        ::munmap(m_bytes, m_size);
    m_bytes = nullptr;
}

}  // namespace parvel::reader
