#pragma once

#include <string>

namespace parvel::testing {

/// A JPEG file of one colour, as libjpeg writes it.
struct JPEGSample {
    enum class Color { Grey, YCbCr, CMYK, YCCK };

    unsigned width = 16;
    unsigned height = 16;
    Color color = Color::YCbCr;
    /// The samples of each pixel: one of grey, three of red, green and blue, four of the inks.
    std::string pixel = "\x33\x66\xCC";
    bool progressive = false;
    bool adobeMarker = true;  ///< for the inks

    [[nodiscard]] std::string bytes() const;
};

}  // namespace parvel::testing
