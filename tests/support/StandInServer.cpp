#include "tests/support/StandInServer.h"

#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstring>
#include <stdexcept>

namespace parvel::testing {

bool StandInConnection::readLine(std::string& line) {
    for (;;) {
        const std::size_t end = m_received.find('\n');
        if (end != std::string::npos) {
            line = m_received.substr(0, end);
            m_received.erase(0, end + 1);
            return true;
        }
        char buffer[4096];
        const ssize_t length = ::recv(m_socket, buffer, sizeof buffer, 0);
        if (length <= 0)
            return false;
        m_received.append(buffer, static_cast<std::size_t>(length));
    }
}

bool StandInConnection::send(std::string_view bytes) {
    while (!bytes.empty()) {
        const ssize_t sent = ::send(m_socket, bytes.data(), bytes.size(), MSG_NOSIGNAL);
        if (sent <= 0)
            return false;
        bytes.remove_prefix(static_cast<std::size_t>(sent));
    }
    return true;
}

void StandInConnection::waitForEnd() {
    for (std::string line; readLine(line);) {
    }
}

StandInServer::StandInServer(const std::string& path, Serve serve) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    if (path.size() >= sizeof address.sun_path)
        throw std::runtime_error("too long a path for a socket");
    std::memcpy(address.sun_path, path.data(), path.size());
    m_listener = ::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    if (::bind(m_listener, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0 ||
        ::listen(m_listener, 16) != 0)
        throw std::runtime_error("no socket");
    m_thread = std::thread([this, serve = std::move(serve)] { run(serve); });
}

StandInServer::StandInServer(Serve serve) {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    socklen_t length = sizeof address;
    m_listener = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    if (::bind(m_listener, reinterpret_cast<const sockaddr*>(&address), length) != 0 ||
        ::listen(m_listener, 16) != 0 ||
        ::getsockname(m_listener, reinterpret_cast<sockaddr*>(&address), &length) != 0)
        throw std::runtime_error("no socket");
    m_port = ntohs(address.sin_port);
    m_thread = std::thread([this, serve = std::move(serve)] { run(serve); });
}

StandInServer::~StandInServer() {
    m_stops = true;
    ::shutdown(m_listener, SHUT_RDWR);
    {
        const std::lock_guard lock(m_mutex);
        if (m_current >= 0)
            ::shutdown(m_current, SHUT_RDWR);
    }
    m_thread.join();
    ::close(m_listener);
}

void StandInServer::setCurrent(int socket) {
    const std::lock_guard lock(m_mutex);
    m_current = socket;
}

void StandInServer::run(const Serve& serve) {
    while (!m_stops) {
        const int socket = ::accept4(m_listener, nullptr, nullptr, SOCK_CLOEXEC);
        if (socket < 0)
            return;
        ++m_connections;
        setCurrent(socket);
        if (!m_stops) {
            StandInConnection connection(socket);
            serve(connection);
        }
        setCurrent(-1);
        ::close(socket);
    }
}

}  // namespace parvel::testing
