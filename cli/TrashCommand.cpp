#include <algorithm>
#include <filesystem>
#include <utility>

#include "cli/AssetChanges.h"
#include "cli/Command.h"
#include "cli/ResultPrinter.h"
#include "cli/TransferAdvice.h"
#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "parvel/platform/TrashedItems.h"

namespace parvel::cli {
namespace {

class TrashCommand : public Command {
public:
    void declare(CommandLine& line) override;
    int run(std::vector<std::string> operands) override;

private:
    int list(const std::vector<std::string>& operands) const;
    void restore(PVAssetMetadataFileManager& manager, Result& result);

    bool m_lists = false;
    bool m_restores = false;
    AssetChanges m_changes;
    std::vector<TrashedItem> m_items;  ///< the last one trashed at the end
};

void TrashCommand::declare(CommandLine& line) {
    line.group("What is done");
    line.flag("--list", "list what was put in the trash, with the paths it had", m_lists);
    line.flag("--restore", "put back what had that PATH; the last one if several had", m_restores);
    line.exclusive({"--list", "--restore"});
    m_changes.declare(line);
    line.note("The trash is the desktop's own.");
}

void trash(PVAssetMetadataFileManager& manager, const AssetPtr& asset, Result& result) {
    const AssetPtr trashed = manager.trashAsset_error(asset, &result.error);
    setRecord(result, trashed, PVAssetMetadataFlavorFull);
    if (!trashed || !trashed->trashedURL())
        return;
    result.outcome =
        "in the trash as \"" + std::string(trashed->trashedURL()->lastPathComponent()) + "\"";
}

int TrashCommand::run(std::vector<std::string> operands) {
    m_changes.begin();
    if (m_lists)
        return list(operands);
    if (!m_restores)
        return m_changes.run("trash", std::move(operands), trash);
    m_items = trashedItems();
    return m_changes.runOnPaths(
        "trash", std::move(operands),
        [this](PVAssetMetadataFileManager& manager, Result& result) { restore(manager, result); });
}

int TrashCommand::list(const std::vector<std::string>& operands) const {
    if (!operands.empty() || m_changes.hasSearchedPaths())
        throw UsageError("--list takes no PATH");
    ResultPrinter printer("trash", m_changes.output().form(), makeOutcomeFormat);
    for (const TrashedItem& item : trashedItems()) {
        Result result = resultForPath(item.original.path());
        result.needsRecord = false;
        result.fields = {{"trashedPath", item.place.path()}, {"trashedAt", item.trashedAt}};
        result.outcome = "trashed " + item.trashedAt + " as \"" +
                         std::string(item.place.lastPathComponent()) + "\"";
        printer.print(result);
    }
    return printer.finish();
}

/// The path with the links of its folder resolved, as the trash keeps it.
std::string resolvedPath(const URL& url) {
    std::error_code unknown;
    const auto folder =
        std::filesystem::weakly_canonical(url.deletingLastPathComponent().path(), unknown);
    return pathAppending(folder.string(), url.lastPathComponent());
}

AssetPtr recordAt(const URL& place) {
    if (AssetPtr record = PVAssetMetadataInspector::metadataForAssetAtURL_error(place))
        return record;
    return PVAssetMetadata::metadataWithURL_dictionary(place, nullptr);
}

void TrashCommand::restore(PVAssetMetadataFileManager& manager, Result& result) {
    const URL url = urlOfPath(result.path);
    const std::string path = resolvedPath(url);
    const auto found = std::find_if(m_items.rbegin(), m_items.rend(), [&](const TrashedItem& item) {
        return item.original.path() == path || item.place == url;
    });
    if (found == m_items.rend()) {
        result.nothing = "not in the trash";
        result.advice = "\"parvel trash --list\" shows what is";
        return;
    }
    const AssetPtr restored = manager.moveAsset_toURL_replaceExisting_error(
        recordAt(found->place), found->original, /*replaceExisting=*/false, &result.error);
    setRecord(result, restored, PVAssetMetadataFlavorFull);
    if (!restored) {
        result.advice = adviceForTransfer(result, found->place, "move that away first");
        return;
    }
    result.outcome = "back at " + found->original.path();
    m_items.erase(std::next(found).base());
}

}  // namespace

std::unique_ptr<Command> makeTrashCommand() {
    return std::make_unique<TrashCommand>();
}

}  // namespace parvel::cli
