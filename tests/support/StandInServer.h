#pragma once

#include <atomic>
#include <functional>
#include <mutex>
#include <string>
#include <string_view>
#include <thread>

namespace parvel::testing {

/// One connection to a StandInServer. Every call ends when the other side closes or the server
/// stops.
class StandInConnection {
public:
    explicit StandInConnection(int socket) : m_socket(socket) {}

    /// False where there is no further line.
    bool readLine(std::string& line);
    /// False once nobody reads any more.
    bool send(std::string_view bytes);
    /// Says nothing more until the other side has gone.
    void waitForEnd();

private:
    int m_socket;
    std::string m_received;
};

/// A program that listens at a socket in the place of a sync client: it takes one connection after
/// the other, on a thread of its own, and has each served by a function. It stops when it goes.
class StandInServer {
public:
    using Serve = std::function<void(StandInConnection&)>;

    /// At a path of the file system.
    StandInServer(const std::string& path, Serve serve);
    /// At a free port of the loopback interface.
    explicit StandInServer(Serve serve);
    ~StandInServer();
    StandInServer(const StandInServer&) = delete;
    StandInServer& operator=(const StandInServer&) = delete;

    [[nodiscard]] int port() const { return m_port; }
    /// How many connections there have been.
    [[nodiscard]] int connections() const { return m_connections; }

private:
    void run(const Serve& serve);
    void setCurrent(int socket);

    int m_listener = -1;
    int m_port = 0;
    std::atomic<int> m_connections{0};
    std::mutex m_mutex;  ///< of m_current
    int m_current = -1;
    std::atomic<bool> m_stops{false};
    std::thread m_thread;
};

}  // namespace parvel::testing
