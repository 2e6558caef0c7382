#pragma once

#include "parvel/platform/FileSystemService.h"

namespace parvel::cli {

/// Lets no folder be lost that is no asset: a person who names one means what is in it. Replacing
/// or removing it fails with EISDIR and touches nothing. A link to a folder is no folder. Nor does
/// a link take the place of what it leads to, and lose it: that fails with EINVAL.
class FolderGuard : public ForwardingFileSystemService {
public:
    using ForwardingFileSystemService::ForwardingFileSystemService;

    bool replaceItem(const URL& existing, const URL& replacement, ReplaceOptions options,
                     std::optional<URL>* resulting, ErrorOut error) override;
    bool removeItem(const URL& item, ErrorOut error) override;
};

/// Why the guard does not let the replacement take the item's place; none where it does.
[[nodiscard]] std::optional<Error> objectionToReplacing(const URL& existing,
                                                        const URL& replacement);

/// Whether the URL is a link that leads to the item, which is none.
[[nodiscard]] bool isLinkTo(const URL& url, const URL& item);

}  // namespace parvel::cli
