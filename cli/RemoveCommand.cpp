#include <cerrno>

#include "cli/AssetChanges.h"
#include "cli/Command.h"

namespace parvel::cli {
namespace {

class RemoveCommand : public Command {
public:
    void declare(CommandLine& line) override;
    int run(std::vector<std::string> operands) override;

private:
    AssetChanges m_changes;
};

void RemoveCommand::declare(CommandLine& line) {
    line.group("What is done");
    m_changes.declareForce(line, "remove a folder that is no asset, too");
    m_changes.declare(line);
    line.note("What is removed does not come back; \"parvel trash\" keeps it for a while.");
}

void remove(PVAssetMetadataFileManager& manager, const AssetPtr& asset, Result& result) {
    const bool isRemoved = manager.removeAsset_error(asset, &result.error);
    result.fields.push_back({"removed", Number::boolean(isRemoved)});
    if (isRemoved) {
        setRecord(result, asset, PVAssetMetadataFlavorFull);
        result.outcome = "removed";
        return;
    }
    const bool isFolder = result.error && result.error->domain() == PVPOSIXErrorDomain &&
                          result.error->code() == EISDIR;
    if (isFolder)
        result.advice =
            "it is a folder and no book: -r removes the assets below it, --force all that is in it";
}

int RemoveCommand::run(std::vector<std::string> operands) {
    m_changes.begin();
    return m_changes.run("remove", std::move(operands), remove);
}

}  // namespace

std::unique_ptr<Command> makeRemoveCommand() {
    return std::make_unique<RemoveCommand>();
}

}  // namespace parvel::cli
