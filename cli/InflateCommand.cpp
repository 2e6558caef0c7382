#include "cli/AssetChanges.h"
#include "cli/BookStaging.h"
#include "cli/Command.h"
#include "cli/Progress.h"

namespace parvel::cli {
namespace {

class InflateCommand : public Command {
public:
    void declare(CommandLine& line) override;
    int run(std::vector<std::string> operands) override;

private:
    void inflate(PVAssetMetadataFileManager& manager, const AssetPtr& asset, Result& result) const;

    BookStaging m_staging;
    ProgressOption m_progress;
    AssetChanges m_changes{Uninspectable::Fails};

    Progress::Form m_form = Progress::Form::Auto;
};

void InflateCommand::declare(CommandLine& line) {
    line.group("How it is done");
    m_staging.declare(line);
    m_progress.declare(line);
    m_changes.declareForce(line, "do it even where that loses a book");
    m_changes.declare(line);
}

int InflateCommand::run(std::vector<std::string> operands) {
    m_changes.begin();
    m_staging.begin();
    m_form = m_progress.form();
    return m_changes.run("inflate", std::move(operands),
                         [this](PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                                Result& result) { inflate(manager, asset, result); });
}

void InflateCommand::inflate(PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                             Result& result) const {
    const bool isZipped = asset->isCompressedBookWithError() == true;
    if (isZipped && !m_changes.isForced() && isRefusedForCapitals(asset, result))
        return;
    std::optional<StagingPlace> place = StagingPlace{};
    if (isZipped)
        place = m_staging.placeFor(*asset->url(), asset->url()->deletingLastPathComponent(),
                                   m_changes.isForced(), result);
    if (!place)
        return;
    AssetPtr inflated;
    {
        BusyProgress progress(m_form, result.path);
        inflated =
            manager.inflateAsset_temporaryDirectory_error(asset, place->directory, &result.error);
        if (inflated)
            progress.finish();
    }
    setRecord(result, inflated, PVAssetMetadataFlavorFull);
    if (!inflated)
        result.nothing = "not expanded";
    else
        result.outcome = isZipped ? "expanded in its place" : "is no zipped book";
}

}  // namespace

std::unique_ptr<Command> makeInflateCommand() {
    return std::make_unique<InflateCommand>();
}

}  // namespace parvel::cli
