#pragma once

#include <cerrno>

namespace parvel::host {

/// Makes a system call until no signal cuts it off; gives what the call gave.
template <class Call>
auto retried(Call call) {
    for (;;) {
        const auto result = call();
        if (result != -1 || errno != EINTR)
            return result;
    }
}

}  // namespace parvel::host
