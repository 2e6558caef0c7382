#pragma once

#include <memory>
#include <string_view>

#include "parvel/foundation/ErrorOut.h"
#include "parvel/foundation/PVExport.h"
#include "parvel/foundation/URL.h"

namespace parvel {

/// A fresh, hidden folder in which a caller of the library has an asset made before it is put in
/// its place: what the operations that take a temporary directory are given. It stands beside the
/// place, so on its file system. It goes, with what is left in it, with its owner; what a killed
/// process left is cleared by the next one that stages there.
///
///     const auto staging = StagingDirectory::makeIn(library, &error);
///     if (staging)
///         manager->inflateAsset_temporaryDirectory_error(book, staging->url(), &error);
class PV_EXPORT StagingDirectory {
public:
    /// What its name begins with, as that of every item that the library is making.
    static constexpr std::string_view namePrefix = ".parvel-stage-";
    /// What the name of an item begins with that has stepped aside for another, where the file
    /// system can't exchange two names. One that a killed process left may be the only copy.
    static constexpr std::string_view asidePrefix = ".parvel-aside-";

    virtual ~StagingDirectory() = default;

    [[nodiscard]] virtual const URL& url() const = 0;

    /// None, with an error of makeServiceError, where it can't be made in the folder.
    [[nodiscard]] static std::unique_ptr<StagingDirectory> makeIn(const URL& folder,
                                                                  ErrorOut error = nullptr);
};

/// Makes staging directories.
class StagingService {
public:
    virtual ~StagingService() = default;

    [[nodiscard]] virtual std::unique_ptr<StagingDirectory> makeIn(const URL& folder,
                                                                   ErrorOut error) = 0;

    static StagingService& host();
};

}  // namespace parvel
