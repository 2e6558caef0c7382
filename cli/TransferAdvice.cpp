#include "cli/TransferAdvice.h"

#include <cerrno>

#include "cli/BookStaging.h"

namespace parvel::cli {
namespace {

std::string adviceForFileError(const Result& result, const URL& place, const URL& source,
                               std::string_view ifTaken) {
    switch (static_cast<PVFileErrorCode>(result.error->code())) {
        case PVFileErrorCode::FileExists:
            if (isSamePlace(place, source))
                return "it is there already";
            return "something stands at " + place.path() + (ifTaken.empty() ? "" : ": ") +
                   std::string(ifTaken);
        case PVFileErrorCode::NoSuchFile:
            if (place == source)
                return place == urlOfPath(result.path) ? "" : place.path() + " is not there";
            return adviceForMissingFolder(place.deletingLastPathComponent());
        case PVFileErrorCode::Corrupt:
            break;
    }
    return {};
}

std::string adviceForPOSIXError(std::int64_t code, const URL& place) {
    switch (code) {
        case EISDIR:
            return place.path() +
                   " is a folder and no book: with --force it goes with all that is in it";
        case EINVAL:
            return "a folder can't go into itself, nor anything take the place of what it lies in or "
                   "leads to";
        case EALREADY:
            return place.path() + " was brought there by this run; --force replaces it";
        case ETIMEDOUT:
            return "its content is not on this device: let the sync client download it and try "
                   "again";
        case ENOTSUP:
            return "no sync client keeps the folder of " + place.path() +
                   " in step: \"parvel cloud status\" tells which";
        default:
            return {};
    }
}

}  // namespace

std::string adviceForTransfer(const Result& result, const URL& source, std::string_view ifTaken) {
    const URL* place = result.error ? result.error->url() : nullptr;
    if (!place)
        return {};
    if (result.error->domain() == PVFileErrorDomain)
        return adviceForFileError(result, *place, source, ifTaken);
    if (result.error->domain() == PVPOSIXErrorDomain)
        return adviceForPOSIXError(result.error->code(), *place);
    return {};
}

std::string adviceForReplacement(const Result& result, const URL& newVersion, const URL& existing,
                                 bool isPlaced) {
    const bool isTaken =
        result.error && result.error->url() && result.error->domain() == PVFileErrorDomain &&
        result.error->code() == static_cast<std::int64_t>(PVFileErrorCode::FileExists);
    if (!isPlaced || !isTaken)
        return adviceForTransfer(result, newVersion, "move that away first");
    return "the new version is in the old one's place, " + existing.path() +
           ", and keeps that name, since something stands at " + result.error->url()->path();
}

}  // namespace parvel::cli
