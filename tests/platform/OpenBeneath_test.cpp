#include "parvel/platform/linux/OpenBeneath.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>

#include <cstddef>
#include <filesystem>
#include <ostream>

#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

using Opener = host::FileDescriptor (*)(int, const char*, int);

/// What opening gave: the bytes of a file, or the errno's name.
std::string outcomeOf(Opener open, const std::string& directory, const char* path) {
    const host::FileDescriptor root(::open(directory.c_str(), O_PATH | O_DIRECTORY));
    const host::FileDescriptor file = open(root.get(), path, O_RDONLY | O_NOFOLLOW | O_NONBLOCK);
    if (!file)
        return strerrorname_np(errno);
    struct stat status;
    if (::fstat(file.get(), &status) != 0 || !S_ISREG(status.st_mode))
        return "no file";
    char bytes[64];
    const ssize_t count = ::read(file.get(), bytes, sizeof bytes);
    return std::string(bytes, static_cast<std::size_t>(std::max<ssize_t>(count, 0)));
}

struct PathAndOutcome {
    const char* path;
    const char* outcome;

    friend void PrintTo(const PathAndOutcome& value, std::ostream* out) {
        *out << '"' << value.path << '"';
    }
};

class OpenBeneathTest : public ::testing::TestWithParam<PathAndOutcome> {
protected:
    OpenBeneathTest() {
        m_folder.write("outside", "outside");
        m_folder.write("root/a/b/file", "file");
        m_folder.write("root/top", "top");
        std::filesystem::create_symlink("a/b/file", m_folder / "root/link");
        std::filesystem::create_symlink("a", m_folder / "root/folderlink");
        std::filesystem::create_symlink("nowhere", m_folder / "root/dangling");
    }

    TemporaryDirectory m_folder;
};

TEST_P(OpenBeneathTest, GivesTheFileOrTheReason) {
    EXPECT_EQ(outcomeOf(&host::openBeneath, m_folder / "root", GetParam().path),
              GetParam().outcome);
}

TEST_P(OpenBeneathTest, GivesTheSameComponentByComponent) {
    EXPECT_EQ(outcomeOf(&host::openBeneathByComponents, m_folder / "root", GetParam().path),
              GetParam().outcome);
}

/// Makes the kernel refuse openat2 to this process, as the filters of some sandboxes do.
bool refuseOpenat2() {
    sock_filter program[] = {
        BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr)),
        BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, SYS_openat2, 0, 1),
        BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ERRNO | EPERM),
        BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW),
    };
    const sock_fprog filter = {sizeof program / sizeof *program, program};
    return ::prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 &&
           ::prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &filter) == 0;
}

TEST(OpenBeneath, GoesByComponentsWhereTheKernelRefusesItsOwnWalk) {
    TemporaryDirectory folder;
    folder.write("a/file", "file");
    constexpr int unfiltered = 2;

    const pid_t child = ::fork();
    if (child == 0) {
        if (!refuseOpenat2())
            ::_exit(unfiltered);
        const bool opened = outcomeOf(&host::openBeneath, folder.path(), "a/file") == "file";
        const bool refused = outcomeOf(&host::openBeneath, folder.path(), "../x") == "EXDEV";
        ::_exit(opened && refused ? 0 : 1);
    }
    int status = 0;
    ASSERT_EQ(::waitpid(child, &status, 0), child);
    ASSERT_TRUE(WIFEXITED(status));
    if (WEXITSTATUS(status) == unfiltered)
        GTEST_SKIP() << "no filter can be set here";
    EXPECT_EQ(WEXITSTATUS(status), 0);
}

INSTANTIATE_TEST_SUITE_P(
    Paths, OpenBeneathTest,
    ::testing::Values(
        PathAndOutcome{"top", "top"}, PathAndOutcome{"a/b/file", "file"},
        PathAndOutcome{"./a//b/./file", "file"}, PathAndOutcome{"a/../a/b/../b/file", "file"},
        PathAndOutcome{"a/b/../../top", "top"}, PathAndOutcome{"a", "no file"},
        PathAndOutcome{"a/", "no file"}, PathAndOutcome{".", "no file"},
        PathAndOutcome{"a/..", "no file"}, PathAndOutcome{"", "ENOENT"},
        PathAndOutcome{"..", "EXDEV"}, PathAndOutcome{"../outside", "EXDEV"},
        PathAndOutcome{"../root/top", "EXDEV"}, PathAndOutcome{"a/../../outside", "EXDEV"},
        PathAndOutcome{"/etc/passwd", "EXDEV"}, PathAndOutcome{"link", "ELOOP"},
        PathAndOutcome{"folderlink/b/file", "ELOOP"}, PathAndOutcome{"dangling", "ELOOP"},
        PathAndOutcome{"a/none", "ENOENT"}, PathAndOutcome{"none/../top", "ENOENT"},
        PathAndOutcome{"top/x", "ENOTDIR"}, PathAndOutcome{"top/../top", "ENOTDIR"},
        PathAndOutcome{"top/", "ENOTDIR"}, PathAndOutcome{"top/.", "ENOTDIR"}));

}  // namespace
}  // namespace parvel::testing
