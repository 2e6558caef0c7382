#include "parvel/platform/linux/Trash.h"

#include <fcntl.h>
#include <pwd.h>
#include <sys/stat.h>
#include <time.h>

#include <array>
#include <cerrno>
#include <climits>
#include <cstdlib>
#include <memory>
#include <optional>
#include <string_view>

#include "parvel/foundation/URL.h"
#include "parvel/platform/linux/FileDescriptor.h"
#include "parvel/platform/linux/ItemMoves.h"
#include "parvel/platform/linux/ItemTree.h"
#include "parvel/platform/linux/Paths.h"

namespace parvel::host {

namespace {

constexpr int kMaximumCollisions = 100000;

/// One trash folder, and the folder that its info files' paths are relative to (empty: absolute).
struct TrashFolder {
    std::string path;
    std::string topDirectory;
};

/// Which mount and file system something lies on.
struct Place {
    std::uint64_t mount;
    std::uint32_t major;
    std::uint32_t minor;
    friend bool operator==(const Place&, const Place&) = default;
};

std::optional<Place> placeOf(const std::string& path) {
    struct statx status {};
    if (::statx(AT_FDCWD, path.c_str(), AT_SYMLINK_NOFOLLOW, STATX_MNT_ID, &status) != 0)
        return std::nullopt;
    return Place{status.stx_mnt_id, status.stx_dev_major, status.stx_dev_minor};
}

std::string homeDirectory() {
    if (const char* home = std::getenv("HOME"); home && *home)
        return home;
    std::array<char, 4096> buffer{};
    passwd entry{};
    passwd* found = nullptr;
    ::getpwuid_r(::geteuid(), &entry, buffer.data(), buffer.size(), &found);
    return found && found->pw_dir ? found->pw_dir : "/";
}

std::string homeTrash() {
    // An empty or relative value counts as none (XDG Base Directory specification).
    const char* data = std::getenv("XDG_DATA_HOME");
    const std::string base =
        data && *data == '/' ? data : pathAppending(homeDirectory(), ".local/share");
    return pathAppending(base, "Trash");
}

int makeFolders(const std::string& path) {
    if (::mkdir(path.c_str(), 0700) == 0 || errno == EEXIST)
        return 0;
    if (errno != ENOENT)
        return errno;
    if (const int error = makeFolders(std::string(pathWithoutLastComponent(path))))
        return error;
    return ::mkdir(path.c_str(), 0700) == 0 || errno == EEXIST ? 0 : errno;
}

int makeTrash(const std::string& trash) {
    if (const int error = makeFolders(pathAppending(trash, "files")))
        return error;
    return makeFolders(pathAppending(trash, "info"));
}

bool isOwnRealFolder(const std::string& path) {
    struct stat status {};
    return ::lstat(path.c_str(), &status) == 0 && S_ISDIR(status.st_mode) &&
           status.st_uid == ::geteuid();
}

/// The topmost folder of the mount that the item lies on.
std::string topDirectoryOf(const std::string& parent, const Place& place) {
    std::string top = parent;
    while (top != "/") {
        std::string above = parentFolderOf(top);
        if (placeOf(above) != place)
            break;
        top = std::move(above);
    }
    return top;
}

/// The volume's own trash: the administrator's `.Trash/$uid` where that is safe, else
/// `.Trash-$uid`.
std::optional<TrashFolder> volumeTrash(const std::string& topDirectory) {
    const std::string number = std::to_string(::geteuid());
    const std::string shared = pathAppending(topDirectory, ".Trash");
    struct stat status {};
    const bool isSafe = ::lstat(shared.c_str(), &status) == 0 && S_ISDIR(status.st_mode) &&
                        (status.st_mode & S_ISVTX) != 0;
    for (const std::string& path : {isSafe ? pathAppending(shared, number) : std::string(),
                                    pathAppending(topDirectory, ".Trash-" + number)}) {
        if (path.empty() || (::mkdir(path.c_str(), 0700) != 0 && errno != EEXIST))
            continue;
        // Nothing is made in it before it is known to be no link to somewhere else.
        if (isOwnRealFolder(path) && makeTrash(path) == 0)
            return TrashFolder{path, topDirectory};
    }
    return std::nullopt;
}

/// As the info file's Path wants it: escaped as in a URI, slashes kept (RFC 2396, 2).
std::string percentEncoded(std::string_view path) {
    static constexpr std::string_view kept =
        "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789-_.!~*'()/";
    static constexpr std::string_view digits = "0123456789ABCDEF";
    std::string text;
    for (const char byte : path) {
        if (kept.find(byte) != std::string_view::npos) {
            text += byte;
            continue;
        }
        text += '%';
        text += digits[static_cast<unsigned char>(byte) >> 4];
        text += digits[static_cast<unsigned char>(byte) & 15];
    }
    return text;
}

std::string localTime() {
    const time_t now = ::time(nullptr);
    tm local{};
    ::localtime_r(&now, &local);
    std::array<char, 32> text{};
    const std::size_t length = ::strftime(text.data(), text.size(), "%Y-%m-%dT%H:%M:%S", &local);
    return {text.data(), length};
}

int writeInfo(const std::string& path, const std::string& originalPath) {
    FileDescriptor file(
        ::open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600));
    if (!file)
        return errno;
    const std::string text =
        "[Trash Info]\nPath=" + originalPath + "\nDeletionDate=" + localTime() + "\n";
    const ssize_t written = ::write(file.get(), text.data(), text.size());
    int error = written == static_cast<ssize_t>(text.size()) ? 0 : written < 0 ? errno : ENOSPC;
    if (error == 0 && ::fsync(file.get()) != 0 && errno != EINVAL)
        error = errno;
    const int closeError = file.close();
    if (error == 0)
        error = closeError;
    if (error != 0)
        ::unlink(path.c_str());
    return error;
}

/// "Guide.pdf", "Guide.2.pdf", "Guide.3.pdf", … cut so that the info file's name fits too.
std::string candidateName(std::string_view name, int attempt) {
    constexpr std::size_t infoSuffix = sizeof(".trashinfo") - 1;
    const std::string_view extension = extensionOfPath(name);
    std::string tail = attempt == 1 ? "" : "." + std::to_string(attempt);
    std::string stem(name);
    if (!extension.empty() && extension.size() + 1 < name.size()) {
        stem = name.substr(0, name.size() - extension.size() - 1);
        tail += "." + std::string(extension);
    }
    if (stem.size() + tail.size() + infoSuffix > NAME_MAX && tail.size() + infoSuffix < NAME_MAX) {
        std::size_t room = NAME_MAX - tail.size() - infoSuffix;
        while (room > 1 && (static_cast<unsigned char>(stem[room]) & 0xC0) == 0x80)
            --room;
        stem.resize(room);
    }
    return stem + tail;
}

std::string infoFileFor(const std::string& trash, const std::string& name) {
    return pathAppending(pathAppending(trash, "info"), name + ".trashinfo");
}

int moveInto(const TrashFolder& trash, const std::string& item, const std::string& absolute,
             std::string& resulting) {
    const std::string name(lastComponentOfPath(item));
    std::string_view original = absolute;
    if (!trash.topDirectory.empty())
        original.remove_prefix(trash.topDirectory == "/" ? 1 : trash.topDirectory.size() + 1);
    const std::string originalPath = percentEncoded(original);

    for (int attempt = 1; attempt < kMaximumCollisions; ++attempt) {
        const std::string candidate = candidateName(name, attempt);
        const std::string info = infoFileFor(trash.path, candidate);
        int error = writeInfo(info, originalPath);
        if (error == EEXIST)
            continue;
        if (error != 0)
            return error;
        resulting = pathAppending(pathAppending(trash.path, "files"), candidate);
        error = syncFolder(pathAppending(trash.path, "info"));
        if (error == 0)
            error = moveExclusively(item, resulting);
        if (error == 0)
            return 0;
        ::unlink(info.c_str());
        if (error != EEXIST)
            return error;
    }
    return EEXIST;
}

/// The item's path with its folder's links resolved: what the info file names.
std::optional<std::string> resolvedPath(const std::string& item) {
    const std::string parent = parentFolderOf(item);
    const std::unique_ptr<char, void (*)(void*)> real(::realpath(parent.c_str(), nullptr),
                                                      &std::free);
    if (!real)
        return std::nullopt;
    return pathAppending(real.get(), lastComponentOfPath(item));
}

/// The trash folder whose "files" folder is the item's; none elsewhere.
std::optional<std::string> trashHolding(const std::string& item) {
    const std::string_view files = pathWithoutLastComponent(item);
    if (lastComponentOfPath(files) != "files")
        return std::nullopt;
    const std::string trash(pathWithoutLastComponent(files));
    const std::string info = infoFileFor(trash, std::string(lastComponentOfPath(item)));
    struct stat status {};
    if (::lstat(info.c_str(), &status) != 0 || !S_ISREG(status.st_mode))
        return std::nullopt;
    return trash;
}

}  // namespace

int trashItem(const std::string& item, std::string& resulting) {
    struct stat status {};
    if (::lstat(item.c_str(), &status) != 0)
        return errno;
    const auto absolute = resolvedPath(item);
    if (!absolute)
        return errno;
    const auto place = placeOf(*absolute);
    if (!place)
        return errno;

    const TrashFolder home{homeTrash(), ""};
    const int homeError = makeTrash(home.path);
    const bool isAtHome = homeError == 0 && placeOf(home.path) == place;
    if (!isAtHome) {
        // An item may be the top of its own mount; then only a copy can trash it.
        const std::string folder = parentFolderOf(*absolute);
        if (placeOf(folder) == place) {
            const auto trash = volumeTrash(topDirectoryOf(folder, *place));
            if (trash && moveInto(*trash, item, *absolute, resulting) == 0)
                return 0;
        }
    }
    return homeError != 0 ? homeError : moveInto(home, item, *absolute, resulting);
}

bool isRenameWithinTrash(const std::string& source, const std::string& destination) {
    return pathWithoutLastComponent(source) == pathWithoutLastComponent(destination) &&
           trashHolding(source).has_value();
}

int renameWithinTrash(const std::string& source, const std::string& destination) {
    const auto trash = trashHolding(source);
    if (!trash)
        return moveExclusively(source, destination);
    const std::string oldInfo = infoFileFor(*trash, std::string(lastComponentOfPath(source)));
    const std::string newInfo = infoFileFor(*trash, std::string(lastComponentOfPath(destination)));
    if (const int error = renameExclusively(oldInfo, newInfo))
        return error;
    const int error = moveExclusively(source, destination);
    if (error != 0)
        (void)renameExclusively(newInfo, oldInfo);
    return error;
}

}  // namespace parvel::host
