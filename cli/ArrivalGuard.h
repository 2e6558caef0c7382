#pragma once

#include <string>
#include <unordered_set>

#include "parvel/platform/FileSystemService.h"

namespace parvel::cli {

/// Lets no item be lost that a run has just put in its place: the next of that name would replace
/// it unseen. Replacing one fails with EALREADY and touches nothing.
class ArrivalGuard : public ForwardingFileSystemService {
public:
    using ForwardingFileSystemService::ForwardingFileSystemService;

    bool moveItem(const URL& source, const URL& destination, ErrorOut error) override;
    bool replaceItem(const URL& existing, const URL& replacement, ReplaceOptions options,
                     std::optional<URL>* resulting, ErrorOut error) override;
    bool copyItem(const URL& source, const URL& destination, ErrorOut error) override;
    bool setUbiquitous(bool ubiquitous, const URL& item, const URL& destination,
                       ErrorOut error) override;

    /// Whether the run has brought what stands there.
    [[nodiscard]] bool hasBrought(const URL& url);

private:
    void noteMove(const URL& source, const URL& destination);

    std::unordered_set<std::string> m_arrivals;  ///< standardized paths
};

}  // namespace parvel::cli
