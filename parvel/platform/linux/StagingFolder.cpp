#include "parvel/platform/linux/StagingFolder.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/file.h>
#include <sys/random.h>
#include <sys/stat.h>

#include <array>
#include <memory>
#include <vector>

#include "parvel/foundation/URL.h"
#include "parvel/platform/linux/ItemTree.h"

namespace parvel::host {

namespace {

constexpr std::string_view kStagingPrefix = ".parvel-stage-";
constexpr int kStagingAttempts = 100;

/// Opens and locks the folder; closed when another holds it or it is gone.
FileDescriptor lockedFolder(const std::string& path) {
    FileDescriptor folder(::open(path.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
    if (!folder || ::flock(folder.get(), LOCK_EX | LOCK_NB) != 0)
        return {};
    struct stat mine {};
    struct stat named {};
    const bool isStillThere = ::fstat(folder.get(), &mine) == 0 &&
                              ::lstat(path.c_str(), &named) == 0 && mine.st_ino == named.st_ino &&
                              mine.st_dev == named.st_dev;
    return isStillThere ? std::move(folder) : FileDescriptor{};
}

void clearStale(const std::string& parent) {
    std::vector<std::string> stale;
    const std::unique_ptr<DIR, int (*)(DIR*)> listing(::opendir(parent.c_str()), &::closedir);
    if (!listing)
        return;
    while (const dirent* entry = ::readdir(listing.get())) {
        if (isStagingName(entry->d_name))
            stale.emplace_back(pathAppending(parent, entry->d_name));
    }
    for (const std::string& path : stale) {
        struct stat status {};
        if (::lstat(path.c_str(), &status) != 0 || status.st_uid != ::geteuid())
            continue;
        if (const FileDescriptor lock = lockedFolder(path))
            (void)removeTree(path);
    }
}

}  // namespace

std::string randomName(std::string_view prefix) {
    static constexpr std::string_view letters = "abcdefghijklmnopqrstuvwxyz234567";
    std::array<unsigned char, 12> bytes{};
    // Twelve bytes come whole; a name that is taken all the same is only tried again.
    if (::getrandom(bytes.data(), bytes.size(), 0) < 0)
        bytes.fill(static_cast<unsigned char>(::getpid()));
    std::string name(prefix);
    for (const unsigned char byte : bytes)
        name += letters[byte % letters.size()];
    return name;
}

bool isStagingName(std::string_view name) {
    return name.starts_with(kStagingPrefix);
}

std::optional<StagingFolder> StagingFolder::makeIn(const std::string& parent, int& error) {
    clearStale(parent);
    for (int attempt = 0; attempt < kStagingAttempts; ++attempt) {
        std::string path = pathAppending(parent, randomName(kStagingPrefix));
        if (::mkdir(path.c_str(), 0700) != 0) {
            if (errno == EEXIST)
                continue;
            error = errno;
            return std::nullopt;
        }
        // Another process may have cleared the folder before it was locked; then the next name.
        if (FileDescriptor folder = lockedFolder(path))
            return StagingFolder(std::move(path), std::move(folder));
        ::rmdir(path.c_str());
    }
    error = EBUSY;
    return std::nullopt;
}

StagingFolder::~StagingFolder() {
    if (m_descriptor)
        (void)removeTree(m_path);
}

}  // namespace parvel::host
