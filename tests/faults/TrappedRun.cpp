// The kernel's user notification does the work: a filter hands every call of the list to the
// parent, which lets it pass, has it fail, or kills the child before it is made.

#include "tests/faults/TrappedRun.h"

#include <linux/filter.h>
#include <linux/seccomp.h>
#include <poll.h>
#include <signal.h>
#include <sys/ioctl.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <filesystem>

#include "parvel/platform/linux/FileDescriptor.h"
#include "parvel/platform/linux/Libcrypto.h"
#include "parvel/platform/linux/Libicui18n.h"
#include "parvel/platform/linux/Libsystemd.h"
#include "parvel/platform/linux/Libzip.h"

namespace parvel::testing {
namespace {

using host::FileDescriptor;

constexpr unsigned kNobody = 65534;
constexpr int kPatience = 60'000;  // milliseconds without a call or an end
constexpr int kNoFilter = 77;      // the exit status of a child that can't be trapped

struct SystemCall {
    long number;
    const char* name;
};

constexpr SystemCall kFileCalls[] = {
    {SYS_close, "close"},
    {SYS_copy_file_range, "copy_file_range"},
    {SYS_faccessat, "faccessat"},
    {SYS_faccessat2, "faccessat2"},
    {SYS_fallocate, "fallocate"},
    {SYS_fchmod, "fchmod"},
    {SYS_fchmodat, "fchmodat"},
    {SYS_fchown, "fchown"},
    {SYS_fchownat, "fchownat"},
    {SYS_fcntl, "fcntl"},
    {SYS_fdatasync, "fdatasync"},
    {SYS_fgetxattr, "fgetxattr"},
    {SYS_flistxattr, "flistxattr"},
    {SYS_flock, "flock"},
    {SYS_fremovexattr, "fremovexattr"},
    {SYS_fsetxattr, "fsetxattr"},
    {SYS_fstat, "fstat"},
    {SYS_fstatfs, "fstatfs"},
    {SYS_fsync, "fsync"},
    {SYS_ftruncate, "ftruncate"},
    {SYS_getdents64, "getdents64"},
    {SYS_getxattr, "getxattr"},
    {SYS_lgetxattr, "lgetxattr"},
    {SYS_linkat, "linkat"},
    {SYS_listxattr, "listxattr"},
    {SYS_lseek, "lseek"},
    {SYS_mkdirat, "mkdirat"},
    {SYS_newfstatat, "newfstatat"},
    {SYS_openat, "openat"},
    {SYS_openat2, "openat2"},
    {SYS_pread64, "pread64"},
    {SYS_pwrite64, "pwrite64"},
    {SYS_read, "read"},
    {SYS_readlinkat, "readlinkat"},
    {SYS_removexattr, "removexattr"},
    {SYS_renameat, "renameat"},
    {SYS_renameat2, "renameat2"},
    {SYS_sendfile, "sendfile"},
    {SYS_setxattr, "setxattr"},
    {SYS_statfs, "statfs"},
    {SYS_statx, "statx"},
    {SYS_symlinkat, "symlinkat"},
    {SYS_syncfs, "syncfs"},
    {SYS_unlinkat, "unlinkat"},
    {SYS_utimensat, "utimensat"},
    {SYS_write, "write"},
#ifdef SYS_rename  // the older calls, which newer machines lack
    {SYS_access, "access"},
    {SYS_chmod, "chmod"},
    {SYS_link, "link"},
    {SYS_lstat, "lstat"},
    {SYS_mkdir, "mkdir"},
    {SYS_open, "open"},
    {SYS_readlink, "readlink"},
    {SYS_rename, "rename"},
    {SYS_rmdir, "rmdir"},
    {SYS_stat, "stat"},
    {SYS_symlink, "symlink"},
    {SYS_unlink, "unlink"},
#endif
};

/// Their effect shows after a power cut alone, and none is made here; they take most of the time.
bool isSync(long number) {
    return number == SYS_fsync || number == SYS_fdatasync || number == SYS_syncfs;
}

const char* nameOfCall(int number) {
    for (const SystemCall& call : kFileCalls) {
        if (call.number == number)
            return call.name;
    }
    return "unknown";
}

sock_filter statement(unsigned code, unsigned value) {
    return {static_cast<std::uint16_t>(code), 0, 0, value};
}

/// Goes on with the next statement where the loaded number is the value, else passes `skip` over.
sock_filter unlessEqual(long value, std::uint8_t skip) {
    return {BPF_JMP | BPF_JEQ | BPF_K, 0, skip, static_cast<std::uint32_t>(value)};
}

/// With `holdsCalls` every call of the list is held; without, none is, and syncs do nothing.
std::vector<sock_filter> filterFor(HostAbilities abilities, bool holdsCalls) {
    constexpr unsigned load = BPF_LD | BPF_W | BPF_ABS;
    constexpr unsigned answer = BPF_RET | BPF_K;
    const sock_filter loadNumber = statement(load, offsetof(seccomp_data, nr));
    std::vector<sock_filter> filter{loadNumber};
    if (!abilities.renameFlags) {
        const unsigned flags = offsetof(seccomp_data, args) + 4 * sizeof(std::uint64_t);
        filter.insert(filter.end(), {unlessEqual(SYS_renameat2, 4),
                                     statement(load, flags),
                                     {BPF_JMP | BPF_JEQ | BPF_K, 1, 0, 0},
                                     statement(answer, SECCOMP_RET_ERRNO | EINVAL),
                                     loadNumber});
    }
    if (!abilities.hardLinks) {
        filter.push_back(unlessEqual(SYS_linkat, 1));
        filter.push_back(statement(answer, SECCOMP_RET_ERRNO | EPERM));
    }
    for (const SystemCall& call : kFileCalls) {
        if (!holdsCalls && !isSync(call.number))
            continue;
        filter.push_back(unlessEqual(call.number, 1));
        filter.push_back(
            statement(answer, holdsCalls ? SECCOMP_RET_USER_NOTIF : SECCOMP_RET_ERRNO));
    }
    filter.push_back(statement(answer, SECCOMP_RET_ALLOW));
    return filter;
}

/// Filters this process from here on; what the kernel answers, -1 for a failure.
int filterOwnCalls(HostAbilities abilities, bool holdsCalls) {
    std::vector<sock_filter> filter = filterFor(abilities, holdsCalls);
    const sock_fprog program{static_cast<unsigned short>(filter.size()), filter.data()};
    if (::prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) != 0)
        return -1;
    const unsigned flags = holdsCalls ? SECCOMP_FILTER_FLAG_NEW_LISTENER : 0;
    return static_cast<int>(::syscall(SYS_seccomp, SECCOMP_SET_MODE_FILTER, flags, &program));
}

/// A message of one byte, with room for one descriptor.
struct DescriptorMessage {
    DescriptorMessage() {
        header.msg_iov = &bytes;
        header.msg_iovlen = 1;
        header.msg_control = control.data();
        header.msg_controllen = control.size();
    }

    char byte = 0;
    iovec bytes{&byte, 1};
    alignas(cmsghdr) std::array<char, CMSG_SPACE(sizeof(int))> control{};
    msghdr header{};
};

bool sendDescriptor(int socket, int descriptor) {
    DescriptorMessage message;
    cmsghdr* control = CMSG_FIRSTHDR(&message.header);
    control->cmsg_level = SOL_SOCKET;
    control->cmsg_type = SCM_RIGHTS;
    control->cmsg_len = CMSG_LEN(sizeof descriptor);
    std::memcpy(CMSG_DATA(control), &descriptor, sizeof descriptor);
    return ::sendmsg(socket, &message.header, 0) == 1;
}

FileDescriptor receiveDescriptor(int socket) {
    DescriptorMessage message;
    if (::recvmsg(socket, &message.header, MSG_CMSG_CLOEXEC) != 1)
        return {};
    const cmsghdr* control = CMSG_FIRSTHDR(&message.header);
    int descriptor = -1;
    if (control && control->cmsg_type == SCM_RIGHTS)
        std::memcpy(&descriptor, CMSG_DATA(control), sizeof descriptor);
    return FileDescriptor(descriptor);
}

/// Root would be refused nothing by modes; the children are refused what a user is, and make files
/// as most users do.
void becomeOrdinaryUser() {
    ::umask(022);
    if (::geteuid() == 0 && (::setresgid(kNobody, kNobody, kNobody) != 0 ||
                             ::setresuid(kNobody, kNobody, kNobody) != 0))
        ::_exit(kNoFilter);
    ::prctl(PR_SET_PDEATHSIG, SIGKILL);
}

/// Decides on the child's calls until it ends.
void decideOnCalls(int listener, int process, pid_t child, const Trap& trap, TrappedRun& run) {
    for (;;) {
        std::array<pollfd, 2> sources{{{listener, POLLIN, 0}, {process, POLLIN, 0}}};
        if (::poll(sources.data(), sources.size(), kPatience) <= 0)
            ::kill(child, SIGKILL);
        if ((sources[0].revents & POLLIN) == 0)
            return;
        seccomp_notif call{};
        if (::ioctl(listener, SECCOMP_IOCTL_NOTIF_RECV, &call) != 0)
            continue;
        const bool isTrapped = trap.act != Trap::Act::None && run.calls.size() == trap.call;
        run.calls.push_back(nameOfCall(call.data.nr));
        if (isTrapped && trap.act == Trap::Act::Kill) {
            run.wasKilled = true;
            ::kill(child, SIGKILL);
            return;
        }
        seccomp_notif_resp answer{};
        answer.id = call.id;
        if (isTrapped)
            answer.error = -trap.errnoValue;
        else if (!isSync(call.data.nr))
            answer.flags = SECCOMP_USER_NOTIF_FLAG_CONTINUE;
        (void)::ioctl(listener, SECCOMP_IOCTL_NOTIF_SEND, &answer);
    }
}

/// Loads in this process what an operation would load on its first use in each child, whose calls
/// for that would be held too.
void loadLibraries() {
    (void)host::Libcrypto::host();
    (void)host::Libicui18n::host();
    (void)host::Libsystemd::host();
    (void)host::Libzip::host();
}

std::optional<bool> answerOf(pid_t child, int* status) {
    while (::waitpid(child, status, 0) < 0 && errno == EINTR) {
    }
    if (!WIFEXITED(*status) || WEXITSTATUS(*status) > 1)
        return std::nullopt;
    return WEXITSTATUS(*status) == 0;
}

}  // namespace

TrappedRun runTrapped(const Trap& trap, HostAbilities abilities,
                      const std::function<bool()>& operation) {
    loadLibraries();
    TrappedRun run;
    std::array<int, 2> sockets{};
    if (::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, sockets.data()) != 0)
        return run;
    FileDescriptor own(sockets[0]);
    FileDescriptor childs(sockets[1]);
    const pid_t child = ::fork();
    if (child == 0) {
        becomeOrdinaryUser();
        const FileDescriptor listener(filterOwnCalls(abilities, /*holdsCalls=*/true));
        if (!listener || !sendDescriptor(childs.get(), listener.get()))
            ::_exit(kNoFilter);
        ::_exit(operation() ? 0 : 1);
    }
    (void)childs.close();
    const FileDescriptor listener = receiveDescriptor(own.get());
    const FileDescriptor process(static_cast<int>(::syscall(SYS_pidfd_open, child, 0)));
    if (listener && process)
        decideOnCalls(listener.get(), process.get(), child, trap, run);
    int status = 0;
    run.result = answerOf(child, &status);
    return run;
}

std::optional<bool> runFreely(HostAbilities abilities, const std::function<bool()>& operation) {
    const pid_t child = ::fork();
    if (child == 0) {
        becomeOrdinaryUser();
        if (filterOwnCalls(abilities, /*holdsCalls=*/false) < 0)
            ::_exit(kNoFilter);
        ::_exit(operation() ? 0 : 1);
    }
    int status = 0;
    return answerOf(child, &status);
}

std::optional<std::string> whyNoTraps() {
    const TrappedRun run = runTrapped({}, {}, [] { return ::access("/", F_OK) == 0; });
    if (run.result == true && run.calls.size() == 1)
        return std::nullopt;
    return "this machine lets no process hold another's system calls (seccomp user notification)";
}

void giveToChildren(const std::string& path) {
    if (::geteuid() != 0)
        return;
    (void)!::lchown(path.c_str(), kNobody, kNobody);
    if (!std::filesystem::is_directory(std::filesystem::symlink_status(path)))
        return;
    for (const auto& entry : std::filesystem::recursive_directory_iterator(path))
        (void)!::lchown(entry.path().c_str(), kNobody, kNobody);
}

}  // namespace parvel::testing
