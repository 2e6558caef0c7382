#include <algorithm>
#include <array>
#include <memory>
#include <optional>
#include <vector>

#include <gif_lib.h>

#include "reader/images/Pixels.h"

namespace parvel::reader {

namespace {

int readGIFBytes(GifFileType* gif, GifByteType* buffer, int length) {
    EncodedImage& rest = *static_cast<EncodedImage*>(gif->UserData);
    const std::size_t count = std::min(rest.size(), static_cast<std::size_t>(std::max(length, 0)));
    std::copy_n(rest.begin(), count, buffer);
    rest = rest.subspan(count);
    return static_cast<int>(count);
}

struct CloseGIF {
    void operator()(GifFileType* gif) const { DGifCloseFile(gif, nullptr); }
};

/// Reads one extension; the colour index that it makes transparent is kept.
bool readExtension(GifFileType& gif, std::optional<int>& transparent) {
    int kind = 0;
    GifByteType* block = nullptr;
    if (DGifGetExtension(&gif, &kind, &block) != GIF_OK)
        return false;
    while (block) {
        GraphicsControlBlock control{};
        if (kind == GRAPHICS_EXT_FUNC_CODE &&
            DGifExtensionToGCB(block[0], block + 1, &control) == GIF_OK)
            transparent = control.TransparentColor == NO_TRANSPARENT_COLOR
                              ? std::nullopt
                              : std::optional(control.TransparentColor);
        if (DGifGetExtensionNext(&gif, &block) != GIF_OK)
            return false;
    }
    return true;
}

/// Reads up to the first frame's pixels.
bool findFirstFrame(GifFileType& gif, std::optional<int>& transparent) {
    while (true) {
        GifRecordType kind = UNDEFINED_RECORD_TYPE;
        if (DGifGetRecordType(&gif, &kind) != GIF_OK)
            return false;
        if (kind == IMAGE_DESC_RECORD_TYPE)
            return DGifGetImageDesc(&gif) == GIF_OK;
        if (kind != EXTENSION_RECORD_TYPE || !readExtension(gif, transparent))
            return false;
    }
}

/// What each colour index draws; an index that the colours don't reach draws nothing.
std::array<std::uint32_t, 256> paletteOf(const ColorMapObject& colors,
                                         std::optional<int> transparent) {
    std::array<std::uint32_t, 256> palette{};
    for (int i = 0; i < std::min(colors.ColorCount, 256); ++i) {
        const GifColorType& color = colors.Colors[i];
        palette[static_cast<std::size_t>(i)] = opaquePixel(color.Red, color.Green, color.Blue);
    }
    if (transparent)
        palette[static_cast<std::size_t>(*transparent) & 0xFF] = 0;
    return palette;
}

/// The rows of a frame in the order in which it stores them (GIF89a, appendix E).
std::vector<int> rowOrder(int height, bool isInterlaced) {
    struct Pass {
        int first;
        int step;
    };
    static constexpr std::array interlaced{Pass{0, 8}, Pass{4, 8}, Pass{2, 4}, Pass{1, 2}};
    static constexpr std::array straight{Pass{0, 1}};

    std::vector<int> order;
    order.reserve(static_cast<std::size_t>(height));
    for (const Pass& pass : isInterlaced ? std::span<const Pass>(interlaced) : straight) {
        for (int row = pass.first; row < height; row += pass.step)
            order.push_back(row);
    }
    return order;
}

/// Draws the frame onto the screen, as far as it lies on it.
bool drawFrame(GifFileType& gif, std::optional<int> transparent, std::uint32_t* pixels, int width,
               int height) {
    const GifImageDesc& frame = gif.Image;
    const ColorMapObject* colors = frame.ColorMap ? frame.ColorMap : gif.SColorMap;
    if (!colors)
        return false;
    const std::array<std::uint32_t, 256> palette = paletteOf(*colors, transparent);

    std::vector<GifPixelType> line(static_cast<std::size_t>(frame.Width));
    const int drawn = std::clamp(width - frame.Left, 0, frame.Width);
    for (const int row : rowOrder(frame.Height, frame.Interlace)) {
        if (DGifGetLine(&gif, line.data(), frame.Width) != GIF_OK)
            return false;
        if (drawn == 0 || frame.Top + row >= height)
            continue;
        std::uint32_t* target =
            pixels + static_cast<std::size_t>(frame.Top + row) * static_cast<std::size_t>(width);
        std::transform(line.begin(), line.begin() + drawn, target + frame.Left,
                       [&palette](GifPixelType index) { return palette[index]; });
    }
    return true;
}

}  // namespace

bool decodeGIF(EncodedImage bytes, const Canvas& canvas) {
    const std::unique_ptr<GifFileType, CloseGIF> gif(DGifOpen(&bytes, readGIFBytes, nullptr));
    std::optional<int> transparent;
    if (!gif || !findFirstFrame(*gif, transparent))
        return false;
    const GifImageDesc& frame = gif->Image;
    if (!isAllowedSize(static_cast<std::uint32_t>(frame.Width),
                       static_cast<std::uint32_t>(frame.Height)))
        return false;

    // Some encoders leave the screen's size out.
    const bool hasScreen = gif->SWidth > 0 && gif->SHeight > 0;
    const int width = hasScreen ? gif->SWidth : frame.Left + frame.Width;
    const int height = hasScreen ? gif->SHeight : frame.Top + frame.Height;
    std::uint32_t* pixels =
        takeCanvas(canvas, static_cast<std::uint32_t>(width), static_cast<std::uint32_t>(height));
    return pixels && drawFrame(*gif, transparent, pixels, width, height);
}

}  // namespace parvel::reader
