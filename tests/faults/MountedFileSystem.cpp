#include "tests/faults/MountedFileSystem.h"

#include <sched.h>
#include <stdlib.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <map>

#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

namespace fs = std::filesystem;

constexpr std::uintmax_t kImageSize = std::uintmax_t{512} << 20;  // sparse; XFS takes no less

/// From here on no mount of this process is seen by another, and none outlives it.
bool keepMountsToOurselves() {
    static const bool isDone = ::unshare(CLONE_NEWNS) == 0 &&
                               ::mount("none", "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0;
    return isDone;
}

bool succeeds(const std::string& command) {
    return ::system((command + " >/dev/null 2>&1").c_str()) == 0;
}

/// Why it is not mounted; empty where it is.
std::string mountAt(const std::string& type, const std::string& folder, const std::string& image) {
    if (::geteuid() != 0)
        return "only root can mount a file system";
    if (!keepMountsToOurselves())
        return "this machine lets no process mount a file system for itself";
    if (type == "tmpfs")
        return ::mount("none", folder.c_str(), "tmpfs", 0, "size=64m") == 0
                   ? ""
                   : "this machine mounts no tmpfs";
    if (!succeeds("command -v mkfs." + type))
        return "mkfs." + type + " is not installed";
    std::ofstream(image).close();
    fs::resize_file(image, kImageSize);
    return succeeds("mkfs." + type + " -q " + image) &&
                   succeeds("mount -t " + type + " -o loop " + image + " " + folder)
               ? ""
               : "this machine mounts no " + type + " from a loop device";
}

/// One mount, with what became of it, until the process ends.
struct Mounted {
    explicit Mounted(const std::string& type) {
        fs::create_directory(folder / "mounted");
        reason = mountAt(type, folder / "mounted", folder / "image");
        ::chmod(folder.path().c_str(), 0755);
        if (!reason.empty())
            return;
        // Nobody but root makes anything at the top, as on any mount that keeps a volume's trash
        // out.
        ::chmod((folder / "mounted").c_str(), 0755);
        fs::create_directory(folder / "mounted/tests");
        ::chmod((folder / "mounted/tests").c_str(), 01777);
    }
    ~Mounted() {
        if (reason.empty())
            ::umount2((folder / "mounted").c_str(), MNT_DETACH);
    }

    TemporaryDirectory folder;
    std::string reason;
};

}  // namespace

std::optional<std::string> mountedFileSystem(const std::string& type, std::string& reason) {
    static std::map<std::string, Mounted> mounts;
    const Mounted& mounted = mounts.try_emplace(type, type).first->second;
    reason = mounted.reason;
    return reason.empty() ? std::optional(mounted.folder / "mounted/tests") : std::nullopt;
}

}  // namespace parvel::testing
