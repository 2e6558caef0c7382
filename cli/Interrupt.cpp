#include "cli/Interrupt.h"

#include <array>
#include <atomic>
#include <cerrno>
#include <csignal>
#include <cstdint>
#include <mutex>
#include <system_error>
#include <thread>

#include <poll.h>
#include <sys/eventfd.h>
#include <unistd.h>

namespace parvel::cli {
namespace {

std::atomic<bool> s_interrupted{false};
/// Readable from the first interrupt on, so that a thread which waits for input wakes up.
int s_wakeUp = -1;

std::mutex s_callMutex;
std::function<void()> s_call;

bool isIgnored(int signal) {
    struct sigaction action {};
    return sigaction(signal, nullptr, &action) == 0 && action.sa_handler == SIG_IGN;
}

void waitForSignals(sigset_t signals) {
    int signal = 0;
    while (sigwait(&signals, &signal) == 0) {
        if (s_interrupted.exchange(true))
            _exit(kInterruptedExit);
        const std::uint64_t one = 1;
        // A full counter would wake the thread all the same.
        (void)!write(s_wakeUp, &one, sizeof one);
        const std::lock_guard lock(s_callMutex);
        if (s_call)
            s_call();
    }
}

}  // namespace

void watchForInterrupts() {
    s_wakeUp = eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
    std::signal(SIGPIPE, SIG_IGN);
    sigset_t watched;
    sigemptyset(&watched);
    for (const int signal : {SIGINT, SIGTERM}) {
        if (!isIgnored(signal))
            sigaddset(&watched, signal);
    }
    // A thread of its own takes the signals, so that no thread's lock or wait can hold one up.
    pthread_sigmask(SIG_BLOCK, &watched, nullptr);
    try {
        std::thread(waitForSignals, watched).detach();
    } catch (const std::system_error&) {
        // The system has no more threads: an interrupt then ends the program at once.
        pthread_sigmask(SIG_UNBLOCK, &watched, nullptr);
    }
}

bool interrupted() {
    return s_interrupted.load(std::memory_order_relaxed);
}

OnInterrupt::OnInterrupt(std::function<void()> call) {
    const std::lock_guard lock(s_callMutex);
    s_call = std::move(call);
    if (interrupted())
        s_call();
}

OnInterrupt::~OnInterrupt() {
    const std::lock_guard lock(s_callMutex);
    s_call = nullptr;
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
