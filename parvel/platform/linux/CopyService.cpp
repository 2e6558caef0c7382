// The copy is made under its own name, exclusively, and stays as far as it came. Its data goes to
// the disk while it is copied, so the sync at the end is short.

#include "parvel/platform/CopyService.h"

#include <fcntl.h>
#include <sys/stat.h>

#include "parvel/platform/linux/FileDescriptor.h"
#include "parvel/platform/linux/ItemContent.h"
#include "parvel/platform/linux/ItemTree.h"
#include "parvel/platform/linux/Paths.h"
#include "parvel/platform/linux/SystemCall.h"
#include "parvel/platform/linux/WriteBehind.h"

namespace parvel {

namespace {

/// One copy. Its steps give 0 or the errno value.
class CopyRun {
public:
    CopyRun(std::string destination, const CopyService::StatusCallback& callback)
        : m_destination(std::move(destination)), m_callback(callback) {}

    int copyFile(int from, const struct stat& status) {
        host::FileDescriptor to(host::retried([&] {
            return ::open(m_destination.c_str(),
                          O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0666);
        }));
        if (!to)
            return errno;
        if (const int error = copyData(from, to.get(), static_cast<std::uint64_t>(status.st_size)))
            return error;
        if (const int error = copyAttributes(from, to.get()))
            return error;
        if (const int error = sync(to.get()))
            return error;
        return to.close();
    }

    /// The folder alone.
    int copyFolder(int from) {
        if (::mkdir(m_destination.c_str(), 0777) != 0)
            return errno;
        const host::FileDescriptor to(host::retried([&] {
            return ::open(m_destination.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC);
        }));
        if (!to)
            return errno;
        if (const int error = copyAttributes(from, to.get()))
            return error;
        return sync(to.get());
    }

private:
    int copyData(int from, int to, std::uint64_t size) {
        if (const int error = tell(CopyOperation::Data, CopyStage::Start))
            return error;
        host::WriteBehind disk(to);
        bool isQuit = false;
        const int error = host::copyContent(from, to, size, [&](std::uint64_t copied) {
            m_copied = copied;
            if (const int failure = disk.reached(copied))
                return failure;
            const int quit = tell(CopyOperation::Data, CopyStage::Progress);
            isQuit = quit != 0;
            return quit;
        });
        if (error != 0)
            return isQuit ? error : tellError(CopyOperation::Data, error);
        return tell(CopyOperation::Data, CopyStage::Finish);
    }

    int copyAttributes(int from, int to) {
        if (const int error = tell(CopyOperation::Attributes, CopyStage::Start))
            return error;
        if (const int error = host::copyAttributes(from, to))
            return tellError(CopyOperation::Attributes, error);
        return tell(CopyOperation::Attributes, CopyStage::Finish);
    }

    /// ECANCELED when the answer is to quit.
    int tell(CopyOperation operation, CopyStage stage) {
        return m_callback && m_callback({operation, stage, m_copied}) == CopyAnswer::Quit
                   ? ECANCELED
                   : 0;
    }

    int tellError(CopyOperation operation, int error) {
        (void)tell(operation, CopyStage::Error);
        return error;
    }

    int sync(int item) {
        if (::fsync(item) != 0 && errno != EINVAL && errno != ENOSYS)
            return errno;
        return host::syncFolder(host::parentFolderOf(m_destination));
    }

    std::string m_destination;
    const CopyService::StatusCallback& m_callback;
    std::uint64_t m_copied = 0;
};

class HostCopyService final : public CopyService {
public:
    int copy(const std::string& source, const std::string& destination,
             const StatusCallback& callback) override {
        const int error = copyItem(source, CopyRun(destination, callback));
        if (error == 0)
            return 0;
        errno = error;
        return -1;
    }

private:
    static int copyItem(const std::string& source, CopyRun run) {
        const host::FileDescriptor from(host::retried(
            [&] { return ::open(source.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY); }));
        struct stat status {};
        if (!from || ::fstat(from.get(), &status) != 0)
            return errno;
        if (S_ISDIR(status.st_mode))
            return run.copyFolder(from.get());
        return S_ISREG(status.st_mode) ? run.copyFile(from.get(), status) : EOPNOTSUPP;
    }
};

}  // namespace

CopyService& CopyService::host() {
    static HostCopyService service;
    return service;
}

}  // namespace parvel
