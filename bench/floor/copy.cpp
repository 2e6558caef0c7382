// The least that a copy costs which is written through to the disk: copy LIST INTO has the kernel
// share each file's blocks, or find room for it and copy it in large pieces, then its extended
// attributes, and syncs it.

#include <fcntl.h>
#include <linux/fs.h>
#include <sys/ioctl.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <cstring>

#include "bench/Runner.h"

namespace {

constexpr std::size_t kPieceSize = 16 << 20;

void copyAttributes(int from, int to) {
    char names[1024];
    char value[1024];
    const ssize_t length = flistxattr(from, names, sizeof names);
    for (ssize_t at = 0; at < length; at += static_cast<ssize_t>(std::strlen(names + at)) + 1) {
        const ssize_t size = fgetxattr(from, names + at, value, sizeof value);
        if (size >= 0)
            static_cast<void>(!fsetxattr(to, names + at, value, static_cast<std::size_t>(size), 0));
    }
}

ssize_t copyContent(int from, int to, off_t size) {
    static_cast<void>(fallocate(to, FALLOC_FL_KEEP_SIZE, 0, size));
    ssize_t copied = 0;
    ssize_t total = 0;
    while ((copied = copy_file_range(from, nullptr, to, nullptr, kPieceSize, 0)) > 0)
        total += copied;
    return total;
}

bool copyFile(const std::string& source, const std::string& target) {
    const int from = open(source.c_str(), O_RDONLY | O_CLOEXEC);
    const int to = open(target.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0600);
    struct stat status {};
    if (from < 0 || to < 0 || fstat(from, &status) != 0)
        return false;
    const ssize_t total =
        ioctl(to, FICLONE, from) == 0 ? status.st_size : copyContent(from, to, status.st_size);
    copyAttributes(from, to);
    const bool isWritten = fsync(to) == 0;
    close(from);
    return close(to) == 0 && isWritten && total == status.st_size;
}

}  // namespace

int main(int argumentCount, char** argumentWords) {
    const auto arguments = parvel::bench::argumentsOf(argumentCount, argumentWords);
    return parvel::bench::runInto(arguments,
                                  [](const std::string& path, const std::string& folder) {
                                      return copyFile(path, folder + "/copy");
                                  });
}
