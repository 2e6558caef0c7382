#include "parvel/platform/linux/OpenBeneath.h"

#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/stat.h>
#include <sys/syscall.h>

#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "parvel/platform/linux/SystemCall.h"

namespace parvel::host {

namespace {

/// A rename anywhere may disturb the kernel's walk over "..", which then asks to be called again.
constexpr int kOpenAttempts = 64;

FileDescriptor refused(int errnoValue) {
    errno = errnoValue;
    return {};
}

bool isLinkAt(int directory, const char* name) {
    struct stat status;
    return ::fstatat(directory, name, &status, AT_SYMLINK_NOFOLLOW) == 0 && S_ISLNK(status.st_mode);
}

/// Opens one component that is neither "." nor "..".
FileDescriptor openComponent(int directory, const std::string& name, int flags) {
    FileDescriptor opened(
        retried([&] { return ::openat(directory, name.c_str(), flags | O_NOFOLLOW | O_CLOEXEC); }));
    if (!opened && errno == ENOTDIR)
        errno = isLinkAt(directory, name.c_str()) ? ELOOP : ENOTDIR;
    return opened;
}

/// Cuts the path at its slashes; a slash at the end counts as a component ".".
std::vector<std::string> componentsOf(std::string_view path) {
    std::vector<std::string> components;
    for (std::size_t start = 0;;) {
        const std::size_t slash = path.find('/', start);
        const std::string_view component = path.substr(start, slash - start);
        components.emplace_back(component.empty() ? "." : component);
        if (slash == std::string_view::npos)
            return components;
        start = slash + 1;
    }
}

}  // namespace

FileDescriptor openBeneath(int directory, const char* path, int flags) {
    open_how how = {};
    how.flags = static_cast<unsigned>(flags | O_CLOEXEC);
    how.resolve = RESOLVE_BENEATH | RESOLVE_NO_SYMLINKS | RESOLVE_NO_MAGICLINKS;
    for (int attempt = 0; attempt < kOpenAttempts; ++attempt) {
        FileDescriptor opened(
            static_cast<int>(::syscall(SYS_openat2, directory, path, &how, sizeof how)));
        if (opened)
            return opened;
        if (errno == ENOSYS || errno == EPERM)
            return openBeneathByComponents(directory, path, flags);
        if (errno != EAGAIN && errno != EINTR)
            return {};
    }
    return {};
}

FileDescriptor openBeneathByComponents(int directory, const char* path, int flags) {
    if (*path == '\0')
        return refused(ENOENT);
    if (*path == '/')
        return refused(EXDEV);

    // Each folder on the way stays open, so that ".." leads to where the walk came from, whatever
    // is moved meanwhile.
    std::vector<FileDescriptor> way;
    const auto here = [&] { return way.empty() ? directory : way.back().get(); };
    std::vector<std::string> components = componentsOf(path);
    const std::string last = std::move(components.back());
    components.pop_back();
    for (const std::string& component : components) {
        if (component == ".")
            continue;
        if (component == "..") {
            if (way.empty())
                return refused(EXDEV);
            way.pop_back();
            continue;
        }
        way.push_back(openComponent(here(), component, O_PATH | O_DIRECTORY));
        if (!way.back())
            return {};
    }

    if (last == ".." && way.empty())
        return refused(EXDEV);
    if (last == "..")
        way.pop_back();
    if (last == "." || last == "..")
        return FileDescriptor(retried([&] { return ::openat(here(), ".", flags | O_CLOEXEC); }));
    return openComponent(here(), last, flags);
}

}  // namespace parvel::host
