#include <stdio.h>

#include <filesystem>
#include <map>
#include <memory>
#include <random>

#include <gtest/gtest.h>

#include "cli/JsonReader.h"
#include "tests/support/EpubBuilder.h"
#include "tests/support/SyncthingPair.h"
#include "tests/support/Waiting.h"

namespace parvel::testing {
namespace {

namespace fs = std::filesystem;

/// The program on two devices, each with its own Syncthing, whose folders are kept in step. What is
/// brought into the first one's folder is found by its daemon when the test says so.
class CloudInstall : public ::testing::Test {
protected:
    void SetUp() override {
        if (!SyncthingPair::isInstalled())
            GTEST_SKIP() << "syncthing is not installed";
        m_pair = std::make_unique<SyncthingPair>(SyncthingPair::Scans::OnDemand);
        ASSERT_TRUE(m_pair->isConnected());
    }

    [[nodiscard]] std::string place(const std::string& name) const {
        return m_pair->folder() / name;
    }
    /// Makes a book with that author beside the folders.
    [[nodiscard]] std::string book(const std::string& author, const std::string& text) const {
        const std::string path = place("book.epub");
        EpubBuilder{}
            .opf(opfText("<dc:title>Guide</dc:title><dc:creator>" + author + "</dc:creator>"))
            .file("OPS/text", text)
            .zip(path);
        return path;
    }

    /// The one result of the program, run on a device.
    [[nodiscard]] Dictionary result(const std::string& device, const std::string& command) const {
        const std::string line = "XDG_CONFIG_HOME='" + place("home/" + device) + "' '" +
                                 PARVEL_PROGRAM + "' " + command + " --json";
        std::string output;
        const std::unique_ptr<FILE, int (*)(FILE*)> program(::popen(line.c_str(), "re"), &::pclose);
        char buffer[4096];
        while (const std::size_t length = ::fread(buffer, 1, sizeof buffer, program.get()))
            output.append(buffer, length);
        const Value results = cli::valueFromJson(output);
        return results.as<Array>() && results.as<Array>()->size() == 1
                   ? *(*results.as<Array>())[0].as<Dictionary>()
                   : Dictionary();
    }
    [[nodiscard]] Dictionary record(const std::string& device, const std::string& command) const {
        const Dictionary whole = result(device, command);
        const Value* record = whole.find("record");
        return record && record->as<Dictionary>() ? *record->as<Dictionary>() : Dictionary();
    }
    static std::string text(const Dictionary& dictionary, std::string_view key) {
        const Value* value = dictionary.find(key);
        return value && value->as<String>() ? *value->as<String>() : std::string();
    }
    [[nodiscard]] std::string status(const std::string& device) const {
        return text(result(device, "cloud status '" + place(device + "/Guide.epub") + "'"),
                    "downloadingStatus");
    }
    [[nodiscard]] std::string author(const std::string& device) const {
        return text(record(device, "inspect '" + place(device + "/Guide.epub") + "'"),
                    "artistName");
    }

    [[nodiscard]] bool becomes(const std::string& device, const std::string& expected) const {
        return comesTrue([&] { return status(device) == expected; });
    }

    /// Each file of the book on a device, with its content.
    [[nodiscard]] std::map<std::string, std::string> content(const std::string& device) const {
        std::map<std::string, std::string> files;
        const std::string root = device + "/Guide.epub";
        for (const auto& entry : fs::recursive_directory_iterator(place(root))) {
            const std::string name = entry.path().lexically_relative(place(root)).string();
            if (entry.is_regular_file())
                files[name] = m_pair->folder().read(root + "/" + name);
        }
        return files;
    }

    std::unique_ptr<SyncthingPair> m_pair;
};

TEST_F(CloudInstall, ABookArrivesWholeOnTheOtherDeviceAndIsReplacedThere) {
    const Dictionary installed = record(
        "first", "install --cloud --into '" + place("first") + "' '" + book("Ada", "one") + "'");
    EXPECT_EQ(text(installed, "path"), place("first/Guide.epub"));
    EXPECT_EQ(status("first"), "downloaded");
    ASSERT_TRUE(m_pair->scanFirst());
    EXPECT_TRUE(becomes("first", "current"));
    EXPECT_TRUE(becomes("second", "current"));
    EXPECT_TRUE(comesTrue([this] { return author("second") == "Ada"; }));
    EXPECT_EQ(content("second"), content("first"));
    EXPECT_EQ(content("second")["OPS/text"], "one");

    const Dictionary updated =
        record("first", "install --cloud --replace --into '" + place("first") + "' --updating '" +
                            place("first/Guide.epub") + "' '" + book("Grace", "two") + "'");
    EXPECT_EQ(text(updated, "path"), place("first/Guide.epub"));
    ASSERT_TRUE(m_pair->scanFirst());
    EXPECT_TRUE(comesTrue([this] { return author("second") == "Grace"; }));
    EXPECT_TRUE(becomes("second", "current"));
    EXPECT_EQ(content("second"), content("first"));
    EXPECT_EQ(content("second")["OPS/text"], "two");
}

TEST_F(CloudInstall, ALargeBookInTheMiddleOfItsTransferIsNotDownloaded) {
    std::mt19937 random(1);
    std::string noise(1'200'000, '\0');
    for (char& byte : noise)
        byte = static_cast<char>(random());

    EXPECT_EQ(text(record("first", "install --cloud --into '" + place("first") + "' '" +
                                       book("Ada", noise) + "'"),
                   "path"),
              place("first/Guide.epub"));
    ASSERT_TRUE(m_pair->scanFirst());

    EXPECT_TRUE(comesTrue([this] { return fs::exists(place("second/Guide.epub")); }));
    EXPECT_EQ(status("second"), "notDownloaded");
    EXPECT_FALSE(fs::exists(place("second/Guide.epub/OPS/text")));

    // Taking it out waits for the rest of it.
    EXPECT_EQ(text(record("second", "cloud take --into '" + place("home") + "' '" +
                                        place("second/Guide.epub") + "'"),
                   "path"),
              place("home/Guide.epub"));
    EXPECT_EQ(m_pair->folder().read("home/Guide.epub/OPS/text"), noise);
}

}  // namespace
}  // namespace parvel::testing
