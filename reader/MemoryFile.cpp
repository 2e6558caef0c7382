#include "reader/MemoryFile.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <unistd.h>

#include <utility>

#include "parvel/platform/linux/SystemCall.h"

namespace parvel::reader {

namespace {

host::FileDescriptor emptyFile() {
    return host::FileDescriptor(::memfd_create("parvel-reader", MFD_CLOEXEC | MFD_ALLOW_SEALING));
}

bool addSeals(const host::FileDescriptor& file) {
    constexpr int seals = F_SEAL_SHRINK | F_SEAL_GROW | F_SEAL_WRITE | F_SEAL_SEAL;
    return ::fcntl(file.get(), F_ADD_SEALS, seals) == 0;
}

}  // namespace

host::FileDescriptor sealedFileOf(std::span<const std::uint8_t> bytes) {
    host::FileDescriptor file = emptyFile();
    while (file && !bytes.empty()) {
        const ssize_t count =
            host::retried([&] { return ::write(file.get(), bytes.data(), bytes.size()); });
        if (count <= 0)
            return host::FileDescriptor();
        bytes = bytes.subspan(static_cast<std::size_t>(count));
    }
    return file && addSeals(file) ? std::move(file) : host::FileDescriptor();
}

MemoryFile::MemoryFile(std::uint64_t size) : m_file(emptyFile()), m_size(size) {
    if (!m_file || ::ftruncate(m_file.get(), static_cast<off_t>(size)) != 0)
        return;
    void* bytes =
        ::mmap(nullptr, size, PROT_READ | PROT_WRITE, MAP_SHARED | MAP_POPULATE, m_file.get(), 0);
    if (bytes != MAP_FAILED)
        m_bytes = static_cast<std::uint8_t*>(bytes);
}

MemoryFile::~MemoryFile() {
    unmap();
}

host::FileDescriptor MemoryFile::seal() {
    unmap();
    return addSeals(m_file) ? std::move(m_file) : host::FileDescriptor();
}

void MemoryFile::unmap() {
    if (m_bytes)
        ::munmap(m_bytes, m_size);
    m_bytes = nullptr;
}

}  // namespace parvel::reader
