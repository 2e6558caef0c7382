#include "cli/ResultFormat.h"
#include "cli/TerminalText.h"
#include "parvel/foundation/ValueReadings.h"

namespace parvel::cli {
namespace {

/// What all of the library's attribute names begin with.
constexpr std::string_view kCommonPart = "com.kestrel.Folium.";
constexpr std::size_t kNameWidth = 17;

/// The PATH, and a line an attribute below it, with the last part of its name.
class AttributesFormat : public ResultFormat {
public:
    AttributesFormat() : m_terminal(Terminal::ofStandardOutput()) {}

    void append(const Result& result, std::string& out) const override;
    [[nodiscard]] std::string_view separator() const override { return "\n"; }

private:
    const Terminal m_terminal;
};

void AttributesFormat::append(const Result& result, std::string& out) const {
    if (!result.record)
        return;
    out += safeText(result.path) + "\n";
    if (result.record->empty())
        out += "  no attributes\n";
    for (const auto& [name, value] : *result.record) {
        const std::string text = stringForm(&value).value_or(std::string());
        appendField(name.substr(name.starts_with(kCommonPart) ? kCommonPart.size() : 0),
                    text.empty() ? "(empty)" : text, kNameWidth, m_terminal.width, out);
    }
}

}  // namespace

std::unique_ptr<ResultFormat> makeAttributesFormat() {
    return std::make_unique<AttributesFormat>();
}

}  // namespace parvel::cli
