// Two processes that want one name at the same moment. A few rounds, or PARVEL_TEST_ROUNDS.

#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <atomic>
#include <filesystem>
#include <functional>

#include <gtest/gtest.h>

#include "parvel/filemanager/PVAssetMetadataFileManager.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "tests/faults/TestLibrary.h"
#include "tests/support/TestRounds.h"

namespace parvel::testing {
namespace {

namespace fs = std::filesystem;

constexpr std::size_t kUsualRounds = 5;

/// A record of what happens to both processes, in memory that they share.
struct Arena {
    std::atomic<int> ready{0};
    std::array<std::atomic<bool>, 2> won{false, false};
};

/// What each of the two does; the number says which one it is.
using Move = std::function<bool(PVAssetMetadataFileManager& manager, int contestant)>;

/// Lets two processes go at the same moment; who of them succeeded.
std::array<bool, 2> contest(const Move& move) {
    void* memory =
        ::mmap(nullptr, sizeof(Arena), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
    Arena& arena = *new (memory) Arena;
    std::array<pid_t, 2> processes{};
    for (int i = 0; i < 2; ++i) {
        processes[i] = ::fork();
        if (processes[i] != 0)
            continue;
        const auto manager = PVAssetMetadataFileManager::init();
        for (++arena.ready; arena.ready < 2;) {
        }
        arena.won[i] = move(*manager, i);
        ::_exit(0);
    }
    for (const pid_t process : processes) {
        int status = 0;
        ::waitpid(process, &status, 0);
        EXPECT_EQ(status, 0) << "a contestant crashed";
    }
    const std::array<bool, 2> won{arena.won[0], arena.won[1]};
    ::munmap(memory, sizeof(Arena));
    return won;
}

/// Names that the disk takes and programs trip over.
const std::vector<std::string>& names() {
    static const std::vector<std::string> all = {
        "Book.pdf",
        "Bu\xCC\x88"
        "cher \xE6\x9B\xB8\xE7\xB1\x8D \xF0\x9F\x93\x9A.pdf",
        "not UTF-8 \xFF\xC3.pdf",
        std::string(251, 'x') + ".pdf",
        " .-\n%2F.pdf",
    };
    return all;
}

class Contest : public ::testing::TestWithParam<std::string> {
protected:
    AssetPtr assetAt(const std::string& place) const {
        return PVAssetMetadata::metadataWithURL_dictionary(m_library.url(place), nullptr);
    }
    [[nodiscard]] Layout found() const { return m_library.layout(m_filled); }
    void fill(const Layout& layout) {
        m_filled = layout;
        m_library.fill(layout);
    }
    void clear() {
        for (const std::string& folder : m_library.folders())
            for (const auto& entry : fs::directory_iterator(folder))
                if (entry.path().filename() != ".stfolder")
                    fs::remove_all(entry.path());
    }

    /// Both want "to/<name>": one gets it, the other's item stays where it was.
    void expectOneWinner(const std::array<std::string, 2>& from, const std::string& kind) {
        const std::string target = "to/" + GetParam();
        for (std::size_t round = 0; round < testRounds(kUsualRounds); ++round) {
            fill({{from[0], kind + " 1"}, {from[1], kind + " 2"}});
            const auto won = contest([&](PVAssetMetadataFileManager& manager, int contestant) {
                return manager.moveAsset_toURL_replaceExisting_error(
                           assetAt(from[contestant]), m_library.url(target),
                           /*replaceExisting=*/false) != nullptr;
            });
            ASSERT_NE(won[0], won[1]) << "in round " << round;
            const int winner = won[0] ? 0 : 1;
            ASSERT_EQ(found(), (Layout{{target, m_filled[from[winner]]},
                                       {from[1 - winner], m_filled[from[1 - winner]]}}))
                << "in round " << round;
            ASSERT_EQ(m_library.litter(), std::vector<std::string>{});
            clear();
        }
    }

    TestLibrary m_library;
    Layout m_filled;
};

TEST_P(Contest, OneOfTwoFilesGetsTheName) {
    expectOneWinner({"from/1.pdf", "from/2.pdf"}, "file");
}

TEST_P(Contest, OneOfTwoPackagesGetsTheName) {
    expectOneWinner({"from/1.epub", "from/2.epub"}, "package");
}

TEST_P(Contest, OneOfTwoGetsTheNameAcrossFileSystems) {
    if (!hasTwoFileSystems())
        GTEST_SKIP() << "only one file system to move within";
    expectOneWinner({"from/1.pdf", "other/2.pdf"}, "file");
}

TEST_P(Contest, CountingUpGivesEachANameOfItsOwn) {
    const std::string& name = GetParam();
    const std::string counted = name.substr(0, name.size() - 4) + " 1.pdf";
    const bool isTooLong = counted.size() > 255;
    for (std::size_t round = 0; round < testRounds(kUsualRounds); ++round) {
        fill({{"from/" + name, "file 1"}, {"cloud/" + name, "file 2"}});
        const auto won = contest([&](PVAssetMetadataFileManager& manager, int contestant) {
            return manager
                       .moveAsset_toDirectory_replaceExisting_renameIfCollision_useAssetIDFileName_error(
                           assetAt((contestant == 0 ? "from/" : "cloud/") + name),
                           m_library.url("to"), /*replaceExisting=*/false,
                           /*renameIfCollision=*/true, /*useAssetIDFileName=*/false) != nullptr;
        });
        const Layout layout = found();
        ASSERT_TRUE(layout.contains("to/" + name)) << "in round " << round;
        ASSERT_EQ(layout.size(), 2U) << "in round " << round;
        if (isTooLong) {
            ASSERT_NE(won[0], won[1]) << "in round " << round;
        } else {
            ASSERT_TRUE(won[0] && won[1]) << "in round " << round;
            ASSERT_TRUE(layout.contains("to/" + counted)) << "in round " << round;
        }
        ASSERT_NE(layout.begin()->second, layout.rbegin()->second) << "in round " << round;
        clear();
    }
}

TEST_P(Contest, OfTwoThatReplaceOneStandsWhole) {
    const std::string target = "to/" + GetParam();
    for (std::size_t round = 0; round < testRounds(kUsualRounds); ++round) {
        fill({{"from/1.epub", "package 1"}, {"from/2.epub", "package 2"}, {target, "package 3"}});
        const auto won = contest([&](PVAssetMetadataFileManager& manager, int contestant) {
            return manager.moveAsset_toURL_replaceExisting_error(
                       assetAt(contestant == 0 ? "from/1.epub" : "from/2.epub"),
                       m_library.url(target), /*replaceExisting=*/true) != nullptr;
        });
        ASSERT_TRUE(won[0] && won[1]) << "in round " << round;
        const Layout layout = found();
        ASSERT_EQ(layout.size(), 1U) << "in round " << round;
        const std::string& item = layout.at(target);
        ASSERT_TRUE(item == "package 1" || item == "package 2") << item;
        ASSERT_EQ(m_library.litter(), std::vector<std::string>{});
        clear();
    }
}

std::string kindOfName(const ::testing::TestParamInfo<std::string>& parameter) {
    static constexpr const char* kinds[] = {"Plain", "Unicode", "NotUTF8", "Longest", "Odd"};
    return kinds[parameter.index];
}

INSTANTIATE_TEST_SUITE_P(Names, Contest, ::testing::ValuesIn(names()), kindOfName);

}  // namespace
}  // namespace parvel::testing
