#include "parvel/metadata/PVAssetMetadata.h"
#include "parvel/metadata/PVAssetMetadataKeys.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "parvel/metadata/StoredPath.h"

namespace parvel {

namespace {

const Value* valueUnder(std::string_view name, const Dictionary* dictionary) {
    return dictionary ? dictionary->find(name) : nullptr;
}

}  // namespace

// Deliberate: the base class keeps nothing of what it is given.
std::shared_ptr<PVAssetMetadata> PVAssetMetadata::initWithURL_dictionary_validate(
    const std::optional<URL>& /*url*/, const Dictionary* /*dictionary*/, bool /*validate*/) {
    return std::make_shared<PVAssetMetadata>(Construction());
}

MutableAssetPtr PVAssetMetadata::metadataWithURL_dictionary(const std::optional<URL>& url,
                                                            const Dictionary* dictionary) {
    if (!url && (!dictionary || dictionary->empty()))
        return nullptr;
    return PVMutableAssetMetadata::initWithURL_dictionary_validate(url, dictionary,
                                                                   /*validate=*/true);
}

MutableAssetPtr PVAssetMetadata::updatesMetadataWithDictionary_error(const Dictionary* dictionary,
                                                                     ErrorOut /*error*/) {
    MutableAssetPtr record = PVMutableAssetMetadata::initWithURL_dictionary_validate(
        std::nullopt, dictionary, /*validate=*/false);
    if (!record->displayName() && record->itemName())
        record->mutableDictionary().set(key::displayName, Value(*record->itemName()));
    return record;
}

MutableAssetPtr PVAssetMetadata::identityMetadataWithStoreID_generatedID_url_error(
    const Value* storeID, const Value* generatedID, const std::optional<URL>& url, ErrorOut error) {
    if (!storeID && !generatedID && !url)
        return fail(error, makeNoIdentityError());

    Dictionary identity;
    if (url)
        identity.set(key::path, url->path());
    if (storeID)
        identity.set(key::storeID, *storeID);
    if (generatedID)
        identity.set(key::generatedID, *generatedID);
    return metadataWithURL_dictionary(url, &identity);
}

MutableAssetPtr PVAssetMetadata::identityMetadataWithDictionary_error(const Dictionary* dictionary,
                                                                      ErrorOut error) {
    return identityMetadataWithStoreID_generatedID_url_error(
        valueUnder(key::storeID, dictionary), valueUnder(key::generatedID, dictionary),
        fileURLOfStoredPath(valueUnder(key::path, dictionary)), error);
}

MutableAssetPtr PVAssetMetadata::deserializedMetadataFromDictionary_error(
    const Dictionary* dictionary, ErrorOut error) {
    const std::optional<URL> url = fileURLOfStoredPath(valueUnder(key::path, dictionary));
    if (!url)
        return fail(error, makeNoIdentityError());
    return metadataWithURL_dictionary(url, dictionary);
}

std::shared_ptr<PVAssetMetadata> PVAssetMetadata::copyWithZone() const {
    return initWithURL_dictionary_validate(url(), m_backingDictionary.get(), /*validate=*/false);
}

MutableAssetPtr PVAssetMetadata::copyWithUpdates(
    const std::function<void(PVMutableAssetMetadata&)>& updates) const {
    MutableAssetPtr copy = PVMutableAssetMetadata::initWithURL_dictionary_validate(
        std::nullopt, m_backingDictionary.get(), /*validate=*/false);
    updates(*copy);
    return copy;
}

MutableAssetPtr PVAssetMetadata::copyWithUpdatedURL(const std::optional<URL>& url) const {
    return copyWithUpdates([&url](PVMutableAssetMetadata& copy) { copy.setUrl(url); });
}

}  // namespace parvel
