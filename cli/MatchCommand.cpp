#include <utility>

#include <unistd.h>

#include "cli/CallLog.h"
#include "cli/Command.h"
#include "cli/Messages.h"
#include "cli/Output.h"
#include "cli/OutputOptions.h"
#include "cli/RecordFile.h"
#include "cli/ResultFormat.h"
#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"

namespace parvel::cli {
namespace {

class MatchCommand : public Command {
public:
    void declare(CommandLine& line) override;
    int run(std::vector<std::string> operands) override;

private:
    struct Side {
        Result result;
        AssetPtr record;
    };

    [[nodiscard]] static Side sideAt(const std::string& path);
    [[nodiscard]] bool matches(const PVAssetMetadata& record, const PVAssetMetadata& other) const;

    std::optional<std::string> m_key;
    OutputOptions m_output;
};

void MatchCommand::declare(CommandLine& line) {
    line.group("What is compared");
    line.option("--key", "KEY",
                "compare the values under KEY alone, in place of the\n"
                "identities",
                m_key);
    m_output.declare(line);
    line.note(
        "A and B are assets, or files with a record as inspect prints it (a property list\n"
        "or JSON). Prints true or false. The exit status is 0 when they match, 1 when they\n"
        "don't, and 3 when a record could not be had.");
}

/// A file that is no asset by its name holds a record.
MatchCommand::Side MatchCommand::sideAt(const std::string& path) {
    Side side{resultForPath(path), nullptr};
    if (side.result.assetType != PVAssetTypeUnknown) {
        CallLog log;
        side.record = PVAssetMetadataInspector::metadataForAssetAtURL_error(urlOfPath(path),
                                                                            &side.result.error);
        side.result.reason = log.reason();
    } else if (const auto dictionary = dictionaryFromFile(path, side.result.reason)) {
        side.record = PVAssetMetadata::metadataWithURL_dictionary(std::nullopt, dictionary.get());
    }
    setRecord(side.result, side.record, PVAssetMetadataFlavorFull);
    return side;
}

bool MatchCommand::matches(const PVAssetMetadata& record, const PVAssetMetadata& other) const {
    if (!m_key)
        return record.hasMatchingIdentity(other);
    return PVAssetMetadata::identityOfDictionary_matchesDictionary_key(
        *record.dictionaryRepresentation(), *other.dictionaryRepresentation(), *m_key);
}

int MatchCommand::run(std::vector<std::string> operands) {
    m_output.applyLog();
    if (operands.size() != 2)
        throw UsageError("two assets or records are needed");
    Side side = sideAt(operands[0]);
    const Side other = sideAt(operands[1]);
    for (const Result* result : {&std::as_const(side).result, &other.result}) {
        if (!result->succeeded())
            writeToStandardError(failureLine("match", *result));
    }
    const bool known = side.record && other.record;
    const bool matching = known && matches(*side.record, *other.record);
    if (!side.result.error)
        side.result.error = other.result.error;
    side.result.fields.push_back({"matches", known ? Value(Number::boolean(matching)) : Value()});

    Output output(STDOUT_FILENO);
    if (m_output.form() != OutputForm::Text)
        output.append(listOfOne(m_output.form(), side.result));
    else if (known)
        output.append(matching ? "true\n" : "false\n");
    if (!output.finish("match") || !known)
        return kNoRecord;
    return matching ? kSuccess : kFailure;
}

}  // namespace

std::unique_ptr<Command> makeMatchCommand() {
    return std::make_unique<MatchCommand>();
}

}  // namespace parvel::cli
