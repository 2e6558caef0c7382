#pragma once

#include <atomic>
#include <cerrno>
#include <cstdint>
#include <string>

#include "parvel/platform/ArchiveCopier.h"
#include "parvel/platform/linux/WriteBehind.h"

namespace parvel::host {

/// What the parts of an archive copier share: how a running copy tells what happens, and how it
/// learns that it is cancelled. A cancellation is told nobody.
class CopierReports {
public:
    CopierReports(ArchiveCopier& copier, ArchiveCopierCallbacks* callbacks,
                  const std::atomic<bool>& isCancelled)
        : m_copier(copier), m_callbacks(callbacks), m_isCancelled(isCancelled) {}

    /// ECANCELED, or 0.
    [[nodiscard]] int cancellation() const {
        return m_isCancelled.load(std::memory_order_acquire) ? ECANCELED : 0;
    }

    /// Gives back the error.
    [[nodiscard]] int fatal(int error) const {
        if (error != 0 && error != ECANCELED && m_callbacks) {
            errno = error;
            m_callbacks->fatalError(m_copier);
        }
        return error;
    }

    /// Waits until all files are on the disk. 0 or the errno value, told already.
    [[nodiscard]] int awaited(TreeBehind& files) const {
        int error = cancellation();
        while (error == 0 && !files.isEmpty()) {
            error = files.awaitOldest();
            if (error == 0)
                error = cancellation();
        }
        return fatal(error);
    }

    /// 0 when the copy is to go on without the file, else the error.
    [[nodiscard]] int failed(const std::string& path, int error) const {
        if (error == ECANCELED || !m_callbacks)
            return error;
        errno = error;
        return m_callbacks->fileError(m_copier, path, error) == kStopAfterFileError ? error : 0;
    }

    void finished(const std::string& path, ArchiveObjectType type, std::uint64_t size) const {
        if (m_callbacks)
            m_callbacks->fileFinished(m_copier, path, type, size);
    }

private:
    ArchiveCopier& m_copier;
    ArchiveCopierCallbacks* m_callbacks;
    const std::atomic<bool>& m_isCancelled;
};

}  // namespace parvel::host
