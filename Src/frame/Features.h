// The processor's features and the switches that the host can turn.
#pragma once

#include <atomic>
#include <cstdint>

#include "frame/KernelVariant.h"
#include "frame/Platform.h"

namespace vexel {

// What start-up finds, one entry per feature switch.
struct Features {
  bool sse = false, sse2 = false, sse3 = false, ssse3 = false, sse41 = false, sse42 = false, avx = false, avx2 = false;
};

Features DetectFeatures(const Processor& processor);

// The most capable kernels that the processor can run at all, whatever the switches say: every instruction set that the
// compiler may use in them, and the operating system saving its registers.
KernelVariant DetectVariant(const Processor& processor);

// A byte that any thread may read while another one sets it.
class Switch {
 public:
  operator bool() const noexcept { return mOn.load(std::memory_order_relaxed) != 0; }
  void Set(bool on) noexcept { mOn.store(on, std::memory_order_relaxed); }

 private:
  std::atomic<uint8_t> mOn{0};
};

struct Switches {
  Switch motionPath, sse, sse2, sse3, ssse3, sse41, sse42, avx, avx2, forceTopLeft;
  // Out of reach of the debug flags: AVX-512 kernels belong to the AVX2 switch.
  Switch noAvx512;
};
extern Switches gSwitches;

// After any change of a switch: settles which kernels run from now on.
void ChooseKernelVariant() noexcept;

}  // namespace vexel
