#include "cli/KeptAttributes.h"

#include "cli/CommandLine.h"
#include "cli/JsonWriter.h"
#include "cli/OutputFile.h"
#include "cli/RecordFile.h"
#include "parvel/foundation/ValueReadings.h"

namespace parvel::cli {

void KeptAttributes::read(const std::string& file) {
    std::string problem = "holds no attributes";
    const auto values = valuesFromFile(file, problem);
    if (!values)
        throw UsageError("--apply " + file + ": " + problem);
    for (const Value& value : *values) {
        const Dictionary* result = value.as<Dictionary>();
        const Value* attributes = result ? result->find("attributes") : nullptr;
        if (!attributes)
            throw UsageError("--apply " + file + ": holds something else than attributes");
        const auto assetID = stringForm(result->find("assetID"));
        if (const Dictionary* kept = attributes->as<Dictionary>(); kept && assetID)
            add(*assetID, *kept);
    }
}

int KeptAttributes::write(const std::string& file) const {
    std::string lines;
    for (const auto& [assetID, attributes] : m_attributes) {
        appendJson(Dictionary{{"assetID", assetID}, {"attributes", attributes}}, lines);
        lines += '\n';
    }
    return writeFile(file, lines);
}

void KeptAttributes::add(const String& assetID, Dictionary attributes) {
    const std::lock_guard lock(m_mutex);
    m_attributes.insert_or_assign(assetID, std::move(attributes));
}

const Dictionary* KeptAttributes::find(const String& assetID) const {
    const auto found = m_attributes.find(assetID);
    return found == m_attributes.end() ? nullptr : &found->second;
}

}  // namespace parvel::cli
