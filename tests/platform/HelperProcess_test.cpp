#include "parvel/platform/linux/HelperProcess.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <filesystem>
#include <thread>

#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "parvel/platform/PdfDocument.h"
#include "parvel/platform/ReaderProgram.h"
#include "tests/support/HelperProcesses.h"
#include "tests/support/LargePdf.h"
#include "tests/support/PdfBuilder.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

/// In force while it lives.
class GivenReaderProgram {
public:
    explicit GivenReaderProgram(const std::string& path) { setReaderProgramPath(path); }
    ~GivenReaderProgram() { setReaderProgramPath(""); }
    GivenReaderProgram(const GivenReaderProgram&) = delete;
    GivenReaderProgram& operator=(const GivenReaderProgram&) = delete;
};

std::atomic<int> childSignals{0};

/// How SIGCHLD is dealt with while it lives.
class ChildSignals {
public:
    explicit ChildSignals(void (*handler)(int)) {
        struct sigaction action {};
        action.sa_handler = handler;
        ::sigaction(SIGCHLD, &action, &m_before);
        childSignals = 0;
    }
    ~ChildSignals() { ::sigaction(SIGCHLD, &m_before, nullptr); }
    ChildSignals(const ChildSignals&) = delete;
    ChildSignals& operator=(const ChildSignals&) = delete;

    static void count(int) { ++childSignals; }

private:
    struct sigaction m_before {};
};

class HelperProcessTest : public ::testing::Test {
protected:
    HelperProcessTest() {
        m_folder.write("a.pdf", PdfBuilder{}.information("/Author (Ann)").page("").bytes());
    }

    std::unique_ptr<PdfDocument> open(std::string_view name = "a.pdf") {
        return PdfDocuments::host().open(m_folder.url(name), &m_error);
    }
    std::string authorOf(std::string_view name = "a.pdf") {
        const auto document = open(name);
        return document ? document->author().value_or("") : "no document";
    }
    /// A helper program that does wrong what its name says.
    std::string falseReader(std::string_view fault) {
        std::filesystem::create_symlink(PARVEL_FALSE_READER, m_folder / fault);
        return m_folder / fault;
    }
    void expectNoDocumentFrom(std::string_view fault) {
        const GivenReaderProgram given(falseReader(fault));
        EXPECT_FALSE(open()) << fault;
        ASSERT_TRUE(m_error) << fault;
        EXPECT_EQ(*m_error, makeFileError(PVFileErrorCode::Corrupt, m_folder.url("a.pdf")))
            << fault;
    }
    void expectHelperIsMissing(const std::string& program) {
        const GivenReaderProgram given(program);
        EXPECT_FALSE(open());
        ASSERT_TRUE(m_error);
        EXPECT_EQ(m_error->domain(), PVFileErrorDomain);
        EXPECT_EQ(m_error->code(), 259);
        EXPECT_EQ(*m_error->url(), m_folder.url("a.pdf"));
        EXPECT_EQ(m_error->message(), "The helper program parvel-reader can't be started.");
        EXPECT_FALSE(readerConfinement());
    }
    void expectNoImageFrom(std::string_view fault) {
        const GivenReaderProgram given(falseReader(fault));
        const auto document = open();
        const auto page = document ? document->firstPage() : nullptr;
        ASSERT_TRUE(page) << fault;
        EXPECT_FALSE(page->draw(10, 10)) << fault;
    }

    TemporaryDirectory m_folder;
    std::optional<Error> m_error;
};

TEST_F(HelperProcessTest, StandsBehindTheFilter) {
    const std::optional<ReaderConfinement> confinement = readerConfinement();

    ASSERT_TRUE(confinement);
    EXPECT_TRUE(confinement->hasSystemCallFilter);
}

TEST_F(HelperProcessTest, ServesCallAfterCall) {
    EXPECT_EQ(authorOf(), "Ann");
    const std::set<pid_t> helpers = helperProcesses();

    EXPECT_EQ(authorOf(), "Ann");

    EXPECT_EQ(helpers.size(), 1U);
    EXPECT_EQ(helperProcesses(), helpers);
}

TEST_F(HelperProcessTest, IsReplacedWhenItEndedWhileItWaited) {
    EXPECT_EQ(authorOf(), "Ann");

    killHelperProcesses();

    EXPECT_EQ(authorOf(), "Ann");
}

TEST_F(HelperProcessTest, OpensTheDocumentAnewWhenItEnded) {
    const auto document = open();
    ASSERT_TRUE(document);

    killHelperProcesses();

    const auto page = document->firstPage();
    ASSERT_TRUE(page);
    killHelperProcesses();
    EXPECT_TRUE(page->draw(10, 10));
}

TEST_F(HelperProcessTest, IsReplacedAfterAThousandDocuments) {
    EXPECT_EQ(authorOf(), "Ann");
    const std::set<pid_t> helpers = helperProcesses();

    for (int i = 0; i < 1000; ++i)
        EXPECT_EQ(authorOf(), "Ann");

    EXPECT_NE(helperProcesses(), helpers);
}

/// Tells whether the one helper maps the file or has it open.
bool isHeldByHelper(const std::string& path) {
    const std::string process = "/proc/" + std::to_string(*helperProcesses().begin());
    std::ifstream maps(process + "/maps");
    if (std::string{std::istreambuf_iterator<char>(maps), {}}.find(path) != std::string::npos)
        return true;
    std::error_code problem;
    const std::filesystem::directory_iterator descriptors(process + "/fd", problem);
    return std::any_of(begin(descriptors), end(descriptors), [&](const auto& descriptor) {
        return std::filesystem::read_symlink(descriptor.path(), problem) == path;
    });
}

TEST_F(HelperProcessTest, HoldsNoDocumentThatNobodyNeeds) {
    const std::string path = m_folder / "large.pdf";
    for (const std::uint64_t size : {reader::longestCopied, reader::longestMapped}) {
        if (const std::error_code problem = writeLargePdf(path, size))
            GTEST_SKIP() << "no files of that size here: " << problem.message();
        auto document = open("large.pdf");
        ASSERT_TRUE(document) << size;
        if (!isHeldByHelper(path))
            GTEST_SKIP() << "what the helper holds can't be read";

        document.reset();

        for (int i = 0; i < 1000 && isHeldByHelper(path); ++i)
            ::usleep(1000);
        EXPECT_FALSE(isHeldByHelper(path)) << size;
    }
}

TEST_F(HelperProcessTest, IsTheSameForAllThatIsAskedOfALargeDocument) {
    if (const std::error_code problem = writeLargePdf(m_folder / "a.pdf", reader::ordinaryInput))
        GTEST_SKIP() << "no files of that size here: " << problem.message();
    auto document = open();
    ASSERT_TRUE(document);
    const std::set<pid_t> helpers = helperProcesses();

    EXPECT_TRUE(document->firstPage()->draw(10, 10));

    EXPECT_EQ(helperProcesses(), helpers);
    document.reset();
    m_folder.write("a.pdf", PdfBuilder{}.information("/Author (Ann)").page("").bytes());
    EXPECT_EQ(authorOf(), "Ann");
    EXPECT_NE(helperProcesses(), helpers);
}

TEST_F(HelperProcessTest, HoldsNothingOfASmallDocumentsFile) {
    m_folder.write("small.pdf", PdfBuilder{}.information("/Author (Bob)").page("").bytes());
    std::filesystem::resize_file(m_folder / "small.pdf", reader::longestCopied);

    const auto document = open("small.pdf");

    ASSERT_TRUE(document);
    EXPECT_EQ(document->author(), "Bob");
    EXPECT_FALSE(isHeldByHelper(m_folder / "small.pdf"));
    EXPECT_TRUE(document->firstPage()->draw(10, 10));
}

TEST_F(HelperProcessTest, OpensAnotherDocumentInPlaceOfOneThatWasForgotten) {
    EXPECT_EQ(authorOf(), "Ann");
    m_folder.write("a.pdf", PdfBuilder{}.information("/Author (Bob)").page("").bytes());

    EXPECT_EQ(authorOf(), "Bob");
}

TEST_F(HelperProcessTest, ServesADocumentThatWasCutShortAtWorstWithNothing) {
    std::string bytes(20 << 20, ' ');
    bytes.insert(0, PdfBuilder{}.page("").bytes());
    m_folder.write("cut.pdf", bytes + PdfBuilder{}.information("/Author (Bob)").page("").bytes());
    const auto file = PdfDocuments::host().openFile(m_folder.url("cut.pdf"));
    const auto document = PdfDocuments::host().openDocument(*file);
    ASSERT_TRUE(document);
    std::filesystem::resize_file(m_folder / "cut.pdf", 10);

    const auto page = document->firstPage();

    EXPECT_TRUE(!page || !page->draw(10, 10));
    EXPECT_EQ(authorOf(), "Ann");
}

TEST_F(HelperProcessTest, IsNoChildThatTheApplicationNotices) {
    const ChildSignals counted(ChildSignals::count);
    setReaderProgramPath("");

    EXPECT_EQ(authorOf(), "Ann");
    killHelperProcesses();
    EXPECT_EQ(authorOf(), "Ann");

    EXPECT_EQ(childSignals, 0);
    EXPECT_EQ(::waitpid(-1, nullptr, WNOHANG), -1);
    EXPECT_EQ(errno, ECHILD);
    EXPECT_EQ(::waitpid(-1, nullptr, WNOHANG | __WALL), -1);
    EXPECT_EQ(errno, ECHILD);
}

TEST_F(HelperProcessTest, StartsWhereChildrenAreIgnored) {
    const ChildSignals ignored(SIG_IGN);
    setReaderProgramPath("");

    EXPECT_EQ(authorOf(), "Ann");
}

TEST_F(HelperProcessTest, InheritsNoSignalMaskAndNoIgnoredSignal) {
    setReaderProgramPath("");
    sigset_t all;
    sigset_t before;
    ::sigfillset(&all);
    ::pthread_sigmask(SIG_BLOCK, &all, &before);
    const auto brokenPipe = ::signal(SIGPIPE, SIG_IGN);
    EXPECT_EQ(authorOf(), "Ann");
    ::signal(SIGPIPE, brokenPipe);
    ::pthread_sigmask(SIG_SETMASK, &before, nullptr);

    const std::string helper = std::to_string(*helperProcesses().begin());
    std::ifstream status("/proc/" + helper + "/status");
    for (std::string word, mask; status >> word;) {
        if (!word.starts_with("Sig"))
            continue;
        status >> mask;
        if (word == "SigBlk:") {
            EXPECT_EQ(std::stoull(mask, nullptr, 16), 0U);
        } else if (word == "SigIgn:") {
            EXPECT_EQ(std::stoull(mask, nullptr, 16) >> (SIGPIPE - 1) & 1, 0U);
        }
    }
}

TEST_F(HelperProcessTest, InheritsNoDescriptor) {
    setReaderProgramPath("");
    std::array<int, 2> ends{};
    ASSERT_EQ(::pipe(ends.data()), 0);  // inherited by what is executed, unless that is seen to
    EXPECT_EQ(authorOf(), "Ann");
    ::close(ends[1]);

    char sign = 0;
    EXPECT_EQ(::read(ends[0], &sign, 1), 0) << "nobody else has the writing end";
    ::close(ends[0]);
}

TEST_F(HelperProcessTest, LeavesTheApplicationsDescriptorsAlone) {
    EXPECT_EQ(authorOf(), "Ann");
    const std::set<std::string> before = openDescriptors();

    {
        const auto document = open();
        const auto page = document->firstPage();
        EXPECT_TRUE(page->draw(10, 10));
        EXPECT_FALSE(open("missing.pdf"));
    }
    EXPECT_EQ(openDescriptors(), before);
    killHelperProcesses();
    EXPECT_EQ(authorOf(), "Ann");

    EXPECT_EQ(openDescriptors().size(), before.size());
}

TEST_F(HelperProcessTest, StartsWhereTheStandardDescriptorsAreClosed) {
    setReaderProgramPath("");
    std::array<int, 3> saved{};
    for (int i = 0; i < 3; ++i) {
        saved[static_cast<std::size_t>(i)] = ::fcntl(i, F_DUPFD_CLOEXEC, 100);
        ::close(i);
    }

    const std::string author = authorOf();
    setReaderProgramPath("");  // ends the helper, whose socket has one of those numbers

    for (int i = 0; i < 3; ++i) {
        ::dup2(saved[static_cast<std::size_t>(i)], i);
        ::close(saved[static_cast<std::size_t>(i)]);
    }
    EXPECT_EQ(author, "Ann");
}

TEST_F(HelperProcessTest, IsNotSharedWithAForkOfTheApplication) {
    EXPECT_EQ(authorOf(), "Ann");
    const std::set<pid_t> helpers = helperProcesses();

    const pid_t fork = ::fork();
    if (fork == 0) {
        const bool isServed = authorOf() == "Ann";
        const bool isOther = helperProcesses() != helpers;
        setReaderProgramPath("");
        ::_exit(isServed && isOther ? 0 : 1);
    }
    int status = 1;
    ::waitpid(fork, &status, 0);

    EXPECT_EQ(status, 0);
    EXPECT_EQ(authorOf(), "Ann");
    EXPECT_EQ(helperProcesses(), helpers);
}

TEST_F(HelperProcessTest, EndsWithTheApplication) {
    std::array<int, 2> ends{};
    ASSERT_EQ(::pipe(ends.data()), 0);
    const pid_t application = ::fork();
    if (application == 0) {
        authorOf();
        const pid_t helper = *helperProcesses().begin();
        const bool isTold = ::write(ends[1], &helper, sizeof helper) == sizeof helper;
        ::_exit(isTold ? 0 : 1);
    }
    pid_t helper = 0;
    ASSERT_EQ(::read(ends[0], &helper, sizeof helper), static_cast<ssize_t>(sizeof helper));
    ::waitpid(application, nullptr, 0);
    ::close(ends[0]);
    ::close(ends[1]);

    const std::string program = "/proc/" + std::to_string(helper) + "/exe";
    std::error_code error;
    for (int i = 0; i < 1000 && std::filesystem::exists(program, error) && !error; ++i)
        ::usleep(1000);
    EXPECT_FALSE(std::filesystem::exists(program, error) && !error);
}

TEST_F(HelperProcessTest, ServesManyThreadsAtOnce) {
    constexpr int threadCount = 16;
    for (int i = 0; i < threadCount; ++i)
        m_folder.write(std::to_string(i),
                       PdfBuilder{}
                           .information("/Author (" + std::to_string(i) + ")")
                           .page("", filled("0 0 " + std::to_string(i / 15.0), "0 0 612 792"))
                           .bytes());
    std::atomic<int> served{0};
    std::vector<std::thread> threads;
    for (int i = 0; i < threadCount; ++i)
        threads.emplace_back([&, i] {
            for (int round = 0; round < 4; ++round) {
                const auto document = PdfDocuments::host().open(m_folder.url(std::to_string(i)));
                const auto page = document ? document->firstPage() : nullptr;
                const auto image = page ? page->draw(20, 20) : std::nullopt;
                served += image && document->author() == std::to_string(i) &&
                          image->row(10)[10] == 0xFF000000U + static_cast<unsigned>(i) * 17;
            }
        });
    for (std::thread& thread : threads)
        thread.join();

    EXPECT_EQ(served, threadCount * 4);
    EXPECT_LE(helperProcesses().size(), 1U) << "one waits for the next call";
}

TEST_F(HelperProcessTest, IsSaidToBeMissing) {
    expectHelperIsMissing(m_folder / "absent");
}

TEST_F(HelperProcessTest, CountsAsMissingWhenItEndsAtOnce) {
    expectHelperIsMissing(falseReader("exits"));
}

TEST_F(HelperProcessTest, CountsAsMissingInAnotherVersion) {
    expectHelperIsMissing(falseReader("other-version"));
}

TEST_F(HelperProcessTest, OpensNothingWhenItEndsOverADocument) {
    expectNoDocumentFrom("ends");
}

TEST_F(HelperProcessTest, OpensNothingWhenItTakesTooLong) {
    expectNoDocumentFrom("hangs");
}

TEST_F(HelperProcessTest, OpensNothingWhenItsAnswerDoesNotAddUp) {
    for (const char* fault :
         {"long-text", "much-text", "no-utf8", "endless-date", "short", "other-number"})
        expectNoDocumentFrom(fault);
}

TEST_F(HelperProcessTest, DrawsNoPageOfWhichNothingCouldBeLearnt) {
    for (const char* fault : {"no-number", "ends-over-page"}) {
        const GivenReaderProgram given(falseReader(fault));
        const auto document = open();
        ASSERT_TRUE(document) << fault;

        const auto page = document->firstPage();

        ASSERT_TRUE(page) << fault;
        EXPECT_EQ(page->cropBoxWidth(), 0) << fault;
        EXPECT_FALSE(PVAssetMetadataInspector::_new_pdf_coverImage_imageSize(m_folder.url("a.pdf"),
                                                                             340, 380))
            << fault;
    }
}

TEST_F(HelperProcessTest, GetsNoDescriptorInThatItDidNotAskFor) {
    const GivenReaderProgram given(falseReader("two-files"));
    const auto document = open();
    const auto page = document ? document->firstPage() : nullptr;
    ASSERT_TRUE(page);
    const std::set<std::string> before = openDescriptors();

    EXPECT_FALSE(page->draw(10, 10));

    EXPECT_LE(openDescriptors().size(), before.size());
}

TEST_F(HelperProcessTest, DrawsNothingWhenItsPixelsDoNotAddUp) {
    for (const char* fault : {"wrong-size", "small-stride", "no-file", "small-file", "unsealed"})
        expectNoImageFrom(fault);
}

TEST_F(HelperProcessTest, IsFoundByARelativePathToo) {
    const std::string program = readerProgramPath();
    const GivenReaderProgram given(std::filesystem::relative(program).string());

    EXPECT_TRUE(std::filesystem::path(readerProgramPath()).is_absolute());
    EXPECT_TRUE(std::filesystem::equivalent(readerProgramPath(), program));
    EXPECT_EQ(authorOf(), "Ann");
}

}  // namespace
}  // namespace parvel::testing
