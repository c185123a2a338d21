// The step graph: every direct conversion between two raster formats, as data.
#pragma once

#include <cstdint>
#include <span>

#include "convert/RowKernel.h"
#include "vexel/vexel.h"

namespace vexel {

// How much of a row a kernel must see at once.
enum class StepSpan : uint8_t {
  Point,  // any run of pixels that starts at a multiple of kBlockMultiple
  Row     // the whole row: it looks at neighbouring pixels
};
inline constexpr int kBlockMultiple = 6;  // whole 4:2:2 pairs and V210 groups

// Whether a kernel quantises what it computes. Moves, widenings and float arithmetic are exact.
enum class StepLoss : uint8_t { Exact, Rounds };

struct Step {
  VX_PixelFormat from, to;
  const RowKernelSet* kernel;
  StepSpan span;
  StepLoss loss;
};

// All steps, those with the same source next to each other.
std::span<const Step> AllSteps() noexcept;

}  // namespace vexel
