#include <cstring>
#include <filesystem>

#include "cli/AssetRecord.h"
#include "cli/Batch.h"
#include "cli/BookStaging.h"
#include "cli/Command.h"
#include "cli/DryRun.h"
#include "cli/Interrupt.h"
#include "cli/KeptAttributes.h"
#include "cli/Messages.h"
#include "cli/Output.h"
#include "cli/OutputOptions.h"
#include "cli/PathSource.h"
#include "cli/PropertyValue.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "parvel/xattr/ExtendedAttributes.h"
#include "parvel/xattr/PNMetadataXattr.h"

namespace parvel::cli {
namespace {

class AttributesCommand : public Command {
public:
    void declare(CommandLine& line) override;
    int run(std::vector<std::string> operands) override;

private:
    [[nodiscard]] Result read(const std::string& path) const;
    [[nodiscard]] Result write(const std::string& path) const;
    [[nodiscard]] Result update(const std::string& path) const;
    [[nodiscard]] Result dump(const std::string& path);
    [[nodiscard]] Result apply(const std::string& path) const;
    [[nodiscard]] Result resultOf(const std::string& path);
    [[nodiscard]] std::string keepDump() const;

    bool m_write = false;
    std::vector<std::string> m_updates;
    std::vector<PropertyValue> m_updateValues;
    std::optional<std::string> m_dumpFile;
    std::optional<std::string> m_applyFile;
    KeptAttributes m_kept;
    std::optional<std::string> m_jobs;
    DryRun m_dryRun;
    AssetRecord m_record{Uninspectable::HasItsURLAlone};
    OutputOptions m_output;
    PathOptions m_paths;
};

void AttributesCommand::declare(CommandLine& line) {
    line.group("What is done");
    line.flag("--write", "write what the record says, where no identity is kept yet", m_write);
    line.list("--update", "KEY=VALUE",
              "change KEY of the record to VALUE, and write what then\n"
              "differs of title, author, genre and the explicit mark",
              m_updates);
    line.option("--dump", "FILE", "keep the attributes of all assets in FILE", m_dumpFile);
    line.option("--apply", "FILE",
                "write the attributes that FILE keeps for the same assets,\n"
                "wherever they lie now",
                m_applyFile);
    m_record.declare(line);
    m_dryRun.declare(line);
    m_paths.declare(line);
    line.option("-j,--jobs", "N", "read N files at once; one a core if not given", m_jobs);
    line.exclusive({"--write", "--update", "--dump", "--apply"});
    line.exclusive({"--write", "--update", "--apply", "--jobs"});
    m_output.declare(line);
}

int AttributesCommand::run(std::vector<std::string> operands) {
    m_output.applyLog();
    m_record.read();
    BatchOptions options{.command = "attributes", .form = m_output.form()};
    for (const std::string& update : m_updates)
        m_updateValues.push_back(PropertyValue::fromText("--update", update));
    if (m_applyFile)
        m_kept.read(*m_applyFile);
    if (m_dumpFile &&
        PVAssetMetadata::assetTypeForAssetAtURL(urlOfPath(*m_dumpFile)) != PVAssetTypeUnknown)
        throw UsageError("--dump " + *m_dumpFile + ": that is the name of an asset");
    m_dryRun.begin();
    const bool reads = !m_write && m_updates.empty() && !m_applyFile;
    // What is written is written in the order given.
    options.jobs = reads ? jobsFromOption(m_jobs) : 1;
    options.makeText = reads && !m_dumpFile ? makeAttributesFormat : makeOutcomeFormat;
    PathSource source(std::move(operands), m_paths);
    const int status =
        runOverPaths(options, source, [this](const std::string& path) { return resultOf(path); });
    const std::string problem = m_dumpFile && !interrupted() ? keepDump() : std::string();
    if (problem.empty())
        return status;
    writeToStandardError(problemLine("attributes", "--dump " + *m_dumpFile + ": " + problem));
    return kFailure;
}

/// Writes what was read into the file of --dump. Gives what went wrong; empty for nothing.
std::string AttributesCommand::keepDump() const {
    std::error_code unknown;
    const auto size = std::filesystem::file_size(*m_dumpFile, unknown);
    if (m_kept.isEmpty() && !unknown && size > 0)
        return "no attributes were read, so it stays as it is";
    const int error = m_dryRun.isAsked() ? 0 : m_kept.write(*m_dumpFile);
    return error == 0 ? std::string() : strerrordesc_np(error);
}

Result AttributesCommand::resultOf(const std::string& path) {
    if (m_write)
        return write(path);
    if (m_applyFile)
        return apply(path);
    if (m_dumpFile)
        return dump(path);
    return m_updates.empty() ? read(path) : update(path);
}

/// The identity that the file keeps. The error tells what the library's own read tells nobody.
std::optional<String> keptIdentity(const URL& url, std::optional<Error>& error) {
    std::optional<String> identity;
    pvamfm_extendedAttributeString_forKey_error(url, &identity, PNMetadataXattrAssetID, &error);
    return identity;
}

/// Why an update was refused.
std::string_view adviceOnUpdate(const URL& url) {
    std::optional<Error> error;
    const std::optional<String> identity = keptIdentity(url, error);
    if (error)
        return "its attributes can't be read";
    if (!identity)
        return "it keeps no attributes yet; write them first, with --write";
    return "the attributes that it keeps are another asset's";
}

/// Why an asset has no identity to be written.
std::string adviceOnIdentity(const URL& url) {
    if (standsAt(url))
        return "nothing in it or on it says which asset it is; --record can say it";
    std::optional<Error> error;
    static_cast<void>(keptIdentity(url, error));
    const bool isForbidden = error && error->code() == EACCES;
    return isForbidden ? "its folder may not be looked into" : "it is not there";
}

Result AttributesCommand::read(const std::string& path) const {
    Result result = resultForPath(path);
    result.recordKey = "attributes";
    result.nothing = "its attributes can't be read";
    const AssetPtr asset = m_record.forResult(result);
    result.assetID = asset->assetID();
    if (auto attributes =
            m_dryRun.makeManager()->extendedAttributesForAsset_error(asset, &result.error))
        result.record = std::make_shared<const Dictionary>(std::move(*attributes));
    else if (std::optional<Error> error; !keptIdentity(urlOfPath(path), error) && error)
        result.reason = error->message();
    return result;
}

Result AttributesCommand::write(const std::string& path) const {
    Result result = resultForPath(path);
    const AssetPtr asset = m_record.forResult(result);
    const bool written =
        m_dryRun.makeManager()->setExtendedAttributesForAsset_error(asset, &result.error);
    result.fields.push_back({"written", Number::boolean(written)});
    setRecord(result, asset, PVAssetMetadataFlavorFull);
    if (result.error == makeNoIdentityError())
        result.advice = adviceOnIdentity(urlOfPath(path));
    result.outcome = written ? "has its attributes" : "nothing to write";
    return result;
}

Result AttributesCommand::update(const std::string& path) const {
    Result result = resultForPath(path);
    const AssetPtr asset = m_record.forResult(result);
    Dictionary changes;
    for (const PropertyValue& value : m_updateValues)
        value.storeIn(changes, *asset->dictionaryRepresentation());
    const AssetPtr updates = PVMutableAssetMetadata::initWithURL_dictionary_validate(
        std::nullopt, &changes, /*validate=*/false);
    const AssetPtr changed = asset->copyWithUpdates([&](PVMutableAssetMetadata& copy) {
        copy.combineWithMetadata(updates.get());
        copy.setUrl(asset->url());  // its extension as it was typed
    });
    const bool written =
        m_dryRun.makeManager()->updateExtendedAttributesForAsset_error(changed, &result.error);
    result.fields.push_back({"written", Number::boolean(written)});
    setRecord(result, changed, PVAssetMetadataFlavorFull);
    if (result.error && result.error->domain() == PVParvelFoundationErrorDomain)
        result.advice = adviceOnUpdate(urlOfPath(path));
    result.outcome = written ? "attributes updated" : "nothing to write";
    return result;
}

Result AttributesCommand::dump(const std::string& path) {
    Result result = read(path);
    const bool keepsAny = result.record && !result.record->empty() && result.assetID;
    if (keepsAny)
        m_kept.add(*result.assetID, *result.record);
    result.outcome = keepsAny ? "kept" : "keeps no attributes";
    return result;
}

/// By the identity that the asset has now: one that a file keeps goes before what it holds.
Result AttributesCommand::apply(const std::string& path) const {
    Result result = resultForPath(path);
    const AssetPtr asset = m_record.forResult(result);
    setRecord(result, asset, PVAssetMetadataFlavorFull);
    const auto manager = m_dryRun.makeManager();
    const Dictionary* kept = result.assetID ? m_kept.find(*result.assetID) : nullptr;
    const bool written =
        kept && manager->_writeExtendedAttributes_url_error(*kept, asset->url(), &result.error);
    if (!kept && !manager->fileManager()->itemExistsAtPath(urlOfPath(path).path()))
        result.error = makeFileError(PVFileErrorCode::NoSuchFile, urlOfPath(path));
    result.fields.push_back({"written", Number::boolean(written)});
    result.outcome = written ? "has its attributes" : "none are kept for it";
    return result;
}

}  // namespace

std::unique_ptr<Command> makeAttributesCommand() {
    return std::make_unique<AttributesCommand>();
}

}  // namespace parvel::cli
