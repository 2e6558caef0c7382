#pragma once

#include <filesystem>
#include <fstream>
#include <set>
#include <string>

#include <signal.h>
#include <unistd.h>

namespace parvel::testing {

/// The helper processes that this process holds, by their process descriptors.
inline std::set<pid_t> helperProcesses() {
    std::set<pid_t> processes;
    for (const auto& entry : std::filesystem::directory_iterator("/proc/self/fdinfo")) {
        std::ifstream file(entry.path());
        for (std::string word; file >> word;) {
            pid_t process = 0;
            if (word == "Pid:" && file >> process && process > 0)
                processes.insert(process);
        }
    }
    return processes;
}

/// Kills them, and waits until they are gone from the sockets.
inline void killHelperProcesses() {
    for (const pid_t process : helperProcesses()) {
        ::kill(process, SIGKILL);
        const std::string status = "/proc/" + std::to_string(process) + "/stat";
        for (int i = 0; i < 1000; ++i) {
            std::ifstream file(status);
            const std::string text{std::istreambuf_iterator<char>(file), {}};
            if (text.empty() || text.find(") Z ") != std::string::npos)
                break;
            ::usleep(1000);
        }
    }
}

/// What this process has open.
inline std::set<std::string> openDescriptors() {
    std::set<std::string> names;
    for (const auto& entry : std::filesystem::directory_iterator("/proc/self/fd")) {
        std::error_code error;
        const std::string target = std::filesystem::read_symlink(entry.path(), error).string();
        if (!error)
            names.insert(entry.path().filename().string());
    }
    return names;
}

}  // namespace parvel::testing
