// Every operation, cut short at its system calls on files one by one: failed with each of a few
// errors, and killed. Afterwards each item is whole at its old place or whole at its new one,
// nothing half-made has a final name, and what a killed run left hidden is cleared by a later one.
// A few points of each operation are tried, or with PARVEL_TEST_ROUNDS those of so many calls; 1000
// are all.

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <tuple>

#include <gtest/gtest.h>

#include "tests/faults/MountedFileSystem.h"
#include "tests/faults/Operations.h"
#include "tests/faults/TestLibrary.h"
#include "tests/faults/TrappedRun.h"
#include "tests/support/EnvironmentValue.h"
#include "tests/support/TestRounds.h"

namespace parvel::testing {
namespace {

constexpr int kErrors[] = {ENOSPC, EIO, EACCES, EXDEV, EROFS};
constexpr std::size_t kUsualPoints = 4;

struct Host {
    const char* name;
    HostAbilities abilities = {};
    const char* fileSystem = nullptr;  ///< mounted for the test; where not given, the usual one
};

constexpr Host kHosts[] = {{"", {}},
                           {"WithoutRenameFlags", {.renameFlags = false}},
                           {"WithoutHardLinks", {.renameFlags = false, .hardLinks = false}},
                           {.name = "OnTmpfs", .fileSystem = "tmpfs"},
                           {.name = "OnXfs", .fileSystem = "xfs"},
                           {.name = "OnBtrfs", .fileSystem = "btrfs"}};

void PrintTo(const Host& host, std::ostream* stream) {
    *stream << host.name;
}

/// Whether something of that name stands anywhere.
bool stands(const Layout& layout, const std::string& item) {
    return std::any_of(layout.begin(), layout.end(),
                       [&item](const Layout::value_type& entry) { return entry.second == item; });
}

bool contains(const std::vector<Layout>& layouts, const Layout& layout) {
    return std::find(layouts.begin(), layouts.end(), layout) != layouts.end();
}

/// Whether the item stands anywhere, whatever else it got on the way, such as other modes.
bool standsInEffect(const Layout& layout, const std::string& item) {
    return std::any_of(layout.begin(), layout.end(), [&item](const Layout::value_type& entry) {
        return entry.second.starts_with(item);
    });
}

/// Whether a place is that of an item which lets another have its own, and is never cleared.
bool isAside(const std::string& place) {
    return place.find("/.parvel-aside-") != std::string::npos;
}

bool holds(const Layout& layout, const Layout::value_type& entry) {
    const auto found = layout.find(entry.first);
    return found != layout.end() && found->second == entry.second;
}

std::string described(const Layout& layout) {
    std::string text;
    for (const auto& [place, item] : layout)
        text += "  " + place + ": " + item + "\n";
    return text;
}

/// Then they are lost without an error, as they are where a file system has none.
bool saysNoAttributesAreKept(std::string_view call, int errnoValue) {
    return call == "fsetxattr" && errnoValue == EACCES;
}

class Faults : public ::testing::TestWithParam<std::tuple<Operation, Host>> {
protected:
    void SetUp() override {
        if (const auto reason = whyNoTraps())
            GTEST_SKIP() << *reason;
        if (m_host.fileSystem) {
            std::string reason;
            const auto mounted = mountedFileSystem(m_host.fileSystem, reason);
            if (!mounted)
                GTEST_SKIP() << reason;
            m_temporary.emplace("TMPDIR", *mounted);
        }
        if (m_operation.needsTwoFileSystems() && !hasTwoFileSystems())
            GTEST_SKIP() << "only one file system to move within";
        m_known = m_operation.before;
        for (const auto& [place, item] : m_operation.after)
            m_known.emplace(place + " later", item);
    }

    void fill(TestLibrary& library) const {
        library.fill(m_operation.before);
        if (m_operation.prepare)
            m_operation.prepare(library);
    }
    [[nodiscard]] bool run(const TestLibrary& library) const {
        library.setEnvironment(m_operation.hasTrashOnOtherFileSystem);
        return m_operation.run(*PVAssetMetadataFileManager::init(), library);
    }
    TrappedRun runTrappedIn(const TestLibrary& library, const Trap& trap) const {
        return runTrapped(trap, m_host.abilities, [&] { return run(library); });
    }
    [[nodiscard]] Layout layoutOf(const TestLibrary& library) const {
        return library.layout(m_known);
    }

    /// The calls of a run that nothing cuts short.
    std::vector<const char*> callsOfWholeRun() const {
        TestLibrary library;
        fill(library);
        const TrappedRun whole = runTrappedIn(library, {});
        EXPECT_EQ(whole.result, m_operation.answers);
        EXPECT_EQ(described(layoutOf(library)), described(m_operation.after));
        EXPECT_EQ(library.litter(), std::vector<std::string>{});
        return whole.calls;
    }

    /// Tries some of the points of a run, or all, and leaves no more than a few failures to read.
    template <class Try>
    void tryPoints(std::size_t points, std::size_t pointsOfCall, Try tryPoint) const {
        const std::size_t usual = m_host.name[0] == 0 ? kUsualPoints : 1;
        const std::size_t rounds = testRounds(0);
        const std::size_t tried = std::min(points, rounds > 0 ? rounds * pointsOfCall : usual);
        RecordProperty("points", static_cast<int>(tried));
        for (std::size_t i = 0; i < tried; ++i) {
            tryPoint(tried == points ? i : (i * points / tried + i) % points);
            if (HasFailure() && ++m_failures == 5)
                return;
        }
    }

    void expectFailedState(const TestLibrary& library, const TrappedRun& run) const {
        const Layout found = layoutOf(library);
        ASSERT_TRUE(run.result) << "it crashed";
        const bool hasSucceeded = *run.result && m_operation.answers;
        if (!m_operation.answers && found == m_operation.after)
            return;
        if (contains(hasSucceeded ? m_operation.succeeded : m_operation.failed, found) ||
            (!hasSucceeded && contains(m_operation.between, found)))
            return;
        EXPECT_EQ(described(found),
                  described(hasSucceeded ? m_operation.after : m_operation.before));
    }

    /// Each item is at one place of its own at least; a replaced one may have given way.
    void expectKilledState(const TestLibrary& library, bool wasKilled) const {
        const Layout found = layoutOf(library);
        const Layout made = withoutHeldNames(found);
        if (made != found && contains(m_operation.besideHeldNames, made))
            return;
        if (made == m_operation.after || contains(m_operation.between, made) ||
            contains(m_operation.killed, made))
            return;
        if (!wasKilled &&
            (contains(m_operation.failed, found) || contains(m_operation.succeeded, found)))
            return;
        for (const auto& entry : found)
            EXPECT_TRUE(mayStand(entry)) << entry.first << ": " << entry.second;
        for (const auto& [place, item] : m_operation.before) {
            const auto inPlace = found.find(place);
            const bool hasGivenWay =
                !stands(m_operation.after, item) &&
                (m_operation.after.empty() ||
                 (inPlace != found.end() && stands(m_operation.after, inPlace->second)));
            EXPECT_TRUE(standsInEffect(found, item) || hasGivenWay) << item << " is nowhere";
        }
    }

    /// Where a rename can't refuse, the name of what is made is held by an empty item meanwhile.
    [[nodiscard]] Layout withoutHeldNames(Layout layout) const {
        std::erase_if(layout, [this](const Layout::value_type& entry) {
            return !m_host.abilities.renameFlags && entry.second == "placeholder" &&
                   m_operation.after.contains(entry.first);
        });
        return layout;
    }

    [[nodiscard]] bool mayStand(const Layout::value_type& entry) const {
        const auto holdsEntry = [&entry](const Layout& layout) { return holds(layout, entry); };
        if (holdsEntry(m_operation.before) || holdsEntry(m_operation.after) ||
            std::any_of(m_operation.between.begin(), m_operation.between.end(), holdsEntry) ||
            std::any_of(m_operation.killed.begin(), m_operation.killed.end(), holdsEntry))
            return true;
        // Where a rename can't refuse or exchange names, one is held by an empty item meanwhile,
        // and an old item steps aside whole.
        if (m_host.abilities.renameFlags)
            return false;
        if (entry.second == "placeholder")
            return isAside(entry.first) || m_operation.after.contains(entry.first);
        return isAside(entry.first) && stands(m_operation.before, entry.second);
    }

    void expectNoLitterLater(const TestLibrary& library) const {
        const auto later = runFreely(m_host.abilities, [&] {
            const auto service = FileSystemService::makeDefault();
            for (const std::string& folder : library.folders()) {
                const URL copy = URL::fileURLWithPath(folder + "/copy of the probe");
                if (!service->copyItem(library.url("probe"), copy) || !service->removeItem(copy))
                    return false;
            }
            return true;
        });
        EXPECT_EQ(later, true) << "no later operation succeeds";
        for (const std::string& path : library.litter())
            EXPECT_TRUE(!m_host.abilities.renameFlags && isAside(path)) << path << " is left";
    }

    /// What was not done is done when it is tried again.
    void expectSuccessLater(const TestLibrary& library) const {
        const Layout found = layoutOf(library);
        const bool isLeft = m_operation.completesWhatIsLeft && contains(m_operation.between, found);
        if (found != m_operation.before && !isLeft)
            return;
        EXPECT_EQ(runFreely(m_host.abilities, [&] { return run(library); }), m_operation.answers)
            << "it does not succeed when it is tried again";
        EXPECT_EQ(described(layoutOf(library)), described(m_operation.after));
    }

    void tryTrap(const Trap& trap, const std::vector<const char*>& calls) const {
        SCOPED_TRACE("call " + std::to_string(trap.call) + " of " + std::to_string(calls.size()) +
                     ", " + calls[trap.call] + ": " +
                     (trap.act == Trap::Act::Kill ? "killed" : std::strerror(trap.errnoValue)));
        TestLibrary library;
        fill(library);
        library.fill({{"probe", "file 9"}});

        const TrappedRun run = runTrappedIn(library, trap);

        // Without a second name nothing comes back once it was renamed over, and an empty item that
        // held a name stays when it can't be removed.
        const bool isFinal =
            !m_host.abilities.hardLinks ||
            (!m_host.abilities.renameFlags && std::string_view(calls[trap.call]) == "rmdir");
        if (run.wasKilled || isFinal)
            expectKilledState(library, run.wasKilled);
        else
            expectFailedState(library, run);
        if (m_operation.alsoHolds) {
            EXPECT_EQ(m_operation.alsoHolds(library), "");
        }
        expectSuccessLater(library);
        expectNoLitterLater(library);
    }

    const Operation m_operation = std::get<0>(GetParam());
    const Host m_host = std::get<1>(GetParam());
    Layout m_known;
    std::optional<EnvironmentValue> m_temporary;
    mutable int m_failures = 0;
};

TEST_P(Faults, AFailedCallCostsNothing) {
    const std::vector<const char*> calls = callsOfWholeRun();
    constexpr std::size_t errors = std::size(kErrors);

    tryPoints(calls.size() * errors, errors, [&](std::size_t point) {
        const Trap trap{Trap::Act::Fail, point / errors, kErrors[point % errors]};
        if (!saysNoAttributesAreKept(calls[trap.call], trap.errnoValue))
            tryTrap(trap, calls);
    });
}

TEST_P(Faults, AKillCostsNothing) {
    const std::vector<const char*> calls = callsOfWholeRun();

    tryPoints(calls.size(), 1, [&](std::size_t point) {
        tryTrap({Trap::Act::Kill, point, 0}, calls);
    });
}

/// Where an item has to step aside for another, and that one turns out to lie on another file
/// system.
class WaysBack : public Faults {};

TEST_P(WaysBack, AnItemThatStepsAsideComesBackPastAFailedCall) {
    const std::vector<const char*> calls = callsOfWholeRun();
    // The name that was held for the other one is free again before the way back.
    const auto freed = std::find(calls.begin(), calls.end(), std::string_view("rmdir"));
    ASSERT_GE(calls.end() - freed, 4);

    for (auto call = freed + 1; call != freed + 4; ++call)
        tryTrap({Trap::Act::Fail, static_cast<std::size_t>(call - calls.begin()), EIO}, calls);
}

Operation operationOfName(std::string_view name) {
    const auto isNamed = [&](const Operation& operation) { return operation.name == name; };
    return *std::find_if(operations().begin(), operations().end(), isNamed);
}

INSTANTIATE_TEST_SUITE_P(
    WithoutRenameFlags, WaysBack,
    ::testing::Combine(::testing::Values(operationOfName("ReplacesAPackageAcross")),
                       ::testing::Values(kHosts[1])));

INSTANTIATE_TEST_SUITE_P(Everywhere, Faults,
                         ::testing::Combine(::testing::ValuesIn(operations()),
                                            ::testing::ValuesIn(kHosts)),
                         [](const auto& parameters) {
                             return std::get<0>(parameters.param).name +
                                    std::get<1>(parameters.param).name;
                         });

}  // namespace
}  // namespace parvel::testing
