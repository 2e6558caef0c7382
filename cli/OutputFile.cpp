#include "cli/OutputFile.h"

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <optional>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "cli/Output.h"
#include "cli/Result.h"
#include "parvel/platform/StagingDirectory.h"

namespace parvel::cli {
namespace {

/// 0 for success, else errno.
int errnoOf(int result) {
    return result < 0 ? errno : 0;
}

int writeInPlace(const std::string& path, std::string_view bytes) {
    const int descriptor = open(path.c_str(), O_WRONLY | O_CLOEXEC);
    if (descriptor < 0)
        return errno;
    const int written = writeAll(descriptor, bytes);
    const int closed = errnoOf(close(descriptor));
    return written != 0 ? written : closed;
}

std::string resolved(const std::string& path) {
    const std::unique_ptr<char, decltype(&std::free)> real(realpath(path.c_str(), nullptr),
                                                           std::free);
    return real ? real.get() : path;
}

/// Fills a new file, whole on the disk when that succeeds.
int fill(int descriptor, std::string_view bytes, std::optional<mode_t> mode) {
    int failure = mode ? errnoOf(fchmod(descriptor, *mode)) : 0;
    if (failure == 0)
        failure = writeAll(descriptor, bytes);
    if (failure == 0)
        failure = errnoOf(fsync(descriptor));
    const int closed = errnoOf(close(descriptor));
    return failure != 0 ? failure : closed;
}

/// Of an error that no folder to stage in could be made.
int errnoOf(const Error& error) {
    return error.domain() == PVPOSIXErrorDomain ? static_cast<int>(error.code()) : ENOENT;
}

int replace(const std::string& path, std::string_view bytes, std::optional<mode_t> mode) {
    const URL target = urlOfPath(path);
    std::optional<Error> error;
    const auto staging = StagingDirectory::makeIn(target.deletingLastPathComponent(), &error);
    if (!staging)
        return errnoOf(*error);
    const std::string staged = staging->url().appendingPathComponent("output").path();
    const int descriptor =
        open(staged.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0666);
    if (descriptor < 0)
        return errno;
    const int failure = fill(descriptor, bytes, mode);
    return failure != 0 ? failure : errnoOf(std::rename(staged.c_str(), path.c_str()));
}

}  // namespace

int writeFile(const std::string& path, std::string_view bytes) {
    struct stat status {};
    if (stat(path.c_str(), &status) != 0)
        return replace(path, bytes, std::nullopt);
    if (!S_ISREG(status.st_mode))
        return writeInPlace(path, bytes);
    return replace(resolved(path), bytes, status.st_mode & 07777);
}

}  // namespace parvel::cli
