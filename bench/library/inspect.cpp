// The library, as an application calls it: the record of each file, with "cover" the cover too.

#include "bench/Runner.h"
#include "parvel/inspection/PVAssetMetadataInspector.h"

int main(int argumentCount, char** argumentWords) {
    using parvel::PVAssetMetadataInspector;
    const auto arguments = parvel::bench::argumentsOf(argumentCount, argumentWords);
    const bool withCover = arguments.has("cover");
    return parvel::bench::runOver(arguments, [&](const std::string& path) {
        const parvel::URL url = parvel::URL::fileURLWithPath(path);
        const parvel::AssetPtr record =
            withCover ? PVAssetMetadataInspector::metadataIncludingCoverForAssetAtURL_error(url)
                      : PVAssetMetadataInspector::metadataForAssetAtURL_error(url);
        return record != nullptr;
    });
}
