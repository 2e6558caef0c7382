#pragma once

#include <unistd.h>

#include <cerrno>

#include <utility>

namespace parvel::host {

/// Owns one file descriptor; negative for none.
class FileDescriptor {
public:
    FileDescriptor() = default;
    explicit FileDescriptor(int descriptor) : m_descriptor(descriptor) {}
    FileDescriptor(FileDescriptor&& other) noexcept
        : m_descriptor(std::exchange(other.m_descriptor, -1)) {}
    FileDescriptor& operator=(FileDescriptor&& other) noexcept {
        std::swap(m_descriptor, other.m_descriptor);
        return *this;
    }
    ~FileDescriptor() {
        if (m_descriptor >= 0)
            ::close(m_descriptor);
    }

    [[nodiscard]] int get() const { return m_descriptor; }
    [[nodiscard]] bool isOpen() const { return m_descriptor >= 0; }
    explicit operator bool() const { return isOpen(); }
    /// Gives the descriptor away.
    [[nodiscard]] int release() { return std::exchange(m_descriptor, -1); }
    /// Closes now; 0, or the errno value: a write may fail as late as here.
    [[nodiscard]] int close() {
        const int descriptor = release();
        return descriptor >= 0 && ::close(descriptor) != 0 ? errno : 0;
    }

private:
    int m_descriptor = -1;
};

}  // namespace parvel::host
