#include "tests/faults/OperationParts.h"

#include "parvel/platform/XattrStore.h"
#include "parvel/xattr/PNMetadataXattr.h"

namespace parvel::testing {
namespace {

bool hasAttribute(const std::string& path, std::string_view name) {
    std::size_t size = 0;
    return XattrStore::host().size(path, std::string(name), size) == 0;
}

}  // namespace

MutableAssetPtr assetAt(const TestLibrary& library, const std::string& place) {
    auto asset = PVAssetMetadata::metadataWithURL_dictionary(library.url(place), nullptr);
    asset->setTitle("A title");
    asset->setAuthor("An author");
    asset->setGenre("Science");
    const Value storeID("4711");
    asset->setStoreID(&storeID);
    return asset;
}

std::function<std::string(const TestLibrary& library)> identityComesLast(const std::string& at) {
    return [at](const TestLibrary& library) -> std::string {
        const std::string path = library.path(at);
        const bool isComplete = hasAttribute(path, PNMetadataXattrTitle) &&
                                hasAttribute(path, PNMetadataXattrAuthor) &&
                                hasAttribute(path, PNMetadataXattrGenre);
        return hasAttribute(path, PNMetadataXattrAssetID) && !isComplete
                   ? "the identity was written before the rest"
                   : "";
    };
}

Layout with(Layout layout, const std::string& place, const std::string& item) {
    layout[place] = item;
    return layout;
}

std::vector<Layout> withEach(const Layout& layout, const std::string& place,
                             const std::vector<std::string>& items) {
    std::vector<Layout> layouts;
    for (const std::string& item : items)
        layouts.push_back(with(layout, place, item));
    return layouts;
}

std::vector<std::string> stagesOf(const std::string& item) {
    return {"placeholder", "part of " + item, item + " but for modes", item};
}

}  // namespace parvel::testing
