#pragma once

#include <array>
#include <string>

#include "tests/support/EnvironmentValue.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {

/// Two Syncthing daemons that keep one folder in step over the loopback interface, with homes,
/// ports and folders of their own; they end when this goes. What the library asks is asked of the
/// second, and the first sends at most 200 KiB a second.
class SyncthingPair {
public:
    /// When the daemons look for what has changed in their own folders.
    enum class Scans { Always, OnDemand };

    /// Whether the program is installed.
    static bool isInstalled();

    explicit SyncthingPair(Scans scans = Scans::Always);
    ~SyncthingPair();
    SyncthingPair(const SyncthingPair&) = delete;
    SyncthingPair& operator=(const SyncthingPair&) = delete;

    /// False where they do not come up and find each other in time.
    [[nodiscard]] bool isConnected() const { return m_isConnected; }
    [[nodiscard]] const TemporaryDirectory& folder() const { return m_folder; }
    /// Has the first look through its folder now; whether it has.
    [[nodiscard]] bool scanFirst() const;

private:
    void configure(std::size_t which, Scans scans);
    void start(std::size_t which);
    [[nodiscard]] bool waitUntilConnected() const;

    TemporaryDirectory m_folder;  ///< holds "first", "second" and the daemons' homes
    std::array<std::string, 2> m_names{"first", "second"};
    std::array<std::string, 2> m_devices;
    std::array<int, 2> m_ports{};
    std::array<int, 2> m_guiPorts{};
    std::array<int, 2> m_processes{-1, -1};
    EnvironmentValue m_state{"XDG_STATE_HOME", m_folder / "none"};
    EnvironmentValue m_config{"XDG_CONFIG_HOME", m_folder / "home/second"};
    bool m_isConnected = false;
};

}  // namespace parvel::testing
