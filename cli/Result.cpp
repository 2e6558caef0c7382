#include "cli/Result.h"

#include <filesystem>

#include "cli/CommandLine.h"

namespace parvel::cli {

std::string_view assetTypeName(PVAssetType type) {
    switch (type) {
        case PVAssetTypeEPub:
            return "epub";
        case PVAssetTypeKestrelPub:
            return "folium";
        case PVAssetTypePDF:
            return "pdf";
        case PVAssetTypeAudiobook:
            return "m4a";
        case PVAssetTypeUnknown:
            break;
    }
    return "unknown";
}

URL urlOfPath(std::string_view path) {
    if (path.empty() || path.front() == '/')
        return URL::fileURLWithPath(path);
    // Where the working directory is gone, the relative path names nothing either way.
    static const std::string workingDirectory = [] {
        std::error_code ignored;
        return std::filesystem::current_path(ignored).string();
    }();
    return URL::fileURLWithPath(pathAppending(workingDirectory, path));
}

URL urlOfOption(std::string_view option, std::string_view path) {
    if (path.empty())
        throw UsageError(std::string(option) + ": the path is empty");
    return urlOfPath(path);
}

Result resultForPath(std::string_view path) {
    Result result;
    result.path = path;
    result.assetType = PVAssetMetadata::assetTypeForAssetAtURL(urlOfPath(path));
    return result;
}

void setRecord(Result& result, const AssetPtr& record, PVAssetMetadataFlavor flavor) {
    if (!record)
        return;
    result.assetID = record->assetID();
    result.record = record->dictionaryRepresentationWithFlavor(flavor);
}

}  // namespace parvel::cli
