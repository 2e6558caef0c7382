#pragma once

#include <cstdint>
#include <optional>

#include "parvel/foundation/Data.h"
#include "parvel/foundation/ErrorOut.h"
#include "parvel/foundation/PVExport.h"
#include "parvel/foundation/URL.h"
#include "parvel/foundation/Value.h"

namespace parvel {

/// What led to a cover, in the order in which it is looked for.
enum class CoverRule : std::uint8_t {
    OwnImage,       ///< `coverImageDataForAssetAtURL_error`
    ImageProperty,  ///< the manifest item with the property "cover-image" (EPUB 3)
    Guide,          ///< the guide's reference to the cover (OPF 2.0)
    CoverItem,      ///< the item that the cover meta names, or whose id is "cover"
    FirstImage,     ///< the first image that the documents of the spine show
};

struct BestCover {
    Data bytes;
    CoverRule rule = CoverRule::OwnImage;
    String image;  ///< the image's path in the book; empty with OwnImage
    String page;   ///< that of the page that shows it; empty where the rule led to the image itself
};

/// A cover for people. `coverImageDataForAssetAtURL_error` decides what an asset's cover is, and no
/// record ever has another; where it gives a book no image, this goes on and tries the other rules.
/// A rule that leads to a page gives the first image which that page shows. The error is that of
/// the asset's own cover, and is set only where there is none.
PV_EXPORT std::optional<BestCover> bestCoverForAssetAtURL(const std::optional<URL>& url,
                                                          ErrorOut error = nullptr);

}  // namespace parvel
