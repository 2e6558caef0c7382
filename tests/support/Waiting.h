#pragma once

#include <chrono>
#include <thread>

namespace parvel::testing {

/// Waits, at most a minute, until the condition holds; whether it does. For what another process
/// does in its own time.
template <class Condition>
bool comesTrue(const Condition& condition) {
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(60);
    while (!condition()) {
        if (std::chrono::steady_clock::now() > deadline)
            return false;
        std::this_thread::sleep_for(std::chrono::milliseconds(50));
    }
    return true;
}

}  // namespace parvel::testing
