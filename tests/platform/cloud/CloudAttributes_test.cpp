#include <sys/stat.h>

#include <filesystem>
#include <optional>
#include <tuple>

#include <gtest/gtest.h>

#include "tests/support/EnvironmentValue.h"
#include "tests/support/ManagedFolder.h"
#include "tests/support/StandInServer.h"

namespace parvel::testing {
namespace {

namespace fs = std::filesystem;

enum class Keeper { Syncthing, Nextcloud };
enum class Form { File, Package };

/// A folder that a client keeps in step, and what stays on the items that go in, out and about.
/// Nextcloud's client is a stand-in that calls everything in step, Syncthing does not run.
class CloudAttributes : public ManagedFolder,
                        public ::testing::WithParamInterface<std::tuple<Keeper, Form>> {
protected:
    void SetUp() override {
        const URL probe = *asset("probe")->url();
        if (!m_manager->setExtendedAttributesForAsset_error(stamped(probe, "ID", "T"), &m_error))
            GTEST_SKIP() << "no extended attributes here";
        if (std::get<Keeper>(GetParam()) == Keeper::Syncthing) {
            m_folder.write("cloud/.stfolder/x", "");
            return;
        }
        m_folder.write("cloud/.sync_0123456789ab.db", "");
        makeFolder("Nextcloud");
        m_server.emplace(m_folder / "Nextcloud/socket", [this](StandInConnection& connection) {
            connection.send("REGISTER_PATH:" + (m_folder / "cloud") + "\n");
            for (std::string line; connection.readLine(line);)
                connection.send(line == "VERSION:"
                                    ? "VERSION:3.7.3:1.1\n"
                                    : "STATUS:OK" + line.substr(line.find(':')) + "\n");
        });
    }

    static MutableAssetPtr stamped(const URL& url, const String& identity, const String& title) {
        const auto record = PVAssetMetadata::metadataWithURL_dictionary(url, nullptr);
        record->setGeneratedID(identity);
        record->setTitle(title);
        return record;
    }
    /// A new book with its attributes, in a folder below.
    MutableAssetPtr book(const std::string& folder, const String& identity, const String& title) {
        const std::string name = folder + "/" + title + ".epub";
        m_folder.write(isPackage() ? name + "/mimetype" : name, "content");
        const auto record = stamped(m_folder.url(name), identity, title);
        EXPECT_TRUE(m_manager->setExtendedAttributesForAsset_error(record));
        return record;
    }
    [[nodiscard]] static bool isPackage() { return std::get<Form>(GetParam()) == Form::Package; }

    /// The attributes of the item that a record names, as the disk has them.
    void expectAttributes(const AssetPtr& record, const Dictionary& expected) {
        ASSERT_TRUE(record);
        EXPECT_EQ(m_manager->extendedAttributesForAsset_error(record), expected);
    }
    static Dictionary attributes(const String& identity, const String& title) {
        return {{"com.kestrel.Folium.assetID", identity}, {"com.kestrel.Folium.title", title}};
    }

    EnvironmentValue m_runtime{"XDG_RUNTIME_DIR", m_folder.path().string()};
    EnvironmentValue m_trash{"XDG_DATA_HOME", m_folder / "data"};
    EnvironmentValue m_configuration{"XDG_CONFIG_HOME", m_folder / "none"};
    std::optional<StandInServer> m_server;
};

TEST_P(CloudAttributes, ABookThatGoesInKeepsThem) {
    const AssetPtr moved = m_manager->setUbiquitous_asset_intoDirectory_replace_error(
        true, book("local", "ID", "Guide"), m_folder.url("cloud"), /*replace=*/false, &m_error);

    expectAttributes(moved, attributes("ID", "Guide"));
}

TEST_P(CloudAttributes, ABookThatGoesInFromAnotherFileSystemKeepsThem) {
    struct stat here {};
    struct stat there {};
    const EnvironmentValue elsewhere("TMPDIR", "/dev/shm");
    if (::stat("/dev/shm", &there) != 0 || ::stat(m_folder.path().c_str(), &here) != 0 ||
        here.st_dev == there.st_dev)
        GTEST_SKIP() << "/dev/shm lies on no other file system";
    const TemporaryDirectory other;
    other.write(isPackage() ? "Guide.epub/mimetype" : "Guide.epub", "content");
    const auto record = stamped(other.url("Guide.epub"), "ID", "Guide");
    if (!m_manager->setExtendedAttributesForAsset_error(record))
        GTEST_SKIP() << "/dev/shm keeps no extended attributes";

    const AssetPtr moved = m_manager->setUbiquitous_asset_intoDirectory_replace_error(
        true, record, m_folder.url("cloud"), /*replace=*/false, &m_error);

    expectAttributes(moved, attributes("ID", "Guide"));
}

TEST_P(CloudAttributes, ABookThatComesOutKeepsThem) {
    makeFolder("local");

    const AssetPtr moved = m_manager->setUbiquitous_asset_intoDirectory_replace_error(
        false, book("cloud", "ID", "Guide"), m_folder.url("local"), /*replace=*/false, &m_error);

    expectAttributes(moved, attributes("ID", "Guide"));
}

TEST_P(CloudAttributes, ANewVersionHasItsOwnAndThoseThatItLacks) {
    const auto old = book("cloud", "OLD", "Old");
    old->setAuthor("Ada");
    ASSERT_TRUE(m_manager->updateExtendedAttributesForAsset_error(old));

    const AssetPtr replaced = m_manager->replaceUbiquitousAsset_withAsset_error(
        old, book("local", "NEW", "New"), &m_error);

    Dictionary expected = attributes("NEW", "New");
    expected.set("com.kestrel.Folium.author", "Ada");
    expectAttributes(replaced, expected);
    ASSERT_TRUE(replaced);
    EXPECT_EQ(replaced->url(), m_folder.url("cloud/New.epub"));
}

TEST_P(CloudAttributes, ANewVersionThatWasNeverStampedHasTheOldIdentity) {
    const auto old = book("cloud", "OLD", "Guide");
    m_folder.write(isPackage() ? "local/new.epub/mimetype" : "local/new.epub", "new");

    m_manager->setUbiquitous_asset_intoDirectory_replace_error(
        true, stamped(m_folder.url("local/new.epub"), "NEW", "Guide"), m_folder.url("cloud"),
        /*replace=*/true, &m_error);

    expectAttributes(old, attributes("OLD", "Guide"));
}

TEST_P(CloudAttributes, ABookThatIsMovedAsideKeepsThem) {
    makeFolder("aside");

    const AssetPtr redacted = m_manager->redactAsset_intoDirectory_error(
        book("cloud", "ID", "Guide"), m_folder.url("aside"), &m_error);

    expectAttributes(redacted, attributes("ID", "Guide"));
}

TEST_P(CloudAttributes, ATrashedBookKeepsThem) {
    const AssetPtr trashed = m_manager->trashAsset_error(book("cloud", "ID", "Guide"), &m_error);

    ASSERT_TRUE(trashed && trashed->trashedURL());
    expectAttributes(PVAssetMetadata::metadataWithURL_dictionary(trashed->trashedURL(), nullptr),
                     attributes("ID", "Guide"));
}

TEST_P(CloudAttributes, WhatAnotherDevicesUpdateWipedIsWrittenAnew) {
    const auto record = book("cloud", "ID", "Guide");
    fs::remove_all(m_folder / "cloud/Guide.epub");
    m_folder.write(isPackage() ? "cloud/Guide.epub/mimetype" : "cloud/Guide.epub", "update");
    expectAttributes(record, {});

    EXPECT_FALSE(m_manager->updateExtendedAttributesForAsset_error(record, &m_error));
    EXPECT_EQ(m_error, makeNoIdentityError());
    EXPECT_TRUE(m_manager->setExtendedAttributesForAsset_error(record));

    expectAttributes(record, attributes("ID", "Guide"));
}

std::string nameOfCase(const ::testing::TestParamInfo<std::tuple<Keeper, Form>>& info) {
    const auto [keeper, form] = info.param;
    return std::string(form == Form::File ? "File" : "Package") +
           (keeper == Keeper::Syncthing ? "InSyncthing" : "InNextcloud");
}

INSTANTIATE_TEST_SUITE_P(Book, CloudAttributes,
                         ::testing::Combine(::testing::Values(Keeper::Syncthing, Keeper::Nextcloud),
                                            ::testing::Values(Form::File, Form::Package)),
                         nameOfCase);

/// A placeholder of Nextcloud's, which carries its item's attributes.
class PlaceholderAttributes : public ManagedFolder {};

TEST_F(PlaceholderAttributes, APlaceholderThatIsMovedWithinItsRootKeepsThem) {
    const Dictionary expected{{"com.kestrel.Folium.assetID", "ID"}};
    m_folder.write("cloud/.sync_0123456789ab.db", "");
    makeFolder("cloud/below");
    const auto placeholder = asset("cloud/Guide.epub.nextcloud", " ");
    placeholder->setGeneratedID("ID");
    if (!m_manager->setExtendedAttributesForAsset_error(placeholder, &m_error))
        GTEST_SKIP() << "no extended attributes here";
    const auto record =
        PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("cloud/Guide.epub"), nullptr);
    EXPECT_EQ(m_manager->extendedAttributesForAsset_error(record), expected);

    const AssetPtr moved =
        m_manager->redactAsset_intoDirectory_error(record, m_folder.url("cloud/below"), &m_error);

    ASSERT_TRUE(moved);
    EXPECT_EQ(moved->url(), m_folder.url("cloud/below/Guide.epub"));
    EXPECT_EQ(m_manager->extendedAttributesForAsset_error(moved), expected);
}

}  // namespace
}  // namespace parvel::testing
