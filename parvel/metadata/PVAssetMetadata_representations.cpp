#include <initializer_list>
#include <utility>

#include "parvel/foundation/PVCasts.h"
#include "parvel/foundation/PVParvelLog.h"
#include "parvel/foundation/ValueReadings.h"
#include "parvel/metadata/PVAssetMetadata.h"
#include "parvel/metadata/PVAssetMetadataKeys.h"
#include "parvel/metadata/StoredPath.h"

namespace parvel {

namespace {

constexpr std::initializer_list<std::string_view> storeFileExclusions = {
    key::path,        key::generatedID,       key::coverImageData,  key::coverImageDataReplaced,
    key::wasRedacted, key::hasPendingUpdates, key::percentComplete, key::sourcePath};

constexpr std::initializer_list<std::string_view> contentLibraryExclusions = {
    key::coverImageData, key::coverImageDataReplaced};

/// The store ID under "itemId" as text; none when its integer reading is below 1.
std::optional<String> normalizedStoreID(const Dictionary& dictionary) {
    const Value* storeID = dictionary.find(key::storeID);
    return int64Reading(storeID) < 1 ? std::nullopt : stringForm(storeID);
}

/// A text under "path" with its last extension in lower case; none for anything else.
std::optional<String> normalizedPath(const Dictionary& dictionary) {
    const String* path = PVDynamicCast(classOf<String>, dictionary.find(key::path));
    return path ? std::optional<String>(pathWithLowercasedExtension(*path)) : std::nullopt;
}

std::optional<Value> normalizedValue(const Dictionary& dictionary, std::string_view name) {
    if (name == key::storeID)
        return normalizedStoreID(dictionary);
    if (name == key::path) {
        if (std::optional<String> path = normalizedPath(dictionary))
            return path;
    }
    const Value* value = dictionary.find(name);
    return value ? std::optional<Value>(*value) : std::nullopt;
}

bool generatedIDsMatch(const Dictionary& dictionary, const Dictionary& other) {
    const String* first = PVDynamicCast(classOf<String>, dictionary.find(key::generatedID));
    const String* second = PVDynamicCast(classOf<String>, other.find(key::generatedID));
    return first && second && !first->empty() && *first == *second;
}

bool storeIDsMatch(const Dictionary& dictionary, const Dictionary& other) {
    const std::optional<String> first = normalizedStoreID(dictionary);
    return first && first == normalizedStoreID(other);
}

bool pathsMatch(const Dictionary& dictionary, const Dictionary& other) {
    const std::optional<String> first = normalizedPath(dictionary);
    return first && !first->empty() && first == normalizedPath(other);
}

std::shared_ptr<const Dictionary> newDictionary(Dictionary dictionary) {
    return std::make_shared<const Dictionary>(std::move(dictionary));
}

}  // namespace

// Representations.

std::shared_ptr<const Dictionary> PVAssetMetadata::dictionaryRepresentationWithFlavor(
    std::int64_t flavor) const {
    switch (flavor) {
        case PVAssetMetadataFlavorFull:
            return dictionaryRepresentation();
        case PVAssetMetadataFlavorContentLibrary:
            return contentLibraryRepresentation();
        case PVAssetMetadataFlavorBazaarMetadata:
            return bazaarMetadataRepresentation();
        case PVAssetMetadataFlavorProgress:
            return progressRepresentation();
        case PVAssetMetadataFlavorIdentity:
            return identityRepresentation();
        default:
            PVParvelLog().error("Unexpected flavor %ld", flavor);
            return nullptr;
    }
}

// Deliberate: the live dictionary, not a copy.
std::shared_ptr<const Dictionary> PVAssetMetadata::dictionaryRepresentation() const {
    return m_backingDictionary;
}

std::shared_ptr<const Dictionary> PVAssetMetadata::contentLibraryRepresentation() const {
    return newDictionary(m_backingDictionary->without(contentLibraryExclusions));
}

std::shared_ptr<const Dictionary> PVAssetMetadata::bazaarMetadataRepresentation() const {
    return newDictionary(m_backingDictionary->without(storeFileExclusions));
}

// Deliberate: the mark of the cover's replacement stays.
std::shared_ptr<const Dictionary> PVAssetMetadata::progressRepresentation() const {
    return newDictionary(m_backingDictionary->without({key::coverImageData}));
}

std::shared_ptr<const Dictionary> PVAssetMetadata::identityRepresentation() const {
    Dictionary identity;
    if (storeID())
        identity.set(key::storeID, *storeID());
    if (generatedID())
        identity.set(key::generatedID, *generatedID());
    if (const std::optional<URL> item = url())
        identity.set(key::path, item->path());
    return newDictionary(std::move(identity));
}

std::vector<std::shared_ptr<const Dictionary>>
PVAssetMetadata::dictionaryRepresentationsForAssets_flavor(const std::vector<AssetPtr>& assets,
                                                           std::int64_t flavor) {
    std::vector<std::shared_ptr<const Dictionary>> representations;
    representations.reserve(assets.size());
    for (const AssetPtr& asset : assets) {
        auto representation = asset ? asset->dictionaryRepresentationWithFlavor(flavor) : nullptr;
        if (representation)
            representations.push_back(std::move(representation));
    }
    return representations;
}

std::vector<String> PVAssetMetadata::assetIDsForAssets(const std::vector<AssetPtr>& assets) {
    std::vector<String> assetIDs;
    assetIDs.reserve(assets.size());
    for (const AssetPtr& asset : assets) {
        std::optional<String> assetID = asset ? asset->assetID() : std::nullopt;
        if (assetID)
            assetIDs.push_back(*std::move(assetID));
    }
    return assetIDs;
}

// Identity.

bool PVAssetMetadata::identityOfDictionary_matchesDictionary_key(
    const Dictionary& dictionary, const Dictionary& other, std::optional<std::string_view> key) {
    if (key) {
        const std::optional<Value> first = normalizedValue(dictionary, *key);
        return first && first == normalizedValue(other, *key);
    }
    // Deliberate: identities that differ decide nothing where another one matches.
    return generatedIDsMatch(dictionary, other) || storeIDsMatch(dictionary, other) ||
           pathsMatch(dictionary, other);
}

bool PVAssetMetadata::hasMatchingIdentity(const PVAssetMetadata& other) const {
    return identityOfDictionary_matchesDictionary_key(*identityRepresentation(),
                                                      *other.identityRepresentation());
}

// Deliberate: neither the URL nor the cached kind is compared.
bool PVAssetMetadata::isEqual(const PVAssetMetadata* other) const {
    return other && *m_backingDictionary == *other->m_backingDictionary;
}

std::size_t PVAssetMetadata::hash() const {
    return m_backingDictionary->hash();
}

bool PVAssetMetadata::shouldUpdateXattrMetadata() const {
    return isPDF() || isBook();
}

String PVAssetMetadata::description() const {
    Dictionary shown = m_backingDictionary->without(contentLibraryExclusions);
    if (coverImageData())
        shown.set(key::coverImageData, "<data>");
    return parvel::description(shown);
}

String logText(const PVAssetMetadata& asset) {
    return asset.description();
}

}  // namespace parvel
