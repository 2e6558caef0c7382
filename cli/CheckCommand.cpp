#include <algorithm>
#include <unordered_set>
#include <utility>

#include <unistd.h>

#include "cli/BookStaging.h"
#include "cli/CallLog.h"
#include "cli/Command.h"
#include "cli/DryRun.h"
#include "cli/Interrupt.h"
#include "cli/JsonWriter.h"
#include "cli/Messages.h"
#include "cli/Output.h"
#include "cli/OutputOptions.h"
#include "cli/PathSource.h"
#include "cli/PropertyListText.h"
#include "cli/Reconciliation.h"
#include "cli/RecordFile.h"
#include "cli/TerminalText.h"
#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"

namespace parvel::cli {
namespace {

constexpr std::string_view kSmallLettersAdvice =
    "give it a name that ends in small letters, with \"parvel move --to\"";

/// What a check found.
struct Findings {
    std::vector<AssetPtr> orphans;
    std::vector<AssetPtr> missing;
    std::vector<MovedAsset> moved;

    [[nodiscard]] bool isEmpty() const { return orphans.empty() && missing.empty(); }
};

class CheckCommand : public Command {
public:
    void declare(CommandLine& line) override;
    int run(std::vector<std::string> operands) override;

private:
    [[nodiscard]] std::vector<AssetPtr> readRecords() const;
    [[nodiscard]] std::vector<URL> findURLs(std::vector<std::string> operands);
    void reportUninspected(const std::vector<URL>& urls, const std::optional<Error>& error);
    void reportFailure(const Result& result);
    [[nodiscard]] std::string textOf(const Findings& findings) const;

    std::optional<std::string> m_records;
    bool m_hasExitCode = false;
    bool m_hasFailure = false;
    DryRun m_dryRun;
    PathOptions m_paths;
    OutputOptions m_output;
};

void CheckCommand::declare(CommandLine& line) {
    line.group("What is compared");
    line.option("--records", "FILE",
                "the records: an array of dictionaries, or results as\n"
                "inspect prints them (JSON, lines of JSON or a property list)",
                m_records);
    line.flag("--exit-code", "end with status 4 where anything is found", m_hasExitCode);
    m_dryRun.declare(line);
    m_paths.declareSources(line);
    m_output.declare(line);
    line.note(
        "Prints the records whose file is gone (orphans), and the assets below each DIR that no\n"
        "record names (missing); an orphan and a missing asset of one identity are a moved one.\n"
        "Missing assets get their attributes, as those of a library have them.");
}

/// The record with the URL that it says, else with its result's PATH. One that has neither names no
/// file.
AssetPtr recordOf(const StoredRecord& stored) {
    if (AssetPtr record = PVAssetMetadata::deserializedMetadataFromDictionary_error(&stored.record))
        return record;
    const std::optional<URL> url =
        stored.path ? std::optional(urlOfPath(*stored.path)) : std::nullopt;
    return PVAssetMetadata::metadataWithURL_dictionary(url, &stored.record);
}

std::vector<AssetPtr> CheckCommand::readRecords() const {
    if (!m_records)
        throw UsageError("say what is known: --records FILE");
    std::string problem;
    auto stored = recordsFromFile(*m_records, problem);
    if (!stored)
        throw UsageError("--records " + *m_records + ": " + problem);
    std::vector<AssetPtr> records;
    records.reserve(stored->size());
    for (StoredRecord& each : *stored) {
        if (AssetPtr record = recordOf(std::exchange(each, {})))
            records.push_back(std::move(record));
    }
    return records;
}

/// The attributes of a missing asset whose extension holds capitals would go to another file of
/// that name in small letters.
bool isLeftOut(Result& result) {
    const URL url = urlOfPath(result.path);
    const auto stored = storedURL(PVAssetMetadata::metadataWithURL_dictionary(url, nullptr));
    if (!stored || *stored == url || !standsAt(*stored) || isSamePlace(*stored, url))
        return false;
    refuse(result, "the library would take " + stored->path() + " for it",
           std::string(kSmallLettersAdvice));
    return true;
}

std::vector<URL> CheckCommand::findURLs(std::vector<std::string> operands) {
    std::vector<URL> urls;
    if (operands.empty() && !m_paths.filesFrom)
        return urls;
    m_paths.recursive = true;
    PathSource source(std::move(operands), m_paths);
    while (const std::optional<FoundPath> found = interrupted() ? std::nullopt : source.next()) {
        Result result = resultForPath(found->path);
        if (found->readErrno == 0) {
            if (isLeftOut(result))
                reportFailure(result);
            else
                urls.push_back(urlOfPath(found->path));
            continue;
        }
        result.error = makePOSIXError(found->readErrno, urlOfPath(found->path));
        reportFailure(result);
    }
    return urls;
}

void CheckCommand::reportFailure(const Result& result) {
    m_hasFailure = true;
    writeToStandardError(failureLine("check", result));
}

/// The library leaves out what it can't inspect; here each is looked at once more for the reason.
/// An error that none of them explains is that of attributes which could not be written.
void CheckCommand::reportUninspected(const std::vector<URL>& urls,
                                     const std::optional<Error>& error) {
    bool isExplained = false;
    std::optional<URL> inspected;
    for (const URL& url : urls) {
        CallLog log;
        Result result = resultForPath(url.path());
        if (PVAssetMetadataInspector::metadataForAssetAtURL_error(url, &result.error)) {
            inspected = url;
            continue;
        }
        result.reason = log.reason();
        reportFailure(result);
        isExplained = true;
    }
    if (!error || isExplained)
        return;
    // A record that names another place than its asset's is one to that asset.
    const URL* const url = inspected ? &*inspected : error->url();
    Result result = resultForPath(url ? url->path() : std::string());
    result.error = error;
    if (inspected)
        result.advice = kSmallLettersAdvice;
    reportFailure(result);
}

std::string pathOf(const AssetPtr& asset) {
    const auto url = asset->url();
    return url ? url->path() : "(no path)";
}

Value arrayOf(const std::vector<AssetPtr>& assets) {
    std::vector<Value> values;
    values.reserve(assets.size());
    for (const AssetPtr& asset : assets)
        values.emplace_back(asset->dictionaryRepresentation());
    return Array(std::move(values));
}

Value arrayOf(const std::vector<MovedAsset>& moved) {
    std::vector<Value> values;
    values.reserve(moved.size());
    for (const MovedAsset& each : moved)
        values.emplace_back(
            Dictionary{{"from", each.orphan->url() ? Value(pathOf(each.orphan)) : Value()},
                       {"to", pathOf(each.missing)},
                       {"assetID", each.missing->assetID().value_or(String())}});
    return Array(std::move(values));
}

/// Moved assets in one line each, and then what has no counterpart.
std::string textForPeople(const Findings& findings) {
    std::unordered_set<const PVAssetMetadata*> paired;
    std::string text;
    for (const MovedAsset& each : findings.moved) {
        text += "moved from " + safeText(pathOf(each.orphan)) + " to " +
                safeText(pathOf(each.missing)) + "\n";
        paired.insert({each.orphan.get(), each.missing.get()});
    }
    for (const AssetPtr& orphan : findings.orphans) {
        if (!paired.contains(orphan.get()))
            text += safeText(pathOf(orphan)) + ": orphan, its file is gone\n";
    }
    for (const AssetPtr& missing : findings.missing) {
        if (!paired.contains(missing.get()))
            text += safeText(pathOf(missing)) + ": missing, no record names it\n";
    }
    return text;
}

std::string CheckCommand::textOf(const Findings& findings) const {
    if (m_output.form() == OutputForm::Text)
        return textForPeople(findings);
    const Dictionary all{{"orphans", arrayOf(findings.orphans)},
                         {"missing", arrayOf(findings.missing)},
                         {"moved", arrayOf(findings.moved)}};
    if (m_output.form() == OutputForm::PropertyList)
        return propertyListText(all);
    std::string text;
    appendJson(all, text);
    return text + "\n";
}

int CheckCommand::run(std::vector<std::string> operands) {
    m_output.applyLog();
    m_dryRun.begin();
    const std::vector<AssetPtr> records = readRecords();
    const auto manager = m_dryRun.makeManager();
    Findings findings;
    findings.orphans = manager->orphanAssetsInAssets_error(records);
    const std::vector<URL> urls = findURLs(std::move(operands));
    if (!interrupted()) {
        std::optional<Error> error;
        findings.missing = manager->assetsForURLs_missingFromAssets_error(urls, records, &error);
        reportUninspected(uninspectedURLs(urls, records, findings.missing), error);
    }
    findings.moved = movedAssets(findings.orphans, findings.missing);

    Output output(STDOUT_FILENO);
    output.append(textOf(findings));
    if (!output.finish("check") || m_hasFailure)
        return kFailure;
    return m_hasExitCode && !findings.isEmpty() ? kFound : kSuccess;
}

}  // namespace

std::unique_ptr<Command> makeCheckCommand() {
    return std::make_unique<CheckCommand>();
}

}  // namespace parvel::cli
