#include "frame/KernelVariant.h"

#include <algorithm>
#include <atomic>

#include "frame/Features.h"

namespace vexel {
namespace {

// The tests' limit.
constinit std::atomic<KernelVariant> gMost{KernelVariant::Avx512};

KernelVariant AllowedBySwitches() noexcept {
  if (gSwitches.avx2) return gSwitches.noAvx512 ? KernelVariant::Avx2 : KernelVariant::Avx512;
  if (gSwitches.avx || gSwitches.sse41) return KernelVariant::Sse41;
  if (gSwitches.sse2) return KernelVariant::Ssse3;
  return KernelVariant::Plain;
}

}  // namespace

KernelVariant ProcessorVariant() noexcept {
  static const KernelVariant variant = DetectVariant(platform::kProcessor);
  return variant;
}

KernelVariant ActiveKernelVariant() noexcept {
  return std::min({ProcessorVariant(), AllowedBySwitches(), gMost.load(std::memory_order_relaxed)});
}

const char* KernelVariantName(KernelVariant variant) noexcept {
  constexpr const char* kNames[kKernelVariantCount] = {"plain", "ssse3", "sse4.1", "avx2", "avx512"};
  return kNames[static_cast<int>(variant)];
}

void LimitKernelVariant(KernelVariant most) noexcept { gMost.store(most, std::memory_order_relaxed); }

}  // namespace vexel
