#include "frame/KernelVariant.h"

#include <algorithm>
#include <mutex>

#include "frame/Features.h"

namespace vexel {
namespace {

std::mutex gMutex;
constinit KernelVariant gMost = KernelVariant::Avx512;  // the tests' limit

KernelVariant AllowedBySwitches() noexcept {
  if (gSwitches.avx2) return gSwitches.noAvx512 ? KernelVariant::Avx2 : KernelVariant::Avx512;
  if (gSwitches.avx || gSwitches.sse41) return KernelVariant::Sse41;
  if (gSwitches.sse2) return KernelVariant::Ssse3;
  return KernelVariant::Plain;
}

void Choose() noexcept { detail::gActiveVariant = std::min({ProcessorVariant(), AllowedBySwitches(), gMost}); }

}  // namespace

namespace detail {

constinit std::atomic<KernelVariant> gActiveVariant{KernelVariant::Plain};

}  // namespace detail

KernelVariant ProcessorVariant() noexcept {
  static const KernelVariant variant = DetectVariant(platform::kProcessor);
  return variant;
}

// Locked, so that of two changes at once the choice made last has seen both.
void ChooseKernelVariant() noexcept {
  const std::lock_guard lock(gMutex);
  Choose();
}

void LimitKernelVariant(KernelVariant most) noexcept {
  const std::lock_guard lock(gMutex);
  gMost = most;
  Choose();
}

const char* KernelVariantName(KernelVariant variant) noexcept {
  constexpr const char* kNames[kKernelVariantCount] = {"plain", "ssse3", "sse4.1", "avx2", "avx512"};
  return kNames[static_cast<int>(variant)];
}

}  // namespace vexel
