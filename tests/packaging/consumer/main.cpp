#include <cstdio>

#include "parvel/inspection/PVAssetMetadataInspector.h"

using namespace parvel;

int main() {
    std::optional<Error> error;
    const URL url = URL::fileURLWithPath("/nowhere/Absent.epub");
    const AssetPtr asset = PVAssetMetadataInspector::metadataForAssetAtURL_error(url, &error);
    std::printf("%s\n", error ? error->message().c_str() : "no error");
    return asset == nullptr && error && error->code() == 4 ? 0 : 1;
}
