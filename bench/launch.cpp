// Runs a command with no output and prints what it and everything that it leaves behind took: CPU
// microseconds, wall microseconds, peak kilobytes. Its own status is the command's, 128 and the
// signal's number for one that a signal ended.

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>

namespace {

constexpr int kEndedBySignal = 128;

long long microseconds(const timeval& time) {
    return time.tv_sec * 1'000'000LL + time.tv_usec;
}

[[noreturn]] void become(char** command) {
    const int nothing = open("/dev/null", O_RDWR);
    for (const int descriptor : {0, 1, 2})
        dup2(nothing, descriptor);
    execvp(command[0], command);
    _exit(127);
}

}  // namespace

int main(int argumentCount, char** arguments) {
    if (argumentCount < 2)
        return 2;
    // A helper that outlives its parent is waited for here.
    prctl(PR_SET_CHILD_SUBREAPER, 1, 0, 0, 0);
    using Clock = std::chrono::steady_clock;
    const Clock::time_point begin = Clock::now();
    const pid_t started = fork();
    if (started == 0)
        become(arguments + 1);
    long long processor = 0;
    long peak = 0;
    Clock::time_point end = begin;
    int result = 0;
    for (;;) {
        int status = 0;
        rusage usage{};
        const pid_t ended = wait4(-1, &status, __WALL, &usage);
        if (ended < 0)
            break;
        if (ended == started) {
            end = Clock::now();
            result = WIFEXITED(status) ? WEXITSTATUS(status) : kEndedBySignal + WTERMSIG(status);
        }
        processor += microseconds(usage.ru_utime) + microseconds(usage.ru_stime);
        peak = std::max(peak, usage.ru_maxrss);
    }
    const auto wall = std::chrono::duration_cast<std::chrono::microseconds>(end - begin).count();
    std::printf("%lld %lld %ld\n", processor, static_cast<long long>(wall), peak);
    return result;
}
