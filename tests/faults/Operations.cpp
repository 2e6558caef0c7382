#include "tests/faults/Operations.h"

#include <algorithm>
#include <ostream>

#include "tests/faults/EditOperations.h"
#include "tests/faults/InstallOperations.h"
#include "tests/faults/OperationParts.h"

namespace parvel::testing {
namespace {

using Manager = PVAssetMetadataFileManager;

auto moving(const std::string& from, const std::string& to, bool replace = false) {
    return [=](Manager& manager, const TestLibrary& library) {
        return manager.moveAsset_toURL_replaceExisting_error(assetAt(library, from),
                                                             library.url(to), replace) != nullptr;
    };
}

auto replacing(const std::string& from, const std::string& to) {
    return moving(from, to, /*replace=*/true);
}

auto movingInto(const std::string& from, const std::string& folder) {
    return [=](Manager& manager, const TestLibrary& library) {
        return manager
                   .moveAsset_toDirectory_replaceExisting_renameIfCollision_useAssetIDFileName_error(
                       assetAt(library, from), library.url(folder), /*replaceExisting=*/false,
                       /*renameIfCollision=*/true, /*useAssetIDFileName=*/false) != nullptr;
    };
}

auto copying(const std::string& from, const std::string& to) {
    return [=](Manager& manager, const TestLibrary& library) {
        return manager.fileManager()->copyItem(library.url(from), library.url(to));
    };
}

auto trashing(const std::string& from) {
    return [=](Manager& manager, const TestLibrary& library) {
        return manager.trashAsset_error(assetAt(library, from)) != nullptr;
    };
}

auto trashingAndRenaming(const std::string& from, const std::string& name) {
    return [=](Manager& manager, const TestLibrary& library) {
        std::optional<URL> trashed;
        FileSystemService& service = *manager.fileManager();
        return service.trashItem(library.url(from), &trashed) &&
               service.moveItem(*trashed,
                                trashed->deletingLastPathComponent().appendingPathComponent(name));
    };
}

auto removing(const std::string& from) {
    return [=](Manager& manager, const TestLibrary& library) {
        return manager.removeAsset_error(assetAt(library, from));
    };
}

auto redacting(const std::string& from, const std::string& folder) {
    return [=](Manager& manager, const TestLibrary& library) {
        return manager.redactAsset_intoDirectory_error(assetAt(library, from),
                                                       library.url(folder)) != nullptr;
    };
}

auto synchronising(bool ubiquitous, const std::string& from, const std::string& folder,
                   bool replace = false) {
    return [=](Manager& manager, const TestLibrary& library) {
        return manager.setUbiquitous_asset_intoDirectory_replace_error(
                   ubiquitous, assetAt(library, from), library.url(folder), replace) != nullptr;
    };
}

auto replacingSynchronised(const std::string& existing, const std::string& replacement) {
    return [=](Manager& manager, const TestLibrary& library) {
        return manager.replaceUbiquitousAsset_withAsset_error(
                   assetAt(library, existing), assetAt(library, replacement)) != nullptr;
    };
}

auto stamping(const std::string& at) {
    return [=](Manager& manager, const TestLibrary& library) {
        std::optional<Error> error;
        return manager.updateWithKeyAttributesAssetMetadata_error(assetAt(library, at), &error) &&
               !error;
    };
}

auto attributing(const std::string& at) {
    return [=](Manager& manager, const TestLibrary& library) {
        return manager.setExtendedAttributesForAsset_error(assetAt(library, at));
    };
}

std::vector<Operation> fileOperations() {
    return {
        {"MovesAFile",
         {{"from/a.pdf", "file 1"}},
         {{"to/b.pdf", "file 1"}},
         moving("from/a.pdf", "to/b.pdf")},
        {"MovesAPackage",
         {{"from/a.epub", "package 1"}},
         {{"to/a.epub", "package 1"}},
         moving("from/a.epub", "to/a.epub")},
        {"MovesAFileAcross",
         {{"from/a.pdf", "file 1"}},
         {{"other/a.pdf", "file 1"}},
         moving("from/a.pdf", "other/a.pdf")},
        {"MovesAPackageAcross",
         {{"from/a.epub", "package 1"}},
         {{"other/a.epub", "package 1"}},
         moving("from/a.epub", "other/a.epub")},
        {"MovesAPackageBack",
         {{"other/a.epub", "package 1"}},
         {{"from/a.epub", "package 1"}},
         moving("other/a.epub", "from/a.epub")},
        {"MovesAClosedPackageAcross",
         {{"from/a.epub", "package 1 closed"}},
         {{"other/a.epub", "package 1 closed"}},
         moving("from/a.epub", "other/a.epub")},
        {"MovesAClosedPackage",
         {{"from/a.epub", "package 1 closed"}},
         {{"to/a.epub", "package 1 closed"}},
         moving("from/a.epub", "to/a.epub"),
         {},
         {{{"from/a.epub", "package 1 closed but for modes"}},
          {{"to/a.epub", "package 1 closed but for modes"}}}},
        {"RenamesInPlace",
         {{"from/a.epub", "package 1"}},
         {{"from/b.epub", "package 1"}},
         moving("from/a.epub", "from/b.epub")},
        {"CountsUpACollision",
         {{"from/a.pdf", "file 1"}, {"to/a.pdf", "file 2"}},
         {{"to/a 1.pdf", "file 1"}, {"to/a.pdf", "file 2"}},
         movingInto("from/a.pdf", "to")},

        {"ReplacesAFile",
         {{"from/a.pdf", "file 2"}, {"to/a.pdf", "file 1 kept"}},
         {{"to/a.pdf", "file 2"}},
         replacing("from/a.pdf", "to/a.pdf")},
        {"ReplacesAPackage",
         {{"from/a.epub", "package 2"}, {"to/a.epub", "package 1"}},
         {{"to/a.epub", "package 2"}},
         replacing("from/a.epub", "to/a.epub"),
         {},
         {{{"from/a.epub", "package 1"}, {"to/a.epub", "package 2"}}}},
        {"ReplacesAClosedPackage",
         {{"from/a.epub", "package 2 closed"}, {"to/a.epub", "package 1 closed"}},
         {{"to/a.epub", "package 2 closed"}},
         replacing("from/a.epub", "to/a.epub"),
         {},
         {{{"from/a.epub", "package 2 closed"}, {"to/a.epub", "package 2 closed"}}}},
        {"ReplacesAPackageByAFile",
         {{"from/a.epub", "file 2"}, {"to/a.epub", "package 1"}},
         {{"to/a.epub", "file 2"}},
         replacing("from/a.epub", "to/a.epub"),
         {},
         {{{"from/a.epub", "package 1"}, {"to/a.epub", "file 2"}}}},
        {"ReplacesAFileAcross",
         {{"from/a.pdf", "file 2"}, {"other/a.pdf", "file 1"}},
         {{"other/a.pdf", "file 2"}},
         replacing("from/a.pdf", "other/a.pdf")},
        {"ReplacesAPackageAcross",
         {{"from/a.epub", "package 2"}, {"other/a.epub", "package 1"}},
         {{"other/a.epub", "package 2"}},
         replacing("from/a.epub", "other/a.epub")},
        {"ReplacesAClosedPackageAcross",
         {{"from/a.epub", "package 2 closed"}, {"other/a.epub", "package 1 closed"}},
         {{"other/a.epub", "package 2 closed"}},
         replacing("from/a.epub", "other/a.epub")},

        {"CopiesAFile",
         {{"from/a.pdf", "file 1"}},
         {{"from/a.pdf", "file 1"}, {"to/a.pdf", "file 1"}},
         copying("from/a.pdf", "to/a.pdf")},
        {"CopiesAPackage",
         {{"from/a.epub", "package 1"}},
         {{"from/a.epub", "package 1"}, {"to/a.epub", "package 1"}},
         copying("from/a.epub", "to/a.epub")},

        {"TrashesAFile",
         {{"from/a.pdf", "file 1"}},
         {{"trash/Trash/files/a.pdf", "file 1"}, {"trash/Trash/info/a.pdf.trashinfo", "info"}},
         trashing("from/a.pdf")},
        {"TrashesAPackage",
         {{"from/a.epub", "package 1"}},
         {{"trash/Trash/files/a.epub", "package 1"}, {"trash/Trash/info/a.epub.trashinfo", "info"}},
         trashing("from/a.epub")},
        {"RenamesInTheTrash",
         {{"from/a.pdf", "file 1"}},
         {{"trash/Trash/files/b.pdf", "file 1"}, {"trash/Trash/info/b.pdf.trashinfo", "info"}},
         trashingAndRenaming("from/a.pdf", "b.pdf"),
         {{{"trash/Trash/files/a.pdf", "file 1"}, {"trash/Trash/info/a.pdf.trashinfo", "info"}}},
         {{{"trash/Trash/files/a.pdf", "file 1"}, {"trash/Trash/info/b.pdf.trashinfo", "info"}}}},
        {.name = "TrashesAPackageAcross",
         .before = {{"from/a.epub", "package 1"}},
         .after = {{"other trash/Trash/files/a.epub", "package 1"},
                   {"other trash/Trash/info/a.epub.trashinfo", "info"}},
         .run = trashing("from/a.epub"),
         .hasTrashOnOtherFileSystem = true},

        {"RemovesAFile", {{"from/a.pdf", "file 1"}}, {}, removing("from/a.pdf")},
        {"RemovesAPackage", {{"from/a.epub", "package 1"}}, {}, removing("from/a.epub"), {{}}},
        {"RemovesAClosedPackage",
         {{"from/a.epub", "package 1 closed"}},
         {},
         removing("from/a.epub"),
         {{}}},
        {"RemovesABarredPackage",
         {{"from/a.epub", "package 1 barred"}},
         {},
         removing("from/a.epub"),
         {{}}},
        {"RedactsAPackage",
         {{"from/a.epub", "package 1"}},
         {{"to/a.epub", "package 1"}},
         redacting("from/a.epub", "to")},
        {"RedactsAFileAcross",
         {{"from/a.epub", "file 1"}},
         {{"other/a.epub", "file 1"}},
         redacting("from/a.epub", "other")},

        {"AddsToTheCloud",
         {{"from/a.epub", "package 1"}, {"cloud/A title.epub", "file 2"}},
         {{"cloud/A title 1.epub", "package 1"}, {"cloud/A title.epub", "file 2"}},
         synchronising(true, "from/a.epub", "cloud")},
        {.name = "AddsToTheCloudAcross",
         .before = {{"other/a.epub", "package 1"}},
         .after = {{"cloud/A title.epub", "package 1"}},
         .run = synchronising(true, "other/a.epub", "cloud"),
         .besideHeldNames = {{{"cloud/A title 1.epub", "package 1"}}}},
        {.name = "TakesOutOfTheCloud",
         .before = {{"cloud/a.epub", "package 1"}},
         .after = {{"other/A title.epub", "package 1"}},
         .run = synchronising(false, "cloud/a.epub", "other"),
         .besideHeldNames = {{{"other/A title 1.epub", "package 1"}}}},
        {.name = "AddsToTheCloudReplacing",
         .before = {{"from/a.epub", "file 2"}, {"cloud/A title.epub", "file 1 kept"}},
         .after = {{"cloud/A title.epub", "file 2 kept"}},
         .run = synchronising(true, "from/a.epub", "cloud", /*replace=*/true),
         .answers = false},
        {"ReplacesInTheCloud",
         {{"from/a.epub", "package 2"}, {"cloud/b.epub", "package 1 kept"}},
         {{"cloud/A title.epub", "package 2 kept"}},
         replacingSynchronised("cloud/b.epub", "from/a.epub"),
         {{{"cloud/b.epub", "package 2 kept"}}}},

        {.name = "WritesAttributes",
         .before = {{"from/a.epub", "package 1"}},
         .after = {{"from/a.epub", "package 1"}},
         .run = attributing("from/a.epub"),
         .alsoHolds = identityComesLast("from/a.epub")},
        {.name = "StampsAFile",
         .before = {{"from/a.pdf", "file 1"}},
         .after = {{"from/a.pdf", "file 1"}},
         .run = stamping("from/a.pdf"),
         .alsoHolds = identityComesLast("from/a.pdf")},
    };
}

std::vector<Operation> makeOperations() {
    std::vector<Operation> all = fileOperations();
    for (const auto& more : {installOperations(), editOperations()})
        all.insert(all.end(), more.begin(), more.end());
    return all;
}

bool isOnOtherFileSystem(const Layout& layout) {
    return std::any_of(layout.begin(), layout.end(), [](const Layout::value_type& entry) {
        return entry.first.starts_with("other");
    });
}

}  // namespace

bool Operation::needsTwoFileSystems() const {
    return isOnOtherFileSystem(before) || isOnOtherFileSystem(after);
}

const std::vector<Operation>& operations() {
    static const std::vector<Operation> all = makeOperations();
    return all;
}

void PrintTo(const Operation& operation, std::ostream* stream) {
    *stream << operation.name;
}

}  // namespace parvel::testing
