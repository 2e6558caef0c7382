#pragma once

#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "cli/ArrivalGuard.h"
#include "cli/AssetRecord.h"
#include "cli/DryRun.h"
#include "cli/OutputOptions.h"
#include "cli/PathSource.h"
#include "cli/Result.h"

namespace parvel::cli {

/// What a command does to one asset; what came of it goes into the result.
using ChangeWork =
    std::function<void(PVAssetMetadataFileManager& manager, const AssetPtr& asset, Result& result)>;

using PathChange = std::function<void(PVAssetMetadataFileManager& manager, Result& result)>;

/// What the commands share that change one asset after the other: the record of each PATH, the
/// PATHs, the dry run and the printing. PATHs are worked on one by one in the order given, since
/// one change may stand in the way of the next; so there is no -j.
class AssetChanges {
public:
    explicit AssetChanges(Uninspectable uninspectable = Uninspectable::HasItsURLAlone)
        : m_record(uninspectable) {}

    void declare(CommandLine& line);
    /// Declares --force; without it no folder that is no asset is lost.
    void declareForce(CommandLine& line, std::string_view help);
    [[nodiscard]] bool isForced() const { return m_isForced; }
    [[nodiscard]] bool isDryRun() const { return m_dryRun.isAsked(); }
    /// Assets that lie in the folder already are left out where a PATH's subfolders are searched;
    /// what the run brings there it does not replace, unless forced to.
    void setTarget(const URL& folder) { m_paths.target = folder; }
    /// Whether there is but one PATH among the operands, and no other source of PATHs.
    [[nodiscard]] bool hasOnePath(const std::vector<std::string>& operands) const;
    /// Whether PATHs are looked for elsewhere than among the operands alone.
    [[nodiscard]] bool hasSearchedPaths() const { return m_paths.filesFrom || m_paths.recursive; }
    /// Reads and begins what was asked for. Throws UsageError.
    void begin();
    int run(std::string_view command, std::vector<std::string> operands, const ChangeWork& work);
    /// The same without the records of the PATHs.
    int runOnPaths(std::string_view command, std::vector<std::string> operands,
                   const PathChange& work);

    /// Whether the guards let the item take the place of what stands there. Where they don't, the
    /// result has their error before anything is touched: some operations write attributes first.
    [[nodiscard]] bool mayReplace(const URL& existing, const URL& replacement,
                                  Result& result) const;

    [[nodiscard]] AssetPtr recordOf(Result& result) const { return m_record.forResult(result); }
    [[nodiscard]] const OutputOptions& output() const { return m_output; }

private:
    AssetRecord m_record;
    DryRun m_dryRun;
    bool m_isGuarded = false;
    bool m_isForced = false;
    std::shared_ptr<ArrivalGuard> m_arrivals;  ///< null where nothing is guarded
    OutputOptions m_output;
    PathOptions m_paths;
};

}  // namespace parvel::cli
