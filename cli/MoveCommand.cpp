#include "cli/AssetChanges.h"
#include "cli/Command.h"
#include "cli/TransferAdvice.h"

namespace parvel::cli {
namespace {

class MoveCommand : public Command {
public:
    void declare(CommandLine& line) override;
    int run(std::vector<std::string> operands) override;

private:
    [[nodiscard]] std::string_view adviceForTakenPlace(const AssetPtr& asset) const;
    void move(PVAssetMetadataFileManager& manager, const AssetPtr& asset, Result& result) const;

    std::optional<std::string> m_to;
    std::optional<std::string> m_into;
    std::optional<URL> m_target;
    bool m_replaces = false;
    bool m_renames = false;
    bool m_takesAssetID = false;
    AssetChanges m_changes;
};

void MoveCommand::declare(CommandLine& line) {
    line.group("Where to");
    line.option("--to", "PATH", "move the one asset to that path", m_to);
    line.option("--into", "DIR", "move each asset into that folder", m_into);
    line.exclusive({"--to", "--into"});
    line.flag("--replace", "put it in the place of what stands there", m_replaces);
    line.flag("--rename",
              "with --into: count up to a free name (PDF documents and\n"
              "audiobooks)",
              m_renames);
    line.flag("--asset-id-name", "with --into: name a book after its identity", m_takesAssetID);
    m_changes.declareForce(line, "with --replace: lose a folder that stands there, too");
    m_changes.declare(line);
}

int MoveCommand::run(std::vector<std::string> operands) {
    m_changes.begin();
    if (!m_to && !m_into)
        throw UsageError("say where to: --to PATH or --into DIR");
    if (m_to && (m_renames || m_takesAssetID))
        throw UsageError("--rename and --asset-id-name choose a name in a folder: use --into");
    if (m_to && !m_changes.hasOnePath(operands))
        throw UsageError("--to takes one PATH");
    m_target = m_to ? urlOfOption("--to", *m_to) : urlOfOption("--into", *m_into);
    if (m_into)
        m_changes.setTarget(*m_target);
    return m_changes.run("move", std::move(operands),
                         [this](PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                                Result& result) { move(manager, asset, result); });
}

std::string_view MoveCommand::adviceForTakenPlace(const AssetPtr& asset) const {
    if (m_to)
        return "--replace replaces it; --into moves into a folder";
    if (asset->isPDF() || asset->isAudiobook())
        return "--replace replaces it, --rename counts up to a free name";
    return "--replace replaces it";
}

void MoveCommand::move(PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                       Result& result) const {
    const AssetPtr moved =
        m_to
            ? manager.moveAsset_toURL_replaceExisting_error(asset, m_target, m_replaces,
                                                            &result.error)
            : manager
                  .moveAsset_toDirectory_replaceExisting_renameIfCollision_useAssetIDFileName_error(
                      asset, *m_target, m_replaces, m_renames, m_takesAssetID, &result.error);
    setRecord(result, moved, PVAssetMetadataFlavorFull);
    const bool isItsOwnPlace = moved == asset;
    if (isItsOwnPlace && !manager.fileManager()->itemExistsAtPath(urlOfPath(result.path).path()))
        result.error = makeFileError(PVFileErrorCode::NoSuchFile, urlOfPath(result.path));
    else if (isItsOwnPlace)
        result.outcome = "is there already";
    else if (moved && moved->url())
        result.outcome = "moved to " + moved->url()->path();
    const bool hasNoName = m_takesAssetID && result.error && !result.error->url();
    if (hasNoName)
        result.advice = "it has no identity that can be a name: --record can say one";
    else if (!moved)
        result.advice =
            adviceForTransfer(result, urlOfPath(result.path), adviceForTakenPlace(asset));
}

}  // namespace

std::unique_ptr<Command> makeMoveCommand() {
    return std::make_unique<MoveCommand>();
}

}  // namespace parvel::cli
