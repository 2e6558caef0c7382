#include "parvel/foundation/ImageFiles.h"

#include "parvel/platform/ImageCodec.h"
#include "parvel/platform/Service.h"

namespace parvel {

std::optional<Image> imageFromData(const Data& data) {
    return Service<ImageCodec>::current().decode(data);
}

std::optional<Data> pngDataFromImage(const Image& image) {
    return Service<ImageCodec>::current().encodePNG(image);
}

}  // namespace parvel
