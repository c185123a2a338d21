// The comparison of a row kernel's variants with its plain definition, and runs over typed rows.
#pragma once

#include <cstddef>
#include <cstdint>
#include <iterator>
#include <limits>
#include <vector>

#include <gtest/gtest.h>

#include "convert/RowKernel.h"
#include "frame/FpModeGuard.h"
#include "support/Arena.h"
#include "support/Random.h"

namespace vexel::testing {

// Mostly values of pictures, some far out of range, and everything that is special about floats.
inline float AnyFloat(Random& random) {
  using Limits = std::numeric_limits<float>;
  static constexpr float kSpecial[] = {0.0f,
                                       -0.0f,
                                       1.0f,
                                       0.5f,
                                       -0.5f,
                                       Limits::infinity(),
                                       -Limits::infinity(),
                                       Limits::quiet_NaN(),
                                       Limits::max(),
                                       Limits::lowest(),
                                       Limits::min(),
                                       Limits::denorm_min(),
                                       8421504.0f,
                                       8421505.5f,
                                       9803371.0f,
                                       -1e9f};
  if (random.OneIn(24)) return kSpecial[random.Int(0, std::size(kSpecial) - 1)];
  return random.OneIn(12) ? random.Float(-1e8f, 1e8f) : random.Float(-0.75f, 1.5f);
}

// Formats that stand for row layouts: pixels of four channels, 4:2:2 pairs, V210 groups.
inline constexpr VX_PixelFormat kPixels8 = VX_PixelFormat::VUYA_4444_8u, kPixels32f = VX_PixelFormat::VUYA_4444_32f,
                                kPairs8 = VX_PixelFormat::UYVY_422_8u, kPairs32f = VX_PixelFormat::UYVY_422_32f,
                                kGroups10 = VX_PixelFormat::V210_422_10u;

struct KernelCase {
  const char* name;
  const RowKernelSet* kernels;
  VX_PixelFormat source, destination;
};

// The active variant gives the plain kernel's bytes for rows of 1 to `most` pixels, and of `longer` ones, without a
// step outside of the rows. No pixels at all touch no memory.
inline void ExpectVariantsAgree(const KernelCase& kernelCase, int most, const std::vector<int>& longer = {}) {
  (*kernelCase.kernels)[ActiveKernelVariant()](nullptr, nullptr, 0);
  ArenaCase arenaCase;
  arenaCase.name = kernelCase.name;
  arenaCase.sources = {kernelCase.source};
  arenaCase.destination = kernelCase.destination;
  arenaCase.run = RunRows(*kernelCase.kernels);
  arenaCase.widths = Range(1, most);
  arenaCase.widths.insert(arenaCase.widths.end(), longer.begin(), longer.end());
  arenaCase.everyContents = true;
  EXPECT_TRUE(RunArena(arenaCase)) << kernelCase.name;
}

// Runs the active variant over typed rows.
template <class To, class From>
std::vector<To> RunKernel(const RowKernelSet& kernels, const std::vector<From>& source, size_t count,
                          size_t destinationSize) {
  std::vector<To> destination(destinationSize);
  const FpModeGuard guard;
  kernels[ActiveKernelVariant()](reinterpret_cast<const uint8_t*>(source.data()),
                                 reinterpret_cast<uint8_t*>(destination.data()), count);
  return destination;
}

}  // namespace vexel::testing
