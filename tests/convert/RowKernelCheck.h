// Runs of row kernels over typed rows. Variants, tails and memory are for ConvertArena.
#pragma once

#include "convert/RowKernel.h"
#include "frame/FpModeGuard.h"
#include "support/Arena.h"
#include "support/Test.h"

namespace vexel::testing {

// Runs a variant over typed rows.
template <class To, class From>
std::vector<To> RunKernel(const RowKernelSet& kernels, const std::vector<From>& source, size_t count,
                          size_t destinationSize, KernelVariant variant = ActiveKernelVariant()) {
  std::vector<To> destination(destinationSize);
  const FpModeGuard guard;
  kernels[variant](reinterpret_cast<const uint8_t*>(source.data()), reinterpret_cast<uint8_t*>(destination.data()),
                   count);
  return destination;
}

}  // namespace vexel::testing
