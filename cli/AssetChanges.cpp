#include "cli/AssetChanges.h"

#include <cerrno>

#include "cli/Batch.h"
#include "cli/FolderGuard.h"

namespace parvel::cli {

void AssetChanges::declare(CommandLine& line) {
    m_record.declare(line);
    m_dryRun.declare(line);
    m_paths.declare(line);
    m_paths.walksFirst = true;
    m_output.declare(line);
}

void AssetChanges::declareForce(CommandLine& line, std::string_view help) {
    m_isGuarded = true;
    line.flag("--force", help, m_isForced);
}

bool AssetChanges::hasOnePath(const std::vector<std::string>& operands) const {
    return operands.size() == 1 && !hasSearchedPaths();
}

void AssetChanges::begin() {
    m_output.applyLog();
    m_record.read();
    m_dryRun.begin();
}

bool AssetChanges::mayReplace(const URL& existing, const URL& replacement, Result& result) const {
    if (!m_isGuarded || m_isForced)
        return true;
    result.error = objectionToReplacing(existing, replacement);
    if (!result.error && m_arrivals && m_arrivals->hasBrought(existing))
        result.error = makePOSIXError(EALREADY, existing);
    return !result.error;
}

int AssetChanges::run(std::string_view command, std::vector<std::string> operands,
                      const ChangeWork& work) {
    return runOnPaths(command, std::move(operands),
                      [&](PVAssetMetadataFileManager& manager, Result& result) {
                          const AssetPtr asset = m_record.forResult(result);
                          if (!asset) {
                              result.nothing = "no metadata";
                              return;
                          }
                          result.assetID = asset->assetID();
                          work(manager, asset, result);
                      });
}

int AssetChanges::runOnPaths(std::string_view command, std::vector<std::string> operands,
                             const PathChange& work) {
    const BatchOptions options{
        .command = command, .form = m_output.form(), .makeText = makeOutcomeFormat};
    PathSource source(std::move(operands), m_paths);
    const auto manager = m_dryRun.makeManager();
    if (m_isGuarded && !m_isForced)
        manager->setFileManager(std::make_shared<FolderGuard>(manager->fileManager()));
    if (m_isGuarded && !m_isForced && m_paths.target) {
        m_arrivals = std::make_shared<ArrivalGuard>(manager->fileManager());
        manager->setFileManager(m_arrivals);
    }
    return runOverPaths(options, source, [&](const std::string& path) {
        Result result = resultForPath(path);
        result.nothing = "nothing was done";
        work(*manager, result);
        return result;
    });
}

}  // namespace parvel::cli
