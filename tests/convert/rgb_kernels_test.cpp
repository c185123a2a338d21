// Moves of RGB channels, bit by bit.
#include <cstdint>
#include <vector>

#include <gtest/gtest.h>

#include "convert/RgbKernels.h"
#include "convert/RowKernelCheck.h"

namespace vexel::testing {
namespace {

template <class T>
struct Moves {
  const RowKernelSet &reverse, &lastToFirst, &firstToLast, &opaqueLast, &opaqueFirst;
  T opaque;

  void Expect(const std::vector<T>& p) const {
    const T a = p[0], b = p[1], c = p[2], d = p[3];
    const auto run = [&](const RowKernelSet& kernels) { return RunKernel<T>(kernels, p, 1, 4); };
    EXPECT_EQ(run(reverse), (std::vector{d, c, b, a}));
    EXPECT_EQ(run(lastToFirst), (std::vector{opaque, c, b, a}));
    EXPECT_EQ(run(firstToLast), (std::vector{d, c, b, opaque}));
    EXPECT_EQ(run(opaqueLast), (std::vector{a, b, c, opaque}));
    EXPECT_EQ(run(opaqueFirst), (std::vector{opaque, b, c, d}));
  }
};

TEST(RgbKernels, MovesAreExact) {
  Moves<uint8_t>{kReverse8u, kBgrx8ToXrgb8, kXrgb8ToBgrx8, kOpaqueLast8u, kOpaqueFirst8u, 255}.Expect({1, 2, 3, 4});
  Moves<uint16_t>{kReverse15u, kBgrx15ToXrgb15, kXrgb15ToBgrx15, kOpaqueLast15u, kOpaqueFirst15u, 32768}.Expect(
      {1, 2, 3, 65535});
  // Floats as bits: denormals and NaNs move unchanged.
  Moves<uint32_t>{kReverse32f, kBgrx32fToXrgb32f, kXrgb32fToBgrx32f, kOpaqueLast32f, kOpaqueFirst32f, 0x3F800000}
      .Expect({1, 0xFFA00001, 0x7F800000, 0x80000000});
}

}  // namespace
}  // namespace vexel::testing
