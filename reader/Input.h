#pragma once

#include <cstdint>
#include <memory>
#include <span>

#include "reader/Channel.h"

namespace parvel::reader {

/// The bytes of a request's input, copied or mapped: none where they can't be had, or are too many
/// to be mapped. A mapped file that is shorter than was said, or is cut short, ends the process,
/// which is meant: it hurts nobody here.
class Input {
public:
    explicit Input(const Received& received);
    ~Input();
    Input(const Input&) = delete;
    Input& operator=(const Input&) = delete;

    /// How much of the address space an input of that size is mapped into.
    [[nodiscard]] static std::uint64_t mappedSize(std::uint64_t size) {
        return size > longestCopied && size <= longestMapped ? size : 0;
    }
    [[nodiscard]] std::span<const std::uint8_t> bytes() const { return m_bytes; }

private:
    void copy(const Received& received);
    void map(const Received& received);

    std::span<const std::uint8_t> m_bytes;
    std::unique_ptr<std::uint8_t[]> m_copy;
};

}  // namespace parvel::reader
