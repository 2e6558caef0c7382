#include "tests/support/SyncthingPair.h"

#include <fcntl.h>
#include <netinet/in.h>
#include <signal.h>
#include <spawn.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <vector>

#include "tests/support/TemporaryDirectory.h"
#include "tests/support/Waiting.h"

namespace parvel::testing {

namespace {

int freePort() {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    socklen_t length = sizeof address;
    const int socket = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    ::bind(socket, reinterpret_cast<sockaddr*>(&address), length);
    ::getsockname(socket, reinterpret_cast<sockaddr*>(&address), &length);
    ::close(socket);
    return ntohs(address.sin_port);
}

/// Starts the program with its output in a file; its process, which ends with this one.
int startProgram(std::vector<std::string> arguments, const std::string& output) {
    arguments.insert(arguments.begin(), {"setpriv", "--pdeathsig", "KILL", "syncthing"});
    std::vector<char*> pointers;
    for (std::string& argument : arguments)
        pointers.push_back(argument.data());
    pointers.push_back(nullptr);
    // The process that does the work, without the one that would start it again.
    std::vector<std::string> variables{"STMONITORED=yes", "STNOUPGRADE=1", "HOME=/nonexistent",
                                       "PATH=/usr/bin:/bin"};
    std::vector<char*> environment;
    for (std::string& variable : variables)
        environment.push_back(variable.data());
    environment.push_back(nullptr);

    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, 1, output.c_str(), O_WRONLY | O_CREAT | O_TRUNC,
                                     0600);
    posix_spawn_file_actions_adddup2(&actions, 1, 2);
    pid_t process = -1;
    const int failure =
        ::posix_spawnp(&process, "setpriv", &actions, nullptr, pointers.data(), environment.data());
    posix_spawn_file_actions_destroy(&actions);
    return failure == 0 ? process : -1;
}

void waitFor(int process) {
    if (process > 0)
        ::waitpid(process, nullptr, 0);
}

/// The reply of a daemon's REST interface to a method with a resource; empty where there is none.
std::string restReply(int port, const std::string& request) {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    address.sin_port = htons(static_cast<std::uint16_t>(port));
    const int socket = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    std::string reply;
    if (::connect(socket, reinterpret_cast<sockaddr*>(&address), sizeof address) == 0) {
        const timeval wait{10, 0};
        ::setsockopt(socket, SOL_SOCKET, SO_RCVTIMEO, &wait, sizeof wait);
        const std::string whole =
            request + " HTTP/1.0\r\nHost: localhost\r\nX-API-Key: secret\r\n\r\n";
        ::send(socket, whole.data(), whole.size(), MSG_NOSIGNAL);
        char buffer[4096];
        for (ssize_t length; (length = ::recv(socket, buffer, sizeof buffer, 0)) > 0;)
            reply.append(buffer, static_cast<std::size_t>(length));
    }
    ::close(socket);
    return reply;
}

}  // namespace

bool SyncthingPair::isInstalled() {
    return ::access("/usr/bin/syncthing", X_OK) == 0;
}

SyncthingPair::SyncthingPair(Scans scans) {
    for (std::size_t which : {0, 1}) {
        const std::string home = m_folder / ("home/" + m_names[which] + "/syncthing");
        waitFor(startProgram({"generate", "--home=" + home, "--no-default-folder"},
                             m_folder / "generate.log"));
        const std::string output = m_folder / (m_names[which] + ".id");
        waitFor(startProgram({"serve", "--home=" + home, "--device-id"}, output));
        m_devices[which] = m_folder.read(m_names[which] + ".id");
        while (!m_devices[which].empty() && m_devices[which].back() == '\n')
            m_devices[which].pop_back();
        m_ports[which] = freePort();
        m_guiPorts[which] = freePort();
    }
    for (std::size_t which : {0, 1})
        configure(which, scans);
    for (std::size_t which : {0, 1})
        start(which);
    m_isConnected = waitUntilConnected();
}

SyncthingPair::~SyncthingPair() {
    for (const int process : m_processes)
        if (process > 0)
            ::kill(process, SIGKILL);
    for (const int process : m_processes)
        waitFor(process);
}

bool SyncthingPair::scanFirst() const {
    return restReply(m_guiPorts[0], "POST /rest/db/scan?folder=books").find(" 200 ") !=
           std::string::npos;
}

void SyncthingPair::configure(std::size_t which, Scans scans) {
    const bool isAlways = scans == Scans::Always;
    const std::size_t other = 1 - which;
    const auto device = [this](std::size_t of) { return "<device id=\"" + m_devices[of] + "\""; };
    const auto address = [](int port) { return "tcp://127.0.0.1:" + std::to_string(port); };
    m_folder.write(m_names[which] + "/.stfolder/keep", "");
    m_folder.write(
        "home/" + m_names[which] + "/syncthing/config.xml",
        "<configuration version=\"36\"><folder id=\"books\" path=\"" + (m_folder / m_names[which]) +
            "\" type=\"sendreceive\" fsWatcherDelayS=\"1\" " +
            (isAlways ? "rescanIntervalS=\"1\" fsWatcherEnabled=\"true\">"
                      : "rescanIntervalS=\"0\" fsWatcherEnabled=\"false\">") +
            device(which) + "/>" + device(other) + "/></folder>" + device(which) +
            "><address>dynamic</address></device>" + device(other) + "><address>" +
            // Only one calls the other: where both do at once, both hang up and wait.
            (which == 0 ? "dynamic" : address(m_ports[other])) +
            "</address></device><gui enabled=\"true\" tls=\"false\"><address>127.0.0.1:" +
            std::to_string(m_guiPorts[which]) +
            "</address><apikey>secret</apikey></gui><options><listenAddress>" +
            address(m_ports[which]) +
            "</listenAddress><globalAnnounceEnabled>false</globalAnnounceEnabled>"
            "<localAnnounceEnabled>false</localAnnounceEnabled><relaysEnabled>false</relaysEnabled>"
            "<natEnabled>false</natEnabled><startBrowser>false</startBrowser>"
            "<urAccepted>-1</urAccepted><autoUpgradeIntervalH>0</autoUpgradeIntervalH>"
            "<crashReportingEnabled>false</crashReportingEnabled>"
            "<reconnectionIntervalS>1</reconnectionIntervalS>"
            "<stunKeepaliveStartS>0</stunKeepaliveStartS>"
            "<limitBandwidthInLan>true</limitBandwidthInLan>" +
            (which == 0 ? "<maxSendKbps>200</maxSendKbps>" : "") + "</options></configuration>");
}

void SyncthingPair::start(std::size_t which) {
    m_processes[which] =
        startProgram({"serve", "--home=" + (m_folder / ("home/" + m_names[which] + "/syncthing")),
                      "--no-browser"},
                     m_folder / (m_names[which] + ".log"));
}

bool SyncthingPair::waitUntilConnected() const {
    return comesTrue([this] {
        return restReply(m_guiPorts[1], "GET /rest/system/connections")
                   .find("\"connected\": true") != std::string::npos;
    });
}

}  // namespace parvel::testing
