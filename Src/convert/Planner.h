// Chooses the chain of steps between two raster formats.
#pragma once

#include <array>
#include <cstdint>

#include "convert/StepGraph.h"

namespace vexel {

inline constexpr int kMaxSteps = 8;

struct PlannedStep {
  const RowKernelSet* kernel;
  StepSpan span;
  VX_PixelFormat to;
};

struct Plan {
  int stepCount = 0;
  std::array<PlannedStep, kMaxSteps> steps{};
};

// Fills `plan` for raster formats. VX_ErrUnsupportedFormat for a special source, VX_ErrUnsupportedDestinationFormat for
// a special destination, VX_ErrFailed when no chain of at most eight steps leads from one to the other.
//
// Among the walks through the step graph the plan is, in this order: the one that never passes through less than both
// ends hold (depth, alpha, chroma resolution); with an end above 8 bits, the one with the fewest roundings; the
// shortest; between 8-bit ends, the one that stays in 8 bits, then the one with the fewest roundings; the cheapest. A
// few chains are fixed. Plans are found once and remembered: a few microseconds at first use of a pair, a table look-up
// later. Thread-safe, allocates nothing.
//
// Render quality above 1 interpolates chroma where 32f 4:2:2 becomes 4:4:4:4; the walk does not depend on it.
VX_Result MakePlan(VX_PixelFormat src, VX_PixelFormat dst, int32_t renderQuality, Plan* plan) noexcept;

// A kernel that gives the bytes of a whole planned chain in one pass over the row, for chains that are asked for often;
// null where there is none. It sees whole rows.
const RowKernelSet* FusedKernelFor(VX_PixelFormat src, VX_PixelFormat dst) noexcept;

// The kernel that copies pixels of a format; null for formats that are no rasters of pixels, pairs or groups.
const RowKernelSet* CopyKernelFor(VX_PixelFormat format) noexcept;

}  // namespace vexel
