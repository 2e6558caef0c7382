#pragma once

#include "parvel/metadata/PVAssetMetadata.h"

namespace parvel {

/// A record with setters: what readers fill and update callbacks change. Setters write straight
/// into the dictionary; one that takes an object removes its key when that is absent, unless it
/// says otherwise. Owned by one thread until it is handed out.
class PV_EXPORT PVMutableAssetMetadata : public PVAssetMetadata {
public:
    explicit PVMutableAssetMetadata(Construction construction) : PVAssetMetadata(construction) {}
    /// Over a copy of the dictionary. Without `validate` the URL is not kept: such a record's URL
    /// comes from "path" alone, so that copies and update records acquire none. Deliberate. With
    /// it, the generation count, store ID, source URL and display name are made sound, and a record
    /// with no URL and no identity is logged and made all the same.
    static MutableAssetPtr initWithURL_dictionary_validate(const std::optional<URL>& url,
                                                           const Dictionary* dictionary,
                                                           bool validate);

    [[nodiscard]] std::shared_ptr<PVAssetMetadata> copyWithZone() const override;

    /// Copies every entry of the other record over this one's; null does nothing. The explicit URL
    /// and the cached kind stay.
    void combineWithMetadata(const PVAssetMetadata* other);

    /// Also sets "path", with the last extension in lower case. The cached kind stays. Deliberate.
    void setUrl(std::optional<URL> url);
    void setSourceURL(const std::optional<URL>& url);
    void setPreviousURL(const std::optional<URL>& url);
    void setTrashedURL(const std::optional<URL>& url);
    void setGeneratedID(std::optional<String> generatedID);
    void setDisplayName(std::optional<String> displayName);
    void setFormat(std::optional<String> format);
    void setProducer(std::optional<String> producer);
    void setGenerationCount(std::uint64_t count);
    void setPreview(bool preview);
    void setHasPendingUpdates(bool pending);
    void setUploadError(const std::optional<Error>& error);
    void setWasRedacted(bool redacted);
    void setLocked(bool locked);
    void setExplicit(bool isExplicit);
    void setPermlink(const std::optional<URL>& permlink);
    /// A number is stored as its decimal string, or removes the store ID when that string's integer
    /// reading is below 1; anything else is stored as given.
    void setStoreID(const Value* storeID);
    void setArtistName(std::optional<String> artistName);
    void setItemName(std::optional<String> itemName);
    void setVersionNumber(std::optional<String> versionNumber);
    void setPageCount(std::uint64_t count);
    void setUpdateDate(std::optional<Date> date);
    void setModificationDate(std::optional<Date> date);
    void setReleaseDate(std::optional<Date> date);
    /// Stored as whole seconds, cut toward zero.
    void setInsertionDate(std::optional<Date> date);
    void setGenre(std::optional<String> genre);
    void setAssetDescription(std::optional<String> description);
    void setPackageHash(std::optional<String> hash);
    void setAllocatedSize(std::uint64_t bytes);
    void setPercentComplete(double share);
    void setCoverImagePath(std::optional<String> path);
    /// A buffer that the cover filter refuses (CoverFilter.h) is ignored: the previous value stays.
    void setCoverImageData(const Data* data);
    void setCoverImageDataReplaced(const Value* replaced);
    void setMimeType(std::optional<String> mimeType);
    /// Sets the package hash; the asset ID itself stays derived. Deliberate.
    void setAssetID(std::optional<String> assetID);
    void setTitle(std::optional<String> title);
    void setSortTitle(std::optional<String> sortTitle);
    void setAuthor(std::optional<String> author);
    void setSortAuthor(std::optional<String> sortAuthor);
    void setComments(std::optional<String> comments);
    void setBookDescription(std::optional<String> description);
    void setYear(std::optional<String> year);
    void setLastOpened(std::optional<Date> date);
    /// Read back as `purchaseDate`. Deliberate.
    void setFirstOpened(std::optional<Date> date);
    void setRating(std::optional<Number> rating);
    /// Does nothing: thumbnails are not kept in the record. Deliberate.
    void setThumbnail(const Data* image);

private:
    void store(std::string_view key, std::optional<Value> value);
    void storeInBookInfo(std::string_view key, std::optional<String> value);
};

}  // namespace parvel
