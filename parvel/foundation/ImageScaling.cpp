#include "parvel/foundation/ImageScaling.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>
#include <numbers>
#include <vector>

#include "parvel/platform/ImageCodec.h"

namespace parvel {

namespace {

/// Alpha, red, green, blue in linear light, the colours multiplied by alpha.
using LinearPixel = std::array<float, 4>;

/// The transfer function of sRGB (IEC 61966-2-1) for bytes, exact both ways.
class TransferCurve {
public:
    TransferCurve() {
        for (std::size_t i = 0; i < 256; ++i) {
            m_linear[i] = linear(static_cast<double>(i) / 255);
            m_least[i] = i == 0 ? 0 : linear((static_cast<double>(i) - 0.5) / 255);
        }
        m_least[256] = std::numeric_limits<float>::infinity();
        std::uint8_t byte = 0;
        for (std::size_t i = 0; i < m_guess.size(); ++i) {
            while (static_cast<float>(i) / kGuesses >= m_least[byte + 1U])
                ++byte;
            m_guess[i] = byte;
        }
    }

    [[nodiscard]] float linearOf(std::uint32_t byte) const { return m_linear[byte]; }
    /// The byte nearest to a value from 0 to 1.
    [[nodiscard]] std::uint32_t byteOf(float value) const {
        std::uint32_t byte = m_guess[static_cast<std::size_t>(value * kGuesses)];
        while (value >= m_least[byte + 1])
            ++byte;
        return byte;
    }

private:
    static constexpr int kGuesses = 4096;

    static float linear(double value) {
        return static_cast<float>(value <= 0.04045 ? value / 12.92
                                                   : std::pow((value + 0.055) / 1.055, 2.4));
    }

    std::array<float, 256> m_linear{};
    std::array<float, 257> m_least{};  ///< the least value whose nearest byte is that one
    std::array<std::uint8_t, kGuesses + 1> m_guess{};
};

LinearPixel linearPixel(const TransferCurve& curve, std::uint32_t pixel) {
    const std::uint32_t alpha = pixel >> 24;
    if (alpha == 0)
        return {};
    const float opacity = static_cast<float>(alpha) / 255;
    const auto channel = [&](std::uint32_t premultiplied) {
        return opacity * curve.linearOf(std::min((premultiplied * 255 + alpha / 2) / alpha, 255U));
    };
    return {opacity, channel(pixel >> 16 & 0xFF), channel(pixel >> 8 & 0xFF),
            channel(pixel & 0xFF)};
}

/// The filter swings beyond its input at sharp edges, so what it gives is clamped.
std::uint32_t pixelOf(const TransferCurve& curve, const LinearPixel& linear) {
    const float opacity = std::clamp(linear[0], 0.0F, 1.0F);
    const auto alpha = static_cast<std::uint32_t>(std::lround(opacity * 255));
    if (alpha == 0)
        return 0;
    const auto channel = [&](float premultiplied) {
        const std::uint32_t byte = curve.byteOf(std::clamp(premultiplied / opacity, 0.0F, 1.0F));
        return (byte * alpha + 127) / 255;
    };
    return alpha << 24 | channel(linear[1]) << 16 | channel(linear[2]) << 8 | channel(linear[3]);
}

double lanczos(double x) {
    constexpr double lobes = 3;
    if (x == 0)
        return 1;
    if (std::abs(x) >= lobes)
        return 0;
    const double angle = std::numbers::pi * x;
    return lobes * std::sin(angle) * std::sin(angle / lobes) / (angle * angle);
}

/// Which source pixels of one direction make each target pixel, and how much of each.
class Kernel {
public:
    struct Span {
        std::uint32_t first;
        std::uint32_t count;
        const float* weights;
    };

    Kernel(std::uint32_t source, std::uint32_t target);

    [[nodiscard]] Span at(std::uint32_t i) const {
        const Range& range = m_ranges[i];
        return {range.first, range.count, m_weights.data() + range.offset};
    }
    [[nodiscard]] std::uint32_t longest() const { return m_longest; }

private:
    struct Range {
        std::uint32_t first;
        std::uint32_t count;
        std::size_t offset;
    };

    std::vector<Range> m_ranges;
    std::vector<float> m_weights;
    std::uint32_t m_longest = 0;
};

Kernel::Kernel(std::uint32_t source, std::uint32_t target) {
    const double ratio = static_cast<double>(source) / target;
    const double stretch = std::max(ratio, 1.0);
    const double reach = 3 * stretch;
    m_ranges.reserve(target);
    std::vector<double> weights;
    for (std::uint32_t i = 0; i < target; ++i) {
        const double centre = (i + 0.5) * ratio;
        const auto first = static_cast<std::uint32_t>(std::max(std::floor(centre - reach), 0.0));
        const auto end = std::min(static_cast<std::uint32_t>(std::ceil(centre + reach)), source);
        weights.clear();
        double sum = 0;
        for (std::uint32_t at = first; at < end; ++at) {
            weights.push_back(lanczos((at + 0.5 - centre) / stretch));
            sum += weights.back();
        }
        m_ranges.push_back({first, end - first, m_weights.size()});
        for (const double weight : weights)
            m_weights.push_back(static_cast<float>(weight / sum));
        m_longest = std::max(m_longest, end - first);
    }
}

LinearPixel weighted(const Kernel::Span& span, const LinearPixel* source) {
    LinearPixel sum{};
    for (std::uint32_t i = 0; i < span.count; ++i) {
        const LinearPixel& pixel = source[span.first + i];
        for (std::size_t channel = 0; channel < sum.size(); ++channel)
            sum[channel] += span.weights[i] * pixel[channel];
    }
    return sum;
}

/// Resamples across first. Of the rows made so only those are kept that are still needed.
class Resampler {
public:
    Resampler(const Image& image, std::uint32_t width, std::uint32_t height)
        : m_image(image),
          m_across(image.width, width),
          m_down(image.height, height),
          m_width(width),
          m_source(image.width),
          m_sum(width),
          m_rows(std::size_t{m_down.longest()} * width) {}

    /// Called for each row in order.
    void resample(std::uint32_t y, std::uint32_t* target) {
        const Kernel::Span span = m_down.at(y);
        while (m_made < span.first + span.count)
            makeRow(m_made++);
        std::fill(m_sum.begin(), m_sum.end(), LinearPixel{});
        for (std::uint32_t i = 0; i < span.count; ++i)
            addRow(span.first + i, span.weights[i]);
        std::transform(m_sum.begin(), m_sum.end(), target,
                       [this](const LinearPixel& pixel) { return pixelOf(m_curve, pixel); });
    }

private:
    [[nodiscard]] LinearPixel* rowAt(std::uint32_t y) {
        return m_rows.data() + std::size_t{y % m_down.longest()} * m_width;
    }
    void makeRow(std::uint32_t y) {
        const std::uint32_t* pixels = m_image.row(y);
        std::transform(pixels, pixels + m_image.width, m_source.begin(),
                       [this](std::uint32_t pixel) { return linearPixel(m_curve, pixel); });
        LinearPixel* row = rowAt(y);
        for (std::uint32_t x = 0; x < m_width; ++x)
            row[x] = weighted(m_across.at(x), m_source.data());
    }
    void addRow(std::uint32_t y, float weight) {
        const LinearPixel* row = rowAt(y);
        for (std::uint32_t x = 0; x < m_width; ++x) {
            for (std::size_t channel = 0; channel < m_sum[x].size(); ++channel)
                m_sum[x][channel] += weight * row[x][channel];
        }
    }

    const Image& m_image;
    const TransferCurve m_curve;
    const Kernel m_across;
    const Kernel m_down;
    const std::uint32_t m_width;
    std::vector<LinearPixel> m_source;
    std::vector<LinearPixel> m_sum;
    std::vector<LinearPixel> m_rows;  ///< a ring
    std::uint32_t m_made = 0;
};

/// `of * part / whole`, rounded, at least 1.
std::uint32_t share(std::uint32_t of, std::uint32_t part, std::uint32_t whole) {
    const std::uint64_t product = std::uint64_t{of} * part;
    return static_cast<std::uint32_t>(std::max<std::uint64_t>((product + whole / 2) / whole, 1));
}

}  // namespace

std::optional<Image> imageScaledToFit(const Image& image, std::uint32_t width,
                                      std::uint32_t height) {
    if (!image.bytes || image.width == 0 || image.height == 0 || width == 0 || height == 0)
        return std::nullopt;
    if (std::uint64_t{width} * image.height <= std::uint64_t{height} * image.width)
        height = share(image.height, width, image.width);
    else
        width = share(image.width, height, image.height);
    if (width == image.width && height == image.height)
        return image;
    if (std::uint64_t{width} * height > ImageCodec::mostPixels)
        return std::nullopt;

    const auto pixels = std::make_shared<std::uint32_t[]>(std::size_t{width} * height);
    Resampler resampler(image, width, height);
    for (std::uint32_t y = 0; y < height; ++y)
        resampler.resample(y, pixels.get() + std::size_t{y} * width);
    return Image{width,
                 height,
                 std::size_t{width} * sizeof(std::uint32_t),
                 {pixels, reinterpret_cast<const std::uint8_t*>(pixels.get())}};
}

}  // namespace parvel
