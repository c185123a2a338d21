// Sets the floating-point mode of the entry points that do float work and puts the caller's back.
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

}  // namespace vexel
