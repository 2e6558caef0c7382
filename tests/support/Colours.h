#pragma once

#include <cstdint>

namespace parvel::testing {

// Opaque pixels, ARGB in native byte order.
inline constexpr std::uint32_t white = 0xFFFFFFFF;
inline constexpr std::uint32_t red = 0xFFFF0000;
inline constexpr std::uint32_t green = 0xFF00FF00;
inline constexpr std::uint32_t blue = 0xFF0000FF;

}  // namespace parvel::testing
