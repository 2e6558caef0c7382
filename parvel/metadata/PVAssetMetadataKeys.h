#pragma once

#include <string_view>

/// The keys of a record's dictionary, one line each: what is stored.
namespace parvel::key {

inline constexpr std::string_view path = "path";              ///< string: file-system path
inline constexpr std::string_view sourcePath = "sourcePath";  ///< string path
inline constexpr std::string_view previousPath = "PVItemPreviousPath";       ///< string path
inline constexpr std::string_view trashedPath = "trashedPath";               ///< string path
inline constexpr std::string_view generatedID = "PVGeneratedItemId";         ///< string
inline constexpr std::string_view displayName = "PVDisplayName";             ///< string
inline constexpr std::string_view format = "PVBooksFormat";                  ///< string
inline constexpr std::string_view producer = "PVBookProducer";               ///< string
inline constexpr std::string_view generationCount = "PVGenerationCount";     ///< unsigned integer
inline constexpr std::string_view isPreview = "isPreview";                   ///< boolean
inline constexpr std::string_view hasPendingUpdates = "PVHasPendingUpdate";  ///< boolean
inline constexpr std::string_view wasRedacted = "PVWasRedacted";             ///< boolean
inline constexpr std::string_view isLocked = "PVIsLocked";                   ///< boolean
inline constexpr std::string_view isExplicit = "explicit";                   ///< boolean
inline constexpr std::string_view permlink = "BazaarU Permlink";    ///< string: absolute URL text
inline constexpr std::string_view storeID = "itemId";               ///< string of decimal digits
inline constexpr std::string_view artistName = "artistName";        ///< string
inline constexpr std::string_view itemName = "itemName";            ///< string
inline constexpr std::string_view versionNumber = "versionNumber";  ///< string
inline constexpr std::string_view shouldDisableOptimizeSpeed =
    "shouldDisableOptimizeSpeed";  ///< boolean
inline constexpr std::string_view shouldDisableTouchEmulation =
    "shouldDisableTouchEmulation";                                              ///< boolean
inline constexpr std::string_view desktopSupportLevel = "desktopSupportLevel";  ///< any value
inline constexpr std::string_view pageCount = "pageCount";                ///< unsigned integer
inline constexpr std::string_view updateDate = "updateDate";              ///< date
inline constexpr std::string_view modificationDate = "modificationDate";  ///< date
inline constexpr std::string_view releaseDate = "releaseDate";            ///< date
inline constexpr std::string_view insertionDate =
    "PVInsertionDate";  ///< signed integer: whole seconds since 2001-01-01 00:00:00 UTC
inline constexpr std::string_view genre = "genre";                       ///< string
inline constexpr std::string_view assetDescription = "bookDescription";  ///< string
inline constexpr std::string_view bookInfo = "book-info";  ///< dictionary of the next three
inline constexpr std::string_view packageHash = "package-file-hash";  ///< string, in "book-info"
inline constexpr std::string_view coverImagePath =
    "cover-image-path";  ///< string: package-relative path, in "book-info"
inline constexpr std::string_view mimeType = "mime-type";             ///< string, in "book-info"
inline constexpr std::string_view allocatedSize = "PVAllocatedSize";  ///< unsigned integer: bytes
inline constexpr std::string_view percentComplete = "PVPercentComplete";  ///< real
inline constexpr std::string_view downloadInfo =
    "com.kestrel.BazaarStore.downloadInfo";                             ///< dictionary, kept opaque
inline constexpr std::string_view coverImageData = "PVCoverImageData";  ///< bytes: encoded image
inline constexpr std::string_view coverImageDataReplaced =
    "PVCoverImageDataReplaced";  ///< set where the cover file was replaced
inline constexpr std::string_view uploadErrorDomain = "PVUploadErrorDomain";  ///< string
inline constexpr std::string_view uploadErrorCode = "PVUploadErrorCode";      ///< signed integer
inline constexpr std::string_view sortTitle = "sort-name";                    ///< string
inline constexpr std::string_view sortAuthor = "sort-artist";                 ///< string
inline constexpr std::string_view comments = "comments";                      ///< string
inline constexpr std::string_view year = "year";                              ///< string
inline constexpr std::string_view lastOpenDate = "PVLastOpenedDate";          ///< date
inline constexpr std::string_view purchaseDate = "PVFirstOpenedDate";         ///< date
inline constexpr std::string_view rating = "rating";                          ///< number

}  // namespace parvel::key
