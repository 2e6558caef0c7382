#include "parvel/platform/ImageCodec.h"

#include <sys/mman.h>
#include <unistd.h>

#include <algorithm>
#include <utility>

#include "parvel/platform/linux/HelperPool.h"
#include "parvel/platform/linux/PNGFile.h"
#include "parvel/platform/linux/SystemCall.h"

namespace parvel {

namespace {

using host::FileDescriptor;

bool writeRange(int descriptor, Data::Bytes range) {
    while (!range.empty()) {
        const ssize_t count =
            host::retried([&] { return ::write(descriptor, range.data(), range.size()); });
        if (count <= 0)
            return false;
        range = range.subspan(static_cast<std::size_t>(count));
    }
    return true;
}

/// The bytes in a file of memory, to be handed to the helper; not open when that fails.
FileDescriptor memoryFileOf(const Data& bytes) {
    FileDescriptor file(::memfd_create("parvel-image", MFD_CLOEXEC));
    if (!file)
        return file;
    const std::vector<Data::Bytes> ranges = bytes.ranges();
    const bool isWritten = std::all_of(ranges.begin(), ranges.end(), [&](Data::Bytes range) {
        return writeRange(file.get(), range);
    });
    return isWritten ? std::move(file) : FileDescriptor();
}

bool isWithinLimits(const Image& image) {
    return std::max(image.width, image.height) <= ImageCodec::longestSide &&
           std::uint64_t{image.width} * image.height <= ImageCodec::mostPixels;
}

/// Decodes in the helper. PNG files are written here: pixels can do no harm.
class HelperImageCodec final : public ImageCodec {
public:
    std::optional<Image> decode(const Data& bytes) override {
        const FileDescriptor file = bytes.empty() ? FileDescriptor() : memoryFileOf(bytes);
        if (!file)
            return std::nullopt;
        host::HelperMeans means;
        means.inputBytes = std::max(means.inputBytes, std::uint64_t{bytes.size()});
        reader::Request request;
        request.ask = reader::Ask::DecodeImage;
        request.size = bytes.size();

        host::HelperLease lease(means);
        host::HelperAnswer answer;
        if (!lease.ask(request, file.get(), answer) ||
            answer.reply.outcome == reader::Outcome::Refused)
            return std::nullopt;
        std::optional<Image> image = host::imageOf(answer);
        if (image && isWithinLimits(*image))
            return image;
        lease.end();
        return std::nullopt;
    }

    std::optional<Data> encodePNG(const Image& image) override { return pngFileOfImage(image); }
};

}  // namespace

ImageCodec& ImageCodec::host() {
    static HelperImageCodec codec;
    return codec;
}

}  // namespace parvel
