#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "tests/support/EpubBuilder.h"
#include "tests/support/ManagedFolder.h"
#include "tests/support/Records.h"

namespace parvel::testing {
namespace {

namespace fs = std::filesystem;

constexpr uid_t kBookOwner = 4001;
constexpr gid_t kBookGroup = 4002;

/// A reader's book that root edits.
class EditingAnothersBooks : public ManagedFolder {
protected:
    void SetUp() override {
        if (geteuid() != 0)
            GTEST_SKIP() << "only root can give files away";
        makeFolder("temporary");
    }

    static EpubBuilder builder() {
        return EpubBuilder{}
            .opf(opfText("<dc:title>Old</dc:title>"))
            .file("OPS/text.xhtml", "text")
            .file("BazaarMetadata.plist", "<plist version=\"1.0\"><dict/></plist>");
    }
    AssetPtr edited(const URL& book) {
        for (const auto& entry : fs::recursive_directory_iterator(m_folder.path()))
            EXPECT_EQ(lchown(entry.path().c_str(), kBookOwner, kBookGroup), 0);
        const AssetPtr record =
            PVAssetMetadataInspector::metadataForAssetAtURL_error(book, &m_error);
        if (!record || !m_manager->setExtendedAttributesForAsset_error(record))
            return nullptr;
        const Dictionary updates{{"itemName", "New"}};
        return m_manager->updateAsset_withUpdates_temporaryDirectory_inflateIfNeeded_error(
            record, &updates, m_folder.url("temporary"), /*inflateIfNeeded=*/true, &m_error);
    }
    void expectTheOwners(const std::string& name) const {
        struct stat status {};
        ASSERT_EQ(lstat((m_folder / name).c_str(), &status), 0) << name;
        EXPECT_EQ(status.st_uid, kBookOwner) << name;
        EXPECT_EQ(status.st_gid, kBookGroup) << name;
    }
};

TEST_F(EditingAnothersBooks, AZippedBookThatIsExpandedForItStaysItsOwners) {
    EXPECT_TRUE(edited(builder().zip(m_folder / "a.epub")));

    EXPECT_FALSE(m_error);
    for (const char* name : {"a.epub", "a.epub/OPS", "a.epub/OPS/text.xhtml",
                             "a.epub/BazaarMetadata.plist", "a.epub/BazaarMetadata-original.plist"})
        expectTheOwners(name);
    EXPECT_EQ(names(), (Names{"a.epub", "temporary"}));
}

TEST_F(EditingAnothersBooks, AStoreFileThatIsWrittenAnewStaysItsOwners) {
    EXPECT_TRUE(edited(builder().expand(m_folder / "a.epub")));

    EXPECT_FALSE(m_error);
    for (const char* name :
         {"a.epub", "a.epub/BazaarMetadata.plist", "a.epub/BazaarMetadata-original.plist"})
        expectTheOwners(name);
}

}  // namespace
}  // namespace parvel::testing
