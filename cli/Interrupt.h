#pragma once

#include <functional>

namespace parvel::cli {

/// The exit status of an interrupted program.
inline constexpr int kInterruptedExit = 130;

/// From here on the first interrupt (SIGINT, SIGTERM) only asks for an end, the second one ends the
/// program at once. A signal that the caller had ignored stays ignored. A closed pipe becomes a
/// failed write instead of a signal.
void watchForInterrupts();

/// Whether an end was asked for. Any thread may ask.
[[nodiscard]] bool interrupted();

/// While it lives, the first interrupt calls the function too, on another thread; at once where it
/// has come already. One at a time.
class OnInterrupt {
public:
    explicit OnInterrupt(std::function<void()> call);
    ~OnInterrupt();
    OnInterrupt(const OnInterrupt&) = delete;
    OnInterrupt& operator=(const OnInterrupt&) = delete;
};

/// Waits until the descriptor has something to read; false when an end was asked for meanwhile.
[[nodiscard]] bool waitForInput(int descriptor);

}  // namespace parvel::cli
