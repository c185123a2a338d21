// Kernel variants: which instruction set a call's kernels use.
#pragma once

#include <atomic>
#include <cstdint>

namespace vexel {

// Least capable first. Highway has no SSE2 or AVX target: the has-SSE2 switch is served by the SSSE3 kernels (plain
// code on a processor without SSSE3) and the has-AVX switch by the SSE4.1 ones. AVX-512 counts as part of the AVX2
// switch.
enum class KernelVariant : uint8_t { Plain, Ssse3, Sse41, Avx2, Avx512 };
inline constexpr int kKernelVariantCount = 5;

namespace detail {

extern __attribute__((visibility("hidden"))) std::atomic<KernelVariant> gActiveVariant;

}  // namespace detail

// The best variant that the processor has and the feature switches allow. Read once per API call, then passed down.
inline KernelVariant ActiveKernelVariant() noexcept { return detail::gActiveVariant.load(std::memory_order_relaxed); }

// The best variant that the processor can run, whatever the switches say.
KernelVariant ProcessorVariant() noexcept;

// "plain", "ssse3", "sse4.1", "avx2", "avx512".
const char* KernelVariantName(KernelVariant variant) noexcept;

// For tests and benchmarks: no call uses more than this variant from now on (Avx512 lifts the limit).
void LimitKernelVariant(KernelVariant most) noexcept;

// One function in all its variants. A variant that was not compiled in falls back to the next lower one.
template <class Function>
class KernelVariants {
 public:
  constexpr KernelVariants(Function plain, Function ssse3, Function sse41, Function avx2, Function avx512)
      : mFunctions{plain, ssse3, sse41, avx2, avx512} {
    for (int i = 1; i < kKernelVariantCount; ++i)
      if (!mFunctions[i]) mFunctions[i] = mFunctions[i - 1];
  }
  constexpr Function operator[](KernelVariant variant) const { return mFunctions[static_cast<int>(variant)]; }

 private:
  Function mFunctions[kKernelVariantCount];
};

}  // namespace vexel
