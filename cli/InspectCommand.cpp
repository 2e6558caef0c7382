#include <array>

#include "cli/Batch.h"
#include "cli/Command.h"
#include "cli/OutputOptions.h"
#include "cli/PathSource.h"
#include "cli/RecordFile.h"
#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"

namespace parvel::cli {
namespace {

struct FlavorName {
    std::string_view name;
    PVAssetMetadataFlavor flavor;
};

constexpr std::array kFlavors{
    FlavorName{"full", PVAssetMetadataFlavorFull},
    FlavorName{"content-library", PVAssetMetadataFlavorContentLibrary},
    FlavorName{"store", PVAssetMetadataFlavorBazaarMetadata},
    FlavorName{"progress", PVAssetMetadataFlavorProgress},
    FlavorName{"identity", PVAssetMetadataFlavorIdentity},
};

PVAssetMetadataFlavor flavorOfName(std::string_view name) {
    for (const FlavorName& known : kFlavors) {
        if (known.name == name)
            return known.flavor;
    }
    throw UsageError("--flavor " + std::string(name) +
                     ": not one of full, content-library, store, progress, identity");
}

class InspectCommand : public Command {
public:
    void declare(CommandLine& line) override;
    int run(std::vector<std::string> operands) override;

private:
    [[nodiscard]] AssetPtr recordAt(const URL& url, ErrorOut error) const;
    [[nodiscard]] Result inspect(const std::string& path) const;

    bool m_cover = false;
    bool m_immediate = false;
    bool m_store = false;
    std::optional<std::string> m_extraFile;
    std::optional<std::string> m_flavorName;
    std::optional<std::string> m_jobs;
    OutputOptions m_output;
    PathOptions m_paths;

    AssetPtr m_extra;
    PVAssetMetadataFlavor m_flavor = PVAssetMetadataFlavorFull;
};

void InspectCommand::declare(CommandLine& line) {
    line.group("What is read");
    line.flag("--cover", "read the cover image too", m_cover);
    line.option("--extra", "FILE",
                "lay the entries of FILE, a property list or JSON\n"
                "dictionary, over what is read",
                m_extraFile);
    line.option("--flavor", "NAME",
                "the part of the record to print: full, content-library,\n"
                "store, progress or identity",
                m_flavorName);
    line.flag("--immediate",
              "read what is known without a download: the whole asset\n"
              "where synchronised storage has it on this device, else\n"
              "the attributes on the file alone",
              m_immediate);
    line.flag("--store", "read PATH itself as a store metadata file", m_store);
    line.exclusive({"--cover", "--extra", "--immediate", "--store"});
    m_paths.declare(line);
    line.option("-j,--jobs", "N", "inspect N assets at once; one a core if not given", m_jobs);
    m_output.declare(line);
}

int InspectCommand::run(std::vector<std::string> operands) {
    m_output.applyLog();
    if (m_flavorName)
        m_flavor = flavorOfName(*m_flavorName);
    if (m_extraFile) {
        std::string problem;
        const std::shared_ptr<const Dictionary> extra = dictionaryFromFile(*m_extraFile, problem);
        if (!extra)
            throw UsageError("--extra " + *m_extraFile + ": " + problem);
        m_extra = PVMutableAssetMetadata::initWithURL_dictionary_validate(std::nullopt, extra.get(),
                                                                          /*validate=*/false);
    }
    BatchOptions options{
        .command = "inspect", .form = m_output.form(), .jobs = jobsFromOption(m_jobs)};
    // Why a store metadata file can't be read is said at the debug level alone.
    if (m_store)
        options.reasonLevel = LogLevel::Debug;
    PathSource source(std::move(operands), m_paths);
    return runOverPaths(options, source, [this](const std::string& path) { return inspect(path); });
}

AssetPtr InspectCommand::recordAt(const URL& url, ErrorOut error) const {
    using Inspector = PVAssetMetadataInspector;
    if (m_store)
        return Inspector::bazaarMetadataForBookAssetAtURL_error(url, error);
    if (m_immediate)
        return Inspector::immediatelyAvailableMetadataForAssetAtURL_error(url, error);
    if (m_extra)
        return Inspector::metadataForAssetAtURL_extraMetadata_error(url, m_extra, error);
    if (m_cover)
        return Inspector::metadataIncludingCoverForAssetAtURL_error(url, error);
    return Inspector::metadataForAssetAtURL_error(url, error);
}

Result InspectCommand::inspect(const std::string& path) const {
    Result result = resultForPath(path);
    setRecord(result, recordAt(urlOfPath(path), &result.error), m_flavor);
    if (m_store)
        result.nothing = "no store metadata";
    return result;
}

}  // namespace

std::unique_ptr<Command> makeInspectCommand() {
    return std::make_unique<InspectCommand>();
}

}  // namespace parvel::cli
