#include "tests/faults/InstallOperations.h"

#include "parvel/iotasks/PVInstallAssetMetadataIOTask.h"
#include "parvel/platform/StagingDirectory.h"
#include "tests/faults/OperationParts.h"

namespace parvel::testing {
namespace {

/// Where the copy is made.
enum class Staging { Hidden, Folder, None };

struct Install {
    std::string from;
    std::string into = "to";
    Staging staging = Staging::Hidden;
    bool copies = true;
    bool replaces = false;
    bool counts = false;
    bool goesToCloud = false;
    std::string updating = {};
};

/// The hidden one goes with what is left in it, as it does for the program.
auto installing(Install install) {
    return [install](PVAssetMetadataFileManager& manager, const TestLibrary& library) {
        const URL target = library.url(install.into);
        const auto task = manager.taskToInstallAsset(assetAt(library, install.from));
        task->setShouldPlainCopy(install.copies);
        task->setReplaceExisting(install.replaces);
        task->setRenameIfCollision(install.counts);
        task->setMakeUbiquitous(install.goesToCloud);
        if (!install.updating.empty())
            task->setUpdatingAsset(assetAt(library, install.updating));
        std::unique_ptr<StagingDirectory> hidden;
        if (install.staging == Staging::Hidden) {
            hidden = StagingDirectory::makeIn(target);
            if (!hidden)
                return false;
            task->setTemporaryDirectory(hidden->url());
        } else if (install.staging == Staging::Folder) {
            task->setTemporaryDirectory(library.url("staging"));
        }
        return task->executeWithTargetDirectory_error(target) != nullptr;
    };
}

/// Where a member's mode can't be set, that is passed over.
std::vector<Layout> withoutModes(const Layout& layout, const std::string& place,
                                 const std::string& item) {
    return withEach(layout, place, {item, item + " but for modes"});
}

std::vector<Operation> bookInstalls() {
    const Layout zip{{"from/a.epub", "zip 1"}};
    const Layout package{{"from/a.epub", "package 1"}};
    const Layout closed{{"from/a.epub", "package 1 closed"}};
    const Layout zipOverPackage{{"from/a.epub", "zip 2"}, {"to/a.epub", "package 1"}};
    const Layout zipForPackage{{"from/a.epub", "zip 2"}, {"to/old.epub", "package 1"}};
    const Layout newZip{{"from/a.epub", "zip 2"}};
    auto madeInItsPlace = withEach(newZip, "to/a.epub", stagesOf("expanded 2"));
    madeInItsPlace.push_back(newZip);
    return {
        {.name = "InstallsABook",
         .before = zip,
         .after = with(zip, "to/a.epub", "expanded 1"),
         .run = installing({.from = "from/a.epub"}),
         .alsoHolds = identityComesLast("to/a.epub")},
        {.name = "InstallsABookThroughAFolder",
         .before = zip,
         .after = with(zip, "to/a.epub", "expanded 1"),
         .run = installing({.from = "from/a.epub", .staging = Staging::Folder}),
         .between = withEach(zip, "staging/a.epub", stagesOf("expanded 1")),
         .alsoHolds = identityComesLast("to/a.epub"),
         .completesWhatIsLeft = true},
        {.name = "InstallsABookDirectly",
         .before = zip,
         .after = with(zip, "to/a.epub", "expanded 1"),
         .run = installing({.from = "from/a.epub", .staging = Staging::None}),
         .between = withEach(zip, "to/a.epub", stagesOf("expanded 1")),
         .alsoHolds = identityComesLast("to/a.epub"),
         .completesWhatIsLeft = true},
        {.name = "InstallsABookDirectlyOverAnother",
         .before = zipOverPackage,
         .after = with(newZip, "to/a.epub", "expanded 2"),
         .run = installing({.from = "from/a.epub", .staging = Staging::None}),
         .between = madeInItsPlace,
         .completesWhatIsLeft = true},
        {.name = "InstallsABookAcross",
         .before = zip,
         .after = with(zip, "other/a.epub", "expanded 1"),
         .run = installing({.from = "from/a.epub", .into = "other"})},
        {.name = "InstallsABookThroughAFolderAcross",
         .before = zip,
         .after = with(zip, "other/a.epub", "expanded 1"),
         .run = installing({.from = "from/a.epub", .into = "other", .staging = Staging::Folder}),
         .between = withEach(zip, "staging/a.epub", stagesOf("expanded 1")),
         .killed = {with(with(zip, "staging/a.epub", "expanded 1"), "other/a.epub", "expanded 1")},
         .completesWhatIsLeft = true},
        {.name = "InstallsAPackage",
         .before = package,
         .after = with(package, "to/a.epub", "package 1 private"),
         .run = installing({.from = "from/a.epub"}),
         .succeeded = withoutModes(package, "to/a.epub", "package 1"),
         .alsoHolds = identityComesLast("to/a.epub")},
        {.name = "InstallsAClosedPackage",
         .before = closed,
         .after = with(closed, "to/a.epub", "package 1 closed private"),
         .run = installing({.from = "from/a.epub"}),
         .killed = withEach(closed, "to/a.epub", {"package 1 closed but for modes"}),
         .succeeded = withoutModes(closed, "to/a.epub", "package 1 closed")},
        {.name = "InstallsAPackageThroughAFolder",
         .before = package,
         .after = with(package, "to/a.epub", "package 1 private"),
         .run = installing({.from = "from/a.epub", .staging = Staging::Folder}),
         .between = withEach(package, "staging/a.epub",
                             {"placeholder", "part of package 1", "package 1",
                              "package 1 but for modes", "package 1 private"}),
         .succeeded = withoutModes(package, "to/a.epub", "package 1"),
         .completesWhatIsLeft = true},
        {.name = "InstallsABookReplacing",
         .before = zipOverPackage,
         .after = with(newZip, "to/a.epub", "expanded 2"),
         .run = installing({.from = "from/a.epub", .replaces = true})},
        {.name = "InstallsABookReplacingThroughAFolder",
         .before = zipOverPackage,
         .after = with(newZip, "to/a.epub", "expanded 2"),
         .run = installing({.from = "from/a.epub", .staging = Staging::Folder, .replaces = true}),
         .between = withEach(zipOverPackage, "staging/a.epub", stagesOf("expanded 2")),
         .killed = {with(with(newZip, "staging/a.epub", "package 1"), "to/a.epub", "expanded 2")},
         .completesWhatIsLeft = true},
        {.name = "UpdatesAnInstalledBook",
         .before = zipForPackage,
         .after = with(newZip, "to/old.epub", "expanded 2"),
         .run = installing({.from = "from/a.epub", .replaces = true, .updating = "to/old.epub"}),
         .alsoHolds = identityComesLast("to/old.epub")},
    };
}

std::vector<Operation> fileInstalls() {
    const Layout file{{"from/a.pdf", "file 1"}};
    const Layout taken{{"from/a.pdf", "file 2"}, {"to/a.pdf", "file 1 kept"}};
    return {
        {.name = "InstallsAFile",
         .before = file,
         .after = with(file, "to/a.pdf", "file 1"),
         .run = installing({.from = "from/a.pdf"}),
         .alsoHolds = identityComesLast("to/a.pdf")},
        {.name = "InstallsAFileThroughAFolder",
         .before = file,
         .after = with(file, "to/a.pdf", "file 1"),
         .run = installing({.from = "from/a.pdf", .staging = Staging::Folder}),
         .between = withEach(file, "staging/a.pdf", stagesOf("file 1")),
         .completesWhatIsLeft = true},
        {.name = "InstallsAFileDirectly",
         .before = file,
         .after = with(file, "to/a.pdf", "file 1"),
         .run = installing({.from = "from/a.pdf", .staging = Staging::None}),
         .between = withEach(file, "to/a.pdf", stagesOf("file 1")),
         .completesWhatIsLeft = true},
        {.name = "InstallsAFileCountingUp",
         .before = taken,
         .after = with(taken, "to/a 1.pdf", "file 2"),
         .run = installing({.from = "from/a.pdf", .counts = true})},
        {.name = "InstallsAFileReplacing",
         .before = taken,
         .after = with(taken, "to/a.pdf", "file 2"),
         .run = installing({.from = "from/a.pdf", .replaces = true})},
    };
}

/// Without a copy, a placement that fails deletes the source, and nothing else does.
std::vector<Operation> movingInstalls() {
    const Layout file{{"from/a.pdf", "file 1"}};
    const Layout package{{"from/a.epub", "package 1"}};
    const Layout taken{{"from/a.pdf", "file 2"}, {"to/a.pdf", "file 1 kept"}};
    return {
        {.name = "InstallsAFileByMoving",
         .before = file,
         .after = {{"to/a.pdf", "file 1"}},
         .run = installing({.from = "from/a.pdf", .copies = false}),
         .failed = {{}}},
        {.name = "InstallsAFileByMovingAndReplacing",
         .before = taken,
         .after = {{"to/a.pdf", "file 2"}},
         .run = installing({.from = "from/a.pdf", .copies = false, .replaces = true}),
         .failed = {{{"to/a.pdf", "file 1 kept"}}}},
        {.name = "InstallsAPackageByMoving",
         .before = package,
         .after = {{"to/a.epub", "package 1 private"}},
         .run = installing({.from = "from/a.epub", .copies = false}),
         .between = withEach({}, "from/a.epub", {"package 1 but for modes", "package 1 private"}),
         .failed = {{}},
         .succeeded = withoutModes({}, "to/a.epub", "package 1"),
         .alsoHolds = identityComesLast("to/a.epub"),
         .completesWhatIsLeft = true},
    };
}

std::vector<Operation> cloudInstalls() {
    const Layout zip{{"from/a.epub", "zip 2"}};
    const Layout taken = with(zip, "cloud/A title.epub", "file 1");
    const Layout old = with(zip, "cloud/b.epub", "expanded 1");
    return {
        {.name = "InstallsIntoTheCloud",
         .before = taken,
         .after = with(taken, "cloud/A title 1.epub", "expanded 2"),
         .run = installing({.from = "from/a.epub", .into = "cloud", .goesToCloud = true})},
        {.name = "UpdatesInTheCloud",
         .before = old,
         .after = with(zip, "cloud/A title.epub", "expanded 2"),
         .run = installing({.from = "from/a.epub",
                            .into = "cloud",
                            .replaces = true,
                            .goesToCloud = true,
                            .updating = "cloud/b.epub"}),
         .between = {with(zip, "cloud/b.epub", "expanded 2")}},
    };
}

}  // namespace

std::vector<Operation> installOperations() {
    std::vector<Operation> all = bookInstalls();
    for (const auto& more : {fileInstalls(), movingInstalls(), cloudInstalls()})
        all.insert(all.end(), more.begin(), more.end());
    return all;
}

}  // namespace parvel::testing
