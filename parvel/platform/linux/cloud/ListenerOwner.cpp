// The kernel's tables of sockets, /proc/net/tcp and tcp6, have a line each, listeners first:
//   0: 0100007F:20C0 00000000:0000 0A 00000000:00000000 00:00000000 00000000  1000  0 21753 …
// with a number, the local address and port, the remote ones, the state (0A listens), queues,
// timers, and the user.

#include "parvel/platform/linux/cloud/ListenerOwner.h"

#include <netinet/in.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <charconv>
#include <cstring>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "parvel/platform/linux/FileDescriptor.h"
#include "parvel/platform/linux/OpenFolder.h"
#include "parvel/platform/linux/SystemCall.h"

namespace parvel::host {

namespace {

/// Where a listener of a table may stand to get a connection: addresses with ports, as written.
using Places = std::vector<std::string>;

std::string hexadecimal(std::uint32_t number, std::size_t digits) {
    constexpr std::string_view names = "0123456789ABCDEF";
    std::string text(digits, '0');
    for (auto digit = text.rbegin(); digit != text.rend(); ++digit, number >>= 4)
        *digit = names[number & 15];
    return text;
}

/// An address's words as the tables have them, each in the order of this machine.
template <std::size_t size>
std::string written(const std::array<std::uint32_t, size>& words) {
    std::string text;
    for (const std::uint32_t word : words)
        text += hexadecimal(word, 8);
    return text;
}

struct Tables {
    Places tcp;
    Places tcp6;
};

Tables placesOf(const sockaddr_storage& address) {
    constexpr std::array<std::uint32_t, 4> everywhere6{};
    if (address.ss_family == AF_INET) {
        sockaddr_in to{};
        std::memcpy(&to, &address, sizeof to);
        const std::uint32_t host = to.sin_addr.s_addr;
        const std::string port = ":" + hexadecimal(ntohs(to.sin_port), 4);
        return {{hexadecimal(host, 8) + port, hexadecimal(INADDR_ANY, 8) + port},
                {written<4>({0, 0, htonl(0xFFFF), host}) + port, written(everywhere6) + port}};
    }
    sockaddr_in6 to{};
    std::memcpy(&to, &address, sizeof to);
    std::array<std::uint32_t, 4> host{};
    std::memcpy(host.data(), &to.sin6_addr, sizeof to.sin6_addr);
    const std::string port = ":" + hexadecimal(ntohs(to.sin6_port), 4);
    return {{}, {written(host) + port, written(everywhere6) + port}};
}

/// Takes the next word off the line.
std::string_view nextWord(std::string_view& line) {
    line.remove_prefix(std::min(line.find_first_not_of(' '), line.size()));
    const std::string_view word = line.substr(0, line.find(' '));
    line.remove_prefix(word.size());
    return word;
}

/// What the listeners of a table say of the places.
struct Found {
    bool isOwn = false;
    bool isForeign = false;
};

/// False at the end of the listeners.
bool readLine(std::string_view line, const Places& places, Found& found) {
    constexpr std::string_view listening = "0A";
    nextWord(line);
    const std::string_view local = nextWord(line);
    nextWord(line);
    if (nextWord(line) != listening)
        return false;
    if (std::find(places.begin(), places.end(), local) == places.end())
        return true;
    for (int skipped = 0; skipped < 3; ++skipped)
        nextWord(line);
    const std::string_view digits = nextWord(line);
    uid_t user = 0;
    const bool isRead =
        std::from_chars(digits.data(), digits.data() + digits.size(), user).ec == std::errc();
    // The system's own user can read whatever is sent in any case.
    const bool isTrusted = isRead && (user == ::geteuid() || user == 0);
    (isTrusted ? found.isOwn : found.isForeign) = true;
    return true;
}

void readTable(const char* path, const Places& places, Found& found) {
    const FileDescriptor table(retried([&] { return ::open(path, O_RDONLY | O_CLOEXEC); }));
    std::string text;
    std::array<char, 16384> buffer;
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
    readTable("/proc/net/tcp", places.tcp, found);
    readTable("/proc/net/tcp6", places.tcp6, found);
    return found.isOwn && !found.isForeign;
}

}  // namespace parvel::host
