#include "parvel/metadata/CoverFilter.h"

#include <algorithm>
#include <optional>
#include <utility>

#include "parvel/platform/Digest.h"
#include "parvel/platform/Service.h"

namespace parvel {

namespace {

CoverFilter& filterOfTheProcess() {
    static CoverFilter filter;
    return filter;
}

}  // namespace

bool CoverFilter::refuses(const Data& data) const {
    if (hostHash && hostHash(data) == refusedHash)
        return true;

    const auto hasSize = [&data](const RefusedImage& image) { return image.size == data.size(); };
    if (std::none_of(refusedImages.begin(), refusedImages.end(), hasSize))
        return false;

    const std::optional<Digest::SHA256> digest = Service<Digest>::current().sha256(data);
    return digest &&
           std::any_of(refusedImages.begin(), refusedImages.end(), [&](const RefusedImage& image) {
               return hasSize(image) && image.sha256 == *digest;
           });
}

void setCoverFilter(CoverFilter filter) {
    filterOfTheProcess() = std::move(filter);
}

const CoverFilter& coverFilter() {
    return filterOfTheProcess();
}

}  // namespace parvel
