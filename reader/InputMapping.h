#pragma once

#include <cstdint>
#include <span>

#include "reader/Channel.h"

namespace parvel::reader {

/// The bytes of a request's input: none where it can't be mapped or is longer than any document may
/// be. A file that is shorter than was said, or is cut short, ends the process, which is meant: it
/// hurts nobody here.
class InputMapping {
public:
    explicit InputMapping(const Received& received);
    ~InputMapping();
    InputMapping(const InputMapping&) = delete;
    InputMapping& operator=(const InputMapping&) = delete;

    [[nodiscard]] std::span<const std::uint8_t> bytes() const { return m_bytes; }

private:
    std::span<std::uint8_t> m_bytes;
};

}  // namespace parvel::reader
