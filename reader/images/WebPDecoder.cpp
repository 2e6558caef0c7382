#include <memory>

#include <webp/decode.h>
#include <webp/demux.h>

#include "reader/images/Pixels.h"

namespace parvel::reader {

namespace {

/// The first frame of a container; a still picture is its only one.
class FirstFrame {
public:
    explicit FirstFrame(WebPDemuxer* demuxer)
        : m_isThere(WebPDemuxGetFrame(demuxer, 1, &m_frame) != 0) {}
    ~FirstFrame() { WebPDemuxReleaseIterator(&m_frame); }
    FirstFrame(const FirstFrame&) = delete;
    FirstFrame& operator=(const FirstFrame&) = delete;

    [[nodiscard]] bool liesWithin(std::uint32_t width, std::uint32_t height) const {
        return m_isThere && m_frame.complete && m_frame.x_offset >= 0 && m_frame.y_offset >= 0 &&
               m_frame.width > 0 && m_frame.height > 0 &&
               std::int64_t{m_frame.x_offset} + m_frame.width <= width &&
               std::int64_t{m_frame.y_offset} + m_frame.height <= height;
    }
    [[nodiscard]] const WebPIterator& operator*() const { return m_frame; }

private:
    WebPIterator m_frame{};
    bool m_isThere;
};

bool drawWebPFrame(const WebPIterator& frame, std::uint32_t* pixels, std::uint32_t width,
                   std::uint32_t height) {
    WebPDecoderConfig config;
    if (!WebPInitDecoderConfig(&config))
        return false;
    const std::size_t offset =
        static_cast<std::size_t>(frame.y_offset) * width + static_cast<std::size_t>(frame.x_offset);
    config.output.colorspace = blueComesFirst ? MODE_bgrA : MODE_Argb;
    config.output.is_external_memory = 1;
    config.output.u.RGBA.rgba = reinterpret_cast<std::uint8_t*>(pixels + offset);
    config.output.u.RGBA.stride = static_cast<int>(width * sizeof(*pixels));
    config.output.u.RGBA.size = (std::size_t{width} * height - offset) * sizeof(*pixels);
    return WebPDecode(frame.fragment.bytes, frame.fragment.size, &config) == VP8_STATUS_OK;
}

}  // namespace

bool decodeWebP(EncodedImage bytes, const Canvas& canvas) {
    const WebPData data{bytes.data(), bytes.size()};
    const std::unique_ptr<WebPDemuxer, decltype(&WebPDemuxDelete)> demuxer(WebPDemux(&data),
                                                                           WebPDemuxDelete);
    if (!demuxer)
        return false;
    const std::uint32_t width = WebPDemuxGetI(demuxer.get(), WEBP_FF_CANVAS_WIDTH);
    const std::uint32_t height = WebPDemuxGetI(demuxer.get(), WEBP_FF_CANVAS_HEIGHT);
    const FirstFrame frame(demuxer.get());
    std::uint32_t* pixels =
        frame.liesWithin(width, height) ? takeCanvas(canvas, width, height) : nullptr;
    return pixels && drawWebPFrame(*frame, pixels, width, height);
}

}  // namespace parvel::reader
