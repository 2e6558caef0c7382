#pragma once

#include <atomic>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string_view>
#include <utility>
#include <vector>

#include "parvel/foundation/ErrorOut.h"
#include "parvel/foundation/PVExport.h"
#include "parvel/foundation/URL.h"
#include "parvel/foundation/Value.h"
#include "parvel/metadata/PVAssetMetadataFlavor.h"
#include "parvel/metadata/PVAssetType.h"

namespace parvel {

class PVAssetMetadata;
class PVMutableAssetMetadata;

/// A record; null is none. Handing back the same pointer is handing back the asset itself.
using AssetPtr = std::shared_ptr<const PVAssetMetadata>;
/// A record that is still being made, or that its caller owns alone.
using MutableAssetPtr = std::shared_ptr<PVMutableAssetMetadata>;

/// What is known of one asset: a typed view over one string-keyed property-list dictionary, an
/// explicit URL and a cached kind. Keys are in PVAssetMetadataKeys.h.
///
/// A record that no longer changes may be read by any number of threads; one that changes is its
/// thread's own. Records share values, so copies are cheap.
///
///     AssetPtr book = PVAssetMetadataInspector::metadataForAssetAtURL_error(url, &error);
///     if (book)
///         std::cout << book->title().value_or("untitled") << '\n';
///
/// Getters that give `const Value*` give the value as it is stored, of whatever kind, and null when
/// it is absent; the pointer is good until the record changes. Booleans read false and unsigned
/// numbers 0 when absent.
class PV_EXPORT PVAssetMetadata {
protected:
    /// Taken by the constructors, so that the library alone can call them.
    struct Construction {
        explicit Construction() = default;
    };

public:
    explicit PVAssetMetadata(Construction);
    /// The base class's initialiser ignores its arguments: the record stays empty.
    static std::shared_ptr<PVAssetMetadata> initWithURL_dictionary_validate(
        const std::optional<URL>& url, const Dictionary* dictionary, bool validate);
    virtual ~PVAssetMetadata();
    PVAssetMetadata(const PVAssetMetadata&) = delete;
    PVAssetMetadata& operator=(const PVAssetMetadata&) = delete;

    // Construction. Each gives a new record.

    /// A validated record (PVMutableAssetMetadata). None when the URL is absent and the dictionary
    /// is null or empty.
    static MutableAssetPtr metadataWithURL_dictionary(const std::optional<URL>& url,
                                                      const Dictionary* dictionary);
    /// A partial set of changes: not validated, without URL; the display name is taken from
    /// "itemName" where it is absent. Never fails and never writes the error.
    static MutableAssetPtr updatesMetadataWithDictionary_error(const Dictionary* dictionary,
                                                               ErrorOut error = nullptr);
    /// A record of an identity alone. -1006 when all three are absent.
    static MutableAssetPtr identityMetadataWithStoreID_generatedID_url_error(
        const Value* storeID, const Value* generatedID, const std::optional<URL>& url,
        ErrorOut error = nullptr);
    /// The same from a dictionary's "itemId", "PVGeneratedItemId" and "path".
    static MutableAssetPtr identityMetadataWithDictionary_error(const Dictionary* dictionary,
                                                                ErrorOut error = nullptr);
    /// A validated record over the whole dictionary. -1006 when it has no usable "path".
    static MutableAssetPtr deserializedMetadataFromDictionary_error(const Dictionary* dictionary,
                                                                    ErrorOut error = nullptr);

    /// An independent copy of the receiver's class; its URL is the file URL of its "path".
    [[nodiscard]] virtual std::shared_ptr<PVAssetMetadata> copyWithZone() const;
    /// A copy that the callback has changed; the receiver stays as it is.
    [[nodiscard]] MutableAssetPtr copyWithUpdates(
        const std::function<void(PVMutableAssetMetadata&)>& updates) const;
    [[nodiscard]] MutableAssetPtr copyWithUpdatedURL(const std::optional<URL>& url) const;

    // The three fields.

    /// The record's own dictionary, never null: later changes show in it.
    [[nodiscard]] std::shared_ptr<const Dictionary> backingDictionary() const;
    void setBackingDictionary(Dictionary dictionary);
    /// The cached kind, else that of `url`, which is then cached unless unknown. Once cached it
    /// stays, whatever URL the record is given later. Deliberate.
    [[nodiscard]] PVAssetType assetType() const;
    /// Unknown clears the cache.
    void setAssetType(PVAssetType type);
    [[nodiscard]] const std::optional<URL>& backingURL() const { return m_backingURL; }
    void setBackingURL(std::optional<URL> url) { m_backingURL = std::move(url); }

    // Properties.

    /// The explicit URL, else the file URL of "path" as it stands.
    [[nodiscard]] std::optional<URL> url() const;
    /// The store ID's string form, else the generated ID where it is text.
    [[nodiscard]] std::optional<String> assetID() const;
    [[nodiscard]] std::optional<URL> sourceURL() const;
    [[nodiscard]] std::optional<URL> previousURL() const;
    [[nodiscard]] std::optional<URL> trashedURL() const;
    [[nodiscard]] const Value* generatedID() const;
    [[nodiscard]] const Value* displayName() const;
    [[nodiscard]] const Value* format() const;
    [[nodiscard]] const Value* producer() const;
    [[nodiscard]] std::uint64_t generationCount() const;
    [[nodiscard]] bool isPreview() const;
    [[nodiscard]] bool hasPendingUpdates() const;
    [[nodiscard]] bool wasRedacted() const;
    [[nodiscard]] bool isLocked() const;
    [[nodiscard]] bool isExplicit() const;
    /// None for an empty text, and for one that is no URL.
    [[nodiscard]] std::optional<URL> permlink() const;
    [[nodiscard]] const Value* storeID() const;
    [[nodiscard]] const Value* artistName() const;
    [[nodiscard]] const Value* itemName() const;
    [[nodiscard]] const Value* versionNumber() const;
    [[nodiscard]] bool shouldDisableOptimizeSpeed() const;
    [[nodiscard]] bool shouldDisableTouchEmulation() const;
    [[nodiscard]] const Value* desktopSupportLevel() const;
    [[nodiscard]] std::uint64_t pageCount() const;
    [[nodiscard]] const Value* updateDate() const;
    [[nodiscard]] const Value* modificationDate() const;
    [[nodiscard]] const Value* releaseDate() const;
    /// Now, at each call, when absent. What is stored and gives no number reads as 0 seconds.
    [[nodiscard]] Date insertionDate() const;
    [[nodiscard]] const Value* genre() const;
    [[nodiscard]] const Value* assetDescription() const;
    [[nodiscard]] const Value* packageHash() const;
    /// Bytes on disk.
    [[nodiscard]] std::uint64_t allocatedSize() const;
    /// Whether an allocated size is stored, to tell 0 from absent.
    [[nodiscard]] bool _hasAllocatedSize() const;
    /// A share from 0 to 1.
    [[nodiscard]] double percentComplete() const;
    [[nodiscard]] const Value* downloadInfo() const;
    [[nodiscard]] const Value* coverImagePath() const;
    [[nodiscard]] const Value* mimeType() const;
    [[nodiscard]] const Value* coverImageData() const;
    [[nodiscard]] const Value* coverImageDataReplaced() const;
    /// None without a domain or with code 0.
    [[nodiscard]] std::optional<Error> uploadError() const;

    // The checked view: a value of another kind reads as none.

    [[nodiscard]] std::optional<String> title() const;
    [[nodiscard]] std::optional<String> sortTitle() const;
    [[nodiscard]] std::optional<String> author() const;
    [[nodiscard]] std::optional<String> sortAuthor() const;
    [[nodiscard]] std::optional<String> comments() const;
    [[nodiscard]] std::optional<String> bookDescription() const;
    [[nodiscard]] std::optional<String> year() const;
    [[nodiscard]] std::optional<Date> lastOpenDate() const;
    /// Reads the first-opened key. Deliberate.
    [[nodiscard]] std::optional<Date> purchaseDate() const;
    [[nodiscard]] std::optional<Number> rating() const;

    // Kinds and package paths.

    /// An absent extension is unknown.
    static PVAssetType assetTypeForFileExtension(std::optional<std::string_view> extension);
    /// By the URL's extension alone; the file is never opened.
    static PVAssetType assetTypeForAssetAtURL(const std::optional<URL>& url);
    static bool isBookURL(const std::optional<URL>& url);
    /// Where the member stands, or would if the package were expanded; none unless a book's URL.
    static std::optional<URL> bazaarMetadataURLWithBaseURL(const std::optional<URL>& base);
    static std::optional<URL> bazaarMetadataBackupURLWithBaseURL(const std::optional<URL>& base);
    static std::optional<URL> bazaarArtworkURLWithBaseURL(const std::optional<URL>& base);
    static std::optional<URL> bazaarArtworkBackupURLWithBaseURL(const std::optional<URL>& base);

    [[nodiscard]] bool isEPub() const;
    [[nodiscard]] bool isKestrelPub() const;
    [[nodiscard]] bool isPDF() const;
    [[nodiscard]] bool isAudiobook() const;
    [[nodiscard]] bool isBook() const;
    /// An EPUB (never a "folium" package) whose producer begins with "Folium Author".
    [[nodiscard]] bool isRMT() const;
    /// These four go by the record's URL alone: a kind cached before that URL is not asked.
    [[nodiscard]] std::optional<URL> bazaarMetadataURL() const;
    [[nodiscard]] std::optional<URL> bazaarMetadataBackupURL() const;
    [[nodiscard]] std::optional<URL> bazaarArtworkURL() const;
    [[nodiscard]] std::optional<URL> bazaarArtworkBackupURL() const;
    /// Whether the item lies in cloud-synchronised storage; false, with a log line, when the query
    /// fails.
    [[nodiscard]] bool isUbiquitous() const;
    /// Whether a book is a single zip file; false for what is no book, none, with a log line, when
    /// the query fails. The error is never written. Deliberate.
    [[nodiscard]] std::optional<bool> isCompressedBookWithError(ErrorOut error = nullptr) const;
    /// Whether every entry of the other record's dictionary stands in this one's with an equal
    /// value.
    [[nodiscard]] bool containsAsset(const PVAssetMetadata& other) const;
    /// Whether the directory contains the item, at any depth; false when the query fails.
    [[nodiscard]] bool isInDirectory(const URL& directory) const;

    // Representations and identity.

    /// None, with a log line, for a flavour that is none of the five.
    [[nodiscard]] std::shared_ptr<const Dictionary> dictionaryRepresentationWithFlavor(
        std::int64_t flavor) const;
    /// The record's own dictionary, not a copy.
    [[nodiscard]] std::shared_ptr<const Dictionary> dictionaryRepresentation() const;
    /// Without the cover image and the mark of its replacement.
    [[nodiscard]] std::shared_ptr<const Dictionary> contentLibraryRepresentation() const;
    /// What is written as a package's store metadata file.
    [[nodiscard]] std::shared_ptr<const Dictionary> bazaarMetadataRepresentation() const;
    /// Without the cover image alone.
    [[nodiscard]] std::shared_ptr<const Dictionary> progressRepresentation() const;
    /// Store ID, generated ID and path, as far as they are there.
    [[nodiscard]] std::shared_ptr<const Dictionary> identityRepresentation() const;
    /// In the order given; none results are skipped.
    static std::vector<std::shared_ptr<const Dictionary>> dictionaryRepresentationsForAssets_flavor(
        const std::vector<AssetPtr>& assets, std::int64_t flavor);
    static std::vector<String> assetIDsForAssets(const std::vector<AssetPtr>& assets);
    /// With a key, whether the two values under it, normalised, are equal and not absent. Without,
    /// whether the generated IDs, the store IDs or the paths match; the first that does decides.
    static bool identityOfDictionary_matchesDictionary_key(
        const Dictionary& dictionary, const Dictionary& other,
        std::optional<std::string_view> key = std::nullopt);
    [[nodiscard]] bool hasMatchingIdentity(const PVAssetMetadata& other) const;

    /// Equal dictionaries; URL and cached kind are not compared. False for null.
    [[nodiscard]] bool isEqual(const PVAssetMetadata* other) const;
    /// Consistent with isEqual.
    [[nodiscard]] std::size_t hash() const;
    /// Whether the record is kept in the asset's extended attributes: PDFs and books.
    [[nodiscard]] bool shouldUpdateXattrMetadata() const;
    /// One line for logs: the content-library representation, with "<data>" for a cover image.
    [[nodiscard]] String description() const;

protected:
    [[nodiscard]] const Value* stored(std::string_view key) const;
    /// The dictionary, for the setters of the mutable class.
    [[nodiscard]] Dictionary& mutableDictionary() { return *m_backingDictionary; }

private:
    static std::optional<URL> _bookSubURLWithBaseURL_filename(const std::optional<URL>& base,
                                                              std::string_view filename);

    std::shared_ptr<Dictionary> m_backingDictionary;
    mutable std::atomic<PVAssetType> m_assetType{PVAssetTypeUnknown};
    std::optional<URL> m_backingURL;
};

/// How a record prints in a log line: its description.
PV_EXPORT String logText(const PVAssetMetadata& asset);

}  // namespace parvel
