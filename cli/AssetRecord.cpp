#include "cli/AssetRecord.h"

#include "cli/CallLog.h"
#include "cli/RecordFile.h"
#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"

namespace parvel::cli {

void AssetRecord::declare(CommandLine& line) {
    line.option("--record", "FILE",
                "take the record from FILE, a property list or JSON\n"
                "dictionary, in place of inspecting the PATH",
                m_file);
}

void AssetRecord::read() {
    if (!m_file)
        return;
    std::string problem;
    m_dictionary = dictionaryFromFile(*m_file, problem);
    if (!m_dictionary)
        throw UsageError("--record " + *m_file + ": " + problem);
}

AssetPtr AssetRecord::forResult(Result& result) const {
    const URL url = urlOfPath(result.path);
    if (m_dictionary)
        return PVAssetMetadata::metadataWithURL_dictionary(url, m_dictionary.get());

    // The command's own log must not hear why an inspection failed that it does without.
    CallLog log;
    std::optional<Error> error;
    AssetPtr record = PVAssetMetadataInspector::metadataForAssetAtURL_error(url, &error);
    if (record)
        return record;
    if (m_uninspectable == Uninspectable::HasItsURLAlone)
        return PVAssetMetadata::metadataWithURL_dictionary(url, nullptr);
    result.error = error;
    result.reason = log.reason();
    return nullptr;
}

}  // namespace parvel::cli
