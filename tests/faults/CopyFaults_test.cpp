// A copy whose last calls fail, those that write it through and close it, is no success.

#include <cerrno>
#include <filesystem>
#include <functional>

#include <gtest/gtest.h>

#include "parvel/platform/ArchiveCopier.h"
#include "parvel/platform/CopyService.h"
#include "tests/faults/TrappedRun.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/ZipBuilder.h"

namespace parvel::testing {
namespace {

class CopyFaults : public ::testing::Test {
protected:
    void SetUp() override {
        if (const auto reason = whyNoTraps())
            GTEST_SKIP() << *reason;
        giveToChildren(m_folder.path().string());
    }

    /// How many of the calls of that name end the copy where they fail.
    std::size_t decisiveCalls(const char* name, const std::function<bool()>& copy) {
        const TrappedRun whole = run({}, copy);
        EXPECT_EQ(whole.result, true);
        std::size_t count = 0;
        for (std::size_t i = 0; i < whole.calls.size(); ++i) {
            if (std::string_view(whole.calls[i]) != name)
                continue;
            const auto result = run({Trap::Act::Fail, i, EIO}, copy).result;
            EXPECT_TRUE(result.has_value()) << "it crashed";
            count += result == false ? 1 : 0;
        }
        return count;
    }
    bool copyFile() {
        return CopyService::host().copy(m_folder / "source", copyPath(), nullptr) == 0;
    }
    bool copyPackage(bool isZip) {
        Dictionary options;
        options.set(ArchiveCopier::extractPKZip, Number::boolean(isZip));
        const auto copier = ArchiveCopierFactory::host().makeCopier();
        return copier->copy(m_folder / "source", copyPath(), options) == 0;
    }

    TemporaryDirectory m_folder;

private:
    [[nodiscard]] std::string copyPath() const { return m_folder / "copy"; }
    TrappedRun run(const Trap& trap, const std::function<bool()>& copy) {
        std::filesystem::remove_all(copyPath());
        return runTrapped(trap, {}, copy);
    }
};

TEST_F(CopyFaults, APlainCopyFailsWithTheSyncsOfItsFileAndOfItsFolder) {
    m_folder.write("source", "content");

    EXPECT_EQ(decisiveCalls("fsync", [this] { return copyFile(); }), 2U);
}

TEST_F(CopyFaults, APlainCopyFailsWithTheCloseOfItsFile) {
    m_folder.write("source", "content");

    EXPECT_EQ(decisiveCalls("close", [this] { return copyFile(); }), 1U);
}

TEST_F(CopyFaults, APlainCopyOfAFolderFailsWithTheSyncsOfBoth) {
    std::filesystem::create_directory(m_folder / "source");

    EXPECT_EQ(decisiveCalls("fsync", [this] { return copyFile(); }), 2U);
}

TEST_F(CopyFaults, AnExpansionFailsWithTheCloseOfEachFileAndTheLastSyncs) {
    m_folder.write("source", ZipBuilder{}.stored("a", "1").deflated("b/c", "2").bytes());
    const auto expand = [this] { return copyPackage(/*isZip=*/true); };

    EXPECT_EQ(decisiveCalls("close", expand), 2U);
    EXPECT_EQ(decisiveCalls("syncfs", expand), 1U);
    EXPECT_EQ(decisiveCalls("fsync", expand), 1U);
}

TEST_F(CopyFaults, ATreesCopyFailsWithTheCloseOfEachFileAndTheLastSyncs) {
    m_folder.write("source/a", "1");
    m_folder.write("source/b/c", "2");
    const auto copy = [this] { return copyPackage(/*isZip=*/false); };

    EXPECT_EQ(decisiveCalls("close", copy), 2U);
    EXPECT_EQ(decisiveCalls("syncfs", copy), 1U);
    EXPECT_EQ(decisiveCalls("fsync", copy), 1U);
}

}  // namespace
}  // namespace parvel::testing
