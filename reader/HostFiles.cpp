#include "reader/HostFiles.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <filesystem>
#include <map>
#include <string_view>

#include "reader/Channel.h"
#include "reader/TrappedCall.h"
#include "reader/Walls.h"

namespace parvel::reader {

namespace {

namespace fs = std::filesystem;

constexpr std::size_t mostFiles = 600;

/// By path. Filled before the walls go up and only read afterwards, so a signal handler may.
std::map<std::string, int, std::less<>>& hostFiles() {
    static std::map<std::string, int, std::less<>> files;
    return files;
}

/// The request that is answered when a file is missing. Set and read on the one thread there is.
const Request* volatile endingRequest = nullptr;

/// Opened by its path as if it were kept. Set and read on that thread, too.
const OfferedFile* volatile offeredFile = nullptr;

/// What code is told that asks for a path that was not kept.
long missingFile() {
    if (const Request* request = endingRequest) {
        Answer wanted;
        wanted.reply.outcome = Outcome::FontsWanted;
        wanted.reply.number = request->number;
        // The kernel rounds a timer up, so what is left may be more than was given.
        const int left = std::min(endProcessorTimeLimit(), drawingMilliseconds);
        wanted.reply.spentMilliseconds = static_cast<std::uint32_t>(drawingMilliseconds - left);
        static_cast<void>(send(wanted));
        ::_exit(0);
    }
    return -ENOENT;
}

/// Negative for none.
int keptDescriptor(std::string_view path) {
    const OfferedFile* offered = offeredFile;
    if (offered && offered->path() == path)
        return offered->descriptor();
    const auto found = hostFiles().find(path);
    return found == hostFiles().end() ? -1 : found->second;
}

/// A descriptor of its own for each open; they share the place in the file, so each begins anew.
long openKept(const char* path) {
    const int kept = keptDescriptor(path);
    if (kept < 0)
        return missingFile();
    const int descriptor = ::fcntl(kept, F_DUPFD_CLOEXEC, 0);
    if (descriptor < 0)
        return -errno;
    ::lseek(descriptor, 0, SEEK_SET);
    return descriptor;
}

/// The C library asks for a descriptor's status as that of an empty path.
long statusOf(int descriptor, const char* path, struct stat* status, int flags) {
    if ((flags & AT_EMPTY_PATH) == 0 || path[0] != '\0')
        return missingFile();
    return ::syscall(SYS_fstat, descriptor, status) == 0 ? 0 : -errno;
}

long resultOf(const TrappedCall& call) {
    switch (call.number()) {
        case SYS_openat:
            return openKept(call.pointer<const char>(1));
        case SYS_newfstatat:
            return statusOf(static_cast<int>(call.argument(0)), call.pointer<const char>(1),
                            call.pointer<struct stat>(2), static_cast<int>(call.argument(3)));
        default:
            return missingFile();
    }
}

void answerTrappedCall(int, siginfo_t* information, void* context) {
    const int savedErrno = errno;
    TrappedCall call(*information, context);
    call.setResult(resultOf(call));
    errno = savedErrno;
}

}  // namespace

void keepHostFile(const std::string& path) {
    if (hostFiles().size() >= mostFiles || hostFiles().count(path) > 0)
        return;
    host::FileDescriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY));
    struct stat status;
    if (file && ::fstat(file.get(), &status) == 0 && S_ISREG(status.st_mode))
        hostFiles().emplace(path, file.release());
}

void keepHostFolder(const std::string& path) {
    std::error_code error;
    for (fs::recursive_directory_iterator entry(path, error), end; !error && entry != end;
         entry.increment(error))
        keepHostFile(entry->path());
}

void answerTrappedCalls() {
    struct sigaction action {};
    action.sa_sigaction = answerTrappedCall;
    action.sa_flags = SA_SIGINFO | SA_NODEFER;
    ::sigaction(SIGSYS, &action, nullptr);
}

OfferedFile::OfferedFile(int descriptor)
    : m_path("/proc/self/fd/" + std::to_string(descriptor)), m_descriptor(descriptor) {
    offeredFile = this;
}

OfferedFile::~OfferedFile() {
    offeredFile = nullptr;
}

EndWhenFileIsWanted::EndWhenFileIsWanted(const Request* request) {
    endingRequest = request;
}

EndWhenFileIsWanted::~EndWhenFileIsWanted() {
    endingRequest = nullptr;
}

}  // namespace parvel::reader
