#pragma once

#include "parvel/platform/FileSystemService.h"

namespace parvel::cli {

/// Lets no folder be lost that is no asset: a person who names one means what is in it. Replacing
/// or removing it fails with EISDIR and touches nothing. A link to a folder is no folder.
class FolderGuard : public ForwardingFileSystemService {
public:
    using ForwardingFileSystemService::ForwardingFileSystemService;

    bool replaceItem(const URL& existing, const URL& replacement, ReplaceOptions options,
                     std::optional<URL>* resulting, ErrorOut error) override;
    bool removeItem(const URL& item, ErrorOut error) override;
};

}  // namespace parvel::cli
