// Coordination by one lock file an item, named after the item's real folder and name, in a private
// folder that no client synchronises. The lock belongs to the open file description, so threads of
// one process exclude each other too, and the kernel drops it when its holder dies. A holder that
// has moved the item leaves the new path in the lock file for whoever waits.

#include <fcntl.h>
#include <stdlib.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <filesystem>
#include <string>
#include <vector>

#include "parvel/platform/Digest.h"
#include "parvel/platform/FileCoordinator.h"
#include "parvel/platform/Service.h"
#include "parvel/platform/linux/FileDescriptor.h"
#include "parvel/platform/linux/ItemTree.h"
#include "parvel/platform/linux/Paths.h"
#include "parvel/platform/linux/SystemCall.h"

namespace parvel {

namespace {

using host::FileDescriptor;

constexpr const char* kFolderName = "parvel-coord";
constexpr std::size_t kMaximumNote = 1 << 16;

/// An item that this thread holds.
struct CoordinatedItem {
    std::string lockPath;
    int lock;
    bool hasNote;
};
thread_local std::vector<CoordinatedItem> t_coordinated;

CoordinatedItem* findCoordinated(const std::string& lockPath) {
    const auto found =
        std::find_if(t_coordinated.begin(), t_coordinated.end(),
                     [&](const CoordinatedItem& item) { return item.lockPath == lockPath; });
    return found == t_coordinated.end() ? nullptr : &*found;
}

bool isPrivateFolder(const std::string& path) {
    struct stat status {};
    return ::lstat(path.c_str(), &status) == 0 && S_ISDIR(status.st_mode) &&
           status.st_uid == ::geteuid() && (status.st_mode & 0077) == 0;
}

/// The user's folder of short-lived files: also a process that was started outside the session,
/// and so was not told of it, is to meet the others there.
std::string runtimeFolder() {
    const char* told = ::getenv("XDG_RUNTIME_DIR");
    return told && *told == '/' ? told : "/run/user/" + std::to_string(::geteuid());
}

/// The folder of lock files; empty with errno set where none is safe.
std::string lockFolder() {
    std::string path = pathAppending(runtimeFolder(), kFolderName);
    if ((::mkdir(path.c_str(), 0700) == 0 || errno == EEXIST) && isPrivateFolder(path))
        return path;
    std::error_code ignored;
    const std::string temporary = std::filesystem::temp_directory_path(ignored).string();
    path = pathAppending(temporary.empty() ? "/tmp" : temporary,
                         std::string(kFolderName) + "-" + std::to_string(::geteuid()));
    if (::mkdir(path.c_str(), 0700) != 0 && errno != EEXIST)
        return {};
    if (isPrivateFolder(path))
        return path;
    errno = EPERM;
    return {};
}

/// Empty, which is no lock file's name and fails the lock, where the host has no digest.
std::string hexSHA256(std::string_view text) {
    static constexpr std::string_view digits = "0123456789abcdef";
    const auto digest = Service<Digest>::current().sha256(Data::copyOf(text));
    std::string hex;
    for (const std::uint8_t byte : digest.value_or(Digest::SHA256{})) {
        hex += digits[byte >> 4];
        hex += digits[byte & 15];
    }
    return digest ? hex : std::string();
}

/// One name an item, by whatever links its folder is reached.
std::string lockName(const URL& url) {
    const std::string folder = host::parentFolderOf(url.path());
    return hexSHA256(
        pathAppending(host::canonicalPath(folder).value_or(folder), url.lastPathComponent()));
}

std::string readNote(int lock) {
    std::string note(kMaximumNote, '\0');
    const ssize_t length = ::pread(lock, note.data(), note.size(), 0);
    note.resize(length > 0 ? static_cast<std::size_t>(length) : 0);
    return note;
}

/// Whether the note was left; without it a waiter is handed the old place.
bool writeNote(int lock, const std::string& note) {
    return ::ftruncate(lock, 0) == 0 &&
           ::pwrite(lock, note.data(), note.size(), 0) == static_cast<ssize_t>(note.size());
}

/// Takes the lock, and tells whether somebody else had to be waited for. False with errno set on a
/// failure.
bool takeLock(int file, bool& hasWaited) {
    struct flock request {};
    request.l_type = F_WRLCK;
    request.l_whence = SEEK_SET;
    if (::fcntl(file, F_OFD_SETLK, &request) == 0)
        return true;
    if (errno != EAGAIN && errno != EACCES && errno != EINTR)
        return false;
    hasWaited = true;
    return host::retried([&] { return ::fcntl(file, F_OFD_SETLKW, &request); }) == 0;
}

/// The opened and locked lock file; closed with errno set on a failure.
FileDescriptor lockFile(const std::string& path, bool& hasWaited) {
    for (;;) {
        FileDescriptor file(::open(path.c_str(), O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, 0600));
        if (!file || !takeLock(file.get(), hasWaited))
            return {};
        struct stat locked {};
        struct stat named {};
        if (::fstat(file.get(), &locked) != 0)
            return {};
        // A lock on a file that was cleared away meanwhile guards nothing.
        if (::lstat(path.c_str(), &named) == 0 && host::isSameItem(named, locked))
            return file;
    }
}

class LinuxFileCoordinator : public FileCoordinator {
public:
    bool coordinateWriting(const URL& url, WritingIntent /*intent*/, ErrorOut error,
                           const Accessor& accessor) override {
        const std::string folder = lockFolder();
        if (folder.empty())
            return fail(error, makeServiceError(errno, url));
        const std::string path = pathAppending(folder, lockName(url));
        if (findCoordinated(path)) {
            accessor(placeToUse(url, {}));
            return true;
        }
        bool hasWaited = false;
        const FileDescriptor lock = lockFile(path, hasWaited);
        if (!lock)
            return fail(error, makeServiceError(errno, url));
        hold(path, lock.get(), url, hasWaited, accessor);
        return true;
    }

    void itemDidMove(const URL& from, const URL& to) override {
        const std::string path = pathAppending(lockFolder(), lockName(from));
        CoordinatedItem* held = findCoordinated(path);
        if (held)
            held->hasNote = writeNote(held->lock, to.standardized().path());
    }

private:
    /// Marks the item as held by this thread while the accessor runs. The lock file goes with it,
    /// unless there is a note in it.
    static void hold(const std::string& path, int lock, const URL& url, bool hasWaited,
                     const Accessor& accessor) {
        struct Holding {
            Holding(const std::string& lockPath, int descriptor, bool hasNote) {
                t_coordinated.push_back({lockPath, descriptor, hasNote});
            }
            ~Holding() {
                if (!t_coordinated.back().hasNote)
                    ::unlink(t_coordinated.back().lockPath.c_str());
                t_coordinated.pop_back();
            }
        };
        std::string note = readNote(lock);
        // Only who waited for the move means the item that was moved; whoever comes later means the
        // name that it asks for, and an item that stands there again is another one.
        const bool isMeant = hasWaited && !host::itemStandsAt(url.path());
        if (!note.empty() && !isMeant && ::ftruncate(lock, 0) == 0)
            note.clear();
        const Holding holding(path, lock, !note.empty());
        accessor(placeToUse(url, isMeant ? note : std::string()));
    }

    static std::optional<URL> placeToUse(const URL& url, const std::string& note) {
        if (host::itemStandsAt(url.path()))
            return url;
        if (!note.empty() && host::itemStandsAt(note))
            return URL::fileURLWithPath(note);
        if (!host::itemStandsAt(host::parentFolderOf(url.path())))
            return std::nullopt;
        return url;
    }
};

}  // namespace

std::shared_ptr<FileCoordinator> FileCoordinator::makeDefault() {
    return std::make_shared<LinuxFileCoordinator>();
}

}  // namespace parvel
