#include "cli/ResultFormat.h"
#include "cli/TerminalText.h"

namespace parvel::cli {
namespace {

class OutcomeFormat : public ResultFormat {
public:
    void append(const Result& result, std::string& out) const override {
        if (result.succeeded() && !result.outcome.empty())
            out += safeText(result.path) + ": " + safeText(result.outcome) + "\n";
    }
};

}  // namespace

std::unique_ptr<ResultFormat> makeOutcomeFormat() {
    return std::make_unique<OutcomeFormat>();
}

}  // namespace parvel::cli
