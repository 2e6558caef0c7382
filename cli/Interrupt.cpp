#include "cli/Interrupt.h"

#include <array>
#include <atomic>
#include <cerrno>
#include <csignal>
#include <cstdint>

#include <poll.h>
#include <sys/eventfd.h>
#include <unistd.h>

namespace parvel::cli {
namespace {

std::atomic<bool> s_interrupted{false};
/// Readable from the first interrupt on, so that a thread which waits for input wakes up.
int s_wakeUp = -1;

static_assert(std::atomic<bool>::is_always_lock_free, "the handler may only use lock-free data");

void onSignal(int) {
    if (s_interrupted.exchange(true))
        _exit(kInterruptedExit);
    const int savedErrno = errno;
    const std::uint64_t one = 1;
    // A full counter would wake the thread all the same.
    static_cast<void>(!write(s_wakeUp, &one, sizeof one));
    errno = savedErrno;
}

void watch(int signal) {
    struct sigaction action {};
    if (sigaction(signal, nullptr, &action) != 0 || action.sa_handler == SIG_IGN)
        return;
    action = {};
    action.sa_handler = onSignal;
    sigemptyset(&action.sa_mask);
    sigaction(signal, &action, nullptr);
}

}  // namespace

void watchForInterrupts() {
    s_wakeUp = eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
    std::signal(SIGPIPE, SIG_IGN);
    watch(SIGINT);
    watch(SIGTERM);
}

bool interrupted() {
    return s_interrupted.load(std::memory_order_relaxed);
}

bool waitForInput(int descriptor) {
    std::array<pollfd, 2> watched{pollfd{descriptor, POLLIN, 0}, pollfd{s_wakeUp, POLLIN, 0}};
    while (!interrupted()) {
        // A failed poll says nothing about the descriptor; reading it will.
        if (poll(watched.data(), watched.size(), -1) < 0 && errno != EINTR)
            return true;
        if (watched[0].revents != 0)
            return !interrupted();
    }
    return false;
}

}  // namespace parvel::cli
