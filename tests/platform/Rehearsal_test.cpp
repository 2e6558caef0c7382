#include <stdlib.h>
#include <sys/stat.h>
#include <unistd.h>

#include <functional>
#include <map>

#include <gtest/gtest.h>

#include "parvel/filemanager/PVAssetMetadataFileManager.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "parvel/platform/Rehearsal.h"
#include "parvel/xattr/ExtendedAttributes.h"
#include "parvel/xattr/PNMetadataXattr.h"
#include "tests/support/EnvironmentValue.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

namespace fs = std::filesystem;

/// What an operation says of itself.
struct Said {
    bool isDone = false;
    std::optional<URL> resulting;
    std::optional<Error> error;

    friend bool operator==(const Said&, const Said&) = default;
};

std::ostream& operator<<(std::ostream& out, const Said& said) {
    out << (said.isDone ? "done" : "failed");
    if (said.resulting)
        out << " at " << said.resulting->path();
    if (said.error)
        out << " with " << said.error->domain() << " " << said.error->code() << " "
            << (said.error->url() ? said.error->url()->path() : "no URL");
    return out;
}

using Operation = std::function<bool(FileSystemService& service, Said& said)>;

/// A folder in which every operation is rehearsed, and then done.
class RehearsedFolder : public ::testing::Test {
protected:
    [[nodiscard]] URL at(const std::string& name) const { return m_folder.url(name); }

    /// Every name below the folder, with the content of files and the target of links.
    [[nodiscard]] std::map<std::string, std::string> disk() const {
        std::map<std::string, std::string> state;
        for (const auto& entry : fs::recursive_directory_iterator(m_folder.path())) {
            const std::string name = fs::relative(entry.path(), m_folder.path()).string();
            state[name] = entry.is_symlink()        ? fs::read_symlink(entry.path()).string()
                          : entry.is_regular_file() ? m_folder.read(name)
                                                    : "a folder";
        }
        return state;
    }

    /// What the operations say when each is done on the service.
    static std::vector<Said> saidBy(FileSystemService& service,
                                    const std::vector<Operation>& operations) {
        std::vector<Said> all;
        for (const Operation& operation : operations) {
            Said said;
            said.isDone = operation(service, said);
            all.push_back(std::move(said));
        }
        return all;
    }

    /// The operations, rehearsed one after the other, say what they say when they are done; and
    /// nothing is touched before.
    void expectTheSame(const std::vector<Operation>& operations) {
        const auto before = disk();
        const std::vector<Said> rehearsed = saidBy(*Rehearsal().fileManager(), operations);
        EXPECT_EQ(disk(), before);
        EXPECT_EQ(rehearsed, saidBy(*FileSystemService::makeDefault(), operations));
    }

    [[nodiscard]] Operation move(const std::string& from, const std::string& to) const {
        return [source = at(from), target = at(to)](FileSystemService& service, Said& said) {
            return service.moveItem(source, target, &said.error);
        };
    }
    [[nodiscard]] Operation replace(const std::string& existing, const std::string& by) const {
        return [target = at(existing), source = at(by)](FileSystemService& service, Said& said) {
            return service.replaceItem(target, source, ReplaceOptions::Default, &said.resulting,
                                       &said.error);
        };
    }
    [[nodiscard]] Operation copy(const std::string& from, const std::string& to) const {
        return [source = at(from), target = at(to)](FileSystemService& service, Said& said) {
            return service.copyItem(source, target, &said.error);
        };
    }
    [[nodiscard]] Operation remove(const std::string& name) const {
        return [item = at(name)](FileSystemService& service, Said& said) {
            return service.removeItem(item, &said.error);
        };
    }
    [[nodiscard]] Operation trash(const std::string& name) const {
        return [item = at(name)](FileSystemService& service, Said& said) {
            return service.trashItem(item, &said.resulting, &said.error);
        };
    }
    [[nodiscard]] Operation exists(const std::string& name) const {
        return [path = m_folder / name](FileSystemService& service, Said&) {
            return service.itemExistsAtPath(path);
        };
    }

    TemporaryDirectory m_folder;
    const EnvironmentValue m_dataHome{"XDG_DATA_HOME", m_folder / "data"};

private:
};

TEST_F(RehearsedFolder, AMovedItemIsFoundAtItsNewPlaceAlone) {
    m_folder.write("a.pdf", "1");

    expectTheSame({move("a.pdf", "b.pdf"), exists("a.pdf"), exists("b.pdf"), move("a.pdf", "c.pdf"),
                   move("b.pdf", "a.pdf")});
}

TEST_F(RehearsedFolder, AMoveToATakenNameFails) {
    m_folder.write("a.pdf", "1");
    m_folder.write("b.pdf", "2");

    expectTheSame({move("a.pdf", "b.pdf"), move("b.pdf", "c.pdf"), move("a.pdf", "b.pdf")});
}

TEST_F(RehearsedFolder, AMoveIntoAFolderThatIsMissingFails) {
    m_folder.write("a.pdf", "1");
    m_folder.write("file", "2");

    expectTheSame({move("a.pdf", "folder/a.pdf"), move("a.pdf", "file/a.pdf"),
                   move("absent.pdf", "b.pdf"), move("a.pdf", std::string(300, 'x'))});
}

TEST_F(RehearsedFolder, TheEmptyPathNamesNothing) {
    m_folder.write("a.pdf", "1");
    const URL none = URL::fileURLWithPath("");

    expectTheSame({
        [](FileSystemService& service, Said&) { return service.itemExistsAtPath(""); },
        [none](FileSystemService& service, Said& said) {
            return service.removeItem(none, &said.error);
        },
        [none](FileSystemService& service, Said& said) {
            return service.trashItem(none, &said.resulting, &said.error);
        },
        [none, this](FileSystemService& service, Said& said) {
            return service.moveItem(none, at("b.pdf"), &said.error);
        },
        [none, this](FileSystemService& service, Said& said) {
            return service.moveItem(at("a.pdf"), none, &said.error);
        },
        [none, this](FileSystemService& service, Said& said) {
            return service.copyItem(at("a.pdf"), none, &said.error);
        },
        [none, this](FileSystemService& service, Said& said) {
            return service.replaceItem(none, at("a.pdf"), ReplaceOptions::Default, &said.resulting,
                                       &said.error);
        },
    });
}

TEST_F(RehearsedFolder, AMoveOfAFolderIntoItselfFails) {
    m_folder.write("a.epub/mimetype", "1");

    expectTheSame({move("a.epub", "a.epub/b.epub"), copy("a.epub", "a.epub/b.epub")});
}

TEST_F(RehearsedFolder, WhatLiesInAMovedFolderMovesAlong) {
    m_folder.write("a.epub/mimetype", "1");
    m_folder.write("a.epub/OPS/b.opf", "2");

    expectTheSame({move("a.epub/mimetype", "a.epub/OPS/c"), move("a.epub", "b.epub"),
                   exists("b.epub/OPS/b.opf"), exists("b.epub/OPS/c"), exists("b.epub/mimetype"),
                   exists("a.epub/OPS/b.opf"), move("b.epub/OPS", "c"), exists("c/c")});
}

TEST_F(RehearsedFolder, ALinkIsAnItemOfItsOwn) {
    m_folder.write("shelf/a.pdf", "1");
    fs::create_symlink("shelf/a.pdf", m_folder.path() / "a.pdf");
    fs::create_symlink("absent", m_folder.path() / "dangling.pdf");
    fs::create_symlink("shelf", m_folder.path() / "books");

    expectTheSame({move("a.pdf", "dangling.pdf"), remove("a.pdf"), exists("shelf/a.pdf"),
                   move("books/a.pdf", "shelf/b.pdf"), exists("books/b.pdf"),
                   exists("shelf/a.pdf")});
}

TEST_F(RehearsedFolder, AReplacementTakesTheExistingItemsPlace) {
    m_folder.write("old.epub/mimetype", "1");
    m_folder.write("new.epub", "2");
    m_folder.write("other.epub", "3");

    expectTheSame({replace("old.epub", "new.epub"), exists("new.epub"), exists("old.epub/mimetype"),
                   replace("absent.epub", "other.epub"), exists("other.epub"),
                   replace("old.epub", "other.epub")});
}

TEST_F(RehearsedFolder, ReplacingAnItemByItselfOrAnotherNameOfItLeavesOne) {
    m_folder.write("a.pdf", "1");
    fs::create_hard_link(m_folder.path() / "a.pdf", m_folder.path() / "b.pdf");

    expectTheSame({replace("a.pdf", "a.pdf"), exists("a.pdf"), replace("a.pdf", "b.pdf"),
                   exists("b.pdf"), exists("a.pdf")});
}

TEST_F(RehearsedFolder, AReplacementByWhatLiesBelowOrAboveFails) {
    m_folder.write("a.epub/inner.epub", "1");

    expectTheSame({replace("a.epub", "a.epub/inner.epub"), replace("a.epub/inner.epub", "a.epub")});
}

TEST_F(RehearsedFolder, ALinkDoesNotReplaceWhatItLeadsTo) {
    m_folder.write("a.epub", "1");
    fs::create_symlink("a.epub", m_folder.path() / "b.epub");
    fs::create_symlink("a.epub", m_folder.path() / "c.epub");

    expectTheSame({replace("a.epub", "b.epub"), exists("b.epub"), replace("c.epub", "b.epub"),
                   exists("b.epub")});
}

TEST_F(RehearsedFolder, ACopyIsFoundBesideItsSource) {
    m_folder.write("a.pdf", "1");

    expectTheSame({copy("a.pdf", "b.pdf"), exists("a.pdf"), exists("b.pdf"), copy("a.pdf", "b.pdf"),
                   copy("absent.pdf", "c.pdf"), copy("a.pdf", "folder/c.pdf")});
}

TEST_F(RehearsedFolder, ARemovedItemIsGone) {
    m_folder.write("a.epub/mimetype", "1");

    expectTheSame({remove("a.epub"), exists("a.epub"), exists("a.epub/mimetype"), remove("a.epub"),
                   move("a.epub", "b.epub")});
}

TEST_F(RehearsedFolder, TrashedItemsGetTheNamesThatTheyWouldGet) {
    m_folder.write("Guide.pdf", "1");
    m_folder.write("shelf/Guide.pdf", "2");
    m_folder.write("other/Guide.pdf", "3");
    m_folder.write("data/Trash/files/Guide.pdf", "stray");

    expectTheSame({trash("Guide.pdf"), trash("shelf/Guide.pdf"), trash("other/Guide.pdf"),
                   exists("Guide.pdf"), trash("Guide.pdf")});
}

TEST_F(RehearsedFolder, ATrashIsMadeInTheRehearsalToo) {
    m_folder.write("a.pdf", "1");

    expectTheSame({trash("a.pdf"), move("data/Trash/files/a.pdf", "data/Trash/files/Title.pdf"),
                   exists("data/Trash/info/Title.pdf.trashinfo"),
                   exists("data/Trash/info/a.pdf.trashinfo"),
                   move("data/Trash/files/Title.pdf", "data/Trash/files/Title/pdf")});
}

TEST_F(RehearsedFolder, ARenameInTheTrashToATakenNameFails) {
    m_folder.write("a.pdf", "1");
    m_folder.write("b.pdf", "2");

    expectTheSame(
        {trash("a.pdf"), trash("b.pdf"), move("data/Trash/files/b.pdf", "data/Trash/files/a.pdf")});
}

TEST_F(RehearsedFolder, WhatLeavesTheTrashLeavesNoInfoFile) {
    m_folder.write("a.pdf", "1");

    expectTheSame({trash("a.pdf"), move("data/Trash/files/a.pdf", "a.pdf"),
                   exists("data/Trash/info/a.pdf.trashinfo"), exists("a.pdf")});
}

TEST_F(RehearsedFolder, APlaceOutsideSynchronisedStorageIsRefused) {
    m_folder.write("a.epub", "1");
    m_folder.write("cloud/.stfolder/x", "");
    m_folder.write("cloud/b.epub.nextcloud", "1");

    const auto setUbiquitous = [this](bool flag, const std::string& from, const std::string& to) {
        return [flag, source = at(from), target = at(to)](FileSystemService& service, Said& said) {
            return service.setUbiquitous(flag, source, target, &said.error);
        };
    };
    expectTheSame({setUbiquitous(true, "a.epub", "b.epub"),
                   setUbiquitous(true, "a.epub", "cloud/a.epub"),
                   setUbiquitous(false, "cloud/b.epub", "b.epub"), exists("cloud/a.epub"),
                   trash("cloud/b.epub"), remove("cloud/b.epub")});
}

/// Gives up the rights of root while it lives.
class UnprivilegedUser {
public:
    UnprivilegedUser() : m_isChanged(geteuid() == 0 && seteuid(65534) == 0) {}
    ~UnprivilegedUser() {
        if (m_isChanged && seteuid(0) != 0)
            abort();
    }
    UnprivilegedUser(const UnprivilegedUser&) = delete;
    UnprivilegedUser& operator=(const UnprivilegedUser&) = delete;

private:
    bool m_isChanged;
};

TEST_F(RehearsedFolder, PermissionsThatForbidAChangeAreSeen) {
    m_folder.write("closed/a.pdf", "1");
    m_folder.write("open/b.pdf", "1");
    m_folder.write("sticky/c.pdf", "1");
    for (const auto& [name, mode] : std::map<std::string, mode_t>{
             {"", 0755}, {"closed", 0555}, {"open", 0777}, {"sticky", 01777}})
        ASSERT_EQ(chmod((m_folder.path() / name).c_str(), mode), 0);
    const UnprivilegedUser user;
    if (geteuid() == 0)
        GTEST_SKIP() << "the user can't be changed";
    m_folder.write("open/own/a.epub", "2");
    ASSERT_EQ(chmod((m_folder / "open/own").c_str(), 0555), 0);

    expectTheSame({move("closed/a.pdf", "open/a.pdf"), move("open/b.pdf", "closed/b.pdf"),
                   remove("closed/a.pdf"), move("sticky/c.pdf", "open/c.pdf"),
                   remove("sticky/c.pdf"), replace("closed/a.pdf", "open/b.pdf"),
                   trash("closed/a.pdf"), move("open/b.pdf", "sticky/b.pdf"),
                   move("open/own", "closed/own"), move("open/own", "sticky/own")});
}

TEST_F(RehearsedFolder, AFolderThatForbidsChangesMovesForItsOwnerAlone) {
    m_folder.write("theirs/a/x", "1");
    m_folder.write("to/b/x", "1");
    for (const char* name : {"", "theirs", "to"})
        ASSERT_EQ(chmod((m_folder.path() / name).c_str(), 0777), 0);
    ASSERT_EQ(chmod((m_folder / "theirs/a").c_str(), 0555), 0);
    const UnprivilegedUser user;
    if (geteuid() == 0)
        GTEST_SKIP() << "the user can't be changed";
    for (const char* name : {"own/a", "own/b"}) {
        m_folder.write(std::string(name) + "/x", "2");
        ASSERT_EQ(chmod((m_folder / name).c_str(), 0555), 0);
    }

    expectTheSame({move("theirs/a", "to/a"), move("own/a", "to/a"), exists("own/a"),
                   replace("to/a", "own/b"), exists("own/b"), replace("to/a", "theirs/a")});
}

TEST_F(RehearsedFolder, AMoveToAnotherFileSystemIsForeseen) {
    std::string pattern = "/dev/shm/parvel-XXXXXX";
    struct stat memory {};
    struct stat here {};
    if (stat("/dev/shm", &memory) != 0 || stat(m_folder.path().c_str(), &here) != 0 ||
        memory.st_dev == here.st_dev || !mkdtemp(pattern.data()))
        GTEST_SKIP() << "no memory file system";
    m_folder.write("a.epub/mimetype", "1");
    m_folder.write("b.epub", "2");
    m_folder.write("c.epub", "3");
    const auto to = [&](const std::string& from, const std::string& name) {
        return [source = at(from), target = URL::fileURLWithPath(pattern + "/" + name)](
                   FileSystemService& service, Said& said) {
            return service.moveItem(source, target, &said.error);
        };
    };

    expectTheSame({to("a.epub", "a.epub"), exists("a.epub"), to("b.epub", "a.epub"),
                   to("b.epub", "folder/b.epub"), to("absent.epub", "d.epub"),
                   to("c.epub", "c.epub"), exists("c.epub")});
    fs::remove_all(pattern);
}

TEST_F(RehearsedFolder, ACoordinatedWriteIsGivenThePlaceAtOnce) {
    m_folder.write("a.epub", "1");
    const Rehearsal rehearsal;
    std::vector<std::optional<URL>> given;
    const auto accessor = [&given](const std::optional<URL>& url) { given.push_back(url); };

    const auto& coordinator = rehearsal.fileCoordinator();
    ASSERT_TRUE(rehearsal.fileManager()->moveItem(at("a.epub"), at("b.epub")));
    for (const URL& url : {at("b.epub"), at("a.epub"), at("folder/a.epub")})
        EXPECT_TRUE(
            coordinator->coordinateWriting(url, WritingIntent::ForMoving, nullptr, accessor));

    EXPECT_EQ(given, (std::vector<std::optional<URL>>{at("b.epub"), at("a.epub"), std::nullopt}));
}

/// The attribute's text; none where there is none.
std::optional<String> attributeAt(const URL& url, std::string_view name) {
    std::optional<String> text;
    EXPECT_TRUE(pvamfm_extendedAttributeString_forKey_error(url, &text, name));
    return text;
}

class RehearsedAttributesOfFiles : public RehearsedFolder {
protected:
    void SetUp() override {
        m_folder.write("a.epub", "1");
        if (!pvamfm_setExtendedAttributeString_forKey_error(at("a.epub"), "A", "one"))
            GTEST_SKIP() << "the file system keeps no extended attributes";
    }

    static bool set(const URL& url, const std::optional<String>& text, std::string_view name,
                    ErrorOut error = nullptr) {
        return pvamfm_setExtendedAttributeString_forKey_error(url, text, name, error);
    }
};

TEST_F(RehearsedAttributesOfFiles, AreReadAsWrittenAndNeverTouched) {
    {
        const Rehearsal rehearsal;
        EXPECT_TRUE(set(at("a.epub"), "B", "two"));
        EXPECT_TRUE(set(at("a.epub"), std::nullopt, "one"));

        EXPECT_EQ(attributeAt(at("a.epub"), "one"), std::nullopt);
        EXPECT_EQ(attributeAt(at("a.epub"), "two"), "B");
    }

    EXPECT_EQ(attributeAt(at("a.epub"), "one"), "A");
    EXPECT_EQ(attributeAt(at("a.epub"), "two"), std::nullopt);
}

TEST_F(RehearsedAttributesOfFiles, GoWithTheItemThatMoves) {
    const Rehearsal rehearsal;
    ASSERT_TRUE(set(at("a.epub"), "B", "two"));

    ASSERT_TRUE(rehearsal.fileManager()->moveItem(at("a.epub"), at("b.epub")));

    EXPECT_EQ(attributeAt(at("b.epub"), "one"), "A");
    EXPECT_EQ(attributeAt(at("b.epub"), "two"), "B");
    std::optional<Error> error;
    EXPECT_FALSE(set(at("a.epub"), "C", "two", &error));
    EXPECT_EQ(error, makePOSIXError(ENOENT, at("a.epub")));
}

TEST_F(RehearsedAttributesOfFiles, OfACopyAreItsOwn) {
    const Rehearsal rehearsal;
    ASSERT_TRUE(rehearsal.fileManager()->copyItem(at("a.epub"), at("b.epub")));

    ASSERT_TRUE(set(at("b.epub"), "B", "one"));

    EXPECT_EQ(attributeAt(at("a.epub"), "one"), "A");
    EXPECT_EQ(attributeAt(at("b.epub"), "one"), "B");
}

TEST_F(RehearsedAttributesOfFiles, FailAsTheyWould) {
    fs::create_symlink("a.epub", m_folder.path() / "link.epub");
    ASSERT_EQ(mkfifo((m_folder / "pipe").c_str(), 0600), 0);
    const auto errors = [this] {
        std::vector<std::optional<Error>> all(5);
        (void)set(at("absent"), "B", "two", &all[0]);
        (void)set(at("pipe"), "B", "two", &all[1]);
        (void)set(at("a.epub"), std::nullopt, "absent", &all[2]);
        (void)set(at("a.epub"), "B", std::string(300, 'n'), &all[3]);
        (void)set(at("link.epub"), "B", "two", &all[4]);
        return all;
    };
    std::vector<std::optional<Error>> rehearsed;
    {
        const Rehearsal rehearsal;
        rehearsed = errors();
    }

    EXPECT_EQ(rehearsed, errors());
    EXPECT_TRUE(rehearsed[0] && rehearsed[1] && rehearsed[2] && rehearsed[3] && !rehearsed[4]);
}

TEST_F(RehearsedAttributesOfFiles, AreStampedOnARecordWithoutTouchingModes) {
    m_folder.write("b.epub/mimetype", "1");
    ASSERT_EQ(chmod((m_folder / "b.epub/mimetype").c_str(), 0644), 0);
    const Dictionary dictionary{{"PVGeneratedItemId", "ID"}};
    const AssetPtr asset = PVAssetMetadata::metadataWithURL_dictionary(at("b.epub"), &dictionary);
    AssetPtr stamped;
    {
        const Rehearsal rehearsal;
        stamped =
            PVAssetMetadataFileManager::init()->updateWithKeyAttributesAssetMetadata_error(asset);
        EXPECT_EQ(attributeAt(at("b.epub"), PNMetadataXattrAssetID), "ID");
    }

    ASSERT_TRUE(stamped);
    EXPECT_GT(stamped->allocatedSize(), 0U);
    EXPECT_EQ(attributeAt(at("b.epub"), PNMetadataXattrAssetID), std::nullopt);
    struct stat status {};
    ASSERT_EQ(stat((m_folder / "b.epub/mimetype").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 0777, 0644U);
}

}  // namespace
}  // namespace parvel::testing
