#include <cerrno>

#include "cli/AssetChanges.h"
#include "cli/BookStaging.h"
#include "cli/Command.h"
#include "cli/Messages.h"
#include "cli/ServiceInPlace.h"
#include "cli/TransferAdvice.h"
#include "parvel/platform/CloudReport.h"

namespace parvel::cli {
namespace {

/// Keeps what came of a replacement, which the library keeps to itself.
class ReplacementWitness : public ForwardingFileSystemService {
public:
    using ForwardingFileSystemService::ForwardingFileSystemService;

    bool replaceItem(const URL& existing, const URL& replacement, ReplaceOptions options,
                     std::optional<URL>* resulting, ErrorOut error) override {
        m_error.reset();
        m_hasReplaced = ForwardingFileSystemService::replaceItem(existing, replacement, options,
                                                                 resulting, &m_error);
        if (!m_hasReplaced)
            assign(error, m_error);
        return m_hasReplaced;
    }

    [[nodiscard]] bool hasReplaced() const { return m_hasReplaced; }
    [[nodiscard]] const std::optional<Error>& error() const { return m_error; }

private:
    bool m_hasReplaced = false;
    std::optional<Error> m_error;
};

/// Whether the program itself refused: a folder that is no book would go, or what this run brought.
bool isGuardsRefusal(const std::optional<Error>& error) {
    return error && error->domain() == PVPOSIXErrorDomain &&
           (error->code() == EISDIR || error->code() == EALREADY);
}

/// `cloud add`, `take`, `replace` and `status`.
class CloudCommand : public Command {
public:
    void declare(CommandLine& line) override;
    int run(std::vector<std::string> operands) override;

private:
    void checkOptions(std::string_view action) const;
    void transfer(bool isInto, PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                  Result& result) const;
    void replaceInto(PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                     Result& result) const;

    std::optional<std::string> m_into;
    std::optional<URL> m_target;
    bool m_replaces = false;
    AssetChanges m_changes;
};

void CloudCommand::declare(CommandLine& line) {
    line.group("Where to");
    line.option("--into", "DIR", "with add and take: move each asset into that folder", m_into);
    line.flag("--replace", "with add: put it in the place of what stands there", m_replaces);
    m_changes.declareForce(line, "lose a folder that stands there, too");
    m_changes.declare(line);
    line.note(
        "add moves assets into a folder that a sync client keeps in step, take moves them out\n"
        "of it; replace puts NEW in the place of OLD and names it after its title; status\n"
        "tells whether a PATH lies in such a folder, and why.");
}

void CloudCommand::checkOptions(std::string_view action) const {
    const bool isTransfer = action == "add" || action == "take";
    if (isTransfer && !m_into)
        throw UsageError(std::string(action) + ": say where to: --into DIR");
    if (!isTransfer && m_into)
        throw UsageError(std::string(action) + " takes no --into");
    if (m_replaces && action != "add")
        throw UsageError(std::string(action) + " takes no --replace");
}

/// The name of a downloading status in results.
std::string_view nameOf(DownloadingStatus status) {
    switch (status) {
        case DownloadingStatus::Current:
            return "current";
        case DownloadingStatus::Downloaded:
            return "downloaded";
        case DownloadingStatus::NotDownloaded:
            return "notDownloaded";
    }
    return {};
}

std::string_view wordsOf(std::optional<DownloadingStatus> status) {
    if (!status)
        return "status unknown";
    return status == DownloadingStatus::NotDownloaded ? "not downloaded" : nameOf(*status);
}

void tellStatus(Result& result) {
    result.needsRecord = false;
    const std::optional<CloudReport> report =
        cloudReportForURL(urlOfPath(result.path), &result.error);
    const auto orNull = [&report](const std::string CloudReport::*text) {
        return report && !((*report).*text).empty() ? Value((*report).*text) : Value();
    };
    const bool hasStatus = report && report->status;
    result.fields = {
        {"isUbiquitous", report ? Value(Number::boolean(report->isUbiquitous)) : Value()},
        {"downloadingStatus", hasStatus ? Value(nameOf(*report->status)) : Value()},
        {"client", orNull(&CloudReport::client)},
        {"root", orNull(&CloudReport::root)},
        {"mark", orNull(&CloudReport::mark)},
        {"reason", orNull(&CloudReport::reason)}};
    if (result.error || !report)
        return;
    if (!report->isUbiquitous) {
        result.outcome = "in no synchronised storage: " + report->reason;
        return;
    }
    result.outcome =
        "in synchronised storage, " + std::string(wordsOf(report->status)) + ": " + report->client +
        " keeps " + report->root + " in step, " +
        (report->mark.empty() ? "as the desktop tells" : "by its mark \"" + report->mark + "\"") +
        "; " + report->reason;
}

void CloudCommand::transfer(bool isInto, PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                            Result& result) const {
    if (m_replaces) {
        replaceInto(manager, asset, result);
        return;
    }
    const AssetPtr moved = manager.setUbiquitous_asset_intoDirectory_replace_error(
        isInto, asset, *m_target, /*replace=*/false, &result.error);
    setRecord(result, moved, PVAssetMetadataFlavorFull);
    if (moved && moved->url())
        result.outcome = "moved to " + moved->url()->path();
    else
        result.advice = adviceForTransfer(result, urlOfPath(result.path), "move that away first");
}

/// The library reports no outcome; the disk tells whether, and the service why not.
void CloudCommand::replaceInto(PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                               Result& result) const {
    const auto witness = std::make_shared<ReplacementWitness>(manager.fileManager());
    {
        const ServiceInPlace inPlace(manager, witness);
        manager.setUbiquitous_asset_intoDirectory_replace_error(
            /*ubiquitous=*/true, asset, *m_target, /*replace=*/true, &result.error);
    }
    result.needsRecord = false;
    if (witness->hasReplaced()) {
        result.outcome = "moved into " + m_target->path();
        return;
    }
    Result failed = result;
    failed.error = standsAt(*m_target)
                       ? witness->error()
                       : makeFileError(PVFileErrorCode::NoSuchFile,
                                       placeInFolder(asset, *m_target, /*takesAssetID=*/false));
    const std::string reason =
        failed.error ? withoutFullStop(failed.error->message()) : "nothing tells why";
    const std::string advice =
        adviceForTransfer(failed, urlOfPath(result.path), "move that away first");
    // What the library did not do is no failure of a call that reports none; a refusal is.
    if (isGuardsRefusal(failed.error)) {
        result.needsRecord = true;
        result.nothing = "still where it was";
        result.reason = reason;
        result.advice = advice;
        return;
    }
    result.outcome = "still where it was: " + reason + (advice.empty() ? "" : "; " + advice);
}

/// --record, where it is given, is the record of the new version.
void replace(PVAssetMetadataFileManager& manager, const AssetPtr& newVersion, Result& result) {
    const AssetPtr asset = AssetRecord(Uninspectable::HasItsURLAlone).forResult(result);
    result.assetID = asset->assetID();
    const AssetPtr replaced =
        manager.replaceUbiquitousAsset_withAsset_error(asset, newVersion, &result.error);
    setRecord(result, replaced, PVAssetMetadataFlavorFull);
    if (replaced && replaced->url())
        result.outcome = "replaced by " + replaced->url()->path();
    else if (const auto url = newVersion->url())
        result.advice = adviceForReplacement(result, *url, urlOfPath(result.path),
                                             !manager.fileManager()->itemExistsAtPath(url->path()));
}

int CloudCommand::run(std::vector<std::string> operands) {
    m_changes.begin();
    const std::string action = operands.empty() ? std::string() : operands.front();
    if (action != "add" && action != "take" && action != "replace" && action != "status")
        throw UsageError("say what to do: add, take, replace or status");
    checkOptions(action);
    operands.erase(operands.begin());
    if (action == "status")
        return m_changes.runOnPaths(
            "cloud", std::move(operands),
            [](PVAssetMetadataFileManager&, Result& result) { tellStatus(result); });
    if (action != "replace") {
        m_target = urlOfOption("--into", *m_into);
        m_changes.setTarget(*m_target);
        return m_changes.run(
            "cloud", std::move(operands),
            [&](PVAssetMetadataFileManager& manager, const AssetPtr& asset, Result& result) {
                transfer(action == "add", manager, asset, result);
            });
    }
    if (operands.size() != 2)
        throw UsageError("replace takes two PATHs, OLD and NEW");
    Result newer = resultForPath(operands.back());
    const AssetPtr newVersion = m_changes.recordOf(newer);
    operands.pop_back();
    if (!m_changes.hasOnePath(operands))
        throw UsageError("replace takes two PATHs, OLD and NEW, and no others");
    return m_changes.runOnPaths("cloud", std::move(operands),
                                [&](PVAssetMetadataFileManager& manager, Result& result) {
                                    replace(manager, newVersion, result);
                                });
}

}  // namespace

std::unique_ptr<Command> makeCloudCommand() {
    return std::make_unique<CloudCommand>();
}

}  // namespace parvel::cli
