#include "parvel/platform/ResourceQueries.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <string>
#include <utility>

#include "parvel/platform/HeldItem.h"
#include "parvel/platform/linux/FileDescriptor.h"
#include "parvel/platform/linux/ItemTree.h"
#include "parvel/platform/linux/OpenItem.h"
#include "parvel/platform/linux/Paths.h"
#include "parvel/platform/linux/SystemCall.h"

namespace parvel {

namespace {

/// What st_blocks counts, whatever the file system's own blocks are.
constexpr std::uint64_t kBytesPerBlock = 512;

/// A place on disk that is held open, so that it keeps its meaning whatever is renamed.
struct HeldPlace {
    host::FileDescriptor descriptor;
    struct stat status = {};

    /// 0, or the errno value.
    int open(int directory, const char* path, int flags = 0) {
        descriptor = host::FileDescriptor(
            host::retried([&] { return ::openat(directory, path, O_PATH | O_CLOEXEC | flags); }));
        return descriptor && ::fstat(descriptor.get(), &status) == 0 ? 0 : errno;
    }
    [[nodiscard]] bool isSameAs(const HeldPlace& other) const {
        return host::isSameItem(status, other.status);
    }
};

/// The folder that holds the file which the path leads to, its links followed. 0, or the errno
/// value.
int openFolderOf(const std::string& path, HeldPlace& folder) {
    const auto file = host::canonicalPath(path);
    return file ? folder.open(AT_FDCWD, host::parentFolderOf(*file).c_str(), O_DIRECTORY) : errno;
}

/// Walks up from the place to the root. 0, or the errno value.
int findAbove(HeldPlace place, const HeldPlace& wanted, bool& found) {
    found = false;
    for (;;) {
        if (place.isSameAs(wanted)) {
            found = true;
            return 0;
        }
        HeldPlace parent;
        if (const int errnoValue = parent.open(place.descriptor.get(), "..", O_DIRECTORY))
            return errnoValue;
        if (parent.isSameAs(place))
            return 0;
        place = std::move(parent);
    }
}

std::optional<struct stat> statusOf(const URL& url, ErrorOut error) {
    if (!url.isFileURL())
        return fail(error, makeServiceError(ENOENT, url));
    if (const auto& held = HeldItem::at(url.path()))
        return held->status;
    struct stat status;
    if (host::retried([&] { return ::stat(url.path().c_str(), &status); }) != 0)
        return fail(error, makeServiceError(errno, url));
    return status;
}

class HostResourceQueries final : public ResourceQueries {
public:
    bool isReachable(const URL& url, ErrorOut error) override {
        return statusOf(url, error).has_value();
    }

    std::optional<bool> isDirectory(const URL& url, ErrorOut error) override {
        const std::optional<struct stat> status = statusOf(url, error);
        if (!status)
            return std::nullopt;
        return S_ISDIR(status->st_mode);
    }

    std::optional<std::uint64_t> totalAllocatedSize(const URL& url, ErrorOut error) override {
        const std::optional<struct stat> status = statusOf(url, error);
        if (!status)
            return std::nullopt;
        return static_cast<std::uint64_t>(status->st_blocks) * kBytesPerBlock;
    }

    std::optional<DirectoryRelationship> relationship(const URL& directory, const URL& item,
                                                      ErrorOut error) override {
        HeldPlace wanted;
        if (const int errnoValue = openAt(directory, wanted))
            return fail(error, makeServiceError(errnoValue, directory));
        HeldPlace place;
        if (const int errnoValue = openAt(item, place))
            return fail(error, makeServiceError(errnoValue, item));
        if (place.isSameAs(wanted))
            return DirectoryRelationship::Same;

        HeldPlace folder;
        bool found = false;
        int errnoValue = S_ISDIR(place.status.st_mode)
                             ? folder.open(place.descriptor.get(), "..", O_DIRECTORY)
                             : openFolderOf(item.path(), folder);
        if (errnoValue == 0)
            errnoValue = findAbove(std::move(folder), wanted, found);
        if (errnoValue != 0)
            return fail(error, makeServiceError(errnoValue, item));
        return found ? DirectoryRelationship::Contains : DirectoryRelationship::Other;
    }

private:
    static int openAt(const URL& url, HeldPlace& place) {
        return url.isFileURL() ? place.open(AT_FDCWD, url.path().c_str()) : ENOENT;
    }
};

}  // namespace

ResourceQueries& ResourceQueries::host() {
    static HostResourceQueries queries;
    return queries;
}

}  // namespace parvel
