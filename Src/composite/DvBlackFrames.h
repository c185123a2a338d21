// Compressed black frames of DV at 25 Mbit/s (IEC 61834-2, SMPTE 314M): 720 x 480 4:1:1 and 720 x 576 4:2:0.
#pragma once

#include <cstdint>

namespace vexel {

enum class DvSystem : uint8_t { Lines525, Lines625 };

// Writes the frame, 120,000 or 144,000 bytes: luma 16, chroma 128, two channels of silence at 48 kHz. Always the same
// bytes.
void WriteDvBlackFrame(DvSystem system, uint8_t* frame) noexcept;

}  // namespace vexel
