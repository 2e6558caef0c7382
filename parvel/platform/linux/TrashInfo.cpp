#include "parvel/platform/linux/TrashInfo.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <time.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <climits>

#include "parvel/foundation/URL.h"
#include "parvel/platform/linux/FileDescriptor.h"

namespace parvel::host {

namespace {

/// A path of the longest name, escaped byte by byte, and as much again.
constexpr std::size_t kLongestInfo = 8 * PATH_MAX;

constexpr std::string_view kHeader = "[Trash Info]";
constexpr std::string_view kPathKey = "Path=";
constexpr std::string_view kDateKey = "DeletionDate=";
/// Other programs pass over keys that they don't know.
constexpr std::string_view kOwnLine = "X-ParvelFoundation=1";

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

/// The value of a hexadecimal digit; -1 for any other character.
int digitValue(char digit) {
    if (digit >= '0' && digit <= '9')
        return digit - '0';
    const char lower = static_cast<char>(digit | 0x20);
    return lower >= 'a' && lower <= 'f' ? lower - 'a' + 10 : -1;
}

/// What is no escape stays as it is: not every program escapes as it should.
std::string decodedPath(std::string_view text) {
    std::string path;
    for (std::size_t at = 0; at < text.size(); ++at) {
        const bool isEscape = text[at] == '%' && at + 2 < text.size();
        const int high = isEscape ? digitValue(text[at + 1]) : -1;
        const int low = isEscape ? digitValue(text[at + 2]) : -1;
        if (high < 0 || low < 0) {
            path += text[at];
            continue;
        }
        path += static_cast<char>(high * 16 + low);
        at += 2;
    }
    return path;
}

std::string localTime() {
    const time_t now = ::time(nullptr);
    tm local{};
    ::localtime_r(&now, &local);
    std::array<char, 32> text{};
    const std::size_t length = ::strftime(text.data(), text.size(), "%Y-%m-%dT%H:%M:%S", &local);
    return {text.data(), length};
}

/// The text of a small regular file; none for anything else.
std::optional<std::string> smallText(const std::string& path) {
    const FileDescriptor file(::open(path.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
    struct stat status {};
    if (!file || ::fstat(file.get(), &status) != 0 || !S_ISREG(status.st_mode))
        return std::nullopt;
    std::string text(kLongestInfo + 1, '\0');
    const ssize_t length = ::read(file.get(), text.data(), text.size());
    if (length < 0 || static_cast<std::size_t>(length) > kLongestInfo)
        return std::nullopt;
    text.resize(static_cast<std::size_t>(length));
    return text;
}

/// The absolute path that an info file's Path stands for. A volume's own lie on that volume: one
/// that was prepared elsewhere names nothing outside it.
std::optional<std::string> originalPath(const std::string& path, const TrashFolder& trash) {
    if (path.empty() || path.find('\0') != std::string::npos)
        return std::nullopt;
    if (trash.topDirectory.empty())
        return path.starts_with('/') ? std::optional(path) : std::nullopt;
    if (path.starts_with('/') || ("/" + path + "/").find("/../") != std::string::npos)
        return std::nullopt;
    return pathAppending(trash.topDirectory, path);
}

std::string_view cutLine(std::string_view& text) {
    const std::string_view line = text.substr(0, text.find('\n'));
    text.remove_prefix(std::min(line.size() + 1, text.size()));
    return line;
}

}  // namespace

int writeTrashInfo(const std::string& file, const TrashFolder& trash, std::string_view absolute) {
    if (!trash.topDirectory.empty())
        absolute.remove_prefix(trash.topDirectory == "/" ? 1 : trash.topDirectory.size() + 1);
    std::string text(kHeader);
    text.append("\n").append(kPathKey).append(percentEncoded(absolute));
    text.append("\n").append(kDateKey).append(localTime());
    text.append("\n").append(kOwnLine).append("\n");

    FileDescriptor info(
        ::open(file.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600));
    if (!info)
        return errno;
    const ssize_t written = ::write(info.get(), text.data(), text.size());
    int error = written == static_cast<ssize_t>(text.size()) ? 0 : written < 0 ? errno : ENOSPC;
    if (error == 0 && ::fsync(info.get()) != 0 && errno != EINVAL)
        error = errno;
    const int closeError = info.close();
    if (error == 0)
        error = closeError;
    if (error != 0)
        ::unlink(file.c_str());
    return error;
}

std::optional<TrashInfo> readTrashInfo(const std::string& file, const TrashFolder& trash) {
    const std::optional<std::string> text = smallText(file);
    std::string_view rest = text ? std::string_view(*text) : std::string_view();
    if (cutLine(rest) != kHeader)
        return std::nullopt;
    std::string path;
    TrashInfo info;
    while (!rest.empty()) {
        const std::string_view line = cutLine(rest);
        // The first of several counts.
        if (line.starts_with(kPathKey) && path.empty())
            path = decodedPath(line.substr(kPathKey.size()));
        else if (line.starts_with(kDateKey) && info.deletionDate.empty())
            info.deletionDate = line.substr(kDateKey.size());
        else if (line == kOwnLine)
            info.isOurs = true;
    }
    const auto original = originalPath(path, trash);
    if (!original)
        return std::nullopt;
    info.original = *original;
    return info;
}

}  // namespace parvel::host
