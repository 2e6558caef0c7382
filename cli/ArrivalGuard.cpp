#include "cli/ArrivalGuard.h"

#include <cerrno>

namespace parvel::cli {

void ArrivalGuard::noteMove(const URL& source, const URL& destination) {
    m_arrivals.erase(source.standardized().path());
    m_arrivals.insert(destination.standardized().path());
}

bool ArrivalGuard::hasBrought(const URL& url) {
    return m_arrivals.contains(url.standardized().path()) && itemExistsAtPath(url.path());
}

bool ArrivalGuard::moveItem(const URL& source, const URL& destination, ErrorOut error) {
    if (!ForwardingFileSystemService::moveItem(source, destination, error))
        return false;
    noteMove(source, destination);
    return true;
}

bool ArrivalGuard::replaceItem(const URL& existing, const URL& replacement, ReplaceOptions options,
                               std::optional<URL>* resulting, ErrorOut error) {
    if (hasBrought(existing))
        return fail(error, makePOSIXError(EALREADY, existing));
    if (!ForwardingFileSystemService::replaceItem(existing, replacement, options, resulting, error))
        return false;
    noteMove(replacement, existing);
    return true;
}

bool ArrivalGuard::copyItem(const URL& source, const URL& destination, ErrorOut error) {
    if (!ForwardingFileSystemService::copyItem(source, destination, error))
        return false;
    m_arrivals.insert(destination.standardized().path());
    return true;
}

bool ArrivalGuard::setUbiquitous(bool ubiquitous, const URL& item, const URL& destination,
                                 ErrorOut error) {
    if (!ForwardingFileSystemService::setUbiquitous(ubiquitous, item, destination, error))
        return false;
    noteMove(item, destination);
    return true;
}

}  // namespace parvel::cli
