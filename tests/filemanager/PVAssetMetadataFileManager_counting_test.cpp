#include <fstream>
#include <utility>

#include <gtest/gtest.h>

#include "tests/support/MovedAssets.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/RecordingFileSystem.h"
#include "tests/support/RefusingServices.h"

namespace parvel::testing {
namespace {

using Lines = std::vector<std::string>;

class CountingUp : public MovedAssets {
protected:
    static std::string lineOfCount(int count) {
        return "default Duplicate name encountered during renaming. Appending count to file " +
               std::to_string(count);
    }
};

TEST_F(CountingUp, ACollidingPDFIsCountedUp) {
    const URL library = makeFolder("library");
    m_folder.write("library/Guide.pdf", "2");
    m_folder.write("library/Guide 1.pdf", "2");
    const auto guide = asset("Guide.pdf");
    RecordedLog log;

    const AssetPtr moved = moveInto(guide, library, {.renameIfCollision = true});

    ASSERT_TRUE(moved);
    EXPECT_EQ(moved->url(), m_folder.url("library/Guide 2.pdf"));
    ASSERT_EQ(log.lines().size(), 4U);
    EXPECT_EQ(log.lines()[0], "debug Rename: Start");
    EXPECT_EQ(log.lines()[1], lineOfCount(1));
    EXPECT_EQ(log.lines()[2], lineOfCount(2));
    EXPECT_TRUE(log.lines()[3].starts_with("default Rename: Move without replacement."));
}

TEST_F(CountingUp, ACollidingAudiobookIsCountedUp) {
    const URL library = makeFolder("library");
    m_folder.write("library/Tale.m4a", "2");

    EXPECT_TRUE(moveInto(asset("Tale.m4a", "1"), library, {.renameIfCollision = true}));

    EXPECT_EQ(names("library"), (Names{"Tale 1.m4a", "Tale.m4a"}));
    EXPECT_EQ(m_folder.read("library/Tale 1.m4a"), "1");
}

TEST_F(CountingUp, AFreeNameIsNotCounted) {
    const URL library = makeFolder("library");
    RecordedLog log;

    EXPECT_TRUE(moveInto(asset("Guide.pdf"), library, {.renameIfCollision = true}));

    EXPECT_EQ(names("library"), Names{"Guide.pdf"});
    EXPECT_EQ(log.lines().size(), 2U);
}

TEST_F(CountingUp, ANameWithoutExtensionIsCountedWithoutADot) {
    const URL library = makeFolder("library");
    m_folder.write("library/Guide", "2");
    const auto guide = asset("Guide");
    guide->setAssetType(PVAssetTypePDF);

    EXPECT_TRUE(moveInto(guide, library, {.renameIfCollision = true}));

    EXPECT_EQ(names("library"), (Names{"Guide", "Guide 1"}));
}

TEST_F(CountingUp, TheCountStandsBeforeTheLastExtension) {
    const URL library = makeFolder("library");
    m_folder.write("library/Guide.en.pdf", "2");

    EXPECT_TRUE(moveInto(asset("Guide.en.pdf"), library, {.renameIfCollision = true}));

    EXPECT_EQ(names("library"), (Names{"Guide.en 1.pdf", "Guide.en.pdf"}));
}

TEST_F(CountingUp, APDFCountsPastItselfInItsOwnFolder) {
    const auto guide = asset("library/Guide.pdf");

    EXPECT_TRUE(moveInto(guide, m_folder.url("library"), {.renameIfCollision = true}));

    EXPECT_EQ(names("library"), Names{"Guide 1.pdf"});
}

TEST_F(CountingUp, APDFThatMayReplaceIsCountedUpAllTheSame) {
    const URL library = makeFolder("library");
    m_folder.write("library/Guide.pdf", "2");
    const auto guide = asset("Guide.pdf", "1");
    RecordedLog log;

    EXPECT_TRUE(moveInto(guide, library, {.replace = true, .renameIfCollision = true}));

    EXPECT_EQ(m_folder.read("library/Guide.pdf"), "2");
    EXPECT_EQ(m_folder.read("library/Guide 1.pdf"), "1");
    ASSERT_EQ(log.lines().size(), 3U);
    EXPECT_EQ(log.lines()[1], lineOfCount(1));
    EXPECT_TRUE(log.lines()[2].starts_with("default Rename: Replacing possibly existing file."));
}

TEST_F(CountingUp, ACollidingPDFFailsOrReplacesWithoutCounting) {
    const URL library = makeFolder("library");
    m_folder.write("library/Guide.pdf", "2");

    EXPECT_FALSE(moveInto(asset("Guide.pdf", "1"), library));
    EXPECT_EQ(m_error,
              makeFileError(PVFileErrorCode::FileExists, m_folder.url("library/Guide.pdf")));

    EXPECT_TRUE(moveInto(asset("Guide.pdf", "1"), library, {.replace = true}));
    EXPECT_EQ(m_folder.read("library/Guide.pdf"), "1");
    EXPECT_EQ(names("library"), Names{"Guide.pdf"});
}

/// Says that every name up to a count is taken.
class CrowdedService : public ForwardingFileSystemService {
public:
    explicit CrowdedService(int taken)
        : ForwardingFileSystemService(FileSystemService::makeDefault()), m_taken(taken) {}
    bool itemExistsAtPath(const std::string&) override { return m_taken-- > 0; }

private:
    int m_taken;
};

class CrowdedLibrary : public CountingUp {
protected:
    CrowdedLibrary() {
        makeFolder("library");
        m_manager->setFileManager(std::make_shared<CrowdedService>(1 << 20));
    }

    AssetPtr m_guide = asset("Guide.pdf", "1");
    URL m_library = m_folder.url("library");
};

TEST_F(CrowdedLibrary, CountingEndsAt9999WithThatNameTakenOrNot) {
    RecordedLog log;

    const AssetPtr moved = moveInto(m_guide, m_library, {.renameIfCollision = true});

    ASSERT_TRUE(moved);
    EXPECT_EQ(names("library"), Names{"Guide 9999.pdf"});
    ASSERT_EQ(log.lines().size(), 10001U);
    EXPECT_EQ(log.lines()[1], lineOfCount(1));
    EXPECT_EQ(log.lines()[9999], lineOfCount(9999));
}

TEST_F(CrowdedLibrary, TheLastNameThatIsTakenFailsTheMove) {
    m_folder.write("library/Guide 9999.pdf", "2");

    EXPECT_FALSE(moveInto(m_guide, m_library, {.renameIfCollision = true}));

    EXPECT_EQ(m_error,
              makeFileError(PVFileErrorCode::FileExists, m_folder.url("library/Guide 9999.pdf")));
    EXPECT_EQ(m_folder.read("library/Guide 9999.pdf"), "2");
    EXPECT_EQ(m_folder.read("Guide.pdf"), "1");
}

TEST_F(CrowdedLibrary, TheLastNameThatIsTakenIsReplacedIfAsked) {
    m_folder.write("library/Guide 9999.pdf", "2");

    EXPECT_TRUE(moveInto(m_guide, m_library, {.replace = true, .renameIfCollision = true}));

    EXPECT_EQ(m_folder.read("library/Guide 9999.pdf"), "1");
    EXPECT_EQ(names("library"), Names{"Guide 9999.pdf"});
}

/// Takes the name between the test and the move, once.
class CompetingService : public ForwardingFileSystemService {
public:
    CompetingService() : ForwardingFileSystemService(FileSystemService::makeDefault()) {}
    bool itemExistsAtPath(const std::string& path) override {
        return isCrowded || ForwardingFileSystemService::itemExistsAtPath(path);
    }
    bool moveItem(const URL& source, const URL& destination, ErrorOut error) override {
        if (!std::exchange(m_hasCompeted, true))
            std::ofstream(destination.path()) << "competitor";
        return ForwardingFileSystemService::moveItem(source, destination, error);
    }
    bool isCrowded = false;

private:
    bool m_hasCompeted = false;
};

TEST_F(CountingUp, ACompetitorThatTookTheNameSendsTheCountOn) {
    m_manager->setFileManager(std::make_shared<CompetingService>());
    const URL library = makeFolder("library");
    RecordedLog log;

    const AssetPtr moved =
        moveInto(asset("Guide.pdf", "mine"), library, {.renameIfCollision = true});

    ASSERT_TRUE(moved);
    EXPECT_EQ(m_folder.read("library/Guide.pdf"), "competitor");
    EXPECT_EQ(m_folder.read("library/Guide 1.pdf"), "mine");
    ASSERT_EQ(log.lines().size(), 4U);
    EXPECT_TRUE(log.lines()[1].starts_with("default Rename: Move without replacement."));
    EXPECT_TRUE(log.lines()[2].starts_with("default Duplicate name"));
    EXPECT_TRUE(log.lines()[3].starts_with("default Rename: Move without replacement."));
}

TEST_F(CountingUp, ATryThatWasMadeAgainLeavesNoErrorBesideTheResult) {
    m_manager->setFileManager(std::make_shared<CompetingService>());
    RecordedLog log;

    EXPECT_TRUE(moveInto(asset("Guide.pdf"), makeFolder("library"), {.renameIfCollision = true}));

    EXPECT_FALSE(m_error);
    EXPECT_FALSE(log.lines()[1].ends_with("error: (null)"));
    EXPECT_TRUE(log.lines()[3].ends_with("error: (null)"));
}

TEST_F(CountingUp, ACompetitorForTheLastNameFailsTheMove) {
    const auto service = std::make_shared<CompetingService>();
    service->isCrowded = true;
    m_manager->setFileManager(service);

    EXPECT_FALSE(moveInto(asset("Guide.pdf"), makeFolder("library"), {.renameIfCollision = true}));

    EXPECT_EQ(m_error,
              makeFileError(PVFileErrorCode::FileExists, m_folder.url("library/Guide 9999.pdf")));
}

TEST_F(CountingUp, ACompetitorIsNotCountedPastUnlessAsked) {
    m_manager->setFileManager(std::make_shared<CompetingService>());

    EXPECT_FALSE(moveInto(asset("Guide.pdf"), makeFolder("library")));

    EXPECT_EQ(names("library"), Names{"Guide.pdf"});
    EXPECT_EQ(m_folder.read("library/Guide.pdf"), "competitor");
}

TEST_F(CountingUp, AFailureThatIsNoCollisionEndsTheMove) {
    m_manager->setFileManager(
        std::make_shared<RefusingFileSystem>([](auto, const URL&) { return true; }));
    const auto guide = asset("Guide.pdf");
    RecordedLog log;

    EXPECT_FALSE(moveInto(guide, makeFolder("library"), {.renameIfCollision = true}));

    EXPECT_EQ(m_error, makePOSIXError(EIO, m_folder.url("Guide.pdf")));
    EXPECT_EQ(log.lines().size(), 2U);
}

TEST_F(CountingUp, TheGivenServiceTellsWhatIsTaken) {
    const auto service = std::make_shared<RecordingFileSystem>();
    m_manager->setFileManager(service);
    const URL library = makeFolder("library");
    m_folder.write("library/a.pdf", "");

    EXPECT_TRUE(moveInto(asset("a.pdf"), library, {.renameIfCollision = true}));

    EXPECT_EQ(
        service->calls,
        (Lines{"exists " + (m_folder / "library/a.pdf"), "exists " + (m_folder / "library/a 1.pdf"),
               "move " + (m_folder / "a.pdf") + " to " + (m_folder / "library/a 1.pdf")}));
}

TEST_F(CountingUp, AFreeNameDoesNotChange) {
    EXPECT_EQ(m_manager->nonCollidingNameForFileName_inDestPath("a.pdf", m_folder.path()), "a.pdf");
}

TEST_F(CountingUp, ATakenNameIsCountedToTheFirstThatIsFree) {
    m_folder.write("a.pdf", "");
    m_folder.write("a 1.pdf", "");

    EXPECT_EQ(m_manager->nonCollidingNameForFileName_inDestPath("a.pdf", m_folder.path()),
              "a 2.pdf");
}

TEST_F(CountingUp, ATakenNameWithoutExtensionGetsATrailingDot) {
    m_folder.write("notes", "");

    EXPECT_EQ(m_manager->nonCollidingNameForFileName_inDestPath("notes", m_folder.path()),
              "notes 1.");
}

TEST_F(CountingUp, ANameIsLookedForInTheGivenDirectory) {
    const auto service = std::make_shared<RecordingFileSystem>();
    m_manager->setFileManager(service);
    m_folder.write("a.pdf", "");

    EXPECT_EQ(m_manager->nonCollidingNameForFileName_inDestPath("a.pdf", m_folder.path()),
              "a 1.pdf");

    EXPECT_EQ(service->calls,
              (Lines{"exists " + (m_folder / "a.pdf"), "exists " + (m_folder / "a 1.pdf")}));
}

TEST_F(CountingUp, CountingANameHasNoLimit) {
    m_manager->setFileManager(std::make_shared<CrowdedService>(12001));

    EXPECT_EQ(m_manager->nonCollidingNameForFileName_inDestPath("a.pdf", m_folder.path()),
              "a 12001.pdf");
}

}  // namespace
}  // namespace parvel::testing
