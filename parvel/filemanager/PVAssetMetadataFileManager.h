#pragma once

#include <memory>
#include <optional>
#include <string_view>

#include "parvel/foundation/ErrorOut.h"
#include "parvel/foundation/PVExport.h"
#include "parvel/metadata/PVAssetMetadata.h"
#include "parvel/platform/DateText.h"
#include "parvel/platform/FileCoordinator.h"
#include "parvel/platform/FileSystemService.h"

namespace parvel {

/// Every file operation on an asset passes through here. It holds nothing but its two platform
/// services, may be made freely, and is for one thread at a time.
class PV_EXPORT PVAssetMetadataFileManager {
public:
    /// With the host's file-system service.
    static std::shared_ptr<PVAssetMetadataFileManager> init();
    /// With the given file-system service, the host's where it is null; always with a new
    /// coordinator.
    static std::shared_ptr<PVAssetMetadataFileManager> initWithFileManager(
        std::shared_ptr<FileSystemService> fileManager);

    [[nodiscard]] const std::shared_ptr<FileSystemService>& fileManager() const;
    void setFileManager(std::shared_ptr<FileSystemService> fileManager);
    [[nodiscard]] const std::shared_ptr<FileCoordinator>& fileCoordinator() const;
    void setFileCoordinator(std::shared_ptr<FileCoordinator> fileCoordinator);

    /// The one formatter of metadata dates: made on first use, shared by all callers.
    static DateText& dateFormatter();
    static String stringFromMetadataDate(const Date& date);
    /// None for text that the formatter did not make.
    static std::optional<Date> metadataDateFromString(std::string_view text);

    /// The library's attributes that exist on the asset: attribute name to text, possibly empty.
    /// None without a URL (-1002), and when any of them can't be read; then the error is not
    /// written. Deliberate.
    [[nodiscard]] std::optional<Dictionary> extendedAttributesForAsset_error(
        const AssetPtr& asset, ErrorOut error = nullptr) const;

private:
    explicit PVAssetMetadataFileManager(std::shared_ptr<FileSystemService> fileManager);

    std::shared_ptr<FileSystemService> m_fileManager;
    std::shared_ptr<FileCoordinator> m_fileCoordinator;
};

}  // namespace parvel
