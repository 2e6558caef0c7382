#include "reader/Walls.h"

#include <fcntl.h>
#include <linux/landlock.h>
#include <seccomp.h>
#include <sys/mman.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <sys/time.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <memory>
#include <utility>

#include "parvel/platform/linux/FileDescriptor.h"
#include "parvel/platform/linux/ReaderProtocol.h"

namespace parvel::reader {

namespace {

/// The most that is written into one memory file: pixels of the largest image, and some room.
constexpr rlim_t longestFile = 256ULL << 20;
/// The CPU time of a helper that serves its time out, whatever it does to the limits of a request.
constexpr rlim_t lifetimeSeconds = 6500;
/// Fonts and tables that are kept, and what a request needs.
constexpr rlim_t mostDescriptors = 700;

void limit(int resource, rlim_t most) {
    const rlimit limits{most, most};
    ::setrlimit(static_cast<__rlimit_resource_t>(resource), &limits);
}

/// Rights over files that kernels have learned since, up to the number of the interface that the
/// running one has.
std::uint64_t fileRights(long interface) {
    constexpr std::uint64_t first = (1ULL << 13) - 1;
    std::uint64_t rights = first;
    if (interface >= 2)
        rights |= 1ULL << 13;  // linking and renaming across folders
    if (interface >= 3)
        rights |= 1ULL << 14;  // truncating
    if (interface >= 5)
        rights |= 1ULL << 15;  // a device's own commands
    return rights;
}

bool forbidAllFiles() {
    const long interface =
        ::syscall(SYS_landlock_create_ruleset, nullptr, 0, LANDLOCK_CREATE_RULESET_VERSION);
    if (interface < 1)
        return false;
    const std::uint64_t handled = fileRights(interface);
    const host::FileDescriptor rules(
        static_cast<int>(::syscall(SYS_landlock_create_ruleset, &handled, sizeof handled, 0)));
    return rules && ::syscall(SYS_landlock_restrict_self, rules.get(), 0) == 0;
}

using Filter = std::unique_ptr<void, decltype(&seccomp_release)>;

/// What drawing and decoding need.
constexpr std::array allowedCalls{
    SCMP_SYS(read),          SCMP_SYS(write),   SCMP_SYS(pread64),       SCMP_SYS(pwrite64),
    SCMP_SYS(lseek),         SCMP_SYS(fstat),   SCMP_SYS(close),         SCMP_SYS(ftruncate),
    SCMP_SYS(memfd_create),  SCMP_SYS(munmap),  SCMP_SYS(mremap),        SCMP_SYS(madvise),
    SCMP_SYS(brk),           SCMP_SYS(recvmsg), SCMP_SYS(sendmsg),       SCMP_SYS(futex),
    SCMP_SYS(getrandom),     SCMP_SYS(sysinfo), SCMP_SYS(clock_gettime), SCMP_SYS(gettimeofday),
    SCMP_SYS(rt_sigreturn),  SCMP_SYS(exit),    SCMP_SYS(exit_group),    SCMP_SYS(setitimer),
    SCMP_SYS(rt_sigprocmask)};

/// What asks for a path.
constexpr std::array trappedCalls{SCMP_SYS(openat), SCMP_SYS(newfstatat), SCMP_SYS(access),
                                  SCMP_SYS(faccessat)};

bool addRules(scmp_filter_ctx filter) {
    int failed = 0;
    for (const int call : allowedCalls)
        failed |= seccomp_rule_add(filter, SCMP_ACT_ALLOW, call, 0);
    for (const int call : trappedCalls)
        failed |= seccomp_rule_add(filter, SCMP_ACT_TRAP, call, 0);
    // Memory never becomes code.
    for (const int call : {SCMP_SYS(mmap), SCMP_SYS(mprotect)})
        failed |= seccomp_rule_add(filter, SCMP_ACT_ALLOW, call, 1,
                                   SCMP_A2(SCMP_CMP_MASKED_EQ, PROT_EXEC, 0));
    for (const std::uint64_t command : {F_DUPFD_CLOEXEC, F_GETFD, F_SETFD, F_GETFL, F_ADD_SEALS})
        failed |= seccomp_rule_add(filter, SCMP_ACT_ALLOW, SCMP_SYS(fcntl), 1,
                                   SCMP_A1(SCMP_CMP_EQ, command));
    // Its own address space alone, and never above the hard limit.
    failed |= seccomp_rule_add(filter, SCMP_ACT_ALLOW, SCMP_SYS(prlimit64), 2,
                               SCMP_A0(SCMP_CMP_EQ, 0), SCMP_A1(SCMP_CMP_EQ, RLIMIT_AS));
    return failed == 0;
}

bool filterSystemCalls() {
    const Filter filter(seccomp_init(SCMP_ACT_ERRNO(EPERM)), &seccomp_release);
    return filter && addRules(filter.get()) && seccomp_load(filter.get()) == 0;
}

}  // namespace

std::uint32_t raiseWalls(std::uint64_t inputBytes) {
    // A crash leaves nothing behind of the documents, and nobody else may look in.
    ::prctl(PR_SET_DUMPABLE, 0);
    ::prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0);
    limit(RLIMIT_CORE, 0);
    limit(RLIMIT_CPU, lifetimeSeconds);
    limit(RLIMIT_NOFILE, mostDescriptors);
    limit(RLIMIT_FSIZE, longestFile);
    limit(RLIMIT_AS, addressSpace + inputBytes);
    std::uint32_t walls = 0;
    if (forbidAllFiles())
        walls |= WallLandlock;
    if (filterSystemCalls())
        walls |= WallSeccomp;
    allowAddressSpace(0);
    return walls;
}

void allowAddressSpace(std::uint64_t inputBytes) {
    static const rlim_t most = [] {
        rlimit limits{};
        ::getrlimit(RLIMIT_AS, &limits);
        return limits.rlim_max;
    }();
    static rlim_t allowed = 0;
    const rlim_t wanted = std::min<rlim_t>(addressSpace + inputBytes, most);
    if (std::exchange(allowed, wanted) == wanted)
        return;
    const rlimit limits{wanted, most};
    ::setrlimit(RLIMIT_AS, &limits);
}

void limitProcessorTime(int milliseconds) {
    const itimerval timer{{}, {milliseconds / 1000, milliseconds % 1000 * 1000}};
    ::setitimer(ITIMER_PROF, &timer, nullptr);
}

int endProcessorTimeLimit() {
    const itimerval none{};
    itimerval left{};
    ::setitimer(ITIMER_PROF, &none, &left);
    return static_cast<int>(left.it_value.tv_sec * 1000 + left.it_value.tv_usec / 1000);
}

}  // namespace parvel::reader
