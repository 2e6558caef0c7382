#include "cli/AssetChanges.h"
#include "cli/Command.h"
#include "cli/TransferAdvice.h"

namespace parvel::cli {
namespace {

class RedactCommand : public Command {
public:
    void declare(CommandLine& line) override;
    int run(std::vector<std::string> operands) override;

private:
    void redact(PVAssetMetadataFileManager& manager, const AssetPtr& asset, Result& result) const;

    std::optional<std::string> m_into;
    std::optional<URL> m_target;
    AssetChanges m_changes;
};

void RedactCommand::declare(CommandLine& line) {
    line.group("Where to");
    line.option("--into", "DIR", "move each asset aside into that folder", m_into);
    m_changes.declare(line);
}

int RedactCommand::run(std::vector<std::string> operands) {
    m_changes.begin();
    if (!m_into)
        throw UsageError("say where to: --into DIR");
    m_target = urlOfOption("--into", *m_into);
    m_changes.setTarget(*m_target);
    return m_changes.run("redact", std::move(operands),
                         [this](PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                                Result& result) { redact(manager, asset, result); });
}

void RedactCommand::redact(PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                           Result& result) const {
    const AssetPtr redacted =
        manager.redactAsset_intoDirectory_error(asset, *m_target, &result.error);
    setRecord(result, redacted, PVAssetMetadataFlavorFull);
    if (redacted && redacted->url())
        result.outcome = "redacted, and moved to " + redacted->url()->path();
    else
        result.advice = adviceForTransfer(result, urlOfPath(result.path), "move that away first");
}

}  // namespace

std::unique_ptr<Command> makeRedactCommand() {
    return std::make_unique<RedactCommand>();
}

}  // namespace parvel::cli
