#include "parvel/platform/FileReader.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <cstring>
#include <string>

#include "parvel/platform/HeldItem.h"
#include "parvel/platform/linux/FileDescriptor.h"
#include "parvel/platform/linux/OpenBeneath.h"
#include "parvel/platform/linux/OpenItem.h"
#include "parvel/platform/linux/SystemCall.h"

namespace parvel {

namespace {

/// Where the size says nothing (files of /proc say 0), the first piece that is read.
constexpr std::uint64_t firstPiece = 4096;

/// A buffer that grows with what is read; one byte more than the file is known to have shows
/// whether it has grown.
struct ReadBuffer {
    std::unique_ptr<std::uint8_t[]> bytes;
    std::size_t size = 0;
    std::size_t capacity = 0;

    void grow(std::size_t wanted) {
        auto larger = std::make_unique_for_overwrite<std::uint8_t[]>(wanted);
        if (size > 0)
            std::memcpy(larger.get(), bytes.get(), size);
        bytes = std::move(larger);
        capacity = wanted;
    }
};

/// Reads a regular file to the end. 0, or the errno value; EBADMSG when there is more than the
/// limit.
int readToEnd(int descriptor, std::uint64_t expected, std::uint64_t limit, ReadBuffer& buffer) {
    buffer.grow(std::max(expected, std::min(firstPiece, limit)) + 1);
    for (;;) {
        const std::size_t room = buffer.capacity - buffer.size;
        const ssize_t count = host::retried(
            [&] { return ::read(descriptor, buffer.bytes.get() + buffer.size, room); });
        if (count < 0)
            return errno;
        if (count == 0)
            return 0;
        buffer.size += static_cast<std::size_t>(count);
        if (buffer.size > limit)
            return EBADMSG;
        // A short read that ends where the file is known to end needs no second one.
        if (buffer.size == expected && static_cast<std::size_t>(count) < room)
            return 0;
        if (buffer.size == buffer.capacity)
            buffer.grow(std::min<std::uint64_t>(buffer.size, limit - buffer.size) + buffer.size +
                        1);
    }
}

/// Reads a regular file whole. `errnoValue` says why there is none: EISDIR for a folder, EBADMSG
/// for anything else that is no regular file and for one over the limit.
std::optional<Data> readOpenFile(int descriptor, std::uint64_t limit, int& errnoValue) {
    struct stat status;
    if (::fstat(descriptor, &status) != 0) {
        errnoValue = errno;
        return std::nullopt;
    }
    const auto size = static_cast<std::uint64_t>(status.st_size);
    if (!S_ISREG(status.st_mode) || size > limit) {
        errnoValue = S_ISDIR(status.st_mode) ? EISDIR : EBADMSG;
        return std::nullopt;
    }
    ReadBuffer buffer;
    errnoValue = readToEnd(descriptor, size, limit, buffer);
    if (errnoValue != 0)
        return std::nullopt;
    return Data::adopt(std::move(buffer.bytes), buffer.size);
}

/// A socket, or a device that is not there, can't even be opened; it is no regular file either.
int fileErrno(int errnoValue) {
    return errnoValue == ENXIO || errnoValue == ENODEV ? EBADMSG : errnoValue;
}

/// In a package a link, a path that leaves it and a folder are no readable files.
int memberErrno(int errnoValue) {
    if (errnoValue == ELOOP || errnoValue == EXDEV || errnoValue == EISDIR)
        return EBADMSG;
    return fileErrno(errnoValue);
}

/// The folder whose members are read, as it is held, or opened for one read.
class PackageFolder {
public:
    explicit PackageFolder(const std::string& path) : m_held(HeldItem::at(path)) {
        if (!m_held)
            m_opened = host::FileDescriptor(host::retried(
                [&] { return ::open(path.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC); }));
    }

    [[nodiscard]] bool isOpen() const { return m_held || m_opened; }
    [[nodiscard]] int get() const { return (m_held ? m_held->descriptor : m_opened).get(); }

private:
    const std::shared_ptr<const host::OpenItem>& m_held;
    host::FileDescriptor m_opened;
};

class HostFileReader final : public FileReader {
public:
    std::optional<Data> readFile(const URL& url, std::uint64_t limit, ErrorOut error) override {
        if (!url.isFileURL())
            return fail(error, makeServiceError(ENOENT, url));
        const host::FileDescriptor file(host::retried([&] {
            return ::open(url.path().c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY);
        }));
        int errnoValue = errno;
        std::optional<Data> data =
            file ? readOpenFile(file.get(), limit, errnoValue) : std::nullopt;
        if (!data)
            return fail(error, makeServiceError(fileErrno(errnoValue), url));
        return data;
    }

    std::optional<Data> readMember(const URL& package, std::string_view path, std::uint64_t limit,
                                   ErrorOut error) override {
        int errnoValue = 0;
        std::optional<Data> data = readMemberOf(package, path, limit, errnoValue);
        if (!data)
            return fail(error, makeServiceError(errnoValue, package.appendingPathComponent(path)));
        return data;
    }

private:
    static std::optional<Data> readMemberOf(const URL& package, std::string_view path,
                                            std::uint64_t limit, int& errnoValue) {
        errnoValue = ENOENT;
        if (!package.isFileURL())
            return std::nullopt;
        const PackageFolder folder(package.path());
        errnoValue = errno;
        if (!folder.isOpen())
            return std::nullopt;

        if (path.starts_with('/'))
            path.remove_prefix(1);
        errnoValue = EBADMSG;
        if (path.empty() || path.find('\0') != std::string_view::npos)
            return std::nullopt;
        const host::FileDescriptor member = host::openBeneath(
            folder.get(), std::string(path).c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY);
        errnoValue = errno;
        std::optional<Data> data =
            member ? readOpenFile(member.get(), limit, errnoValue) : std::nullopt;
        errnoValue = memberErrno(errnoValue);
        return data;
    }
};

}  // namespace

FileReader& FileReader::host() {
    static HostFileReader reader;
    return reader;
}

}  // namespace parvel
