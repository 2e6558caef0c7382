#include "cli/CallLog.h"

#include <algorithm>
#include <array>
#include <memory>

#include "cli/CommandLine.h"
#include "cli/Output.h"
#include "cli/TerminalText.h"

namespace parvel::cli {
namespace {

constexpr std::array<std::string_view, 5> kLevelNames{"debug", "default", "error", "fault", "off"};

/// What a log line means to a person who asked for one asset. A higher rank tells more: the step
/// that failed rather than the steps around it that failed in turn.
struct Reason {
    std::string_view text;
    std::string_view words;
    int rank;
};

constexpr std::array kReasons{
    Reason{"Caught exception while trying to get asset metadata: %@",
           "what the file holds is malformed", 5},
    Reason{"Failed to create containerXML document",
           "the container document (META-INF/container.xml) is missing or damaged", 5},
    Reason{"Failed to get opf path",
           "the container document is damaged, or names no package document", 5},
    Reason{"Failed to get opf url",
           "the container document is damaged, or names no package document", 5},
    Reason{"Failed to extract opf data", "the package document is missing or damaged", 5},
    Reason{"Failed to make zipArchive", "the file is no zip archive, or a damaged one", 5},
    Reason{"Failed to create opf document", "the package document is damaged", 5},
    Reason{"Failed to find metadata element.", "the package document has no metadata", 5},
    Reason{"Failed to read PDF contents", "the file could not be read", 5},
    Reason{"Failed to create PDF document", "the file is no PDF document, or a damaged one", 5},
    Reason{"Failed to determine if url is directory", "the file could not be looked at", 5},
    Reason{"Exception while parsing Bazaar Metadta", "the store metadata file is malformed", 5},
    Reason{"BazaarMetadata: fail", "the file is no property list", 5},
    Reason{"persistMetadata: Failed to create metadata plist",
           "what it should keep is nothing that its store metadata file can hold", 5},
    Reason{"persistMetadata: Failed to persist updated book metadata",
           "its store metadata file could not be written", 5},
    Reason{"Failed to get opf data. url: %@ error: %@", "the package document can't be read", 4},
    Reason{"Failed to get opf data", "the book has no container document (META-INF/container.xml)",
           3},
};

/// What any other line is worth: that of a failed step more than one on the way there.
constexpr int kStepRank = 1;
constexpr int kFailureRank = 2;

/// Lines that say only that something failed, or that nothing did.
constexpr std::array<std::string_view, 7> kUntelling{
    "MissingAsset: Failed to inspect url: %@",
    "Parsed Metadata: %@",
    "Failed to get metadata: %@ url error: %@",
    "Failed to create aggregated metadata",
    "Failed to create dictionary from opf",
    "Failed to get element from xpath: %@",
    "xAttrs: Using promised URL",
};

/// Whether a line that has no words of its own may be a reason as it stands. What only begins is
/// none.
bool isTelling(const LogLine& line) {
    return line.level >= LogLevel::Default && line.text.find(": start {") == line.text.npos &&
           std::find(kUntelling.begin(), kUntelling.end(), line.text) == kUntelling.end();
}

LogLevel s_printed = LogLevel::Off;

void print(const LogLine& line) {
    std::string text(kLevelNames[static_cast<std::size_t>(line.level)]);
    text.append(" ").append(line.subsystem).append(":").append(line.category).append(" ");
    writeToStandardError(text + safeText(line.message()) + "\n");
}

class StandardErrorLog : public LogSink {
public:
    void write(const LogLine& line) override { print(line); }
};

}  // namespace

LogLevel logLevelOfName(std::string_view name) {
    const auto found = std::find(kLevelNames.begin(), kLevelNames.end(), name);
    if (found == kLevelNames.end())
        throw UsageError("--log " + safeText(name) +
                         ": not one of off, fault, error, default, debug");
    return static_cast<LogLevel>(found - kLevelNames.begin());
}

void printLogLines(LogLevel least) {
    s_printed = least;
    if (least != LogLevel::Off)
        setLogSink(std::make_shared<StandardErrorLog>());
    setLogLevel(least);
}

CallLog::CallLog(LogLevel least) : m_scope(*this, std::min(least, s_printed)) {}

bool CallLog::hasKnownReason() const {
    return m_rank > kFailureRank;
}

void CallLog::clear() {
    m_reason.clear();
    m_rank = 0;
}

void CallLog::write(const LogLine& line) {
    if (line.level >= s_printed)
        print(line);
    const auto known =
        std::find_if(kReasons.begin(), kReasons.end(),
                     [&line](const Reason& reason) { return reason.text == line.text; });
    if (known != kReasons.end()) {
        if (known->rank > m_rank) {
            m_reason = known->words;
            m_rank = known->rank;
        }
        return;
    }
    const int rank = line.level >= LogLevel::Error ? kFailureRank : kStepRank;
    if (rank > m_rank && isTelling(line)) {
        m_reason = line.message();
        m_rank = rank;
    }
}

}  // namespace parvel::cli
