#include "cli/AssetChanges.h"
#include "cli/BookStaging.h"
#include "cli/Command.h"
#include "cli/TransferAdvice.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"

namespace parvel::cli {
namespace {

class RenameCommand : public Command {
public:
    void declare(CommandLine& line) override;
    int run(std::vector<std::string> operands) override;

private:
    void rename(PVAssetMetadataFileManager& manager, const AssetPtr& asset, Result& result) const;

    std::optional<std::string> m_displayName;
    AssetChanges m_changes{Uninspectable::Fails};
};

void RenameCommand::declare(CommandLine& line) {
    line.group("What is done");
    line.option("--display-name", "NAME", "give the one asset that display name first",
                m_displayName);
    m_changes.declare(line);
    line.note("A PDF document's file is named after its display name; any other keeps its name.");
}

int RenameCommand::run(std::vector<std::string> operands) {
    m_changes.begin();
    if (m_displayName && !m_changes.hasOnePath(operands))
        throw UsageError("--display-name takes one PATH");
    return m_changes.run("rename", std::move(operands),
                         [this](PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                                Result& result) { rename(manager, asset, result); });
}

void RenameCommand::rename(PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                           Result& result) const {
    if (asset->isPDF() && isRefusedForCapitals(asset, result))
        return;
    AssetPtr named = asset;
    if (m_displayName)
        named = asset->copyWithUpdates(
            [this](PVMutableAssetMetadata& copy) { copy.setDisplayName(m_displayName); });
    const AssetPtr renamed = manager.normalizeNamingForAsset_error(named, &result.error);
    setRecord(result, renamed, PVAssetMetadataFlavorFull);
    if (!renamed && result.error == makeMissingURLError())
        result.advice = "its display name makes no name of a file";
    else if (!renamed)
        result.advice = adviceForTransfer(result, urlOfPath(result.path),
                                          "choose another name with --display-name");
    else if (renamed->url() != asset->url())
        result.outcome = "renamed to " + renamed->url()->path();
    else
        result.outcome = renamed->isPDF() ? "has that name already"
                                          : "keeps its name, as all but PDF documents do";
}

}  // namespace

std::unique_ptr<Command> makeRenameCommand() {
    return std::make_unique<RenameCommand>();
}

}  // namespace parvel::cli
