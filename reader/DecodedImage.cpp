#include "reader/DecodedImage.h"

#include <optional>

#include "reader/Input.h"
#include "reader/MemoryFile.h"
#include "reader/images/ImageDecoder.h"

namespace parvel::reader {

Answer decodedImage(const Received& received) {
    const Input input(received);
    Answer answer;
    Reply& reply = answer.reply;
    std::optional<MemoryFile> pixels;
    const Canvas canvas = [&](std::uint32_t width, std::uint32_t height) -> std::uint32_t* {
        reply.width = width;
        reply.height = height;
        reply.stride = width * static_cast<std::uint32_t>(sizeof(std::uint32_t));
        reply.size = std::uint64_t{reply.stride} * height;
        pixels.emplace(reply.size);
        return reinterpret_cast<std::uint32_t*>(pixels->bytes().data());
    };
    if (!decodeImage(input.bytes(), canvas))
        return refusal();
    answer.file = pixels->seal();
    if (!answer.file)
        return refusal();
    reply.outcome = Outcome::Done;
    return answer;
}

}  // namespace parvel::reader
