#include "parvel/platform/ReaderProgram.h"

#include <dlfcn.h>
#include <unistd.h>

#include <filesystem>
#include <mutex>

#include "parvel/platform/linux/HelperPool.h"

namespace parvel {

namespace {

namespace fs = std::filesystem;

constexpr std::string_view programName = "parvel-reader";

std::mutex& pathGuard() {
    static std::mutex guard;
    return guard;
}

/// Where the application says that the program is; empty for nowhere.
std::string& givenPath() {
    static std::string path;
    return path;
}

/// The folder of the file that this code was loaded from.
fs::path ownFolder() {
    Dl_info info{};
    std::error_code error;
    const void* self = reinterpret_cast<const void*>(&ownFolder);
    // Of a program itself only the name that it was called by is known.
    if (::dladdr(self, &info) != 0 && info.dli_fname && info.dli_fname[0] == '/')
        return fs::canonical(info.dli_fname, error).parent_path();
    return fs::canonical("/proc/self/exe", error).parent_path();
}

/// The program of the installation, else that of the build tree.
std::string ownProgram() {
    const fs::path folder = ownFolder();
    const fs::path installed = folder / PARVEL_LIB_TO_LIBEXEC / programName;
    if (::access(installed.c_str(), X_OK) == 0)
        return installed.lexically_normal();
    return (folder / "../bin" / programName).lexically_normal();
}

}  // namespace

void setReaderProgramPath(std::string_view path) {
    host::endIdleHelper();
    const std::lock_guard lock(pathGuard());
    // The helper starts in another folder.
    std::error_code error;
    givenPath() = path.empty() ? std::string() : fs::absolute(path, error).string();
}

std::string readerProgramPath() {
    const std::lock_guard lock(pathGuard());
    return givenPath().empty() ? ownProgram() : givenPath();
}

std::optional<ReaderConfinement> readerConfinement() {
    const host::HelperLease lease;
    if (!lease.helper())
        return std::nullopt;
    const std::uint32_t walls = lease.helper()->walls();
    return ReaderConfinement{(walls & reader::WallSeccomp) != 0,
                             (walls & reader::WallLandlock) != 0};
}

}  // namespace parvel
