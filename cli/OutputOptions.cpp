#include "cli/OutputOptions.h"

#include "cli/CallLog.h"

namespace parvel::cli {

void declareLogOption(CommandLine& line, std::optional<std::string>& target) {
    line.option("--log", "LEVEL",
                "print the library's log lines to standard error:\n"
                "off, fault, error, default or debug",
                target);
}

void OutputOptions::declare(CommandLine& line) {
    line.group("What is printed");
    line.flag("--json", "print one JSON array with a result for each PATH", json);
    line.flag("--jsonl", "print a line of JSON for each PATH as soon as it is known", jsonLines);
    line.flag("--plist", "print one XML property list", propertyList);
    line.exclusive({"--json", "--jsonl", "--plist"});
    declareLogOption(line, log);
}

OutputForm OutputOptions::form() const {
    if (json)
        return OutputForm::Json;
    if (jsonLines)
        return OutputForm::JsonLines;
    return propertyList ? OutputForm::PropertyList : OutputForm::Text;
}

void OutputOptions::applyLog() const {
    if (log)
        printLogLines(logLevelOfName(*log));
}

}  // namespace parvel::cli
