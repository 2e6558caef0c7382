#pragma once

#include <cstdint>
#include <set>
#include <string>
#include <vector>

#include "cli/Finding.h"
#include "cli/Result.h"
#include "parvel/platform/FileSystemService.h"

namespace parvel::cli {

/// Looks at assets and folders one after the other, and changes nothing. Only what it has made sure
/// of is a finding.
class AssetDiagnosis {
public:
    /// What endangers the asset of the result's PATH. The result gets its identity; where nothing
    /// of a library's kind stands there, its error.
    [[nodiscard]] std::vector<Finding> findingsOfAsset(Result& result);
    /// What endangers all assets that lie in the folder.
    [[nodiscard]] std::vector<Finding> findingsOfFolder(const URL& folder);

private:
    [[nodiscard]] bool isFirstOfItsFileSystem(const URL& url);

    std::set<std::uint64_t> m_fileSystems;  ///< those that were said to keep no attributes
};

/// A hidden item that a killed run has left in a folder, or what stands there for an asset that is
/// not on this device.
struct Remnant {
    std::string path;
    Finding finding;
};

/// Those in the folder and its subfolders, packages and other hidden folders left out, by name.
[[nodiscard]] std::vector<Remnant> remnantsBelow(const std::string& folder);

/// Nothing where the service, a rehearsal's, could trash the item.
[[nodiscard]] std::vector<Finding> findingsOfTrash(FileSystemService& service, const URL& item);

}  // namespace parvel::cli
