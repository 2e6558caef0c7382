#include "cli/BookStaging.h"

#include <filesystem>

#include "parvel/foundation/ValueReadings.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"

namespace parvel::cli {

void BookStaging::declare(CommandLine& line) {
    line.option("--temporary", "DIR",
                "have a book made in DIR before it takes its place; if\n"
                "not given, in a hidden folder beside the place",
                m_temporary);
    line.flag("--direct", "have it made in its place at once", m_isDirect);
    line.exclusive({"--temporary", "--direct"});
}

void BookStaging::begin() {
    if (!m_temporary)
        return;
    m_directory = urlOfOption("--temporary", *m_temporary);
    std::error_code unknown;
    if (!std::filesystem::is_directory(m_directory->path(), unknown))
        throw UsageError("--temporary " + *m_temporary + ": there is no such folder");
}

std::optional<StagingPlace> BookStaging::placeFor(const URL& book, const URL& folder, bool isForced,
                                                  Result& result) const {
    StagingPlace place;
    const URL stage = m_directory.value_or(folder);
    if (!isForced && liesWithin(stage, book)) {
        refuse(result, stage.path() + " lies in the book itself", "choose a folder elsewhere");
        return std::nullopt;
    }
    if (!m_isDirect && !m_directory) {
        place.fresh = StagingDirectory::makeIn(folder, &result.error);
        if (!place.fresh) {
            if (result.error->domain() == PVFileErrorDomain)
                result.advice = adviceForMissingFolder(folder);
            return std::nullopt;
        }
        place.directory = place.fresh->url();
        return place;
    }

    place.directory = m_directory;
    const URL inTheWay =
        place.directory.value_or(folder).appendingPathComponent(book.lastPathComponent());
    if (isForced || !standsAt(inTheWay))
        return place;
    const std::string option = m_isDirect ? "--direct" : "--temporary";
    if (isSamePlace(inTheWay, book))
        refuse(result, "with " + option + " the library would delete the book before it is read",
               "leave out " + option + ", or give --force to lose it");
    else
        refuse(result, "with " + option + " the library would delete " + inTheWay.path() + " first",
               "leave out " + option + ", or give --force to lose that");
    return std::nullopt;
}

void refuse(Result& result, std::string reason, std::string advice) {
    result.nothing = "refused";
    result.reason = std::move(reason);
    result.advice = std::move(advice);
}

std::optional<URL> storedURL(const AssetPtr& asset) {
    return asset->copyWithUpdates([](PVMutableAssetMetadata&) {})->url();
}

bool isRefusedForCapitals(const AssetPtr& asset, Result& result) {
    if (asset->url() == storedURL(asset))
        return false;
    refuse(result, "the library would look for a name that ends in small letters",
           "give it such a name first, with \"parvel move --to\"");
    return true;
}

std::string adviceForMissingFolder(const URL& folder) {
    return standsAt(folder) ? folder.path() + " is no folder"
                            : "there is no folder " + folder.path() + ": make it first";
}

bool standsAt(const URL& url) {
    std::error_code unknown;
    return std::filesystem::exists(std::filesystem::symlink_status(url.path(), unknown));
}

std::optional<URL> placeInFolder(const AssetPtr& asset, const URL& folder, bool takesAssetID) {
    const auto url = asset->url();
    if (!url)
        return std::nullopt;
    if (!takesAssetID || !asset->isBook())
        return folder.appendingPathComponent(url->lastPathComponent());
    const Value* id = int64Reading(asset->storeID()) >= 1 ? asset->storeID() : asset->generatedID();
    const auto stem = stringForm(id);
    if (!stem)
        return std::nullopt;
    return folder.appendingPathComponent(*stem + "." + std::string(url->pathExtension()));
}

bool liesWithin(const URL& item, const URL& folder) {
    namespace fs = std::filesystem;
    std::error_code unknown;
    for (fs::path path = fs::weakly_canonical(item.path(), unknown);; path = path.parent_path()) {
        if (fs::equivalent(path, folder.path(), unknown))
            return true;
        if (path == path.parent_path())
            return false;
    }
}

bool isSamePlace(const URL& url, const URL& other) {
    std::error_code unknown;
    return url.standardized() == other.standardized() ||
           std::filesystem::equivalent(url.path(), other.path(), unknown);
}

}  // namespace parvel::cli
