#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string_view>
#include <vector>

#include "parvel/foundation/ErrorOut.h"
#include "parvel/foundation/PVExport.h"
#include "parvel/metadata/PVAssetMetadata.h"
#include "parvel/platform/DateText.h"
#include "parvel/platform/FileCoordinator.h"
#include "parvel/platform/FileSystemService.h"

namespace parvel {

class PVInstallAssetMetadataIOTask;

/// Every file operation on an asset passes through here. It takes a record, which it leaves as it
/// is, and gives a new one that says what became of the asset; none, with an error, where the
/// operation failed. A null record, or one without URL, names no item: -1002 where nothing else is
/// said. Codes below zero are those of PVParvelFoundationErrorDomain; the errors of the platform's
/// services pass out as they are.
///
/// A manager holds nothing but its two platform services, may be made freely, and is for one thread
/// at a time. What a failed operation had completed is not undone; a file or package that the host
/// moves, copies or replaces is whole at its old place or whole at its new one.
class PV_EXPORT PVAssetMetadataFileManager
    : public std::enable_shared_from_this<PVAssetMetadataFileManager> {
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

    // Moving and naming.

    /// Moves the item, over an existing one if asked. The same record comes back, and nothing is
    /// touched, when the target is the item's own place. None with the error untouched for no
    /// target.
    AssetPtr moveAsset_toURL_replaceExisting_error(const AssetPtr& asset,
                                                   const std::optional<URL>& target,
                                                   bool replaceExisting, ErrorOut error = nullptr);
    /// Moves the item into the directory under its own name. A book may instead be named after its
    /// store ID, or its generated ID where it has none; a PDF or audiobook counts up past names
    /// that are taken, to 9999, if asked. General error 259, without URL, for a book with no usable
    /// name: an ID that is empty, ".", "..", or holds a slash or NUL is none. None with the error
    /// untouched for a PDF or audiobook without URL.
    AssetPtr moveAsset_toDirectory_replaceExisting_renameIfCollision_useAssetIDFileName_error(
        const AssetPtr& asset, const URL& directory, bool replaceExisting, bool renameIfCollision,
        bool useAssetIDFileName, ErrorOut error = nullptr);
    /// The file name, or the first of "name 1.ext", "name 2.ext", … that is free in the directory.
    /// A name without extension gets a trailing dot. Deliberate.
    [[nodiscard]] String nonCollidingNameForFileName_inDestPath(const String& fileName,
                                                                const String& destPath) const;
    /// The title, or else the item's name, as a file name that any synchronised storage takes: at
    /// most 254 UTF-16 units and the dot. None for a record without URL.
    [[nodiscard]] std::optional<String> _sanitizedFilenameForAsset(const AssetPtr& asset) const;
    /// Stamps a placed asset with its allocated size and the present as its insertion date, unless
    /// it has them, and writes its attributes. The record comes back also when they can't be
    /// written; the error tells, and is overwritten in every case.
    AssetPtr updateWithKeyAttributesAssetMetadata_error(const AssetPtr& asset,
                                                        ErrorOut error = nullptr);

    // Updates.

    /// Renames a PDF after its own display name; any other asset comes back as it is. A display
    /// name that ends in ".pdf" gets a second one. Deliberate.
    AssetPtr normalizeNamingForAsset_error(const AssetPtr& asset, ErrorOut error = nullptr);
    /// Applies a user's edits: renames a PDF after its new display name, combines the updates into
    /// the record, writes the attributes; then, with `inflateIfNeeded`, expands a zipped book,
    /// replaces its cover and writes its store metadata file. Updates that the record holds already
    /// give back the asset itself, whose attributes are written all the same, and which still names
    /// the old place of a PDF that was renamed. Deliberate. None where the rename, the expansion or
    /// the cover fails; what was done before stays.
    AssetPtr updateAsset_withUpdates_temporaryDirectory_inflateIfNeeded_error(
        const AssetPtr& asset, const Dictionary* updates,
        const std::optional<URL>& temporaryDirectory, bool inflateIfNeeded,
        ErrorOut error = nullptr);
    /// Brings a freshly placed asset into the directory under its ID's name, over what stands
    /// there; or, where the existing one lies in synchronised storage, into that one's place. The
    /// existing record, where there is one, comes back with the new one's entries, also after a
    /// failed move: the error tells. Deliberate.
    AssetPtr applyUpdate_onExistingAsset_targetDirectory_error(const AssetPtr& update,
                                                               const AssetPtr& existing,
                                                               const URL& directory,
                                                               ErrorOut error = nullptr);
    /// Puts a zipped book's package folder, expanded in the temporary directory, in the place of
    /// the zip file; any other asset comes back as it is. A record with another source URL has the
    /// book there expanded, under that one's name, and keeps its zip file. Deliberate. None where
    /// the item can't be looked at, without an error. Without a temporary directory the zip file
    /// itself is in the way and is deleted before it is read: always give one. Deliberate.
    AssetPtr inflateAsset_temporaryDirectory_error(const AssetPtr& asset,
                                                   const std::optional<URL>& temporaryDirectory,
                                                   ErrorOut error = nullptr);
    /// Writes the store metadata file of an expanded book, whose first version is backed up, and
    /// the extended attributes of any asset. The log alone tells of failures; nothing is written
    /// into a zip file.
    void persistMetadata(const AssetPtr& asset);
    /// Writes the extended attributes that differ.
    void persistXattrMetadata(const AssetPtr& asset);
    /// Copies the store metadata file to its backup, which is never replaced.
    void _backupMetadataIfNeeded(const AssetPtr& asset);
    /// Renames a PDF within its folder; slashes and colons become low lines. Never overwrites:
    /// general error 516 with the new URL where that is taken, 4 with the old one where nothing
    /// stands there. -1002 without a URL, and for a name that is empty or holds a NUL.
    AssetPtr _renameExistingPDFMetadata_toDisplayName_error(
        const AssetPtr& asset, const std::optional<String>& displayName, ErrorOut error = nullptr);
    /// Puts the updates' cover in a package's cover file, which is moved aside first; a null marker
    /// removes it and brings back the first one. A record of a kind without such a file is only
    /// given the cover. The record comes back unchanged without a new cover; none for an empty one.
    /// A first one that can't be brought back leaves its error beside the record; a cover that
    /// can't be moved aside, as where a first one is kept already, does not. Deliberate. The
    /// misspelling is the operation's name.
    AssetPtr _updateImageCoverDataForMetadta_updates_error(const AssetPtr& asset,
                                                           const AssetPtr& updates,
                                                           ErrorOut error = nullptr);

    // Installing.

    /// A new task that brings the asset into the library: a book expanded or copied as a package,
    /// anything else copied as a file. The caller sets its flags; it keeps this manager.
    std::shared_ptr<PVInstallAssetMetadataIOTask> taskToInstallAsset(const AssetPtr& asset);

    // Synchronised storage, trash, removal, redaction.

    /// Moves the asset into synchronised storage or out of it, under its sanitised name. -1009 for
    /// no record or URL; none without an error where no name results. With `replace`, whatever
    /// stands at the target is replaced, and the result is none in every case. Deliberate: read it
    /// from disk.
    AssetPtr setUbiquitous_asset_intoDirectory_replace_error(bool ubiquitous, const AssetPtr& asset,
                                                             const URL& directory, bool replace,
                                                             ErrorOut error = nullptr);
    /// Puts the new version in the synchronised asset's place and then under its own sanitised
    /// name. -1002 also where the coordinator has no place to tell. The error is written in every
    /// case. A replaced item whose move failed stays where it is.
    AssetPtr replaceUbiquitousAsset_withAsset_error(const AssetPtr& asset,
                                                    const AssetPtr& newVersion,
                                                    ErrorOut error = nullptr);
    /// Moves the item to the user's trash and gives it its display name there; a rename that fails
    /// leaves it under the trash's own name. So does a display name without extension, of an item
    /// that has one. Deliberate. The record's `trashedURL` is its place.
    AssetPtr trashAsset_error(const AssetPtr& asset, ErrorOut error = nullptr);
    /// Deletes the item for good, a package with all that it holds; of a link the link alone. After
    /// a failure it stands as it was; where a part of it was gone already, its name is free.
    bool removeAsset_error(const AssetPtr& asset, ErrorOut error = nullptr);
    /// Moves the item aside into the directory; one of that name there fails it. The error is not
    /// written for a record without URL. Deliberate.
    AssetPtr redactAsset_intoDirectory_error(const AssetPtr& asset, const URL& directory,
                                             ErrorOut error = nullptr);

    // Records and the disk.

    /// The records whose item is not reachable, in order. The error is never written.
    [[nodiscard]] std::vector<AssetPtr> orphanAssetsInAssets_error(
        const std::vector<AssetPtr>& assets, ErrorOut error = nullptr) const;
    /// New, inspected and stamped records for the URLs that none of the records names, in order;
    /// those that can't be inspected are left out. The error is the last that a step reported.
    [[nodiscard]] std::vector<AssetPtr> assetsForURLs_missingFromAssets_error(
        const std::vector<URL>& urls, const std::vector<AssetPtr>& assets,
        ErrorOut error = nullptr) const;

    // Extended attributes.

    /// The library's attributes that exist on the asset: attribute name to text, possibly empty.
    /// None without a URL (-1002), and when any of them can't be read; then the error is not
    /// written. Deliberate.
    [[nodiscard]] std::optional<Dictionary> extendedAttributesForAsset_error(
        const AssetPtr& asset, ErrorOut error = nullptr) const;

    /// Writes identity, title, author, genre and the explicit mark once: true, with nothing
    /// written, where the item carries an identity already. -1002 without a URL, -1006 without an
    /// asset ID.
    bool setExtendedAttributesForAsset_error(const AssetPtr& asset, ErrorOut error = nullptr);
    /// Writes those of title, author, genre and the explicit mark that differ; false without an
    /// error when none does. -1002 without a URL; -1006 where the attributes can't be read or are
    /// another asset's. A stored explicit mark is never cleared. Deliberate.
    bool updateExtendedAttributesForAsset_error(const AssetPtr& asset, ErrorOut error = nullptr);
    /// Writes texts by attribute name. False without an error for no URL or nothing to write; what
    /// was written before a failure stays.
    bool _writeExtendedAttributes_url_error(const Dictionary& attributes,
                                            const std::optional<URL>& url,
                                            ErrorOut error = nullptr);
    /// Gives a package's visible files mode 0600 and returns their allocated size in bytes, or that
    /// of a single file, whose mode stays. The error is written in every case.
    std::uint64_t _fixPermissionsAndCalculateAllocatedSizeAtURL_error(const URL& url,
                                                                      ErrorOut error = nullptr);

private:
    explicit PVAssetMetadataFileManager(std::shared_ptr<FileSystemService> fileManager);

    std::shared_ptr<FileSystemService> m_fileManager;
    std::shared_ptr<FileCoordinator> m_fileCoordinator;
};

}  // namespace parvel
