#include "cli/Messages.h"

#include <cerrno>

#include "cli/AssetWalk.h"
#include "cli/TerminalText.h"

namespace parvel::cli {
namespace {

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

std::string_view adviceForPOSIXError(std::int64_t code) {
    switch (code) {
        case EACCES:
        case EPERM:
            return "check the permissions of the file and of the folders above it";
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

std::string_view adviceFor(const Result& result) {
    const Error& error = *result.error;
    if (error.domain() == PVParvelFoundationErrorDomain)
        return adviceForLibraryError(result);
    if (error.domain() == PVPOSIXErrorDomain)
        return adviceForPOSIXError(error.code());
    const bool isAbsent = error.domain() == PVFileErrorDomain &&
                          error.code() == static_cast<std::int64_t>(PVFileErrorCode::NoSuchFile);
    if (isAbsent && result.path.find('\0') != std::string::npos)
        return "the name holds a NUL: are the names NUL-ended, so that -0 is needed?";
    return {};
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
    line += safeText(withoutFullStop(reasonTellsMore(result) ? result.reason : error.message()));
    line += " (" + safeText(error.domain()) + " " + std::to_string(error.code()) + ")";
    const std::string advice =
        result.advice.empty() ? std::string(adviceFor(result)) : safeText(result.advice);
    return line + (advice.empty() ? "" : "; ") + advice + "\n";
}

std::string problemLine(std::string_view command, std::string_view problem) {
    std::string line = "parvel: ";
    if (!command.empty())
        line += std::string(command) + ": ";
    return line + safeText(problem) + "\n";
}

}  // namespace parvel::cli
