#include "parvel/foundation/Error.h"

#include <cerrno>
#include <climits>
#include <cstring>
#include <utility>

namespace parvel {
namespace {

const char* fileErrorText(std::int64_t code) {
    switch (static_cast<PVFileErrorCode>(code)) {
        case PVFileErrorCode::NoSuchFile:
            return "The file does not exist.";
        case PVFileErrorCode::Corrupt:
            return "The file could not be read because it is not in the expected format.";
        case PVFileErrorCode::FileExists:
            return "A file with this name exists already.";
    }
    return nullptr;
}

const char* libraryErrorText(std::int64_t code) {
    switch (static_cast<PVParvelFoundationErrorCode>(code)) {
        case PVParvelFoundationErrorCode::NoAssetType:
            return "The file is of no kind that the library knows.";
        case PVParvelFoundationErrorCode::MissingURL:
            return "A location is missing.";
        case PVParvelFoundationErrorCode::NoAssetID:
            return "The file has no identity, or it could not be opened.";
        case PVParvelFoundationErrorCode::NoIdentity:
            return "The record has no identity.";
        case PVParvelFoundationErrorCode::Cancelled:
            return "The operation was cancelled.";
        case PVParvelFoundationErrorCode::CorruptAsset:
            return "The record is damaged.";
    }
    return nullptr;
}

/// In English whatever the process's locale is.
const char* posixErrorText(std::int64_t code) {
    return code >= 0 && code <= INT_MAX ? strerrordesc_np(static_cast<int>(code)) : nullptr;
}

const char* fixedText(std::string_view domain, std::int64_t code) {
    if (domain == PVParvelFoundationErrorDomain)
        return libraryErrorText(code);
    if (domain == PVFileErrorDomain)
        return fileErrorText(code);
    return domain == PVPOSIXErrorDomain ? posixErrorText(code) : nullptr;
}

Error::UserInfo userInfoWithURL(const std::optional<URL>& url) {
    Error::UserInfo info;
    if (url)
        info.emplace(PVURLErrorKey, *url);
    return info;
}

Error makeLibraryError(PVParvelFoundationErrorCode code, Error::UserInfo info = {}) {
    return {PVParvelFoundationErrorDomain, static_cast<std::int64_t>(code), std::move(info)};
}

}  // namespace

const URL* Error::url() const {
    const auto entry = m_userInfo.find(PVURLErrorKey);
    return entry == m_userInfo.end() ? nullptr : std::get_if<URL>(&entry->second);
}

std::string Error::message() const {
    const auto entry = m_userInfo.find(PVLocalizedFailureReasonErrorKey);
    if (entry != m_userInfo.end()) {
        if (const auto* reason = std::get_if<std::string>(&entry->second))
            return *reason;
    }
    const char* text = fixedText(m_domain, m_code);
    return text ? text : "Unknown error " + std::to_string(m_code);
}

Error makeNoAssetTypeError(const URL& url) {
    return makeLibraryError(PVParvelFoundationErrorCode::NoAssetType, userInfoWithURL(url));
}

Error makeMissingURLError() {
    return makeLibraryError(PVParvelFoundationErrorCode::MissingURL);
}

Error makeNoAssetIDError(const URL& url) {
    return makeLibraryError(PVParvelFoundationErrorCode::NoAssetID, userInfoWithURL(url));
}

Error makeNoIdentityError() {
    return makeLibraryError(PVParvelFoundationErrorCode::NoIdentity);
}

Error makeCancelledError(const std::optional<URL>& source) {
    return makeLibraryError(PVParvelFoundationErrorCode::Cancelled, userInfoWithURL(source));
}

Error makeCorruptAssetError(std::string reason) {
    Error::UserInfo info;
    info.emplace(PVLocalizedFailureReasonErrorKey, std::move(reason));
    return makeLibraryError(PVParvelFoundationErrorCode::CorruptAsset, std::move(info));
}

Error makeFileError(PVFileErrorCode code, const std::optional<URL>& url) {
    return {PVFileErrorDomain, static_cast<std::int64_t>(code), userInfoWithURL(url)};
}

Error makePOSIXError(int errnoValue, const std::optional<URL>& url) {
    return {PVPOSIXErrorDomain, errnoValue, userInfoWithURL(url)};
}

Error makeServiceError(int errnoValue, const URL& url) {
    switch (errnoValue) {
        case ENOENT:
        case ENOTDIR:
            return makeFileError(PVFileErrorCode::NoSuchFile, url);
        case EEXIST:
        case ENOTEMPTY:
            return makeFileError(PVFileErrorCode::FileExists, url);
        case EBADMSG:
            return makeFileError(PVFileErrorCode::Corrupt, url);
        default:
            return makePOSIXError(errnoValue, url);
    }
}

}  // namespace parvel
