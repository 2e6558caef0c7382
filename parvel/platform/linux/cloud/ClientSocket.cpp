#include "parvel/platform/linux/cloud/ClientSocket.h"

#include <poll.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cstring>

#include "parvel/platform/linux/SystemCall.h"
#include "parvel/platform/linux/cloud/ListenerOwner.h"

namespace parvel::host {

namespace {

/// Whole milliseconds until the deadline, rounded up, so that nobody polls on without waiting.
int millisecondsUntil(Deadline deadline) {
    using std::chrono::milliseconds;
    const auto left = std::chrono::ceil<milliseconds>(deadline - std::chrono::steady_clock::now());
    return static_cast<int>(std::clamp<milliseconds::rep>(left.count(), 0, 600'000));
}

bool isOwnUsers(int socket) {
    ucred peer{};
    socklen_t length = sizeof peer;
    return ::getsockopt(socket, SOL_SOCKET, SO_PEERCRED, &peer, &length) == 0 &&
           peer.uid == ::geteuid();
}

}  // namespace

SocketOutcome ClientSocket::wait(short events, Deadline deadline) const {
    for (;;) {
        pollfd polled{m_socket.get(), events, 0};
        const int ready = ::poll(&polled, 1, millisecondsUntil(deadline));
        if (ready > 0)
            return SocketOutcome::Done;
        if (ready == 0)
            return SocketOutcome::TimedOut;
        if (errno != EINTR)
            return SocketOutcome::Gone;
    }
}

SocketOutcome ClientSocket::connect(int family, const sockaddr* address, socklen_t length,
                                    Deadline deadline) {
    m_socket = FileDescriptor(::socket(family, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
    if (!m_socket)
        return SocketOutcome::Gone;
    if (::connect(m_socket.get(), address, length) == 0)
        return SocketOutcome::Done;
    // A listener whose queue is full: it takes no connections in.
    if (errno == EAGAIN)
        return SocketOutcome::TimedOut;
    if (errno != EINPROGRESS && errno != EINTR)
        return SocketOutcome::Gone;
    if (const SocketOutcome waited = wait(POLLOUT, deadline); waited != SocketOutcome::Done)
        return waited;
    int error = 0;
    socklen_t size = sizeof error;
    const bool isAsked = ::getsockopt(m_socket.get(), SOL_SOCKET, SO_ERROR, &error, &size) == 0;
    return isAsked && error == 0 ? SocketOutcome::Done : SocketOutcome::Gone;
}

SocketOutcome ClientSocket::connectToPath(const std::string& path, Deadline deadline) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    if (path.empty() || path.size() >= sizeof address.sun_path)
        return SocketOutcome::Gone;
    std::memcpy(address.sun_path, path.data(), path.size());
    const SocketOutcome outcome =
        connect(AF_UNIX, reinterpret_cast<const sockaddr*>(&address), sizeof address, deadline);
    if (outcome == SocketOutcome::Done && !isOwnUsers(m_socket.get()))
        return SocketOutcome::Gone;
    return outcome;
}

SocketOutcome ClientSocket::connectToAddress(const sockaddr_storage& address, socklen_t length,
                                             Deadline deadline) {
    const SocketOutcome outcome =
        connect(address.ss_family, reinterpret_cast<const sockaddr*>(&address), length, deadline);
    if (outcome == SocketOutcome::Done && !isListenerTrusted(address))
        return SocketOutcome::Gone;
    return outcome;
}

SocketOutcome ClientSocket::send(std::string_view bytes, Deadline deadline) {
    while (!bytes.empty()) {
        const ssize_t sent = retried(
            [&] { return ::send(m_socket.get(), bytes.data(), bytes.size(), MSG_NOSIGNAL); });
        if (sent >= 0) {
            bytes.remove_prefix(static_cast<std::size_t>(sent));
            continue;
        }
        if (errno != EAGAIN)
            return SocketOutcome::Gone;
        if (const SocketOutcome waited = wait(POLLOUT, deadline); waited != SocketOutcome::Done)
            return waited;
    }
    return SocketOutcome::Done;
}

SocketOutcome ClientSocket::readSome(Deadline deadline) {
    if (const SocketOutcome waited = wait(POLLIN, deadline); waited != SocketOutcome::Done)
        return waited;
    std::array<char, 16384> buffer;
    const ssize_t received =
        retried([&] { return ::recv(m_socket.get(), buffer.data(), buffer.size(), 0); });
    if (received < 0 && errno == EAGAIN)
        return SocketOutcome::Done;
    if (received <= 0)
        return SocketOutcome::Gone;
    m_received.append(buffer.data(), static_cast<std::size_t>(received));
    return SocketOutcome::Done;
}

SocketOutcome ClientSocket::readLine(std::string& line, std::size_t limit, Deadline deadline) {
    for (std::size_t searched = 0;;) {
        // A peer that never stops sending is not listened to beyond the deadline either.
        if (std::chrono::steady_clock::now() >= deadline)
            return SocketOutcome::TimedOut;
        const std::size_t end = m_received.find('\n', searched);
        if (std::min(end, m_received.size()) > limit)
            return SocketOutcome::TooLong;
        if (end != std::string::npos) {
            line.assign(m_received, 0, end);
            m_received.erase(0, end + 1);
            return SocketOutcome::Done;
        }
        searched = m_received.size();
        if (const SocketOutcome read = readSome(deadline); read != SocketOutcome::Done)
            return read;
    }
}

SocketOutcome ClientSocket::readToEnd(std::string& bytes, std::size_t limit, Deadline deadline) {
    while (m_received.size() <= limit) {
        if (std::chrono::steady_clock::now() >= deadline)
            return SocketOutcome::TimedOut;
        const SocketOutcome read = readSome(deadline);
        if (read == SocketOutcome::Gone) {
            bytes = std::exchange(m_received, {});
            return SocketOutcome::Done;
        }
        if (read != SocketOutcome::Done)
            return read;
    }
    return SocketOutcome::TooLong;
}

}  // namespace parvel::host
