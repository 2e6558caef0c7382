#include "tests/faults/EditOperations.h"

#include <span>

#include "parvel/platform/StagingDirectory.h"
#include "parvel/platform/XattrStore.h"
#include "parvel/xattr/PNMetadataXattr.h"
#include "tests/faults/OperationParts.h"

namespace parvel::testing {
namespace {

using Manager = PVAssetMetadataFileManager;

const std::string kCover = "from/a.epub/BazaarArtwork";
const std::string kFirstCover = "from/a.epub/BazaarArtwork-original";
const std::string kStore = "from/a.epub/BazaarMetadata.plist";
const std::string kFirstStore = "from/a.epub/BazaarMetadata-original.plist";
const std::string kRest = "from/a.epub/OPS";

/// A hidden folder beside the item, to expand it in; it goes with what is left in it.
std::unique_ptr<StagingDirectory> stagingBeside(const TestLibrary& library,
                                                const std::string& place) {
    return StagingDirectory::makeIn(library.url(place).deletingLastPathComponent());
}

auto editing(const std::string& at, const Dictionary& updates, bool inflates = true) {
    return [=](Manager& manager, const TestLibrary& library) {
        const auto staging = stagingBeside(library, at);
        return staging && manager.updateAsset_withUpdates_temporaryDirectory_inflateIfNeeded_error(
                              assetAt(library, at), &updates, staging->url(), inflates) != nullptr;
    };
}

auto inflating(const std::string& at) {
    return [=](Manager& manager, const TestLibrary& library) {
        const auto staging = stagingBeside(library, at);
        return staging && manager.inflateAsset_temporaryDirectory_error(assetAt(library, at),
                                                                        staging->url()) != nullptr;
    };
}

auto inflatingThrough(const std::string& at, const std::optional<std::string>& folder) {
    return [=](Manager& manager, const TestLibrary& library) {
        const auto staging = folder ? std::optional(library.url(*folder)) : std::nullopt;
        return manager.inflateAsset_temporaryDirectory_error(assetAt(library, at), staging) !=
               nullptr;
    };
}

auto applying(const std::string& update, const std::string& existing) {
    return [=](Manager& manager, const TestLibrary& library) {
        const AssetPtr known = existing.empty() ? nullptr : assetAt(library, existing);
        const AssetPtr applied = manager.applyUpdate_onExistingAsset_targetDirectory_error(
            assetAt(library, update), known, library.url("to"));
        return !known && applied;  // with one that exists a record comes back in any case
    };
}

auto normalizing(const std::string& at) {
    return [=](Manager& manager, const TestLibrary& library) {
        const auto asset = assetAt(library, at);
        asset->setDisplayName("A title");
        return manager.normalizeNamingForAsset_error(asset) != nullptr;
    };
}

/// Gives an item the identity that a record of it has, and the title.
auto identified(const std::string& at) {
    return [=](const TestLibrary& library) {
        const auto write = [&](std::string_view name, std::string_view value) {
            return XattrStore::host().set(library.path(at), std::string(name),
                                          std::as_bytes(std::span(value)));
        };
        (void)write(PNMetadataXattrAssetID, *assetAt(library, at)->assetID());
        (void)write(PNMetadataXattrTitle, "A title");
    };
}

/// The members of the book that is edited.
Layout book(const std::string& rest, const Layout& covers, const Layout& stores) {
    Layout layout{{kRest, rest}};
    layout.insert(covers.begin(), covers.end());
    layout.insert(stores.begin(), stores.end());
    return layout;
}

const Dictionary kNewTitleAndCover{{"itemName", "New"},
                                   {"PVCoverImageData", Data::copyOf(contentOf("image 2"))}};

/// An edit of title and cover: the old cover steps aside, then the new one is written; the old
/// store file is copied, then the new one is written. Where no backup can be made the edit goes on.
std::vector<Operation> bookEdits() {
    const Layout oldCover{{kCover, "cover 1"}};
    const Layout coverAside{{kFirstCover, "cover 1"}};
    const Layout newCover{{kCover, "image 2"}, {kFirstCover, "cover 1"}};
    const Layout newCoverAlone{{kCover, "image 2 but for modes"}};  // those of the old one
    const Layout oldStore{{kStore, "store of the zip"}};
    const Layout bothStores{{kStore, "store of the zip"}, {kFirstStore, "store of the zip"}};
    const Layout newStore{{kStore, "store New"}, {kFirstStore, "store of the zip"}};
    const Layout newStoreAlone{{kStore, "store New"}};
    const auto state = [](const Layout& covers, const Layout& stores) {
        return book("folder 3", covers, stores);
    };
    const std::vector<Layout> between = {state(coverAside, oldStore), state(newCover, oldStore)};
    const std::vector<Layout> killed = {state(newCover, bothStores)};
    const std::vector<Layout> succeeded = {state(newCover, bothStores),
                                           state(newCover, newStoreAlone),
                                           state(newCoverAlone, newStore)};
    auto unzipped = between;
    unzipped.push_back(state(oldCover, oldStore));

    const Layout editedTwice = state({{kCover, "cover 2"}, {kFirstCover, "cover 1"}}, newStore);
    const Layout onlyCoverTwice = with(editedTwice, kStore, "store Newer");
    const Layout before = state({{kCover, "cover 4"}, {kFirstCover, "cover 1"}},
                                {{kStore, "store Newer"}, {kFirstStore, "store of the zip"}});
    const Layout restored = state(oldCover, newStore);
    return {
        {.name = "EditsABook",
         .before = state(oldCover, oldStore),
         .after = state(newCover, newStore),
         .run = editing("from/a.epub", kNewTitleAndCover),
         .between = between,
         .killed = killed,
         .succeeded = succeeded,
         .prepare = identified("from/a.epub")},
        {.name = "EditsABookAgain",
         .before = before,
         .after = editedTwice,
         .run = editing("from/a.epub", kNewTitleAndCover),
         .between = {onlyCoverTwice},
         .succeeded = {onlyCoverTwice},
         .prepare = identified("from/a.epub"),
         .completesWhatIsLeft = true},
        {.name = "EditsAZippedBook",
         .before = {{"from/a.epub", "zip 3"}},
         .after = state(newCover, newStore),
         .run = editing("from/a.epub", kNewTitleAndCover),
         .between = unzipped,
         .killed = killed,
         .succeeded = succeeded,
         .prepare = identified("from/a.epub")},
    };
}

std::vector<Operation> otherEdits() {
    const Layout newCover{{kCover, "image 2"}, {kFirstCover, "cover 1"}};
    const Layout coverGone{{kFirstCover, "cover 1"}};
    const Layout firstCover{{kCover, "cover 1"}};
    const Layout oldStore{{kStore, "store Old"}};
    const Layout bothStores{{kStore, "store Old"}, {kFirstStore, "store Old"}};
    const Layout newStore{{kStore, "store A title"}, {kFirstStore, "store Old"}};
    const auto state = [](const Layout& covers, const Layout& stores) {
        return book("folder 3", covers, stores);
    };
    return {
        {.name = "RestoresACover",
         .before = state(newCover, oldStore),
         .after = state(firstCover, newStore),
         .run = editing("from/a.epub", {{"PVCoverImageData", Value()}}),
         .between = {state(coverGone, oldStore)},
         .killed = {state(firstCover, oldStore), state(firstCover, bothStores)},
         .succeeded = {state(coverGone, newStore), state(firstCover, bothStores),
                       state(firstCover, {{kStore, "store A title"}})},
         .prepare = identified("from/a.epub")},
        {.name = "EditsTheAttributesAlone",
         .before = {{"from/a.epub", "zip 1"}},
         .after = {{"from/a.epub", "zip 1"}},
         .run = editing("from/a.epub", {{"itemName", "New"}}, /*inflates=*/false),
         .prepare = identified("from/a.epub")},
        {.name = "EditsTheNameOfAFile",
         .before = {{"from/a.pdf", "file 1"}},
         .after = {{"from/New.pdf", "file 1"}},
         .run = editing("from/a.pdf", {{"PVDisplayName", "New"}}),
         .failed = {{{"from/New.pdf", "file 1"}}},
         .prepare = identified("from/a.pdf")},
        {.name = "RenamesAFileAfterItsTitle",
         .before = {{"from/a.pdf", "file 1"}},
         .after = {{"from/A title.pdf", "file 1"}},
         .run = normalizing("from/a.pdf")},
    };
}

std::vector<Operation> inflations() {
    const Layout zip{{"from/a.epub", "zip 1"}};
    const Layout expanded{{"from/a.epub", "expanded 1"}};
    return {
        {.name = "InflatesABook",
         .before = zip,
         .after = expanded,
         .run = inflating("from/a.epub"),
         .alsoHolds = identityComesLast("from/a.epub")},
        {.name = "InflatesABookThroughAFolder",
         .before = zip,
         .after = expanded,
         .run = inflatingThrough("from/a.epub", "staging"),
         .between = withEach(zip, "staging/a.epub", stagesOf("expanded 1")),
         .killed = {with(expanded, "staging/a.epub", "zip 1")}},
        // The book itself is what is cleared for the copy; but for that nothing takes it.
        {.name = "InflatesABookDirectly",
         .before = zip,
         .after = {},
         .run = inflatingThrough("from/a.epub", std::nullopt),
         .answers = false},
    };
}

std::vector<Operation> newVersions() {
    const Layout update{{"from/a.epub", "package 2"}};
    const std::vector<std::string> stampedInPart = {"package 2 but for modes", "package 2 private"};
    const Layout old{{"to/4711.epub", "package 1"}};
    const Layout oldInCloud{{"cloud/b.epub", "package 1"}};
    return {
        {.name = "AppliesANewBook",
         .before = update,
         .after = {{"to/4711.epub", "package 2 private"}},
         .run = applying("from/a.epub", ""),
         .between = withEach({}, "from/a.epub", stampedInPart),
         .succeeded = withEach({}, "to/4711.epub", {"package 2", "package 2 but for modes"}),
         .completesWhatIsLeft = true},
        {.name = "AppliesANewVersion",
         .before = {{"from/a.epub", "package 2"}, {"to/4711.epub", "package 1"}},
         .after = {{"to/4711.epub", "package 2 private"}},
         .run = applying("from/a.epub", "to/4711.epub"),
         .between = withEach(old, "from/a.epub", stampedInPart),
         .killed = {{{"from/a.epub", "package 1"}, {"to/4711.epub", "package 2 private"}}},
         .failed = withEach({}, "to/4711.epub", {"package 2", "package 2 but for modes"}),
         .answers = false},
        {.name = "AppliesANewVersionInTheCloud",
         .before = {{"from/a.epub", "package 2"}, {"cloud/b.epub", "package 1"}},
         .after = {{"cloud/A title.epub", "package 2 private"}},
         .run = applying("from/a.epub", "cloud/b.epub"),
         .between = withEach(oldInCloud, "from/a.epub", stampedInPart),
         .killed = {{{"from/a.epub", "package 1"}, {"cloud/b.epub", "package 2 private"}},
                    {{"cloud/b.epub", "package 2 private"}}},
         // What can't be asked counts as not synchronised.
         .failed = {with(oldInCloud, "to/4711.epub", "package 2 private"),
                    {{"cloud/b.epub", "package 2 private"}},
                    {{"cloud/A title.epub", "package 2"}},
                    {{"cloud/A title.epub", "package 2 but for modes"}}},
         .answers = false},
    };
}

}  // namespace

std::vector<Operation> editOperations() {
    std::vector<Operation> all = bookEdits();
    for (const auto& more : {otherEdits(), inflations(), newVersions()})
        all.insert(all.end(), more.begin(), more.end());
    return all;
}

}  // namespace parvel::testing
