// Image primitives with status codes: constant fills, one channel of four, multiplication by constants.
//
// Images are rows of whole pixels; row r starts at base + r * rowBytes, and rowBytes may be negative. Width and height
// count pixels and must be positive, |rowBytes| must hold a row unless there is only one. On an error nothing is
// written. Large images are spread over the host's processors and written past the cache. Any thread may call.
#pragma once

#include <cstddef>
#include <cstdint>

namespace vexel::primitives {

// 0 is done, negative an error, positive a warning.
enum class Status : int32_t {
  Ok = 0,
  NullPointer = -1,
  Size = -2,
  Step = -3,
  Channel = -4,
  PlainCode = 1,  // only from Initialise: there are no vector instructions, or they are switched off
};
const char* StatusText(Status status) noexcept;

enum class Domain { Channels, Fills, Arithmetic };
// Chooses a family's code for the processor; to be called when the feature switches stand.
Status Initialise(Domain domain) noexcept;

// Sets every pixel of one-channel and of four-channel images.
Status Fill(uint8_t value, uint8_t* dst, ptrdiff_t rowBytes, int width, int height) noexcept;
Status Fill(uint16_t value, uint16_t* dst, ptrdiff_t rowBytes, int width, int height) noexcept;
Status Fill(float value, float* dst, ptrdiff_t rowBytes, int width, int height) noexcept;
Status Fill4(const uint8_t (&pixel)[4], uint8_t* dst, ptrdiff_t rowBytes, int width, int height) noexcept;
Status Fill4(const uint16_t (&pixel)[4], uint16_t* dst, ptrdiff_t rowBytes, int width, int height) noexcept;
Status Fill4(const float (&pixel)[4], float* dst, ptrdiff_t rowBytes, int width, int height) noexcept;

// Sets channel 0 to 3 of every four-channel pixel; the other three keep their values.
Status SetChannel(int channel, uint8_t value, uint8_t* dst, ptrdiff_t rowBytes, int width, int height) noexcept;
Status SetChannel(int channel, uint16_t value, uint16_t* dst, ptrdiff_t rowBytes, int width, int height) noexcept;
Status SetChannel(int channel, float value, float* dst, ptrdiff_t rowBytes, int width, int height) noexcept;

// dst = min(255, src * constants[channel] * 2^-scaleFactor), rounded to nearest, ties to even; any scale factor.
// dst may be src itself, with the same row bytes; otherwise the images must not overlap.
Status MultiplyByConstants4(const uint8_t* src, ptrdiff_t srcRowBytes, const uint8_t (&constants)[4], uint8_t* dst,
                            ptrdiff_t dstRowBytes, int width, int height, int scaleFactor) noexcept;

}  // namespace vexel::primitives
