#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include <webp/encode.h>
#include <webp/mux.h>

namespace parvel::testing {

/// Straight RGBA bytes as a WebP file without loss, or with little.
inline std::string webpOf(const std::string& rgba, int width, bool lossless = true) {
    const auto* pixels = reinterpret_cast<const std::uint8_t*>(rgba.data());
    const int height = static_cast<int>(rgba.size()) / 4 / width;
    std::uint8_t* file = nullptr;
    const std::size_t size = lossless
                                 ? WebPEncodeLosslessRGBA(pixels, width, height, width * 4, &file)
                                 : WebPEncodeRGBA(pixels, width, height, width * 4, 95, &file);
    std::string bytes(reinterpret_cast<char*>(file), size);
    WebPFree(file);
    return bytes;
}

/// An animated WebP file of these pictures, two or more, at an offset (even numbers) within the
/// canvas.
inline std::string animatedWebPOf(const std::vector<std::string>& frames, int x, int y) {
    WebPMux* mux = WebPMuxNew();
    const WebPMuxAnimParams animation{0, 0};
    WebPMuxSetAnimationParams(mux, &animation);
    for (const std::string& frame : frames) {
        WebPMuxFrameInfo info{};
        info.bitstream = {reinterpret_cast<const std::uint8_t*>(frame.data()), frame.size()};
        info.x_offset = x;
        info.y_offset = y;
        info.duration = 100;
        info.id = WEBP_CHUNK_ANMF;
        WebPMuxPushFrame(mux, &info, /*copy_data=*/1);
    }
    WebPData file{};
    WebPMuxAssemble(mux, &file);
    std::string bytes(reinterpret_cast<const char*>(file.bytes), file.size);
    WebPDataClear(&file);
    WebPMuxDelete(mux);
    return bytes;
}

}  // namespace parvel::testing
