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

using Vector = hn::Vec<hn::ScalableTag<float>>;

// What the loops work on.
struct Block {
  static constexpr size_t kCount = 3 * hn::MaxLanes(hn::ScalableTag<float>());
  HWY_ALIGN float values[kCount];
  HWY_ALIGN float scratch[2 * kCount];
};

// Single vectors, with the core known or not, and loops by turns.
template <PowerCore kCore>
void PowersOf(const float* src, float* dst, size_t count, const PowerExponent& y) {
  const hn::ScalableTag<float> d;
  const size_t n = hn::Lanes(d);
  Block block;
  for (size_t i = 0; i < count; i += 3 * n) {
    if (i / (3 * n) % 2 != 0) {
      std::memcpy(block.values, src + i, sizeof block.values);
      power::Powers<kCore>(
          block.values, 3 * n, block.scratch, y, [](Vector v) VX_POWER_STEP { return v; },
          [](Vector power, Vector) VX_POWER_STEP { return power; });
      std::memcpy(dst + i, block.values, sizeof block.values);
    } else {
      hn::StoreU(power::Power<kCore>(hn::LoadU(d, src + i), y), d, dst + i);
      hn::StoreU(power::PowerAny(hn::LoadU(d, src + i + n), y), d, dst + i + n);
      hn::StoreU(power::Power<kCore>(hn::LoadU(d, src + i + 2 * n), y), d, dst + i + 2 * n);
    }
  }
}

void Powers(const float* src, float* dst, size_t count, const PowerExponent& y) {
  if (y.core == PowerCore::Float) return PowersOf<PowerCore::Float>(src, dst, count, y);
  if (y.core == PowerCore::Long) return PowersOf<PowerCore::Long>(src, dst, count, y);
  return PowersOf<PowerCore::Scalar>(src, dst, count, y);
}

// Three vectors at once, loops that have not met a minus sign yet and loops that have, by turns.
template <PowerCore kCore>
void SignedPowersOf(const float* src, float* dst, size_t count, const PowerExponent& y) {
  const hn::ScalableTag<float> d;
  const size_t n = hn::Lanes(d);
  Block block;
  for (size_t i = 0, turn = 0; i < count; i += 3 * n, ++turn) {
    if (turn % 3 != 0) {
      bool negative = turn % 3 == 2;
      std::memcpy(block.values, src + i, sizeof block.values);
      power::SignedPowersAny(block.values, 3 * n, block.scratch, y, negative);
      std::memcpy(dst + i, block.values, sizeof block.values);
      continue;
    }
    auto a = hn::LoadU(d, src + i), b = hn::LoadU(d, src + i + n), c = hn::LoadU(d, src + i + 2 * n);
    power::SignedPower3<kCore>(a, b, c, y);
    hn::StoreU(a, d, dst + i);
    hn::StoreU(b, d, dst + i + n);
    hn::StoreU(c, d, dst + i + 2 * n);
  }
}

void SignedPowers(const float* src, float* dst, size_t count, const PowerExponent& y) {
  if (y.core == PowerCore::Float) return SignedPowersOf<PowerCore::Float>(src, dst, count, y);
  if (y.core == PowerCore::Long) return SignedPowersOf<PowerCore::Long>(src, dst, count, y);
  return SignedPowersOf<PowerCore::Scalar>(src, dst, count, y);
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
