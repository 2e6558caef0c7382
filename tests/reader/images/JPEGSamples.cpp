#include "tests/reader/images/JPEGSamples.h"

#include <cstdio>
#include <cstdlib>

#include <jpeglib.h>

namespace parvel::testing {

std::string JPEGSample::bytes() const {
    jpeg_compress_struct info{};
    jpeg_error_mgr errors{};
    info.err = jpeg_std_error(&errors);
    jpeg_create_compress(&info);
    unsigned char* buffer = nullptr;
    unsigned long size = 0;
    jpeg_mem_dest(&info, &buffer, &size);

    const bool inks = color == Color::CMYK || color == Color::YCCK;
    info.image_width = width;
    info.image_height = height;
    info.input_components = static_cast<int>(pixel.size());
    info.in_color_space = inks ? JCS_CMYK : color == Color::Grey ? JCS_GRAYSCALE : JCS_RGB;
    jpeg_set_defaults(&info);
    if (color == Color::YCCK)
        jpeg_set_colorspace(&info, JCS_YCCK);
    jpeg_set_quality(&info, 100, TRUE);
    if (progressive)
        jpeg_simple_progression(&info);
    info.write_Adobe_marker = inks && adobeMarker;

    jpeg_start_compress(&info, TRUE);
    std::string row;
    for (unsigned x = 0; x < width; ++x)
        row += pixel;
    auto* samples = reinterpret_cast<JSAMPROW>(row.data());
    while (info.next_scanline < info.image_height)
        jpeg_write_scanlines(&info, &samples, 1);
    jpeg_finish_compress(&info);
    jpeg_destroy_compress(&info);

    std::string file(reinterpret_cast<char*>(buffer), size);
    std::free(buffer);
    return file;
}

}  // namespace parvel::testing
