// Caches inside colour-space objects that many threads may fill at once. Whoever comes first computes; everybody else
// would compute the same, and no reader sees a value that is still being written.
#pragma once

#include <atomic>
#include <mutex>

#include "frame/FpModeGuard.h"
#include "vexel/color_space.h"

namespace vexel {

// Guards the filling (and copying) of all caches. It is never held while a value is computed.
std::mutex& LazyCacheMutex() noexcept;

// Writes those of `count` floats that differ from `values` in their bits, the first one last. Once the values stand,
// calls only read, so that plain reads by the caller afterwards race with nobody.
void WriteOnce(float* target, const float* values, int count) noexcept;

// The matrix behind a flag, computed on first use.
template <class Compute>
const VX::CSMatrix& CachedMatrix(VX::CSMatrix& matrix, bool& valid, const Compute& compute) {
  const std::atomic_ref<bool> flag(valid);
  if (!flag.load(std::memory_order_acquire)) {
    const DefaultFpMode mode;
    const VX::CSMatrix value = compute();
    const std::lock_guard<std::mutex> lock(LazyCacheMutex());
    if (!flag.load(std::memory_order_relaxed)) {
      matrix = value;
      flag.store(true, std::memory_order_release);
    }
  }
  return matrix;
}

// Three coefficients of which the first is 0 until they are computed.
template <class Compute>
const float* CachedCoeffs(float* coeffs, const Compute& compute) {
  if (std::atomic_ref<float>(coeffs[0]).load(std::memory_order_acquire) == 0.0f) {
    float values[3];
    compute(values);
    WriteOnce(coeffs, values, 3);
  }
  return coeffs;
}

}  // namespace vexel
