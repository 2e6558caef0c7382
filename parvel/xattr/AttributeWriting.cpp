// Writes to the disk: extended attributes, one call each, and the modes of a package's files.
// Nothing is taken back after a failure; since the identity is written last, a set that was cut
// short is completed by the next call.

#include "parvel/xattr/AttributeWriting.h"

#include "parvel/foundation/PVCasts.h"
#include "parvel/foundation/PVParvelLog.h"
#include "parvel/foundation/ValueReadings.h"
#include "parvel/metadata/AssetURL.h"
#include "parvel/platform/DirectoryEnumerator.h"
#include "parvel/platform/ResourceQueries.h"
#include "parvel/platform/Service.h"
#include "parvel/xattr/AttributeDictionary.h"
#include "parvel/xattr/ExtendedAttributes.h"
#include "parvel/xattr/PNMetadataXattr.h"

namespace parvel {

namespace {

constexpr unsigned kOwnerReadWrite = 0600;
constexpr const char* kExplicitText = "1";

const String* storedText(const Dictionary& attributes, std::string_view name) {
    return PVDynamicCast(classOf<String>, attributes.find(name));
}

std::optional<String> genreText(const PVAssetMetadata& asset) {
    const String* genre = PVDynamicCast(classOf<String>, asset.genre());
    return genre ? std::optional(*genre) : std::nullopt;
}

void putPresent(Dictionary& attributes, std::string_view name, const std::optional<String>& value) {
    if (value)
        attributes.set(name, *value);
}

void putChanged(Dictionary& changes, const Dictionary& stored, std::string_view name,
                const std::optional<String>& value) {
    const String* before = storedText(stored, name);
    if (value && (!before || *before != *value))
        changes.set(name, *value);
}

/// A value that is no text is passed over: writing never removes an attribute.
bool writeAttribute(const URL& url, std::string_view name, const Value& value, ErrorOut error) {
    const String* text = PVDynamicCast(classOf<String>, &value);
    return !text || pvamfm_setExtendedAttributeString_forKey_error(url, *text, name, error);
}

std::uint64_t fixPermissionsOfPackage(const URL& url) {
    std::uint64_t sum = 0;
    Service<DirectoryEnumerator>::current().enumerate(
        url, [&sum](const DirectoryEnumerator::Entry& entry) {
            if (entry.isDirectory() == true)
                return;
            (void)entry.setPermissions(kOwnerReadWrite);
            sum += entry.totalAllocatedSize().value_or(0);
        });
    return sum;
}

}  // namespace

bool setAttributesForAsset(const AssetPtr& asset, ErrorOut error) {
    const auto url = urlOf(asset);
    if (!url)
        return fail(error, makeMissingURLError());

    // Deliberate: a failed read leaves its error with the caller and stops nothing.
    std::optional<String> identity;
    if (pvamfm_extendedAttributeString_forKey_error(*url, &identity, PNMetadataXattrAssetID,
                                                    error) &&
        identity)
        return true;

    const auto assetID = asset->assetID();
    if (!assetID)
        return fail(error, makeNoIdentityError());

    Dictionary attributes;
    attributes.set(PNMetadataXattrAssetID, *assetID);
    putPresent(attributes, PNMetadataXattrTitle, asset->title());
    putPresent(attributes, PNMetadataXattrAuthor, asset->author());
    putPresent(attributes, PNMetadataXattrGenre, genreText(*asset));
    if (asset->isExplicit())
        attributes.set(PNMetadataXattrExplicit, kExplicitText);
    return writeAttributes(attributes, url, error);
}

bool updateAttributesForAsset(const AssetPtr& asset, ErrorOut error) {
    const auto url = urlOf(asset);
    if (!url)
        return fail(error, makeMissingURLError());

    const auto stored = attributeDictionaryAtURL(*url);
    if (!stored)
        return fail(error, makeNoIdentityError());
    const auto assetID = asset->assetID();
    const String* storedID = storedText(*stored, PNMetadataXattrAssetID);
    if (!assetID || !storedID || *assetID != *storedID)
        return fail(error, makeNoIdentityError());

    Dictionary changes;
    putChanged(changes, *stored, PNMetadataXattrTitle, asset->title());
    putChanged(changes, *stored, PNMetadataXattrAuthor, asset->author());
    putChanged(changes, *stored, PNMetadataXattrGenre, genreText(*asset));
    // Deliberate: a record that is not explicit never clears a stored mark.
    const String* mark = storedText(*stored, PNMetadataXattrExplicit);
    if (asset->isExplicit() && !(mark && boolReading(*mark)))
        changes.set(PNMetadataXattrExplicit, kExplicitText);
    return writeAttributes(changes, url, error);
}

bool writeAttributes(const Dictionary& attributes, const std::optional<URL>& url, ErrorOut error) {
    // Deliberate: nothing to write is no success and no error.
    if (!url || attributes.empty())
        return false;
    for (const auto& [name, value] : attributes) {
        if (name != PNMetadataXattrAssetID && !writeAttribute(*url, name, value, error))
            return false;
    }
    const Value* identity = attributes.find(PNMetadataXattrAssetID);
    return !identity || writeAttribute(*url, PNMetadataXattrAssetID, *identity, error);
}

std::uint64_t fixPermissionsAndCalculateAllocatedSize(const URL& url, ErrorOut error) {
    ResourceQueries& queries = Service<ResourceQueries>::current();
    std::optional<Error> directoryError;
    std::uint64_t size = 0;
    const auto isDirectory = queries.isDirectory(url, &directoryError);
    if (!isDirectory) {
        // Deliberate: the misspelling is part of the text.
        PVParvelLog().error("Failed to state file for directory");
    } else if (*isDirectory) {
        size = fixPermissionsOfPackage(url);
    } else if (const auto fileSize = queries.totalAllocatedSize(url)) {
        size = *fileSize;
    } else {
        PVParvelLog().error("Failed to stat file for size");
    }
    // Deliberate: written in every case, and an error only of the directory query.
    assign(error, directoryError);
    return size;
}

}  // namespace parvel
