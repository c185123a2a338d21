#include "color/power_kernels.h"

#include <cmath>
#include <cstdint>
#include <cstring>

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "color/power_kernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "frame/Power-inl.h"

HWY_BEFORE_NAMESPACE();
namespace vexel::testing {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;
namespace power = vexel::HWY_NAMESPACE;

// Single vectors, then three at once, then with the core found at run time.
template <PowerCore kCore>
void PowersOf(const float* src, float* dst, size_t count, const PowerExponent& y) {
  const hn::ScalableTag<float> d;
  const size_t n = hn::Lanes(d);
  for (size_t i = 0; i < count; i += 3 * n) {
    auto a = hn::LoadU(d, src + i), b = hn::LoadU(d, src + i + n), c = hn::LoadU(d, src + i + 2 * n);
    if (i / (3 * n) % 2 != 0) {
      power::Power3<kCore>(a, b, c, y);
    } else {
      a = power::Power<kCore>(a, y);
      b = power::PowerAny(b, y);
      c = power::Power<kCore>(c, y);
    }
    hn::StoreU(a, d, dst + i);
    hn::StoreU(b, d, dst + i + n);
    hn::StoreU(c, d, dst + i + 2 * n);
  }
}

void Powers(const float* src, float* dst, size_t count, const PowerExponent& y) {
  if (y.core == PowerCore::Float) return PowersOf<PowerCore::Float>(src, dst, count, y);
  if (y.core == PowerCore::Long) return PowersOf<PowerCore::Long>(src, dst, count, y);
  return PowersOf<PowerCore::Scalar>(src, dst, count, y);
}

void SignedPowers(const float* src, float* dst, size_t count, const PowerExponent& y) {
  const hn::ScalableTag<float> d;
  const size_t n = hn::Lanes(d);
  for (size_t i = 0; i < count; i += 3 * n) {
    auto a = hn::LoadU(d, src + i), b = hn::LoadU(d, src + i + n), c = hn::LoadU(d, src + i + 2 * n);
    power::SignedPower3Any(a, b, c, y);
    hn::StoreU(a, d, dst + i);
    hn::StoreU(b, d, dst + i + n);
    hn::StoreU(c, d, dst + i + 2 * n);
  }
}

#define VX_TEST_FUNCTION(name, function)                                                                             \
  void name(const float* src, float* dst, size_t count) {                                                            \
    const hn::ScalableTag<float> d;                                                                                  \
    for (size_t i = 0; i < count; i += hn::Lanes(d)) hn::StoreU(power::function(hn::LoadU(d, src + i)), d, dst + i); \
  }
VX_TEST_FUNCTION(Logs, Log)
VX_TEST_FUNCTION(Log10s, Log10)
VX_TEST_FUNCTION(Exps, Exp)
VX_TEST_FUNCTION(Exp10s, Exp10)
#undef VX_TEST_FUNCTION

}  // namespace HWY_NAMESPACE
}  // namespace vexel::testing
HWY_AFTER_NAMESPACE();

#if HWY_ONCE

#include "frame/KernelTable.h"

namespace vexel::testing {
namespace plain {

void Powers(const float* src, float* dst, size_t count, const PowerExponent& y) {
  for (size_t i = 0; i < count; ++i) dst[i] = Power(src[i], y);
}
void SignedPowers(const float* src, float* dst, size_t count, const PowerExponent& y) {
  for (size_t i = 0; i < count; ++i) dst[i] = SignedPower(src[i], y);
}
template <float (*kFunction)(float)>
void Map(const float* src, float* dst, size_t count) {
  for (size_t i = 0; i < count; ++i) dst[i] = kFunction(src[i]);
}
constexpr auto& Logs = Map<Log>;
constexpr auto& Log10s = Map<Log10>;
constexpr auto& Exps = Map<Exp>;
constexpr auto& Exp10s = Map<Exp10>;

}  // namespace plain

const KernelVariants<PowerArray> kPowers = VX_KERNEL_VARIANTS(Powers);
const KernelVariants<PowerArray> kSignedPowers = VX_KERNEL_VARIANTS(SignedPowers);
const KernelVariants<FunctionArray> kLogs = VX_KERNEL_VARIANTS(Logs);
const KernelVariants<FunctionArray> kLog10s = VX_KERNEL_VARIANTS(Log10s);
const KernelVariants<FunctionArray> kExps = VX_KERNEL_VARIANTS(Exps);
const KernelVariants<FunctionArray> kExp10s = VX_KERNEL_VARIANTS(Exp10s);

}  // namespace vexel::testing

#endif  // HWY_ONCE
