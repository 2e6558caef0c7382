#pragma once

#include <dirent.h>

#include <cerrno>

#include "parvel/platform/linux/FileDescriptor.h"

namespace parvel::host {

/// The entries of an open directory, "." and ".." left out.
class DirectoryStream {
public:
    /// Takes the descriptor over; it must be open for reading.
    explicit DirectoryStream(FileDescriptor directory)
        : m_stream(directory ? ::fdopendir(directory.get()) : nullptr) {
        if (m_stream)
            (void)directory.release();
    }
    ~DirectoryStream() {
        if (m_stream)
            ::closedir(m_stream);
    }
    DirectoryStream(const DirectoryStream&) = delete;
    DirectoryStream& operator=(const DirectoryStream&) = delete;

    [[nodiscard]] bool isOpen() const { return m_stream; }
    [[nodiscard]] int descriptor() const { return ::dirfd(m_stream); }

    /// Null at the end, with errno 0, and where the rest can't be read. Valid until the next call.
    [[nodiscard]] const dirent* next() {
        for (;;) {
            errno = 0;
            const dirent* entry = ::readdir(m_stream);
            if (!entry)
                return nullptr;
            const char* name = entry->d_name;
            if (name[0] != '.' || (name[1] && (name[1] != '.' || name[2])))
                return entry;
        }
    }

private:
    DIR* m_stream;
};

}  // namespace parvel::host
