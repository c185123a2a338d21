// What the plain definitions of the four-channel kernels share: the walk over a row, opaque alpha per depth, and the
// processor's float conversion.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <utility>
#include <xmmintrin.h>

namespace vexel {

// What a kernel does with the alpha channel besides its work on the pixel.
enum class AlphaWrite : uint8_t { Keep, OpaqueLast, OpaqueFirst };

// Full scale of a channel of type T, which is also opaque alpha. 15u reaches 32768 in 16-bit words.
template <class T>
inline constexpr T kFullScale = T{1};
template <>
inline constexpr uint8_t kFullScale<uint8_t> = 255;
template <>
inline constexpr uint16_t kFullScale<uint16_t> = 32768;

inline constexpr float k8uTo32f = 0.003921569f;  // float(1 / 255.)
inline constexpr float k15uTo32f = 1.0f / 32768;

// Index of the channel that holds alpha.
inline constexpr size_t AlphaIndex(AlphaWrite alpha) { return alpha == AlphaWrite::OpaqueFirst ? 0 : 3; }

namespace plain {

// Calls channel(0) to channel(kChannels - 1), unrolled.
template <size_t kChannels = 4, class Channel>
inline void ForChannels(const Channel& channel) {
  [&]<size_t... k>(std::index_sequence<k...>) { (channel(k), ...); }
  (std::make_index_sequence<kChannels>());
}

// Calls pixel(in, out) for each pixel of a row, with its channels of type From and To. Rows need no alignment.
template <class From, class To, size_t kFromChannels = 4, size_t kToChannels = 4, class Pixel>
inline void MapPixels(const uint8_t* src, uint8_t* dst, size_t count, const Pixel& pixel) {
  for (size_t i = 0; i < count; ++i) {
    From in[kFromChannels];
    To out[kToChannels];
    std::memcpy(in, src + i * sizeof in, sizeof in);
    pixel(in, out);
    ForChannels<kToChannels>(
        [&](size_t k) { std::memcpy(dst + i * sizeof out + k * sizeof(To), out + k, sizeof(To)); });
  }
}

// The same, channel by channel, then with the alpha channel written opaque if asked for.
template <class From, class To, AlphaWrite kAlpha, class Channel>
inline void MapChannels(const uint8_t* src, uint8_t* dst, size_t count, const Channel& channel) {
  MapPixels<From, To>(src, dst, count, [&](const From* in, To* out) {
    ForChannels([&](size_t k) { out[k] = channel(in[k]); });
    if constexpr (kAlpha != AlphaWrite::Keep) out[AlphaIndex(kAlpha)] = kFullScale<To>;
  });
}

// Round as the processor is set to (to nearest even unless the host changed it); NaN and what int32 cannot hold give
// INT32_MIN, so narrowing saturates them to 0.
inline int32_t ConvertNearest(float value) { return _mm_cvtss_si32(_mm_set_ss(value)); }

inline int32_t Clamp(int32_t value, int32_t least, int32_t most) {
  return value < least ? least : value > most ? most : value;
}

}  // namespace plain
}  // namespace vexel
