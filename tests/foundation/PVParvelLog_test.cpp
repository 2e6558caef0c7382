#include "parvel/foundation/PVParvelLog.h"

#include "tests/support/RecordedLog.h"
#include "tests/support/TestRounds.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <mutex>
#include <thread>

namespace parvel::testing {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

/// Keeps the messages of any thread.
class CollectingSink : public LogSink {
public:
    void write(const LogLine& line) override {
        const std::lock_guard guard(m_lock);
        m_messages.push_back(line.message());
    }
    [[nodiscard]] std::vector<std::string> messages() const {
        const std::lock_guard guard(m_lock);
        return m_messages;
    }

private:
    mutable std::mutex m_lock;
    std::vector<std::string> m_messages;
};

/// Sends all threads' lines to a sink of its own while it lives.
class CommonLog {
public:
    explicit CommonLog(LogLevel level) {
        setLogSink(m_sink);
        setLogLevel(level);
    }
    ~CommonLog() {
        setLogSink(nullptr);
        setLogLevel(LogLevel::Default);
    }
    [[nodiscard]] std::vector<std::string> messages() const { return m_sink->messages(); }

private:
    std::shared_ptr<CollectingSink> m_sink = std::make_shared<CollectingSink>();
};

/// Counts how often it is described.
struct Described {
    mutable int times = 0;
};
std::string logText(const Described& object) {
    ++object.times;
    return "described";
}

void logOneOfEachLevel() {
    PVParvelLog().debug("one");
    PVParvelLog().info("two");
    PVParvelLog().error("three");
    PVParvelLog().fault("four");
}

TEST(PVParvelLog, IsOneHandle) {
    EXPECT_EQ(&PVParvelLog(), &PVParvelLog());
}

TEST(PVParvelLog, WritesEachLevelInOrder) {
    const RecordedLog log;
    logOneOfEachLevel();

    EXPECT_THAT(log.lines(), ElementsAre("debug one", "default two", "error three", "fault four"));
}

TEST(PVParvelLog, NamesSubsystemAndCategory) {
    class NamesSink : public LogSink {
    public:
        void write(const LogLine& line) override {
            EXPECT_EQ(line.subsystem, "com.kestrel.PVAgentService");
            EXPECT_EQ(line.category, "Parvel");
            ++lines;
        }
        int lines = 0;
    } sink;
    const ThreadLogSink scope(sink, LogLevel::Debug);
    PVParvelLog().info("line");

    EXPECT_EQ(sink.lines, 1);
}

TEST(PVParvelLog, WantsTheDefaultLevelAtFirst) {
    EXPECT_FALSE(PVParvelLog().isEnabled(LogLevel::Debug));
    EXPECT_TRUE(PVParvelLog().isEnabled(LogLevel::Default));
}

TEST(PVParvelLog, WritesNothingBelowTheCommonLevel) {
    const CommonLog log(LogLevel::Error);
    logOneOfEachLevel();

    EXPECT_THAT(log.messages(), ElementsAre("three", "four"));
    EXPECT_FALSE(PVParvelLog().isEnabled(LogLevel::Default));
}

TEST(PVParvelLog, WritesNothingWhenOff) {
    const CommonLog log(LogLevel::Off);
    logOneOfEachLevel();

    EXPECT_THAT(log.messages(), IsEmpty());
    EXPECT_FALSE(PVParvelLog().isEnabled(LogLevel::Fault));
}

TEST(PVParvelLog, DescribesNoArgumentOfALevelThatIsOff) {
    const Described argument;
    const CommonLog log(LogLevel::Default);
    PVParvelLog().debug("off: %@", argument);
    EXPECT_EQ(argument.times, 0);

    PVParvelLog().info("on: %@", argument);
    EXPECT_EQ(argument.times, 1);
    EXPECT_THAT(log.messages(), ElementsAre("on: described"));
}

TEST(PVParvelLog, DescribesNothingForAThreadThatDidNotAsk) {
    const Described argument;
    std::thread([&argument] {
        const CommonLog common(LogLevel::Off);
        const RecordedLog log;
        std::thread([&argument] { PVParvelLog().fault("off: %@", argument); }).join();
    }).join();

    EXPECT_EQ(argument.times, 0);
}

TEST(PVParvelLog, PrintsEveryKindOfArgument) {
    const RecordedLog log;
    const URL url = URL::fileURLWithPath("/a b");
    const std::string text = "text";
    const char* characters = "characters";
    PVParvelLog().info("%@ %@ %@ %s %s", url, text, std::string_view("view"), characters,
                       "literal");
    PVParvelLog().info("%d %d %d %ld %lu %llu", true, false, -1, -2L, 3UL, ~0ULL);
    PVParvelLog().info("%@ %@ %@", Value(Array{"a"}), Value("plain"), Value(Number::real(1.5)));
    PVParvelLog().info("%@", makeCorruptAssetError("PVAssetMetadata is nil"));

    EXPECT_THAT(log.lines(),
                ElementsAre("default file:///a%20b text view characters literal",
                            "default 1 0 -1 -2 3 18446744073709551615", "default (\"a\") plain 1.5",
                            "default Error Domain=PVParvelFoundationErrorDomain Code=-1009 "
                            "\"PVAssetMetadata is nil\""));
}

TEST(PVParvelLog, PrintsAbsentArgumentsAsNull) {
    const RecordedLog log;
    const Value* value = nullptr;
    const char* characters = nullptr;
    const std::optional<Error> error;
    const std::optional<URL> url = URL::fileURLWithPath("/a");
    const std::shared_ptr<const Value> shared;
    PVParvelLog().error("%@ %s %@ %@ %@", value, characters, error, url, shared);

    EXPECT_THAT(log.lines(), ElementsAre("error (null) (null) (null) file:///a (null)"));
}

TEST(PVParvelLog, LeavesAnUnclosedBraceAndAPercentSignAsWritten) {
    const RecordedLog log;
    PVParvelLog().info("metadataCompressed: end {success: %d", true);
    PVParvelLog().info("100%% of %@", "it");

    EXPECT_THAT(log.lines(),
                ElementsAre("default metadataCompressed: end {success: 1", "default 100% of it"));
}

TEST(ThreadLogSink, TakesTheLinesOfItsThreadAlone) {
    const CommonLog common(LogLevel::Default);
    const RecordedLog own;
    std::thread([] { PVParvelLog().info("other thread"); }).join();
    PVParvelLog().info("own thread");

    EXPECT_THAT(common.messages(), ElementsAre("other thread"));
    EXPECT_THAT(own.lines(), ElementsAre("default own thread"));
}

TEST(ThreadLogSink, LeavesAnotherThreadsLevelAlone) {
    const CommonLog common(LogLevel::Default);
    const RecordedLog own;
    std::thread([] { logOneOfEachLevel(); }).join();

    EXPECT_THAT(common.messages(), ElementsAre("two", "three", "four"));
}

TEST(ThreadLogSink, WritesFromItsOwnLevelUp) {
    CollectingSink sink;
    const CommonLog common(LogLevel::Debug);
    const ThreadLogSink scope(sink, LogLevel::Error);
    logOneOfEachLevel();

    EXPECT_THAT(sink.messages(), ElementsAre("three", "four"));
    EXPECT_THAT(common.messages(), IsEmpty());
}

TEST(ThreadLogSink, WritesNothingAtOff) {
    CollectingSink sink;
    const CommonLog common(LogLevel::Debug);
    const ThreadLogSink scope(sink, LogLevel::Off);
    logOneOfEachLevel();

    EXPECT_THAT(sink.messages(), IsEmpty());
    EXPECT_THAT(common.messages(), IsEmpty());
}

TEST(ThreadLogSink, NestsWithTheInnermostInForce) {
    CollectingSink outer;
    CollectingSink inner;
    const ThreadLogSink outerScope(outer, LogLevel::Debug);
    {
        const ThreadLogSink innerScope(inner, LogLevel::Default);
        PVParvelLog().debug("not wanted by the inner");
        PVParvelLog().info("inner");
    }
    PVParvelLog().debug("outer");

    EXPECT_THAT(inner.messages(), ElementsAre("inner"));
    EXPECT_THAT(outer.messages(), ElementsAre("outer"));
}

TEST(ThreadLogSink, LowersTheThresholdOnlyWhileItLives) {
    CollectingSink sink;
    {
        const ThreadLogSink scope(sink, LogLevel::Debug);
        EXPECT_TRUE(PVParvelLog().isEnabled(LogLevel::Debug));
    }

    EXPECT_FALSE(PVParvelLog().isEnabled(LogLevel::Debug));
}

TEST(SetLogSink, LetsTheSinkBeforeItGo) {
    auto first = std::make_shared<CollectingSink>();
    const std::weak_ptr<CollectingSink> watched = first;
    setLogSink(std::move(first));
    EXPECT_FALSE(watched.expired());
    setLogSink(nullptr);

    EXPECT_TRUE(watched.expired());
}

TEST(SetLogSink, KeepsTheSinkBeforeItForALineThatIsBeingWritten) {
    class SwappingSink : public LogSink {
    public:
        explicit SwappingSink(bool& outlived) : m_outlived(outlived) {}
        ~SwappingSink() override { m_isAlive = false; }
        void write(const LogLine& line) override {
            setLogSink(nullptr);
            m_outlived = m_isAlive && line.message() == "line";
        }

    private:
        bool& m_outlived;
        bool m_isAlive = true;
    };
    bool outlived = false;
    setLogSink(std::make_shared<SwappingSink>(outlived));
    PVParvelLog().info("line");

    EXPECT_TRUE(outlived);
}

TEST(SetLogSink, LosesNoLineOf16ThreadsWhileSinksChange) {
    constexpr std::size_t kThreads = 16;
    const std::size_t rounds = testRounds(200);
    const auto first = std::make_shared<CollectingSink>();
    const auto second = std::make_shared<CollectingSink>();
    setLogSink(first);
    std::atomic<std::size_t> ownLines{0};
    std::vector<std::thread> threads;
    for (std::size_t index = 0; index < kThreads; ++index) {
        threads.emplace_back([index, rounds, &ownLines] {
            for (std::size_t round = 0; round < rounds; ++round) {
                PVParvelLog().info("common %lu %lu", index, round);
                const RecordedLog log;
                PVParvelLog().debug("own %lu", round);
                ownLines += log.lines().size();
            }
        });
    }
    for (std::size_t round = 0; round < rounds; ++round) {
        setLogSink(round % 2 == 0 ? second : first);
        setLogLevel(round % 2 == 0 ? LogLevel::Debug : LogLevel::Default);
    }
    for (std::thread& thread : threads)
        thread.join();
    setLogSink(nullptr);
    setLogLevel(LogLevel::Default);

    EXPECT_EQ(first->messages().size() + second->messages().size(), kThreads * rounds);
    EXPECT_EQ(ownLines, kThreads * rounds);
}

}  // namespace
}  // namespace parvel::testing
