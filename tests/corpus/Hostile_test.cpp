#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <nlohmann/json.hpp>

#include <chrono>
#include <cstdlib>
#include <fstream>
#include <map>
#include <tuple>

#include "parvel/inspection/BestCover.h"
#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

using nlohmann::json;
using ::testing::HasSubstr;
using ::testing::Not;
namespace fs = std::filesystem;

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr bool kIsSanitized = true;  // a sanitizer takes time and memory of its own
#else
constexpr bool kIsSanitized = false;
#endif
constexpr long kMostMemoryInKilobytes = 256 * 1024;
constexpr auto kLongestTime = std::chrono::seconds(kIsSanitized ? 120 : 10);

/// Everything below a folder: what it is, with permissions, how long, and when anything of it, its
/// attributes too, was changed.
using DiskState = std::map<std::string, std::tuple<mode_t, off_t, time_t, long>>;

DiskState stateBelow(const fs::path& folder) {
    DiskState state;
    for (const fs::directory_entry& entry : fs::recursive_directory_iterator(folder)) {
        struct stat status {};
        if (lstat(entry.path().c_str(), &status) == 0)
            state[entry.path()] = {status.st_mode, status.st_size, status.st_ctim.tv_sec,
                                   status.st_ctim.tv_nsec};
    }
    return state;
}

long peakMemoryInKilobytes() {
    rusage usage{};
    getrusage(RUSAGE_SELF, &usage);
    return usage.ru_maxrss;
}

/// Every text and all bytes of a value, one after the other.
std::string contentOf(const Value& value) {
    if (const auto* text = value.as<String>())
        return *text;
    if (const auto* data = value.as<Data>()) {
        std::vector<std::uint8_t> storage;
        return String(data->text(storage));
    }
    std::string content;
    if (const auto* array = value.as<Array>()) {
        for (const Value& item : *array)
            content += contentOf(item);
    }
    if (const auto* dictionary = value.as<Dictionary>()) {
        for (const auto& [key, item] : *dictionary)
            content += key + contentOf(item);
    }
    return content;
}

std::string shellWord(const std::string& path) {
    return "'" + path + "'";
}

/// A folder with a make_hostile.py; the given set stands where the environment says.
enum class Assets { Own, Given };

std::string assetsName(const ::testing::TestParamInfo<Assets>& info) {
    return info.param == Assets::Own ? "Own" : "Given";
}

class HostileTest : public ::testing::TestWithParam<Assets> {
protected:
    void SetUp() override {
        const char* folder =
            GetParam() == Assets::Own ? PARVEL_CORPUS_TESTS : std::getenv("PARVEL_HOSTILE");
        if (!folder)
            GTEST_SKIP() << "PARVEL_HOSTILE names no folder with make_hostile.py";
        if (std::system("python3 -c '' 2>/dev/null") != 0)
            GTEST_SKIP() << "no python3 to make the assets with";
        const std::string command =
            "python3 " + shellWord(folder + std::string("/make_hostile.py")) + " " +
            shellWord(m_assets) + " --canary " + shellWord(m_directory / "canary") + " >/dev/null";
        ASSERT_EQ(std::system(command.c_str()), 0) << command;
        std::ifstream file(m_assets + "/manifest.json");
        m_manifest = json::parse(file);
    }

    [[nodiscard]] static std::string nameAndReason(const json& asset) {
        return asset.at("name").get<std::string>() + ": " + asset.at("why").get<std::string>();
    }
    [[nodiscard]] URL placeOf(const json& asset) const {
        return URL::fileURLWithPath(m_assets + "/" + asset.at("path").get<std::string>());
    }

    void inspect(const json& asset) {
        SCOPED_TRACE(nameAndReason(asset));
        const URL url = placeOf(asset);
        const long memory = peakMemoryInKilobytes();
        const auto start = std::chrono::steady_clock::now();
        std::optional<Error> error;
        const AssetPtr record =
            PVAssetMetadataInspector::metadataIncludingCoverForAssetAtURL_error(url, &error);
        EXPECT_LT(std::chrono::steady_clock::now() - start, kLongestTime);
        if (!kIsSanitized) {
            EXPECT_LT(peakMemoryInKilobytes() - memory, kMostMemoryInKilobytes);
        }

        const std::string expect = asset.at("expect");
        if (expect != "either") {
            EXPECT_EQ(record != nullptr, expect == "record") << (error ? error->message() : "");
        }
        if (record) {
            EXPECT_THAT(contentOf(*record->backingDictionary()),
                        Not(HasSubstr(m_manifest.at("secret").get<std::string>())));
        }
    }

    void seekCover(const json& asset) {
        SCOPED_TRACE(nameAndReason(asset));
        const auto start = std::chrono::steady_clock::now();
        const std::optional<BestCover> cover = bestCoverForAssetAtURL(placeOf(asset));
        EXPECT_LT(std::chrono::steady_clock::now() - start, kLongestTime);
        if (cover) {
            EXPECT_THAT(contentOf(cover->bytes),
                        Not(HasSubstr(m_manifest.at("secret").get<std::string>())));
        }
    }

    TemporaryDirectory m_directory;
    std::string m_assets = m_directory / "assets";
    json m_manifest;
};

TEST_P(HostileTest, EveryAssetEndsInARecordOrAnErrorAndTouchesNothing) {
    const DiskState before = stateBelow(m_directory.path());

    for (const json& asset : m_manifest.at("assets"))
        inspect(asset);

    EXPECT_EQ(stateBelow(m_directory.path()), before);
}

TEST_P(HostileTest, TheBestCoverOfEveryAssetIsItsOwnAndTouchesNothing) {
    const DiskState before = stateBelow(m_directory.path());

    for (const json& asset : m_manifest.at("assets"))
        seekCover(asset);

    EXPECT_EQ(stateBelow(m_directory.path()), before);
}

INSTANTIATE_TEST_SUITE_P(Assets, HostileTest, ::testing::Values(Assets::Own, Assets::Given),
                         assetsName);

}  // namespace
}  // namespace parvel::testing
