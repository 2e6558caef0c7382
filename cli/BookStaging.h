#pragma once

#include <memory>
#include <optional>
#include <string>

#include "cli/CommandLine.h"
#include "cli/Result.h"
#include "parvel/platform/StagingDirectory.h"

namespace parvel::cli {

/// Where a command has a book made before it takes its place: --temporary DIR; with --direct
/// nowhere; else in a fresh hidden folder beside the place, which goes with this object.
struct StagingPlace {
    std::unique_ptr<StagingDirectory> fresh;
    std::optional<URL> directory;  ///< what the library is given
};

/// The options of that choice, and what stands between them and a book that they would cost.
class BookStaging {
public:
    void declare(CommandLine& line);
    /// Reads what was asked for. Throws UsageError.
    void begin();
    [[nodiscard]] bool isDirect() const { return m_isDirect; }

    /// The place for the book of that URL, which is to stand in the folder. None where the result
    /// says why not: the library would delete what it finds in its way, and unless it is forced to,
    /// the program does not let it.
    [[nodiscard]] std::optional<StagingPlace> placeFor(const URL& book, const URL& folder,
                                                       bool isForced, Result& result) const;

private:
    std::optional<std::string> m_temporary;
    bool m_isDirect = false;

    std::optional<URL> m_directory;
};

/// Makes the result one that was refused before anything was touched.
void refuse(Result& result, std::string reason, std::string advice);

/// Where the library looks for an asset once it has written its record: what it writes, it writes
/// under the stored path, whose extension is in small letters.
[[nodiscard]] std::optional<URL> storedURL(const AssetPtr& asset);

/// Refuses an asset that the library would take another file for, by the capitals in its extension.
[[nodiscard]] bool isRefusedForCapitals(const AssetPtr& asset, Result& result);

/// What to do about a folder that is not there, or is none.
[[nodiscard]] std::string adviceForMissingFolder(const URL& folder);

/// Whether anything stands there, a dangling link included.
[[nodiscard]] bool standsAt(const URL& url);

/// Where an asset would stand in a folder of the library: under its own name, or a book under its
/// identity's. None where it has no such name.
[[nodiscard]] std::optional<URL> placeInFolder(const AssetPtr& asset, const URL& folder,
                                               bool takesAssetID);

/// Whether the item is the folder, or lies somewhere below it; links count as what they lead to.
[[nodiscard]] bool liesWithin(const URL& item, const URL& folder);

/// Whether both are one item on the disk, or the same place where nothing stands.
[[nodiscard]] bool isSamePlace(const URL& url, const URL& other);

}  // namespace parvel::cli
