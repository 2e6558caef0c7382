#pragma once

#include <sys/socket.h>

#include <chrono>
#include <optional>
#include <string>
#include <string_view>

#include "parvel/platform/linux/FileDescriptor.h"

namespace parvel::host {

using Deadline = std::chrono::steady_clock::time_point;

/// How a step of a conversation with another program ended.
enum class SocketOutcome {
    Done,
    Gone,      ///< nobody listens, or the other side closed
    TimedOut,  ///< the deadline passed
    TooLong,   ///< more bytes than were allowed
};

/// A stream socket to another program on this machine. No call outlasts its deadline, and no more
/// bytes are kept than its caller allows, whatever the other side does. A socket of another user
/// counts as one that nobody listens at.
class ClientSocket {
public:
    /// Connects; at a path of the file system, or at an address of the loopback interface.
    SocketOutcome connectToPath(const std::string& path, Deadline deadline);
    SocketOutcome connectToAddress(const sockaddr_storage& address, socklen_t length,
                                   Deadline deadline);

    SocketOutcome send(std::string_view bytes, Deadline deadline);
    /// The next line, without its end; at most `limit` bytes.
    SocketOutcome readLine(std::string& line, std::size_t limit, Deadline deadline);
    /// All bytes until the other side closes; at most `limit`.
    SocketOutcome readToEnd(std::string& bytes, std::size_t limit, Deadline deadline);

private:
    SocketOutcome connect(int family, const sockaddr* address, socklen_t length, Deadline deadline);
    SocketOutcome wait(short events, Deadline deadline) const;
    SocketOutcome readSome(Deadline deadline);

    FileDescriptor m_socket;
    std::string m_received;  ///< read, and not yet given out
};

}  // namespace parvel::host
