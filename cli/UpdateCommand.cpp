#include "cli/AssetChanges.h"
#include "cli/BookStaging.h"
#include "cli/Command.h"
#include "cli/FolderGuard.h"
#include "cli/Progress.h"
#include "cli/TransferAdvice.h"

namespace parvel::cli {
namespace {

class UpdateCommand : public Command {
public:
    void declare(CommandLine& line) override;
    int run(std::vector<std::string> operands) override;

private:
    void update(PVAssetMetadataFileManager& manager, const AssetPtr& asset, Result& result) const;
    [[nodiscard]] bool isRefused(PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                                 Result& result) const;
    [[nodiscard]] std::string adviceOnFailure(PVAssetMetadataFileManager& manager,
                                              const AssetPtr& asset, const Result& result) const;

    std::optional<std::string> m_into;
    std::optional<std::string> m_existingPath;
    ProgressOption m_progress;
    AssetChanges m_changes{Uninspectable::Fails};

    URL m_folder = URL::fileURLWithPath("");
    AssetPtr m_existing;
    Progress::Form m_form = Progress::Form::Auto;
};

void UpdateCommand::declare(CommandLine& line) {
    line.group("Where to");
    line.option("--into", "DIR", "the folder of the library", m_into);
    line.option("--existing", "OLD",
                "the asset of the library that NEW is a new version of;\n"
                "one in synchronised storage is replaced there",
                m_existingPath);
    m_progress.declare(line);
    m_changes.declareForce(line, "do it even where that loses another book or a folder");
    m_changes.declare(line);
}

int UpdateCommand::run(std::vector<std::string> operands) {
    m_changes.begin();
    m_form = m_progress.form();
    if (!m_into)
        throw UsageError("say where to: --into DIR");
    m_folder = urlOfOption("--into", *m_into);
    m_changes.setTarget(m_folder);
    if (m_existingPath) {
        if (!m_changes.hasOnePath(operands))
            throw UsageError("--existing takes one PATH");
        Result existing = resultForPath(urlOfOption("--existing", *m_existingPath).path());
        m_existing = AssetRecord(Uninspectable::HasItsURLAlone).forResult(existing);
    }
    return m_changes.run("update", std::move(operands),
                         [this](PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                                Result& result) { update(manager, asset, result); });
}

/// The library puts the new version over whatever stands at its name.
bool UpdateCommand::isRefused(PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                              Result& result) const {
    if (m_changes.isForced())
        return false;
    if (isRefusedForCapitals(asset, result))
        return true;
    if (m_existing && m_existing->isUbiquitous()) {
        const auto existing = m_existing->url();
        return existing && !m_changes.mayReplace(*existing, *asset->url(), result);
    }
    const std::optional<URL> place = placeInFolder(asset, m_folder, /*takesAssetID=*/true);
    const bool isThere =
        place && isSamePlace(*place, *asset->url()) && !isLinkTo(*asset->url(), *place);
    if (!place || isThere || !manager.fileManager()->itemExistsAtPath(place->path()))
        return false;
    if (!m_changes.mayReplace(*place, *asset->url(), result))
        return true;
    if (m_existing && m_existing->url() && isSamePlace(*place, *m_existing->url()))
        return false;
    Result standing = resultForPath(place->path());
    const AssetPtr other = AssetRecord(Uninspectable::Fails).forResult(standing);
    if (other && other->hasMatchingIdentity(*asset))
        return false;
    refuse(result, place->path() + " is another asset, and would be lost",
           "say with --existing that it is the one to replace, or give --force");
    return true;
}

std::string UpdateCommand::adviceOnFailure(PVAssetMetadataFileManager& manager,
                                           const AssetPtr& asset, const Result& result) const {
    const URL newVersion = *asset->url();
    const auto existing = m_existing ? m_existing->url() : std::nullopt;
    if (!existing)
        return adviceForTransfer(result, newVersion, "");
    const bool isPlaced = !manager.fileManager()->itemExistsAtPath(newVersion.path());
    return adviceForReplacement(result, newVersion, *existing, isPlaced);
}

void UpdateCommand::update(PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                           Result& result) const {
    result.nothing = "not brought in";
    if (isRefused(manager, asset, result)) {
        if (result.error)
            result.advice = adviceOnFailure(manager, asset, result);
        return;
    }
    AssetPtr updated;
    {
        BusyProgress progress(m_form, result.path);
        updated = manager.applyUpdate_onExistingAsset_targetDirectory_error(
            asset, m_existing, m_folder, &result.error);
        if (updated && !result.error)
            progress.finish();
    }
    setRecord(result, updated, PVAssetMetadataFlavorFull);
    if (updated && updated->url() && !result.error)
        result.outcome = "now " + updated->url()->path();
    else
        result.advice = adviceOnFailure(manager, asset, result);
}

}  // namespace

std::unique_ptr<Command> makeUpdateCommand() {
    return std::make_unique<UpdateCommand>();
}

}  // namespace parvel::cli
