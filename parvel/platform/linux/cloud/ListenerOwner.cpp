// The kernel's tables of sockets, /proc/net/tcp and tcp6, have a line each, listeners first:
//   0: 0100007F:20C0 00000000:0000 0A 00000000:00000000 00:00000000 00000000  1000  0 21753 …
// with a number, the local address and port, the remote ones, the state (0A listens), queues,
// timers, and the user.

#include "parvel/platform/linux/cloud/ListenerOwner.h"

#include <fcntl.h>
#include <netinet/in.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <charconv>
#include <cstring>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "parvel/platform/linux/FileDescriptor.h"
#include "parvel/platform/linux/SystemCall.h"

namespace parvel::host {

namespace {

/// Where a listener of a table may stand to get a connection, as written: at the address itself,
/// which goes before, or at every one.
struct Places {
    std::string exact;
    std::string everywhere;
};

std::string hexadecimal(std::uint32_t number, std::size_t digits) {
    constexpr std::string_view names = "0123456789ABCDEF";
    std::string text(digits, '0');
    for (auto digit = text.rbegin(); digit != text.rend(); ++digit, number >>= 4)
        *digit = names[number & 15];
    return text;
}

/// Of an address of version 6.
using Words = std::array<std::uint32_t, 4>;

/// An address's words as the tables have them, each in the order of this machine.
std::string written(const Words& words) {
    std::string text;
    for (const std::uint32_t word : words)
        text += hexadecimal(word, 8);
    return text;
}

struct Tables {
    std::optional<Places> tcp;
    Places tcp6;
};

Tables placesOf(const sockaddr_storage& address) {
    constexpr Words everywhere6{};
    if (address.ss_family == AF_INET) {
        sockaddr_in to{};
        std::memcpy(&to, &address, sizeof to);
        const std::uint32_t host = to.sin_addr.s_addr;
        const std::string port = ":" + hexadecimal(ntohs(to.sin_port), 4);
        return {Places{hexadecimal(host, 8) + port, hexadecimal(INADDR_ANY, 8) + port},
                {written({0, 0, htonl(0xFFFF), host}) + port, written(everywhere6) + port}};
    }
    sockaddr_in6 to{};
    std::memcpy(&to, &address, sizeof to);
    Words host{};
    std::memcpy(host.data(), &to.sin6_addr, sizeof to.sin6_addr);
    const std::string port = ":" + hexadecimal(ntohs(to.sin6_port), 4);
    return {std::nullopt, {written(host) + port, written(everywhere6) + port}};
}

/// Takes the next word off the line.
std::string_view nextWord(std::string_view& line) {
    line.remove_prefix(std::min(line.find_first_not_of(' '), line.size()));
    const std::string_view word = line.substr(0, line.find(' '));
    line.remove_prefix(word.size());
    return word;
}

/// Whether a user who listens is this one, or the system's own, who can read what is sent anyway.
bool isTrustedUser(std::string_view digits) {
    uid_t user = 0;
    const char* const end = digits.data() + digits.size();
    const auto read = std::from_chars(digits.data(), end, user);
    return read.ec == std::errc() && read.ptr == end && (user == ::geteuid() || user == 0);
}

/// What the listeners of the tables say of the places.
struct Found {
    std::optional<bool> isExactTrusted;
    bool isOwn = false;
    bool isForeign = false;
};

/// False where nothing more is to be learnt from the table: the listeners end, or one is exact.
bool readLine(std::string_view line, const Places& places, Found& found) {
    constexpr std::string_view listening = "0A";
    nextWord(line);
    const std::string_view local = nextWord(line);
    nextWord(line);
    if (nextWord(line) != listening)
        return false;
    if (local != places.exact && local != places.everywhere)
        return true;
    for (int skipped = 0; skipped < 3; ++skipped)
        nextWord(line);
    const bool isTrusted = isTrustedUser(nextWord(line));
    if (local == places.exact)
        found.isExactTrusted = isTrusted;
    else
        (isTrusted ? found.isOwn : found.isForeign) = true;
    return local != places.exact;
}

void readTable(const char* path, const Places& places, Found& found) {
    const FileDescriptor table(retried([&] { return ::open(path, O_RDONLY | O_CLOEXEC); }));
    std::string text;
    // As long as a padded line: to fill a larger one, the kernel looks through all sockets.
    std::array<char, 150> buffer;
    for (bool isTitle = true; table;) {
        const ssize_t length =
            retried([&] { return ::read(table.get(), buffer.data(), buffer.size()); });
        if (length <= 0)
            return;
        text.append(buffer.data(), static_cast<std::size_t>(length));
        for (std::size_t end; (end = text.find('\n')) != text.npos; text.erase(0, end + 1)) {
            const std::string_view line = std::string_view(text).substr(0, end);
            if (!std::exchange(isTitle, false) && !readLine(line, places, found))
                return;
        }
    }
}

}  // namespace

bool isListenerTrusted(const sockaddr_storage& address) {
    const Tables places = placesOf(address);
    Found found;
    if (places.tcp)
        readTable("/proc/net/tcp", *places.tcp, found);
    if (!found.isExactTrusted)
        readTable("/proc/net/tcp6", places.tcp6, found);
    return found.isExactTrusted.value_or(found.isOwn && !found.isForeign);
}

}  // namespace parvel::host
