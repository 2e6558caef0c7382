#pragma once

#include <cstddef>
#include <functional>
#include <optional>
#include <string>
#include <vector>

namespace parvel::testing {

/// A kind of host whose file systems can do less: renames that refuse a taken name or exchange two,
/// and hard links.
struct HostAbilities {
    bool renameFlags = true;
    bool hardLinks = true;
};

/// What happens at one of a run's system calls, counted from 0.
struct Trap {
    enum class Act { None, Fail, Kill };
    Act act = Act::None;
    std::size_t call = 0;
    int errnoValue = 0;
};

/// How a run ended: with the operation's own answer, or without one, killed or crashed.
struct TrappedRun {
    std::optional<bool> result;
    bool wasKilled = false;
    std::vector<const char*> calls;  ///< those on files, in order
};

/// Runs an operation in a child process, an ordinary user's where this one is root's, and holds
/// every system call on files that it makes until the trap has decided on it.
[[nodiscard]] TrappedRun runTrapped(const Trap& trap, HostAbilities abilities,
                                    const std::function<bool()>& operation);

/// The same on such a host, with nothing held and nothing counted.
[[nodiscard]] std::optional<bool> runFreely(HostAbilities abilities,
                                            const std::function<bool()>& operation);

/// Why no run can be trapped here; none where it can.
[[nodiscard]] std::optional<std::string> whyNoTraps();

/// Gives what stands at a path to the user that the children run as.
void giveToChildren(const std::string& path);

}  // namespace parvel::testing
