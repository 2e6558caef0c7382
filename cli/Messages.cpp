#include "cli/Messages.h"

#include <cerrno>

#include "cli/AssetWalk.h"
#include "cli/TerminalText.h"

namespace parvel::cli {
namespace {

bool isAbsent(const Error& error) {
    return error.domain() == PVFileErrorDomain &&
           error.code() == static_cast<std::int64_t>(PVFileErrorCode::NoSuchFile);
}

std::string_view adviceForLibraryError(const Result& result) {
    switch (static_cast<PVParvelFoundationErrorCode>(result.error->code())) {
        case PVParvelFoundationErrorCode::NoAssetType:
            if (isPlainFolder(urlOfPath(result.path).path()))
                return "it is a folder: name the assets in it, or take them all with -r";
            return "a book ends in .epub or .folium, a document in .pdf, an audiobook in .m4a";
        case PVParvelFoundationErrorCode::NoAssetID:
            return "nothing in it or on it says which asset it is";
        default:
            return {};
    }
}

/// The path below the asset of what an error is about; empty where it is about anything else.
std::string memberOf(const Result& result) {
    const URL* const url = result.error->url();
    const std::string folder = urlOfPath(result.path).standardized().path() + "/";
    const std::string place = url ? url->standardized().path() : std::string();
    return !result.path.empty() && place.starts_with(folder) ? place.substr(folder.size())
                                                             : std::string();
}

std::string adviceForPermissions(const Result& result) {
    const URL* const url = result.error->url();
    const bool isElsewhere = url && url->standardized() != urlOfPath(result.path).standardized() &&
                             memberOf(result).empty();
    if (isElsewhere)
        return "check the permissions of the file, of " + url->path() +
               " and of the folders above them";
    return "check the permissions of the file and of the folders above it";
}

std::string adviceForPOSIXError(const Result& result) {
    switch (result.error->code()) {
        case EACCES:
        case EPERM:
            return adviceForPermissions(result);
        case ELOOP:
            return "symbolic links lead in a circle, or out of the book";
        case ENOSPC:
        case EDQUOT:
            return "make room on the disk and try again";
        case EMFILE:
        case ENFILE:
            return "too many files are open; try with a smaller -j";
        default:
            return {};
    }
}

/// What is odd about the name of a file that is not there.
std::string_view adviceForName(std::string_view path) {
    if (path.find('\0') != std::string::npos)
        return "the name holds a NUL: are the names NUL-ended, so that -0 is needed?";
    if (path.find('\n') != std::string::npos)
        return "the name holds a line end: is it several names, a line each?";
    if (path.ends_with('\r'))
        return "the name ends in a carriage return: write the list of names with plain line ends";
    return {};
}

std::string adviceFor(const Result& result) {
    const Error& error = *result.error;
    if (error.domain() == PVParvelFoundationErrorDomain)
        return std::string(adviceForLibraryError(result));
    if (error.domain() == PVPOSIXErrorDomain)
        return adviceForPOSIXError(result);
    return std::string(isAbsent(error) ? adviceForName(result.path) : std::string_view());
}

/// What can't be read of the asset, where that is a part of it.
std::string memberThatFails(const Result& result) {
    const Error& error = *result.error;
    const bool isUnreadable =
        error.domain() == PVPOSIXErrorDomain && (error.code() == EACCES || error.code() == EIO);
    return isAbsent(error) || isUnreadable ? memberOf(result) : std::string();
}

/// The log's reason says more than the general error of damaged content without a reason of its
/// own.
bool reasonTellsMore(const Result& result) {
    return !result.reason.empty() && result.error->domain() == PVFileErrorDomain &&
           result.error->code() == static_cast<std::int64_t>(PVFileErrorCode::Corrupt) &&
           !result.error->userInfo().contains(PVLocalizedFailureReasonErrorKey);
}

}  // namespace

std::string withoutFullStop(std::string words) {
    if (words.ends_with('.'))
        words.pop_back();
    return words;
}

std::string failureLine(std::string_view command, const Result& result) {
    std::string line = "parvel: " + std::string(command) + ": " + safeText(result.path) + ": ";
    if (!result.error) {
        line += result.nothing;
        line += (result.reason.empty() ? "" : ": ") + safeText(withoutFullStop(result.reason));
        return line + (result.advice.empty() ? "" : "; ") + safeText(result.advice) + "\n";
    }
    const Error& error = *result.error;
    if (const std::string member = memberThatFails(result); !member.empty())
        line += safeText(member) + ": ";
    line += safeText(withoutFullStop(reasonTellsMore(result) ? result.reason : error.message()));
    line += " (" + safeText(error.domain()) + " " + std::to_string(error.code()) + ")";
    const std::string advice = safeText(result.advice.empty() ? adviceFor(result) : result.advice);
    return line + (advice.empty() ? "" : "; ") + advice + "\n";
}

std::string problemLine(std::string_view command, std::string_view problem) {
    std::string line = "parvel: ";
    if (!command.empty())
        line += std::string(command) + ": ";
    return line + safeText(problem) + "\n";
}

}  // namespace parvel::cli
