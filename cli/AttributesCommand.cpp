#include "cli/AssetRecord.h"
#include "cli/Batch.h"
#include "cli/Command.h"
#include "cli/OutputOptions.h"
#include "cli/PathSource.h"
#include "parvel/filemanager/PVAssetMetadataFileManager.h"
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

    bool m_write = false;
    std::optional<std::string> m_jobs;
    AssetRecord m_record{Uninspectable::HasItsURLAlone};
    OutputOptions m_output;
    PathOptions m_paths;
};

void AttributesCommand::declare(CommandLine& line) {
    line.group("What is done");
    line.flag("--write", "write what the record says, where no identity is kept yet", m_write);
    m_record.declare(line);
    m_paths.declare(line);
    line.option("-j,--jobs", "N", "read N files at once; one a core if not given", m_jobs);
    line.exclusive({"--write", "--jobs"});
    m_output.declare(line);
}

int AttributesCommand::run(std::vector<std::string> operands) {
    m_output.applyLog();
    m_record.read();
    BatchOptions options{.command = "attributes", .form = m_output.form()};
    // What is written is written in the order given.
    options.jobs = m_write ? 1 : jobsFromOption(m_jobs);
    options.makeText = m_write ? makeOutcomeFormat : makeAttributesFormat;
    PathSource source(std::move(operands), m_paths);
    return runOverPaths(options, source, [this](const std::string& path) {
        return m_write ? write(path) : read(path);
    });
}

/// Why not even the first attribute can be read: the library's own read tells nobody.
std::string reasonAgainstReading(const URL& url) {
    std::optional<String> identity;
    std::optional<Error> error;
    pvamfm_extendedAttributeString_forKey_error(url, &identity, PNMetadataXattrAssetID, &error);
    return error ? error->message() : std::string();
}

Result AttributesCommand::read(const std::string& path) const {
    Result result = resultForPath(path);
    result.recordKey = "attributes";
    result.nothing = "its attributes can't be read";
    const AssetPtr asset = m_record.forResult(result);
    result.assetID = asset->assetID();
    if (auto attributes = PVAssetMetadataFileManager::init()->extendedAttributesForAsset_error(
            asset, &result.error))
        result.record = std::make_shared<const Dictionary>(std::move(*attributes));
    else
        result.reason = reasonAgainstReading(urlOfPath(path));
    return result;
}

Result AttributesCommand::write(const std::string& path) const {
    Result result = resultForPath(path);
    const AssetPtr asset = m_record.forResult(result);
    const bool written = PVAssetMetadataFileManager::init()->setExtendedAttributesForAsset_error(
        asset, &result.error);
    result.fields.push_back({"written", Number::boolean(written)});
    setRecord(result, asset, PVAssetMetadataFlavorFull);
    result.outcome = written ? "has its attributes" : "nothing to write";
    return result;
}

}  // namespace

std::unique_ptr<Command> makeAttributesCommand() {
    return std::make_unique<AttributesCommand>();
}

}  // namespace parvel::cli
