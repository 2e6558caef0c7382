#include "cli/FolderGuard.h"

#include <cerrno>
#include <filesystem>

#include "parvel/metadata/PVAssetMetadata.h"

namespace parvel::cli {
namespace {

bool isFolderAlone(const URL& url) {
    std::error_code unknown;
    const auto status = std::filesystem::symlink_status(url.path(), unknown);
    return std::filesystem::is_directory(status) && !PVAssetMetadata::isBookURL(url);
}

}  // namespace

bool isLinkTo(const URL& url, const URL& item) {
    std::error_code unknown;
    return std::filesystem::is_symlink(std::filesystem::symlink_status(url.path(), unknown)) &&
           !std::filesystem::is_symlink(std::filesystem::symlink_status(item.path(), unknown)) &&
           std::filesystem::equivalent(url.path(), item.path(), unknown);
}

std::optional<Error> objectionToReplacing(const URL& existing, const URL& replacement) {
    if (isFolderAlone(existing))
        return makePOSIXError(EISDIR, existing);
    if (isLinkTo(replacement, existing))
        return makePOSIXError(EINVAL, existing);
    return std::nullopt;
}

bool FolderGuard::replaceItem(const URL& existing, const URL& replacement, ReplaceOptions options,
                              std::optional<URL>* resulting, ErrorOut error) {
    if (std::optional<Error> objection = objectionToReplacing(existing, replacement))
        return fail(error, std::move(*objection));
    return ForwardingFileSystemService::replaceItem(existing, replacement, options, resulting,
                                                    error);
}

bool FolderGuard::removeItem(const URL& item, ErrorOut error) {
    if (isFolderAlone(item))
        return fail(error, makePOSIXError(EISDIR, item));
    return ForwardingFileSystemService::removeItem(item, error);
}

}  // namespace parvel::cli
