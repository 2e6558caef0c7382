#include "parvel/iotasks/PlacedCopy.h"

#include "parvel/metadata/StoredPath.h"

namespace parvel {

std::optional<URL> urlOfCopy(const std::optional<URL>& source,
                             const std::optional<URL>& directory) {
    if (!source || !directory)
        return std::nullopt;
    return directory->appendingPathComponent(
        pathWithLowercasedExtension(source->lastPathComponent()));
}

}  // namespace parvel
