// Whose a file is, and who else may do what with it, after it was written anew, replaced, copied or
// expanded: by root, who may give files away, and by an ordinary user.

#include <sys/fsuid.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <cstring>
#include <filesystem>
#include <tuple>

#include <gtest/gtest.h>

#include "parvel/foundation/Number.h"
#include "parvel/platform/ArchiveCopier.h"
#include "parvel/platform/FileSystemService.h"
#include "parvel/platform/FileWriter.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/ZipBuilder.h"

namespace parvel::testing {
namespace {

namespace fs = std::filesystem;

constexpr uid_t kReader = 4001;
constexpr gid_t kReaders = 4002;
constexpr uid_t kGuest = 4003;  // whom access lists name
constexpr uid_t kWriter = 4004;
constexpr gid_t kWriters = 4005;

/// What the file system asks for on this thread is asked by an ordinary user while it lives.
class AsWriter {
public:
    AsWriter() {
        setfsgid(kWriters);
        setfsuid(kWriter);
    }
    ~AsWriter() {
        setfsuid(geteuid());
        setfsgid(getegid());
    }
    AsWriter(const AsWriter&) = delete;
    AsWriter& operator=(const AsWriter&) = delete;
};

/// One entry of an access list as the kernel has it, on machines whose bytes stand as there.
struct AccessEntry {
    std::uint16_t tag;
    std::uint16_t rights;
    std::uint32_t id = UINT32_MAX;
};

/// A list that names the guest, whatever the group and the others may.
std::string listWithGuest(std::uint16_t guest, std::uint16_t group, std::uint16_t others) {
    const std::uint32_t version = 2;
    const AccessEntry entries[] = {
        {0x01, 6}, {0x02, guest, kGuest}, {0x04, group}, {0x10, 7}, {0x20, others}};
    std::string bytes(sizeof version + sizeof entries, '\0');
    std::memcpy(bytes.data(), &version, sizeof version);
    std::memcpy(bytes.data() + sizeof version, entries, sizeof entries);
    return bytes;
}

class ItemOwners : public ::testing::Test {
protected:
    void SetUp() override {
        if (geteuid() != 0)
            GTEST_SKIP() << "only root can give files away";
        ASSERT_EQ(chmod(m_folder.path().c_str(), 0777), 0);
    }

    /// A file of the reader's.
    std::string file(const std::string& name, mode_t mode, gid_t group = kReaders) {
        const std::string path = m_folder.write(name, "old");
        EXPECT_EQ(chown(path.c_str(), kReader, group), 0);
        EXPECT_EQ(chmod(path.c_str(), mode), 0);
        return path;
    }
    bool write(const std::string& name) {
        return FileWriter::host().writeFile(m_folder.url(name), Data::copyOf("new"), &m_error);
    }
    bool replace(const std::string& existing, const std::string& replacement,
                 ReplaceOptions options) {
        return m_service->replaceItem(m_folder.url(existing), m_folder.url(replacement), options,
                                      nullptr, &m_error);
    }
    bool setList(const std::string& path, const char* kind, const std::string& list) {
        const std::string name = std::string("system.posix_acl_") + kind;
        return setxattr(path.c_str(), name.c_str(), list.data(), list.size(), 0) == 0;
    }
    static std::string listOf(const std::string& path) {
        std::string list(1024, '\0');
        const ssize_t size =
            getxattr(path.c_str(), "system.posix_acl_access", list.data(), list.size());
        return list.substr(0, size < 0 ? 0 : static_cast<std::size_t>(size));
    }
    struct Owned {
        uid_t owner = 0;
        gid_t group = 0;
        mode_t mode = 0;
        bool operator==(const Owned& other) const {
            return std::tie(owner, group, mode) == std::tie(other.owner, other.group, other.mode);
        }
        friend std::ostream& operator<<(std::ostream& stream, const Owned& owned) {
            return stream << owned.owner << ":" << owned.group << " " << std::oct << owned.mode;
        }
    };
    [[nodiscard]] Owned ownedAt(const std::string& name) const {
        struct stat status {};
        EXPECT_EQ(lstat((m_folder / name).c_str(), &status), 0) << name;
        return {status.st_uid, status.st_gid, status.st_mode & 07777};
    }

    TemporaryDirectory m_folder;
    std::shared_ptr<FileSystemService> m_service = FileSystemService::makeDefault();
    std::optional<Error> m_error;
};

TEST_F(ItemOwners, AFileThatRootWritesAnewStaysItsOwners) {
    file("a", 0640);

    EXPECT_TRUE(write("a"));

    EXPECT_FALSE(m_error);
    EXPECT_EQ(m_folder.read("a"), "new");
    EXPECT_EQ(ownedAt("a"), (Owned{kReader, kReaders, 0640}));
}

TEST_F(ItemOwners, ANewFileIsTheWriters) {
    {
        const AsWriter writer;
        EXPECT_TRUE(write("a"));
    }

    EXPECT_EQ(ownedAt("a").owner, kWriter);
    EXPECT_EQ(ownedAt("a").group, kWriters);
}

TEST_F(ItemOwners, AFileWrittenAnewLosesItsSetIDBits) {
    file("a", 06755);

    EXPECT_TRUE(write("a"));

    EXPECT_EQ(ownedAt("a"), (Owned{kReader, kReaders, 0755}));
}

TEST_F(ItemOwners, AnothersFileBecomesTheWritersAndKeepsAGroupThatIsHis) {
    file("a", 0660, kWriters);

    const AsWriter writer;
    EXPECT_TRUE(write("a"));

    EXPECT_FALSE(m_error);
    EXPECT_EQ(ownedAt("a"), (Owned{kWriter, kWriters, 0660}));
}

TEST_F(ItemOwners, WithoutItsGroupAFileLetsNobodyInWhomItKeptOut) {
    file("a", 0664);
    file("b", 0606);

    const AsWriter writer;
    EXPECT_TRUE(write("a"));
    EXPECT_TRUE(write("b"));

    EXPECT_FALSE(m_error);
    EXPECT_EQ(ownedAt("a"), (Owned{kWriter, kWriters, 0644}));
    EXPECT_EQ(ownedAt("b"), (Owned{kWriter, kWriters, 0600}));
}

TEST_F(ItemOwners, AFileWrittenAnewKeepsItsAccessList) {
    const std::string path = file("a", 0600);
    const std::string list = listWithGuest(/*guest=*/4, /*group=*/0, /*others=*/0);
    if (!setList(path, "access", list))
        GTEST_SKIP() << "no access lists here: " << strerror(errno);

    EXPECT_TRUE(write("a"));

    EXPECT_EQ(listOf(path), list);
    EXPECT_EQ(ownedAt("a"), (Owned{kReader, kReaders, 0670}));
}

TEST_F(ItemOwners, WithAnAccessListButWithoutItsGroupAFileIsTheWritersAlone) {
    const std::string path = file("a", 0600);
    if (!setList(path, "access", listWithGuest(/*guest=*/6, /*group=*/6, /*others=*/4)))
        GTEST_SKIP() << "no access lists here: " << strerror(errno);

    const AsWriter writer;
    EXPECT_TRUE(write("a"));

    EXPECT_EQ(listOf(path), "");
    EXPECT_EQ(ownedAt("a"), (Owned{kWriter, kWriters, 0600}));
}

TEST_F(ItemOwners, AFileWrittenAnewGetsNoAccessListFromItsFolder) {
    const std::string path = file("a", 0660);
    if (!setList(m_folder.path(), "default", listWithGuest(/*guest=*/7, /*group=*/7, /*others=*/0)))
        GTEST_SKIP() << "no access lists here: " << strerror(errno);

    EXPECT_TRUE(write("a"));

    EXPECT_EQ(listOf(path), "");
    EXPECT_EQ(ownedAt("a"), (Owned{kReader, kReaders, 0660}));
}

TEST_F(ItemOwners, ADefaultReplacementStaysTheOldItemsOwners) {
    file("old", 0640);
    m_folder.write("new", "2");

    EXPECT_TRUE(replace("old", "new", ReplaceOptions::Default));

    EXPECT_FALSE(m_error);
    EXPECT_EQ(m_folder.read("old"), "2");
    EXPECT_EQ(ownedAt("old"), (Owned{kReader, kReaders, 0640}));
}

TEST_F(ItemOwners, ADefaultReplacementOfAPackageGivesItsMembersToo) {
    const std::string old = m_folder.write("old/a", "1");
    ASSERT_EQ(chown((m_folder / "old").c_str(), kReader, kReaders), 0);
    m_folder.write("new/OPS/text", "2");
    fs::create_symlink("OPS/text", m_folder / "new/link");
    ASSERT_EQ(chmod((m_folder / "new/OPS").c_str(), 0700), 0);

    EXPECT_TRUE(replace("old", "new", ReplaceOptions::Default));

    EXPECT_FALSE(m_error);
    EXPECT_EQ(ownedAt("old/OPS"), (Owned{kReader, kReaders, 0700}));
    for (const char* name : {"old", "old/OPS/text", "old/link"}) {
        EXPECT_EQ(ownedAt(name).owner, kReader) << name;
        EXPECT_EQ(ownedAt(name).group, kReaders) << name;
    }
    EXPECT_FALSE(fs::exists(m_folder / "new"));
}

TEST_F(ItemOwners, APackageInAZippedBooksPlaceIsItsOwnersToo) {
    file("old", 0644);
    m_folder.write("new/OPS/text", "2");
    ASSERT_EQ(chmod((m_folder / "new").c_str(), 0700), 0);

    EXPECT_TRUE(replace("old", "new", ReplaceOptions::Default));

    EXPECT_EQ(ownedAt("old"), (Owned{kReader, kReaders, 0700}));
    EXPECT_EQ(ownedAt("old/OPS/text").owner, kReader);
}

TEST_F(ItemOwners, ADefaultReplacementKeepsTheOldItemsAccessList) {
    const std::string old = file("old", 0600);
    const std::string list = listWithGuest(/*guest=*/4, /*group=*/0, /*others=*/0);
    if (!setList(old, "access", list))
        GTEST_SKIP() << "no access lists here: " << strerror(errno);
    file("new", 0670);

    EXPECT_TRUE(replace("old", "new", ReplaceOptions::Default));

    EXPECT_EQ(listOf(old), list);
}

TEST_F(ItemOwners, AReplacementOfNewMetadataOnlyBelongsToTheNewItemsOwner) {
    file("old", 0640);
    m_folder.write("new", "2");
    ASSERT_EQ(chown((m_folder / "new").c_str(), kWriter, kWriters), 0);

    EXPECT_TRUE(replace("old", "new", ReplaceOptions::NewMetadataOnly));

    EXPECT_EQ(ownedAt("old").owner, kWriter);
    EXPECT_EQ(ownedAt("old").group, kWriters);
}

TEST_F(ItemOwners, ACopyHasTheOwnerAndTheAccessListOfItsOriginal) {
    const std::string original = file("a", 0600);
    const std::string list = listWithGuest(/*guest=*/4, /*group=*/0, /*others=*/0);
    if (!setList(original, "access", list))
        GTEST_SKIP() << "no access lists here: " << strerror(errno);

    EXPECT_TRUE(m_service->copyItem(m_folder.url("a"), m_folder.url("b"), &m_error));

    EXPECT_EQ(listOf(m_folder / "b"), list);
    EXPECT_EQ(ownedAt("b"), ownedAt("a"));
}

class BookOwners : public ItemOwners {
protected:
    int expand(const std::string& archive, const std::string& package) {
        const Dictionary options{{std::string(ArchiveCopier::extractPKZip), Number::boolean(true)}};
        return ArchiveCopierFactory::host().makeCopier()->copy(m_folder / archive,
                                                               m_folder / package, options);
    }
    void makeBook(const std::string& name, uid_t owner = kReader, gid_t group = kReaders) {
        m_folder.write(name, ZipBuilder{}.deflated("OPS/text/a", "1").stored("b", "2").bytes());
        ASSERT_EQ(chown((m_folder / name).c_str(), owner, group), 0);
    }
};

TEST_F(BookOwners, APackageThatRootCopiesIsItsOwnersLinksIncluded) {
    m_folder.write("from/OPS/text", "1");
    fs::create_symlink("OPS/text", m_folder / "from/link");
    for (const char* member : {"from/link", "from/OPS/text", "from/OPS", "from"})
        ASSERT_EQ(lchown((m_folder / member).c_str(), kReader, kReaders), 0);

    EXPECT_TRUE(m_service->copyItem(m_folder.url("from"), m_folder.url("copy"), &m_error));
    EXPECT_EQ(ArchiveCopierFactory::host().makeCopier()->copy(m_folder / "from",
                                                              m_folder / "package", {}),
              0);

    for (const char* copy : {"copy", "package"}) {
        for (const char* member : {"", "/OPS", "/OPS/text", "/link"}) {
            const std::string name = std::string(copy) + member;
            EXPECT_EQ(ownedAt(name).owner, kReader) << name;
            EXPECT_EQ(ownedAt(name).group, kReaders) << name;
        }
    }
}

TEST_F(BookOwners, WhatRootExpandsIsTheArchivesOwners) {
    makeBook("zip");

    EXPECT_EQ(expand("zip", "book"), 0);

    for (const char* folder : {"book", "book/OPS", "book/OPS/text"})
        EXPECT_EQ(ownedAt(folder), (Owned{kReader, kReaders, 0700})) << folder;
    for (const char* member : {"book/OPS/text/a", "book/b"})
        EXPECT_EQ(ownedAt(member), (Owned{kReader, kReaders, 0600})) << member;
}

TEST_F(BookOwners, WhatRootExpandsIsTheArchivesGroupsWhoseverTheFolderIs) {
    makeBook("of readers", 0, kReaders);
    makeBook("of root", 0, 0);
    fs::create_directory(m_folder / "shelf");
    ASSERT_EQ(chown((m_folder / "shelf").c_str(), kReader, kReaders), 0);
    ASSERT_EQ(chmod((m_folder / "shelf").c_str(), 02770), 0);

    EXPECT_EQ(expand("of readers", "a"), 0);
    EXPECT_EQ(expand("of readers", "shelf/a"), 0);
    EXPECT_EQ(expand("of root", "b"), 0);
    EXPECT_EQ(expand("of root", "shelf/b"), 0);

    for (const char* member : {"a/OPS/text/a", "a/b", "shelf/a/OPS/text/a", "shelf/a/b"})
        EXPECT_EQ(ownedAt(member), (Owned{0, kReaders, 0600})) << member;
    for (const char* member : {"b/OPS/text/a", "b/b", "shelf/b/OPS/text/a", "shelf/b/b"})
        EXPECT_EQ(ownedAt(member), (Owned{0, 0, 0600})) << member;
}

}  // namespace
}  // namespace parvel::testing
