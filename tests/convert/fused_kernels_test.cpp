// Moves of channels bit by bit, and kernels that do at once what others do one after the other: byte for byte the same.
#include "convert/RgbKernels.h"
#include "convert/RowKernelCheck.h"
#include "convert/YuvKernels.h"
#include "support/Test.h"

namespace vexel::testing {
namespace {

using Steps = std::vector<const RowKernelSet*>;

template <class T>
void ExpectMoves(const RowKernelSet& reverse, const RowKernelSet& opaqueLast, const RowKernelSet& opaqueFirst,
                 const std::vector<T>& p, T opaque) {
  const auto run = [&](const RowKernelSet& kernels) { return RunKernel<T>(kernels, p, 1, 4); };
  EXPECT_EQ(run(reverse), (std::vector{p[3], p[2], p[1], p[0]}));
  EXPECT_EQ(run(opaqueLast), (std::vector{p[0], p[1], p[2], opaque}));
  EXPECT_EQ(run(opaqueFirst), (std::vector{opaque, p[1], p[2], p[3]}));
}

TEST(FusedKernels, MovesAreExact) {
  ExpectMoves<uint8_t>(kReverse8u, kOpaqueLast8u, kOpaqueFirst8u, {1, 2, 3, 4}, 255);
  ExpectMoves<uint16_t>(kReverse15u, kOpaqueLast15u, kOpaqueFirst15u, {1, 2, 3, 65535}, 32768);
  // Floats as bits: denormals and NaNs move unchanged.
  ExpectMoves<uint32_t>(kReverse32f, kOpaqueLast32f, kOpaqueFirst32f, {1, 0xFFA00001, 0x7F800000, 0x80000000},
                        0x3F800000);
  const std::vector<uint32_t> pairs = {1, 2, 0xFFA00001, 4, 5, 6, 7, 0x80000000};
  EXPECT_EQ(RunKernel<uint32_t>(kSwap422_32f, pairs, 4, 8),
            (std::vector<uint32_t>{2, 1, 4, 0xFFA00001, 6, 5, 0x80000000, 7}));
  const std::vector<uint8_t> bytes = {1, 2, 3, 4, 5, 6, 7, 8};
  EXPECT_EQ(RunKernel<uint8_t>(kSwap422_8u, bytes, 4, 8), (std::vector<uint8_t>{2, 1, 4, 3, 6, 5, 8, 7}));
}

TEST(FusedKernels, EqualTheirPlainSteps) {
  constexpr F k8 = F::BGRA_4444_8u, k15 = F::BGRA_4444_15u, k32 = F::BGRA_4444_32f, kPairs8 = F::UYVY_422_8u,
              kPairs32 = F::UYVY_422_32f, kV210 = F::V210_422_10u;
  const struct {
    const RowKernelSet& fused;
    Steps steps;
    F from, to;
  } kernels[] = {
      {kBgrx8ToXrgb8, {&kOpaqueLast8u, &kReverse8u}, k8, k8},
      {kXrgb8ToBgrx8, {&kOpaqueFirst8u, &kReverse8u}, k8, k8},
      {kBgrx15ToXrgb15, {&kOpaqueLast15u, &kReverse15u}, k15, k15},
      {kXrgb15ToBgrx15, {&kOpaqueFirst15u, &kReverse15u}, k15, k15},
      {kBgrx32fToXrgb32f, {&kOpaqueLast32f, &kReverse32f}, k32, k32},
      {kXrgb32fToBgrx32f, {&kOpaqueFirst32f, &kReverse32f}, k32, k32},
      {kWiden8uTo32fOpaqueLast, {&kWiden8uTo32f, &kOpaqueLast32f}, k8, k32},
      {kWiden8uTo32fOpaqueFirst, {&kWiden8uTo32f, &kOpaqueFirst32f}, k8, k32},
      {kWiden15uTo32fOpaqueLast, {&kWiden15uTo32f, &kOpaqueLast32f}, k15, k32},
      {kWiden15uTo32fOpaqueFirst, {&kWiden15uTo32f, &kOpaqueFirst32f}, k15, k32},
      {kWiden8uTo15uOpaqueLast, {&kWiden8uTo15u, &kOpaqueLast15u}, k8, k15},
      {kWiden8uTo15uOpaqueFirst, {&kWiden8uTo15u, &kOpaqueFirst15u}, k8, k15},
      {kNarrow32fTo8uOpaqueLast, {&kNarrow32fTo8u, &kOpaqueLast8u}, k32, k8},
      {kNarrow32fTo8uOpaqueFirst, {&kNarrow32fTo8u, &kOpaqueFirst8u}, k32, k8},
      {kNarrow32fTo15uOpaqueLast, {&kNarrow32fTo15u, &kOpaqueLast15u}, k32, k15},
      {kNarrow32fTo15uOpaqueFirst, {&kNarrow32fTo15u, &kOpaqueFirst15u}, k32, k15},
      {kNarrow15uTo8uOpaqueLast, {&kNarrow15uTo8u, &kOpaqueLast8u}, k15, k8},
      {kNarrow15uTo8uOpaqueFirst, {&kNarrow15uTo8u, &kOpaqueFirst8u}, k15, k8},
      {kBgra8ToBgrp32f, {&kWiden8uTo32f, &kPremultiplyLast32f}, k8, k32},
      {kBgrx32fToLinear, {&kBgra32fToLinear, &kOpaqueLast32f}, k32, k32},
      {kLinearToBgrx32f, {&kLinearToBgra32f, &kOpaqueLast32f}, k32, k32},
      {kBgra8ToLinear, {&kWiden8uTo32f, &kBgra32fToLinear}, k8, k32},
      {kVuyx8To32f, {&kVuya8To32f, &kOpaqueLast32f}, k8, k32},
      {kVuyx32fTo8, {&kVuya32fTo8, &kOpaqueLast8u}, k32, k8},
      {kVuya8ToVuyp32f, {&kVuya8To32f, &kPremultiplyLast32f}, k8, k32},
      {kBgrx32fToVuyx32f_601, {&kBgra32fToVuya32f_601, &kOpaqueLast32f}, k32, k32},
      {kBgrx32fToVuyx32f_709, {&kBgra32fToVuya32f_709, &kOpaqueLast32f}, k32, k32},
      {kVuyx32fToBgrx32f_601, {&kVuya32fToBgra32f_601, &kOpaqueLast32f}, k32, k32},
      {kVuyx32fToBgrx32f_709, {&kVuya32fToBgra32f_709, &kOpaqueLast32f}, k32, k32},
      {kVuyx32f_601To709, {&kVuya32f_601To709, &kOpaqueLast32f}, k32, k32},
      {kVuyx32f_709To601, {&kVuya32f_709To601, &kOpaqueLast32f}, k32, k32},
      {kVuya8ToBgra32f_601, {&kVuya8To32f, &kVuya32fToBgra32f_601}, k8, k32},
      {kVuya8ToBgra32f_709, {&kVuya8To32f, &kVuya32fToBgra32f_709}, k8, k32},
      {kVuyx8ToBgrx32f_601, {&kVuyx8To32f, &kVuyx32fToBgrx32f_601}, k8, k32},
      {kVuyx8ToBgrx32f_709, {&kVuyx8To32f, &kVuyx32fToBgrx32f_709}, k8, k32},
      {kBgra32fToVuya8_601, {&kBgra32fToVuya32f_601, &kVuya32fTo8}, k32, k8},
      {kBgra32fToVuya8_709, {&kBgra32fToVuya32f_709, &kVuya32fTo8}, k32, k8},
      {kBgrx8ToVuyx8_601, {&kBgra8ToVuya8_601, &kOpaqueLast8u}, k8, k8},
      {kBgrx8ToVuyx8_709, {&kBgra8ToVuya8_709, &kOpaqueLast8u}, k8, k8},
      {kVuyx8ToBgrx8_601, {&kVuya8ToBgra8_601, &kOpaqueLast8u}, k8, k8},
      {kVuyx8ToBgrx8_709, {&kVuya8ToBgra8_709, &kOpaqueLast8u}, k8, k8},
      {kVuyx8_601To709, {&kVuya8_601To709, &kOpaqueLast8u}, k8, k8},
      {kVuyx8_709To601, {&kVuya8_709To601, &kOpaqueLast8u}, k8, k8},
      {kBgra8ToUyvy8_601, {&kPremultiplyLast8u, &kBgra8ToVuya8_601, &kVuyx8ToUyvy8}, k8, kPairs8},
      {kBgra8ToUyvy8_709, {&kPremultiplyLast8u, &kBgra8ToVuya8_709, &kVuyx8ToUyvy8}, k8, kPairs8},
      {kBgrx8ToUyvy8_601, {&kBgrx8ToVuyx8_601, &kVuyx8ToUyvy8}, k8, kPairs8},
      {kBgrx8ToUyvy8_709, {&kBgrx8ToVuyx8_709, &kVuyx8ToUyvy8}, k8, kPairs8},
      {kVuyx8ToUyvy8, {&kVuyx8ToUyvy8}, k8, kPairs8},
      {kYuyv8ToBgrx8_601, {&kSwap422_8u, &kUyvy8ToBgrx8_601}, kPairs8, k8},
      {kYuyv8ToBgrx8_709, {&kSwap422_8u, &kUyvy8ToBgrx8_709}, kPairs8, k8},
      {kYuyv8ToVuyx8, {&kSwap422_8u, &kUyvy8ToVuyx8}, kPairs8, k8},
      {kYuyv8_601To709, {&kSwap422_8u, &kUyvy8_601To709, &kSwap422_8u}, kPairs8, kPairs8},
      {kYuyv8_709To601, {&kSwap422_8u, &kUyvy8_709To601, &kSwap422_8u}, kPairs8, kPairs8},
      {kYuyv8To32f, {&kSwap422_8u, &kUyvy8To32f, &kSwap422_32f}, kPairs8, kPairs32},
      {kYuyv32fTo8, {&kSwap422_32f, &kUyvy32fTo8, &kSwap422_8u}, kPairs32, kPairs8},
      {kUyvy32fToV210, {&kUyvy32fToV210}, kPairs32, kV210},
      {kV210ToUyvy8, {&kV210ToUyvy8}, kV210, kPairs8},
      {kV210ToBgrx8_601, {&kV210ToBgrx8_601}, kV210, k8},
      {kV210ToBgrx8_709, {&kV210ToBgrx8_709}, kV210, k8},
      {kV210ToVuyx8, {&kV210ToVuyx8}, kV210, k8},
      {kV210_709ToVuyx8_601, {&kV210_709ToVuyx8_601}, kV210, k8},
  };
  for (const auto& kernel : kernels)
    for (size_t count = 1; count <= 1100; count += count < 72 ? 1 : count < 262 ? 19 : 73) {
      Random random(count);
      const auto rowBytes = [count](F f) {
        return static_cast<size_t>(UnpaddedRowBytes(f, static_cast<int64_t>(count)));
      };
      std::vector<uint8_t> source(rowBytes(kernel.from)), steps = source;
      FillSamples(source.data(), source.size(), kernel.from, static_cast<Contents>(count % kContentsCount), random);
      if (kernel.from == k8) {  // all opaque, all but one, any alphas
        for (size_t i = 0; count % 3 == 0 && i < count; ++i) source[4 * i + 3] = 255;
        if (count % 6 != 0) source[count / 2 * 4 + 3] = 77;
      }
      const auto fused = RunKernel<uint8_t>(kernel.fused, source, count, rowBytes(kernel.to));
      steps = source;
      for (const RowKernelSet* step : kernel.steps)
        steps = RunKernel<uint8_t>(*step, steps, count, 16 * count + 16, KernelVariant::Plain);
      steps.resize(fused.size());
      ASSERT_EQ(fused, steps) << "kernel " << &kernel - kernels << ", " << count << " pixels";
    }
}

}  // namespace
}  // namespace vexel::testing
