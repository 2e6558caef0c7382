#pragma once

#include <string_view>

/// The extended attributes that carry an asset's metadata on the file or package folder itself.
/// Every value is UTF-8 text without a terminator.
namespace parvel {

/// The asset's identity: written from `assetID`, read back as the generated ID.
inline constexpr std::string_view PNMetadataXattrAssetID = "com.kestrel.Folium.assetID";
inline constexpr std::string_view PNMetadataXattrTitle = "com.kestrel.Folium.title";
inline constexpr std::string_view PNMetadataXattrSortTitle = "com.kestrel.Folium.sortTitle";
inline constexpr std::string_view PNMetadataXattrAuthor = "com.kestrel.Folium.author";
inline constexpr std::string_view PNMetadataXattrSortAuthor = "com.kestrel.Folium.sortAuthor";
inline constexpr std::string_view PNMetadataXattrGenre = "com.kestrel.Folium.genre";
inline constexpr std::string_view PNMetadataXattrComments = "com.kestrel.Folium.comments";
inline constexpr std::string_view PNMetadataXattrBookDescription =
    "com.kestrel.Folium.bookDescription";
inline constexpr std::string_view PNMetadataXattrYear = "com.kestrel.Folium.year";
/// Boolean text; only ever "1" when written.
inline constexpr std::string_view PNMetadataXattrExplicit = "com.kestrel.Folium.explicit";
/// Metadata date text.
inline constexpr std::string_view PNMetadataXattrLastOpened = "com.kestrel.Folium.lastOpened";
/// Metadata date text.
inline constexpr std::string_view PNMetadataXattrFirstOpened = "com.kestrel.Folium.firstOpened";
/// Decimal integer text.
inline constexpr std::string_view PNMetadataXattrRating = "com.kestrel.Folium.rating";

// For the library's clients alone; nothing in the library reads or writes these.
inline constexpr std::string_view PNMetadataXattrCollectionID = "com.kestrel.Folium.collectionID";
inline constexpr std::string_view PNMetadataXattrReadingLocation =
    "com.kestrel.Folium.readingLocation";
inline constexpr std::string_view PNMetadataXattrHighWaterMark = "com.kestrel.Folium.highWaterMark";
inline constexpr std::string_view PNMetadataXattrOptionFlags = "com.kestrel.Folium.optionFlags";
inline constexpr std::string_view PNMetadataXattrThumbnail = "com.kestrel.Folium.thumbnail";

}  // namespace parvel
