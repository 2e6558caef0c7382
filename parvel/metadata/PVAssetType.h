#pragma once

#include <cstdint>
#include <string_view>

namespace parvel {

/// The kind of an asset, told by its file-name extension alone, without regard to case.
enum PVAssetType : std::int64_t {
    PVAssetTypeUnknown = 0,     ///< any other extension, none, or no URL
    PVAssetTypeEPub = 1,        ///< "epub"
    PVAssetTypeKestrelPub = 2,  ///< "folium", the reading application's own package variant
    PVAssetTypePDF = 3,         ///< "pdf"
    PVAssetTypeAudiobook = 4,   ///< "m4a"
};

/// Paths of well-known members, relative to a book package's root.
inline constexpr std::string_view PVAssetMetadataBazaarMetadataPlistPath = "BazaarMetadata.plist";
inline constexpr std::string_view PVAssetMetadataBazaarMetadataPlistBackupPath =
    "BazaarMetadata-original.plist";
inline constexpr std::string_view PVAssetMetadataBazaarArtworkPath = "BazaarArtwork";
inline constexpr std::string_view PVAssetMetadataBazaarArtworkBackupPath = "BazaarArtwork-original";
/// The EPUB container document (OCF 3.0, 3.5.2.1).
inline constexpr std::string_view PVAssetMetadataContainerXMLPath = "META-INF/container.xml";

}  // namespace parvel
