#include "reader/Input.h"

#include <sys/mman.h>
#include <unistd.h>

#include "parvel/platform/linux/SystemCall.h"

namespace parvel::reader {

Input::Input(const Received& received) {
    const std::uint64_t size = received.request.size;
    if (mappedSize(size) > 0)
        map(received);
    else if (size > 0 && size <= longestCopied)
        copy(received);
}

Input::~Input() {
    if (!m_copy && !m_bytes.empty())
        ::munmap(const_cast<std::uint8_t*>(m_bytes.data()), m_bytes.size());
}

void Input::copy(const Received& received) {
    const auto size = static_cast<std::size_t>(received.request.size);
    m_copy = std::make_unique_for_overwrite<std::uint8_t[]>(size);
    std::size_t copied = 0;
    while (copied < size) {
        const ssize_t count = host::retried([&] {
            return ::pread(received.input.get(), m_copy.get() + copied, size - copied,
                           static_cast<off_t>(copied));
        });
        if (count <= 0)
            return;
        copied += static_cast<std::size_t>(count);
    }
    m_bytes = {m_copy.get(), size};
}

void Input::map(const Received& received) {
    const auto size = static_cast<std::size_t>(received.request.size);
    void* bytes = ::mmap(nullptr, size, PROT_READ, MAP_PRIVATE, received.input.get(), 0);
    if (bytes != MAP_FAILED)
        m_bytes = {static_cast<const std::uint8_t*>(bytes), size};
}

}  // namespace parvel::reader
