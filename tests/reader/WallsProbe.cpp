// Goes behind the helper's walls and tries what they are to keep from it. Prints what gets through.

#include <fcntl.h>
#include <signal.h>
#include <sys/mman.h>
#include <sys/prctl.h>
#include <sys/ptrace.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <string>

#include "parvel/platform/linux/ReaderProtocol.h"
#include "reader/HostFiles.h"
#include "reader/Walls.h"

namespace parvel::reader {
namespace {

int faults = 0;

void check(const char* what, bool isSo) {
    std::printf("%s: %s\n", isSo ? "as it should" : "FAULT", what);
    faults += isSo ? 0 : 1;
}

bool canMap(std::size_t size, int protection) {
    void* memory = ::mmap(nullptr, size, protection, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
    if (memory != MAP_FAILED)
        ::munmap(memory, size);
    return memory != MAP_FAILED;
}

bool canMakeMemoryCode() {
    constexpr std::size_t size = 4096;
    void* memory =
        ::mmap(nullptr, size, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
    return ::mprotect(memory, size, PROT_READ | PROT_EXEC) == 0;
}

/// How a process ends that goes behind the walls and does this.
template <class Act>
int signalThatEnds(Act act) {
    const pid_t process = ::fork();
    if (process == 0) {
        static_cast<void>(raiseWalls(0));
        act();
        ::_exit(0);
    }
    int status = 0;
    ::waitpid(process, &status, 0);
    return WIFSIGNALED(status) ? WTERMSIG(status) : 0;
}

void checkFiles(const std::string& kept, const char* other) {
    const int first = ::open(kept.c_str(), O_RDONLY);
    char signs[5] = {};
    check("a file kept before can be read", ::read(first, signs, 4) == 4 && signs[3] == 't');
    std::FILE* stream = std::fopen(kept.c_str(), "rb");
    check("it can be opened again, from its beginning",
          stream && std::fread(signs, 1, 4, stream) == 4 && signs[0] == 'k');
    check("no other file can be opened", ::open(other, O_RDONLY) < 0);
    check("no file can be made", ::open("/tmp/parvel-walls-probe", O_RDWR | O_CREAT, 0600) < 0);
    check("no folder can be opened", ::open("/", O_RDONLY | O_DIRECTORY) < 0);
    struct stat status;
    check("nothing is known of a path", ::stat(other, &status) != 0 && ::access(other, F_OK) != 0);
    check("the status of a descriptor is known", ::fstat(first, &status) == 0);
    check("nothing can be removed", ::unlink(kept.c_str()) != 0);
}

void checkProcesses() {
    check("no process can be made", ::fork() < 0);
    check("no program can be run", ::execl("/bin/true", "true", nullptr) != 0);
    check("no signal can be sent", ::kill(::getppid(), 0) != 0);
    check("no process can be traced", ::ptrace(PTRACE_ATTACH, ::getppid(), 0, 0) != 0);
    check("no socket can be made",
          ::socket(AF_INET, SOCK_STREAM, 0) < 0 && ::socket(AF_UNIX, SOCK_STREAM, 0) < 0);
    rlimit limits{};
    check("another process's limits can't be asked",
          ::prlimit(1, RLIMIT_AS, nullptr, &limits) != 0);
    check("the other limits can't be raised", ::setrlimit(RLIMIT_FSIZE, &limits) != 0);
}

void checkMemory() {
    check("there is memory", canMap(64 << 20, PROT_READ | PROT_WRITE));
    check("there is no more than its limit", !canMap(addressSpace, PROT_READ | PROT_WRITE));
    allowAddressSpace(16ULL << 30);
    check("the limit can't be raised at will", !canMap(1ULL << 30, PROT_READ | PROT_WRITE));
    check("memory is no code", !canMap(4096, PROT_READ | PROT_EXEC) && !canMakeMemoryCode());
}

int runProbe(const char* path) {
    keepHostFile(path);
    check("spinning ends by the limit on time", signalThatEnds([] {
                                                    limitProcessorTime(50);
                                                    for (;;) {
                                                    }
                                                }) == SIGPROF);
    answerTrappedCalls();
    check("the filter stands", (raiseWalls(ordinaryInput) & WallSeccomp) != 0);
    checkFiles(path, "/etc/passwd");
    checkProcesses();
    checkMemory();
    std::fflush(stdout);
    return faults == 0 ? 0 : 1;
}

/// The probe can't remove its file itself.
int run() {
    char path[] = "/tmp/parvel-walls-XXXXXX";
    const int file = ::mkstemp(path);
    if (file < 0 || ::write(file, "kept", 4) != 4)
        return 1;
    const pid_t probe = ::fork();
    if (probe == 0)
        ::_exit(runProbe(path));
    int status = 0;
    ::waitpid(probe, &status, 0);
    ::unlink(path);
    return WIFEXITED(status) ? WEXITSTATUS(status) : 1;
}

}  // namespace
}  // namespace parvel::reader

int main() {
    return parvel::reader::run();
}
