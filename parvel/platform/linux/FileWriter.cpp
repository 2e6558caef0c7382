#include "parvel/platform/FileWriter.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstdio>
#include <string>

#include "parvel/platform/linux/FileDescriptor.h"
#include "parvel/platform/linux/ItemInheritance.h"
#include "parvel/platform/linux/ItemTree.h"
#include "parvel/platform/linux/Paths.h"
#include "parvel/platform/linux/StagingFolder.h"
#include "parvel/platform/linux/SystemCall.h"

namespace parvel {

namespace {

int writeAll(int file, Data::Bytes bytes) {
    while (!bytes.empty()) {
        const ssize_t written =
            host::retried([&] { return ::write(file, bytes.data(), bytes.size()); });
        if (written < 0)
            return errno;
        bytes = bytes.subspan(static_cast<std::size_t>(written));
    }
    return 0;
}

/// A new file with the bytes, closed and on the disk.
int makeFile(const std::string& path, const Data& bytes) {
    host::FileDescriptor file(
        ::open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0666));
    if (!file)
        return errno;
    for (const Data::Bytes range : bytes.ranges()) {
        if (const int error = writeAll(file.get(), range))
            return error;
    }
    if (::fsync(file.get()) != 0 && errno != EINVAL && errno != ENOSYS)
        return errno;
    return file.close();
}

/// Puts what the file that goes has on the one that comes. A link has nothing.
int inheritFrom(const std::string& oldFile, const std::string& newFile) {
    struct stat status {};
    if (::lstat(oldFile.c_str(), &status) != 0)
        return errno == ENOENT ? 0 : errno;
    if (!S_ISREG(status.st_mode))
        return 0;
    if (const int error = host::inheritMetadata(oldFile, newFile))
        return error;
    return host::syncItem(newFile);
}

int replaceFile(const std::string& path, const Data& bytes) {
    const std::string folder = host::parentFolderOf(path);
    int error = 0;
    const auto staging = host::StagingFolder::makeIn(folder, error);
    if (!staging)
        return error;
    const std::string staged = pathAppending(staging->path(), "file");
    if ((error = makeFile(staged, bytes)) != 0)
        return error;
    if ((error = inheritFrom(path, staged)) != 0)
        return error;
    if (::rename(staged.c_str(), path.c_str()) != 0)
        return errno;
    return host::syncFolder(folder);
}

class HostFileWriter final : public FileWriter {
public:
    bool writeFile(const URL& url, const Data& bytes, ErrorOut error) override {
        const int failure = url.isFileURL() ? replaceFile(url.path(), bytes) : ENOENT;
        return failure == 0 || fail(error, makeServiceError(failure, url));
    }
};

}  // namespace

FileWriter& FileWriter::host() {
    static HostFileWriter writer;
    return writer;
}

}  // namespace parvel
