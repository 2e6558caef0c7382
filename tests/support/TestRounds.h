#pragma once

#include <cstddef>
#include <cstdlib>

namespace parvel::testing {

/// How often a repeating test goes round: PARVEL_TEST_ROUNDS where that is set, else as usual.
inline std::size_t testRounds(std::size_t usual) {
    const char* rounds = std::getenv("PARVEL_TEST_ROUNDS");
    const std::size_t wanted = rounds ? std::strtoul(rounds, nullptr, 10) : 0;
    return wanted > 0 ? wanted : usual;
}

}  // namespace parvel::testing
