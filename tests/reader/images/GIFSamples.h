#pragma once

#include <array>
#include <cstdint>
#include <string>
#include <vector>

#include <gif_lib.h>

namespace parvel::testing {

/// A GIF file with a frame in red, green, blue and white (indices 0 to 3), as giflib writes it.
struct GIFSample {
    int screenWidth = 2;
    int screenHeight = 2;
    int left = 0;
    int top = 0;
    int width = 2;
    int height = 2;
    std::string indices{"\0\1\2\3", 4};  ///< in the order in which the rows are stored
    bool interlaced = false;
    int transparent = NO_TRANSPARENT_COLOR;
    bool localColors = false;
    bool noColors = false;
    int frames = 1;

    [[nodiscard]] std::string bytes() const;
};

inline std::string GIFSample::bytes() const {
    std::string file;
    const OutputFunc write = [](GifFileType* gif, const GifByteType* bytes, int size) {
        static_cast<std::string*>(gif->UserData)
            ->append(reinterpret_cast<const char*>(bytes), static_cast<std::size_t>(size));
        return size;
    };
    GifFileType* gif = EGifOpen(&file, write, nullptr);
    EGifSetGifVersion(gif, true);
    static constexpr std::array<GifColorType, 4> rgb{
        GifColorType{255, 0, 0}, {0, 255, 0}, {0, 0, 255}, {255, 255, 255}};
    ColorMapObject* colors = GifMakeMapObject(4, rgb.data());

    EGifPutScreenDesc(gif, screenWidth, screenHeight, 8, 0,
                      localColors || noColors ? nullptr : colors);
    for (int frame = 0; frame < frames; ++frame) {
        GraphicsControlBlock control{DISPOSAL_UNSPECIFIED, false, 0, transparent};
        std::array<GifByteType, 4> block{};
        EGifGCBToExtension(&control, block.data());
        EGifPutExtension(gif, GRAPHICS_EXT_FUNC_CODE, 4, block.data());
        EGifPutImageDesc(gif, left, top, width, height, interlaced,
                         localColors || frame > 0 ? colors : nullptr);
        std::string rest = indices;
        for (int row = 0; row < height; ++row)
            EGifPutLine(gif, reinterpret_cast<GifPixelType*>(rest.data()) + row * width, width);
    }
    GifFreeMapObject(colors);
    EGifCloseFile(gif, nullptr);
    return file;
}

}  // namespace parvel::testing
