// A helper is started by an intermediate process that shares this one's memory and descriptors,
// spawns the program and ends at once:
//   1. clone without a signal at the end, so that only a wait for this very process finds it;
//   2. there, posix_spawn of the program, and a process descriptor for it, which lands here;
//   3. the intermediate ends and is waited for; the program has become an orphan.
// A direct child would not do: executing a program restores its SIGCHLD.

#include "parvel/platform/linux/HelperProcess.h"

#include <fcntl.h>
#include <poll.h>
#include <sched.h>
#include <signal.h>
#include <spawn.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <chrono>
#include <cstring>
#include <utility>

#include "parvel/platform/linux/SystemCall.h"

// The C library's own name for clone(2). ThreadSanitizer wraps the other one, takes every clone for
// a fork, and would make no thread afterwards in this process, whose memory is shared here.
// NOLINTNEXTLINE(bugprone-reserved-identifier): the C library's
extern "C" int __clone(int (*function)(void*), void* stack, int flags, void* argument,
                       ...) noexcept;

namespace parvel::host {

namespace {

using reader::Ask;
using reader::Outcome;
using reader::Reply;
using reader::Request;

constexpr std::size_t intermediateStack = 64 * 1024;
constexpr std::size_t longestReplyText = 2 * reader::longestText;
// From the kernel's headers of 5.4, which the C library's need not have.
constexpr auto waitForProcessDescriptor = static_cast<idtype_t>(3);

/// What the intermediate process is to start, and what came of it.
struct Launch {
    const char* program = nullptr;
    char* const* arguments = nullptr;
    const posix_spawn_file_actions_t* files = nullptr;
    const posix_spawnattr_t* attributes = nullptr;
    bool isStarted = false;
    int process = -1;
};

/// Runs in the intermediate process, on memory and descriptors of this one.
int launchProgram(void* argument) {
    Launch& launch = *static_cast<Launch*>(argument);
    pid_t process = 0;
    launch.isStarted = ::posix_spawn(&process, launch.program, launch.files, launch.attributes,
                                     launch.arguments, environ) == 0;
    if (launch.isStarted)
        launch.process = static_cast<int>(::syscall(SYS_pidfd_open, process, 0));
    return 0;
}

/// No handler of the application's may run in the intermediate process, which shares its memory.
class AllSignalsBlocked {
public:
    AllSignalsBlocked() {
        sigset_t all;
        ::sigfillset(&all);
        ::pthread_sigmask(SIG_SETMASK, &all, &m_before);
    }
    ~AllSignalsBlocked() { ::pthread_sigmask(SIG_SETMASK, &m_before, nullptr); }
    AllSignalsBlocked(const AllSignalsBlocked&) = delete;
    AllSignalsBlocked& operator=(const AllSignalsBlocked&) = delete;

private:
    sigset_t m_before;
};

void runIntermediate(Launch& launch) {
    const auto stack = std::make_unique_for_overwrite<std::byte[]>(intermediateStack);
    const AllSignalsBlocked blocked;
    const int noSignal = 0;
    const pid_t intermediate = ::__clone(launchProgram, stack.get() + intermediateStack,
                                         CLONE_VM | CLONE_VFORK | CLONE_FILES | noSignal, &launch);
    if (intermediate > 0)
        retried([&] { return ::waitpid(intermediate, nullptr, __WCLONE); });
}

/// The program's standard files are the null device, its socket has the agreed descriptor, and
/// nothing else is open. Its folder is the root, so that it holds on to no file system.
class SpawnFiles {
public:
    explicit SpawnFiles(int socket) {
        ::posix_spawn_file_actions_init(&m_actions);
        add(::posix_spawn_file_actions_adddup2(&m_actions, socket, reader::socketDescriptor));
        for (const int standard : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO})
            add(::posix_spawn_file_actions_addopen(&m_actions, standard, "/dev/null", O_RDWR, 0));
        add(::posix_spawn_file_actions_addclosefrom_np(&m_actions, reader::socketDescriptor + 1));
        add(::posix_spawn_file_actions_addchdir_np(&m_actions, "/"));
    }
    ~SpawnFiles() { ::posix_spawn_file_actions_destroy(&m_actions); }
    SpawnFiles(const SpawnFiles&) = delete;
    SpawnFiles& operator=(const SpawnFiles&) = delete;

    /// Null when there was no memory.
    [[nodiscard]] const posix_spawn_file_actions_t* get() const {
        return m_isSound ? &m_actions : nullptr;
    }

private:
    void add(int errnoValue) { m_isSound = m_isSound && errnoValue == 0; }

    posix_spawn_file_actions_t m_actions;
    bool m_isSound = true;
};

/// No signal handled, ignored or blocked, and a session of its own, so that the terminal's signals
/// don't reach it.
class SpawnAttributes {
public:
    SpawnAttributes() {
        ::posix_spawnattr_init(&m_attributes);
        sigset_t signals;
        ::sigfillset(&signals);
        ::posix_spawnattr_setsigdefault(&m_attributes, &signals);
        ::sigemptyset(&signals);
        ::posix_spawnattr_setsigmask(&m_attributes, &signals);
        ::posix_spawnattr_setflags(
            &m_attributes, POSIX_SPAWN_SETSIGDEF | POSIX_SPAWN_SETSIGMASK | POSIX_SPAWN_SETSID);
    }
    ~SpawnAttributes() { ::posix_spawnattr_destroy(&m_attributes); }
    SpawnAttributes(const SpawnAttributes&) = delete;
    SpawnAttributes& operator=(const SpawnAttributes&) = delete;

    [[nodiscard]] const posix_spawnattr_t* get() const { return &m_attributes; }

private:
    posix_spawnattr_t m_attributes;
};

/// Room for the one descriptor that goes with a message.
union DescriptorSpace {
    cmsghdr header;
    std::array<char, CMSG_SPACE(sizeof(int))> bytes;
};

void attachDescriptor(msghdr& message, DescriptorSpace& space, int descriptor) {
    space.bytes.fill(0);
    message.msg_control = space.bytes.data();
    message.msg_controllen = space.bytes.size();
    cmsghdr* header = CMSG_FIRSTHDR(&message);
    header->cmsg_level = SOL_SOCKET;
    header->cmsg_type = SCM_RIGHTS;
    header->cmsg_len = CMSG_LEN(sizeof descriptor);
    std::memcpy(CMSG_DATA(header), &descriptor, sizeof descriptor);
}

FileDescriptor attachedDescriptor(msghdr& message) {
    const cmsghdr* header = CMSG_FIRSTHDR(&message);
    if (!header || header->cmsg_level != SOL_SOCKET || header->cmsg_type != SCM_RIGHTS ||
        header->cmsg_len != CMSG_LEN(sizeof(int)))
        return FileDescriptor();
    int descriptor = -1;
    std::memcpy(&descriptor, CMSG_DATA(header), sizeof descriptor);
    return FileDescriptor(descriptor);
}

/// Starts the program; where the host has process descriptors, with one for it.
bool launchHelper(const std::string& program, const HelperMeans& means, int socket,
                  FileDescriptor& process) {
    std::string name = program;
    std::string bytes = std::to_string(means.inputBytes);
    std::string fonts = reader::fontsArgument;
    const std::array<char*, 4> arguments{name.data(), bytes.data(),
                                         means.hasFonts ? fonts.data() : nullptr, nullptr};
    const SpawnFiles files(socket);
    const SpawnAttributes attributes;
    if (!files.get())
        return false;
    Launch launch{program.c_str(), arguments.data(), files.get(), attributes.get()};
    runIntermediate(launch);
    process = FileDescriptor(launch.process);
    return launch.isStarted;
}

bool isInput(Ask ask) {
    return ask == Ask::OpenDocument || ask == Ask::DecodeImage;
}

}  // namespace

std::unique_ptr<HelperProcess> HelperProcess::start(const std::string& program,
                                                    const HelperMeans& means) {
    std::array<int, 2> ends{};
    if (::socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, ends.data()) != 0)
        return nullptr;
    FileDescriptor ours(ends[0]);
    FileDescriptor process;
    {
        // Closed before the helper is heard: its end shows only once nobody else holds it.
        const FileDescriptor theirs(ends[1]);
        if (!launchHelper(program, means, theirs.get(), process))
            return nullptr;
    }
    std::unique_ptr<HelperProcess> helper(
        new HelperProcess(std::move(ours), std::move(process), means));
    HelperAnswer hello;
    if (!helper->receive(hello) || hello.reply.outcome != Outcome::Hello ||
        hello.reply.version != reader::version)
        return nullptr;
    helper->m_walls = hello.reply.walls;
    return helper;
}

HelperProcess::HelperProcess(FileDescriptor socket, FileDescriptor process,
                             const HelperMeans& means)
    : m_socket(std::move(socket)),
      m_process(std::move(process)),
      m_means(means),
      m_owner(::getpid()),
      m_text(std::make_unique_for_overwrite<char[]>(longestReplyText)) {}

HelperProcess::~HelperProcess() {
    if (!m_process || !isOurs())
        return;
    ::syscall(SYS_pidfd_send_signal, m_process.get(), SIGKILL, nullptr, 0);
    // Only an application that reaps orphans has it as a child now.
    const auto descriptor = static_cast<id_t>(m_process.get());
    siginfo_t ignored;
    retried([&] { return ::waitid(waitForProcessDescriptor, descriptor, &ignored, WEXITED); });
}

bool HelperProcess::isOurs() const {
    return m_owner == ::getpid();
}

HelperProcess::Exchange HelperProcess::ask(const Request& request, int descriptor,
                                           HelperAnswer& answer) {
    ++m_number;
    if (!send(request, descriptor))
        return Exchange::NotAsked;
    m_inputCount += isInput(request.ask) ? 1 : 0;
    return receive(answer) ? Exchange::Answered : Exchange::Failed;
}

bool HelperProcess::tell(const Request& request) {
    return send(request, -1);
}

bool HelperProcess::send(const Request& request, int descriptor) const {
    Request sent = request;
    sent.number = m_number;
    iovec part{&sent, sizeof sent};
    msghdr message{};
    message.msg_iov = &part;
    message.msg_iovlen = 1;
    DescriptorSpace space;
    if (descriptor >= 0)
        attachDescriptor(message, space, descriptor);
    const ssize_t count =
        retried([&] { return ::sendmsg(m_socket.get(), &message, MSG_NOSIGNAL | MSG_DONTWAIT); });
    return count == static_cast<ssize_t>(sizeof sent);
}

bool HelperProcess::receive(HelperAnswer& answer) {
    if (!awaitReply())
        return false;
    std::array<iovec, 2> parts{iovec{&answer.reply, sizeof answer.reply},
                               iovec{m_text.get(), longestReplyText}};
    msghdr message{};
    message.msg_iov = parts.data();
    message.msg_iovlen = parts.size();
    DescriptorSpace space;
    message.msg_control = space.bytes.data();
    // No room for a second one, which would then be nobody's.
    message.msg_controllen = CMSG_LEN(sizeof(int));
    const ssize_t count =
        retried([&] { return ::recvmsg(m_socket.get(), &message, MSG_CMSG_CLOEXEC); });
    if (count <= 0)
        return false;
    answer.file = attachedDescriptor(message);
    const auto size = static_cast<std::size_t>(count);
    if (size < sizeof(Reply) || (message.msg_flags & (MSG_TRUNC | MSG_CTRUNC)) != 0)
        return false;
    answer.text = std::string_view(m_text.get(), size - sizeof(Reply));
    return answer.reply.number == m_number;
}

bool HelperProcess::awaitReply() const {
    using Clock = std::chrono::steady_clock;
    const Clock::time_point end =
        Clock::now() + std::chrono::milliseconds(reader::longestWaitMilliseconds);
    for (;;) {
        const auto left = std::chrono::ceil<std::chrono::milliseconds>(end - Clock::now()).count();
        pollfd waited{m_socket.get(), POLLIN, 0};
        const int count = left > 0 ? ::poll(&waited, 1, static_cast<int>(left)) : 0;
        if (count >= 0)
            return count == 1;
        if (errno != EINTR)
            return false;
    }
}

}  // namespace parvel::host
