#include <csetjmp>
#include <cstddef>
#include <cstdio>

#include <jerror.h>
#include <jpeglib.h>

#include "reader/images/Pixels.h"

namespace parvel::reader {

namespace {

/// More scans than any encoder writes; a picture of thousands would be drawn over and over.
constexpr int kMostScans = 100;

/// The decoder's state. libjpeg reports a failure by a function that must not return.
class JPEGReader {
public:
    JPEGReader() {
        m_info.err = jpeg_std_error(&m_errors);
        m_errors.error_exit = escape;
        m_errors.emit_message = escapeFromMissingData;
        m_progress.progress_monitor = escapeFromManyScans;
        m_info.client_data = this;
    }
    ~JPEGReader() { jpeg_destroy_decompress(&m_info); }
    JPEGReader(const JPEGReader&) = delete;
    JPEGReader& operator=(const JPEGReader&) = delete;

    /// Holds no object with a destructor while libjpeg works, for the jump passes over it.
    [[nodiscard]] bool decode(EncodedImage bytes, const Canvas& canvas);

private:
    [[noreturn]] static void escape(j_common_ptr info);
    static void escapeFromMissingData(j_common_ptr info, int level);
    static void escapeFromManyScans(j_common_ptr info);

    [[nodiscard]] bool isCMYK() const {
        return m_info.jpeg_color_space == JCS_CMYK || m_info.jpeg_color_space == JCS_YCCK;
    }
    void readRows(std::uint32_t* pixels);
    void convertFromCMYK(std::uint32_t* row) const;

    jpeg_decompress_struct m_info{};
    jpeg_error_mgr m_errors{};
    jpeg_progress_mgr m_progress{};
    std::jmp_buf m_escape{};
};

void JPEGReader::escape(j_common_ptr info) {
    std::longjmp(static_cast<JPEGReader*>(info->client_data)->m_escape, 1);
}

/// Of what libjpeg only warns of, the end before the last pixel counts as a failure.
void JPEGReader::escapeFromMissingData(j_common_ptr info, int level) {
    constexpr int warning = -1;
    if (level == warning && info->err->msg_code == JWRN_HIT_MARKER)
        escape(info);
}

void JPEGReader::escapeFromManyScans(j_common_ptr info) {
    if (static_cast<JPEGReader*>(info->client_data)->m_info.input_scan_number > kMostScans)
        escape(info);
}

bool JPEGReader::decode(EncodedImage bytes, const Canvas& canvas) {
    if (setjmp(m_escape) != 0)
        return false;
    jpeg_create_decompress(&m_info);
    m_info.progress = &m_progress;
    jpeg_mem_src(&m_info, bytes.data(), bytes.size());
    jpeg_read_header(&m_info, /*require_image=*/TRUE);

    std::uint32_t* pixels = takeCanvas(canvas, m_info.image_width, m_info.image_height);
    if (!pixels)
        return false;
    m_info.out_color_space = isCMYK() ? JCS_CMYK : blueComesFirst ? JCS_EXT_BGRA : JCS_EXT_ARGB;
    jpeg_start_decompress(&m_info);
    readRows(pixels);
    return true;
}

void JPEGReader::readRows(std::uint32_t* pixels) {
    while (m_info.output_scanline < m_info.output_height) {
        std::uint32_t* row = pixels + std::size_t{m_info.output_scanline} * m_info.output_width;
        JSAMPROW samples = reinterpret_cast<JSAMPROW>(row);
        jpeg_read_scanlines(&m_info, &samples, 1);
        if (isCMYK())
            convertFromCMYK(row);
    }
}

/// In place, for four samples take as much room as one pixel. The encoders that mark their work as
/// Adobe's do, and nearly all do, store the inks inverted.
void JPEGReader::convertFromCMYK(std::uint32_t* row) const {
    const std::uint32_t inversion = m_info.saw_Adobe_marker ? 0 : 0xFF;
    const JSAMPLE* samples = reinterpret_cast<const JSAMPLE*>(row);
    for (JDIMENSION i = 0; i < m_info.output_width; ++i, samples += 4) {
        const std::uint32_t black = samples[3] ^ inversion;
        row[i] = opaquePixel(scaledByByte(samples[0] ^ inversion, black),
                             scaledByByte(samples[1] ^ inversion, black),
                             scaledByByte(samples[2] ^ inversion, black));
    }
}

}  // namespace

bool decodeJPEG(EncodedImage bytes, const Canvas& canvas) {
    JPEGReader reader;
    return reader.decode(bytes, canvas);
}

}  // namespace parvel::reader
