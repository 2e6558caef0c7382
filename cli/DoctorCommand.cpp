#include "cli/AssetDiagnosis.h"
#include "cli/AssetWalk.h"
#include "cli/Command.h"
#include "cli/HostDiagnosis.h"
#include "cli/Interrupt.h"
#include "cli/OutputOptions.h"
#include "cli/PathSource.h"
#include "cli/ResultPrinter.h"
#include "cli/TerminalText.h"
#include "parvel/platform/Rehearsal.h"

namespace parvel::cli {
namespace {

constexpr std::string_view kFindings = "findings";

/// A line a finding: the PATH, what was found, what to do about it. Where nothing was found, a line
/// for a result that says so.
class FindingsFormat : public ResultFormat {
public:
    void append(const Result& result, std::string& out) const override;
};

void FindingsFormat::append(const Result& result, std::string& out) const {
    const auto textOf = [](const Dictionary& finding, std::string_view key) {
        return safeText(*finding.find(key)->as<String>());
    };
    const Array* findings =
        result.fields.empty() ? nullptr : result.fields.front().value.as<Array>();
    if (!findings)
        return;
    if (findings->empty() && !result.outcome.empty())
        out += safeText(result.path) + ": " + safeText(result.outcome) + "\n";
    for (const Value& value : *findings) {
        const Dictionary& finding = *value.as<Dictionary>();
        out += safeText(result.path) + ": " + textOf(finding, "message") + "; " +
               textOf(finding, "advice") + "\n";
    }
}

std::unique_ptr<ResultFormat> makeFindingsFormat() {
    return std::make_unique<FindingsFormat>();
}

class DoctorCommand : public Command {
public:
    void declare(CommandLine& line) override;
    int run(std::vector<std::string> operands) override;

private:
    void examineHost();
    void examineFolder(const std::string& path);
    void examineFound(const FoundPath& found);
    void report(Result result, const std::vector<Finding>& findings);

    bool m_hasExitCode = false;
    PathOptions m_paths;
    OutputOptions m_output;

    std::optional<ResultPrinter> m_printer;
    AssetDiagnosis m_diagnosis;
    bool m_hasTriedTrash = false;
    bool m_hasFound = false;
};

void DoctorCommand::declare(CommandLine& line) {
    line.group("What is looked at");
    line.flag("--exit-code", "end with status 4 where anything is found", m_hasExitCode);
    m_paths.declareSources(line);
    m_output.declare(line);
    line.note(
        "Says what endangers the assets and those below each DIR, and what to do about it;\n"
        "without any, what is amiss with the program's own helper. Nothing is changed.");
}

int DoctorCommand::run(std::vector<std::string> operands) {
    m_output.applyLog();
    std::optional<PathSource> source;
    if (!operands.empty() || m_paths.filesFrom || m_paths.nulEnded)
        source.emplace(std::move(operands), m_paths);
    m_printer.emplace("doctor", m_output.form(), makeFindingsFormat);
    if (!source)
        examineHost();
    while (const auto found = source && !interrupted() ? source->next() : std::nullopt) {
        m_hasTriedTrash = false;
        if (found->readErrno == 0 && isPlainFolder(found->path))
            examineFolder(found->path);
        else
            examineFound(*found);
    }
    const int status = m_printer->finish();
    return status == kSuccess && m_hasExitCode && m_hasFound ? kFound : status;
}

void DoctorCommand::examineHost() {
    Result result = resultForPath(readerProgramPath());
    result.outcome = "the helper program works, and is confined";
    report(std::move(result), findingsOfReader(readerConfinement()));
}

/// The folder itself, the assets below it, and what was left between them.
void DoctorCommand::examineFolder(const std::string& path) {
    report(resultForPath(path), m_diagnosis.findingsOfFolder(urlOfPath(path)));
    AssetWalk walk(path);
    while (const auto found = interrupted() ? std::nullopt : walk.next())
        examineFound(*found);
    for (const Remnant& remnant : remnantsBelow(path))
        report(resultForPath(remnant.path), {remnant.finding});
}

void DoctorCommand::examineFound(const FoundPath& found) {
    Result result = resultForPath(found.path);
    std::vector<Finding> findings;
    if (found.readErrno != 0)
        result.error = makePOSIXError(found.readErrno, urlOfPath(found.path));
    else
        findings = m_diagnosis.findingsOfAsset(result);
    // What can't be inspected, or is elsewhere, would fail for reasons of its own.
    if (result.assetID && !m_hasTriedTrash) {
        m_hasTriedTrash = true;
        const Rehearsal rehearsal;
        for (Finding& finding : findingsOfTrash(*rehearsal.fileManager(), urlOfPath(found.path)))
            findings.push_back(std::move(finding));
    }
    report(std::move(result), findings);
}

void DoctorCommand::report(Result result, const std::vector<Finding>& findings) {
    std::vector<Value> values;
    values.reserve(findings.size());
    for (const Finding& finding : findings)
        values.emplace_back(Dictionary{{"kind", String(finding.kind)},
                                       {"message", finding.message},
                                       {"advice", finding.advice}});
    m_hasFound = m_hasFound || !findings.empty();
    result.needsRecord = false;
    result.fields = {{std::string(kFindings), Array(std::move(values))}};
    m_printer->print(result);
}

}  // namespace

std::unique_ptr<Command> makeDoctorCommand() {
    return std::make_unique<DoctorCommand>();
}

}  // namespace parvel::cli
