// The library, as an application calls it: the record of each file. A second argument "cover" asks
// for the cover too.

#include "bench/Runner.h"
#include "parvel/inspection/PVAssetMetadataInspector.h"

int main(int argumentCount, char** arguments) {
    using parvel::PVAssetMetadataInspector;
    const bool withCover = argumentCount > 2 && std::strcmp(arguments[2], "cover") == 0;
    return parvel::bench::runOver(argumentCount, arguments, [&](const std::string& path) {
        const parvel::URL url = parvel::URL::fileURLWithPath(path);
        const parvel::AssetPtr record =
            withCover ? PVAssetMetadataInspector::metadataIncludingCoverForAssetAtURL_error(url)
                      : PVAssetMetadataInspector::metadataForAssetAtURL_error(url);
        return record != nullptr;
    });
}
