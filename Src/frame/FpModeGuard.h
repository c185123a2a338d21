// Floating-point modes for a while: that of the entry points that do float work, and the default for what is kept.
#pragma once

#include <cstdint>
#include <xmmintrin.h>

#include "frame/SeededBug.h"

namespace vexel {

// ORs flush-to-zero (bit 15) and the precision-exception mask (bit 5) into MXCSR. The saved word comes back unchanged,
// so exceptions raised inside leave no flag behind.
class FpModeGuard {
 public:
  FpModeGuard() noexcept : mSaved(_mm_getcsr()) { _mm_setcsr(mSaved | kMode); }
  ~FpModeGuard() {
    if (!Has(SeededBug::FpModeLeak)) _mm_setcsr(mSaved);
  }
  FpModeGuard(const FpModeGuard&) = delete;
  FpModeGuard& operator=(const FpModeGuard&) = delete;

 private:
  static constexpr uint32_t kMode = 0x8020;
  uint32_t mSaved;
};

// Rounds to nearest, if `wanted`, whatever the caller does: for kernels of integers, whose codes could run over if
// sums were rounded upward. Compilers know nothing of it and may move arithmetic of the same function across.
class NearestRounding {
 public:
  explicit NearestRounding(bool wanted) noexcept : mChanged(wanted ? _mm_getcsr() & kRounding : 0) {
    if (mChanged) _mm_setcsr(_mm_getcsr() ^ mChanged);
  }
  ~NearestRounding() {
    if (mChanged) _mm_setcsr(_mm_getcsr() | mChanged);
  }
  NearestRounding(const NearestRounding&) = delete;
  NearestRounding& operator=(const NearestRounding&) = delete;

 private:
  static constexpr uint32_t kRounding = 0x6000;
  uint32_t mChanged;
};

// What is computed on first use and kept must not depend on the rounding mode of whoever comes first.
class DefaultFpMode {
 public:
  DefaultFpMode() noexcept : mSaved(_mm_getcsr()) { _mm_setcsr(0x1F80); }
  ~DefaultFpMode() { _mm_setcsr(mSaved); }
  DefaultFpMode(const DefaultFpMode&) = delete;
  DefaultFpMode& operator=(const DefaultFpMode&) = delete;

 private:
  uint32_t mSaved;
};

}  // namespace vexel
