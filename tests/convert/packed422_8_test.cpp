// Packed 8-bit 4:2:2: interpolated upwards, low-passed downwards, recoded.
#include <cmath>
#include <cstring>
#include <vector>

#include <gtest/gtest.h>

#include "convert/RgbKernels.h"
#include "convert/RowKernelCheck.h"
#include "convert/YuvKernels.h"
#include "convert/YuvReference.h"
#include "support/Random.h"

namespace vexel::testing {
namespace {

using Bytes = std::vector<uint8_t>;

constexpr size_t kWidths = 131;  // four vectors of the widest variant and some
// Strays allowed from the exact value: half a code and what fixed point adds.
constexpr double kTolerance = 0.52;

// Noise, with codes 0 and 255 more often than by chance.
Bytes RandomBytes(size_t bytes, uint64_t seed) {
  Random random(seed);
  Bytes row(bytes);
  for (uint8_t& value : row) {
    const uint32_t bits = random.Bits32();
    value = static_cast<uint8_t>(bits >> 8 & (bits & 7 ? 255 : 0));
    if ((bits & 15) == 8) value = 255;
  }
  return row;
}

Bytes Convert(const RowKernelSet& kernels, const Bytes& source, size_t count, size_t bytes) {
  return RunKernel<uint8_t>(kernels, source, count, bytes);
}
size_t PairBytes(size_t count) { return (count + 1) / 2 * 4; }

// Chroma of pixel i in a UYVY row as V, U, Y.
Triple ExactPixel(const Bytes& uyvy, size_t count, size_t i) {
  const size_t at = i / 2 * 4, last = PairBytes(count) - 4, next = i % 2 != 0 ? std::min(at + 4, last) : at;
  return {{(uyvy[at + 2] + uyvy[next + 2]) / 2.0, (uyvy[at] + uyvy[next]) / 2.0, 1.0 * uyvy[at + 1 + i % 2 * 2]}};
}

struct Upward {
  const RowKernelSet *fromPairs, *fromPixels;
  Triple (*exact)(const Triple&);
};
const Upward kUpward[] = {
    {&kUyvy8ToBgrx8_601, &kVuyx8ToBgrx8_601, [](const Triple& p) { return VuyToBgr(k601, p); }},
    {&kUyvy8ToBgrx8_709, &kVuyx8ToBgrx8_709, [](const Triple& p) { return VuyToBgr(k709, p); }},
    {&kUyvy8ToVuyx8, &kOpaqueLast8u, [](const Triple& p) { return p; }},
};

TEST(Packed422Kernels8, OddPixelsAreInterpolatedAndEvenOnesAreNot) {
  for (const size_t count : {200001u, 2u, 1u}) {
    const Bytes source = RandomBytes(PairBytes(count), count);
    Bytes evenPixels(4 * ((count + 1) / 2));
    for (size_t i = 0; i < count; i += 2) {
      const Triple exact = ExactPixel(source, count, i);
      for (size_t c = 0; c < 3; ++c) evenPixels[2 * i + c] = static_cast<uint8_t>(exact.c[c]);
    }
    for (size_t k = 0; k < std::size(kUpward); ++k) {
      const Bytes got = Convert(*kUpward[k].fromPairs, source, count, 4 * count);
      const Bytes even = Convert(*kUpward[k].fromPixels, evenPixels, (count + 1) / 2, evenPixels.size());
      for (size_t i = 0; i < count; ++i) {
        if (i % 2 == 0) {
          ASSERT_EQ(std::memcmp(&got[4 * i], &even[2 * i], 4), 0) << k << " pixel " << i;
          continue;
        }
        const Triple exact = kUpward[k].exact(ExactPixel(source, count, i));
        for (size_t c = 0; c < 3; ++c)
          ASSERT_NEAR(got[4 * i + c], Code8(exact.c[c]), kTolerance) << k << " pixel " << i << " channel " << c;
        ASSERT_EQ(got[4 * i + 3], 255);
      }
    }
  }
}

TEST(Packed422Kernels8, UpAndDownAgainGivesTheSameBytes) {
  for (size_t count = 1; count <= kWidths; ++count) {
    Bytes source = RandomBytes(PairBytes(count), count);
    if (count % 2 != 0) source[source.size() - 1] = source[source.size() - 3];
    const Bytes pixels = Convert(kUyvy8ToVuyx8, source, count, 4 * count);
    EXPECT_EQ(Convert(kVuyx8ToUyvy8, pixels, count, source.size()), source) << count;
  }
}

// Rounding inside the lifting adds at most a quarter to the half code of the last rounding.
TEST(Packed422Kernels8, DownwardChromaIsLowPassed) {
  constexpr double kTaps[] = {-0.125, 0.25, 0.75, 0.25, -0.125};
  for (size_t count = 1; count <= kWidths; ++count) {
    const Bytes source = RandomBytes(4 * count, 1000 + count);
    const Bytes got = Convert(kVuyx8ToUyvy8, source, count, PairBytes(count));
    const auto pixel = [&](size_t i, int offset) {
      const auto at = static_cast<ptrdiff_t>(i) + offset;
      return &source[4 * static_cast<size_t>(std::clamp<ptrdiff_t>(at, 0, static_cast<ptrdiff_t>(count) - 1))];
    };
    for (size_t i = 0; i < count; i += 2) {
      for (size_t c = 0; c < 2; ++c) {
        double exact = 0;
        for (int k = -2; k <= 2; ++k) exact += kTaps[k + 2] * pixel(i, k)[c];
        ASSERT_NEAR(got[2 * i + 2 - 2 * c], Code8(exact), 0.7501)
            << count << " pixels, pixel " << i << " channel " << c;
      }
      ASSERT_EQ(got[2 * i + 1], pixel(i, 0)[2]) << count;
      ASSERT_EQ(got[2 * i + 3], pixel(i, 1)[2]) << count;
    }
  }
}

TEST(Packed422Kernels8, RecodedPairsAgreeWithPixels) {
  struct {
    const RowKernelSet *pairs, *pixels;
    Luma from, to;
  } const kRecodings[] = {{&kUyvy8_601To709, &kVuyx8_601To709, k601, k709},
                          {&kUyvy8_709To601, &kVuyx8_709To601, k709, k601}};
  constexpr size_t kCount = 100000;
  const Bytes source = RandomBytes(PairBytes(kCount), 5);
  Bytes evenPixels(2 * kCount);
  for (size_t i = 0; i < 2 * kCount; i += 4) {
    const uint8_t vuyx[4] = {source[i + 2], source[i], source[i + 1], 255};
    std::memcpy(&evenPixels[i], vuyx, 4);
  }
  for (const auto& recoding : kRecodings) {
    const Bytes got = Convert(*recoding.pairs, source, kCount, source.size());
    const Bytes even = Convert(*recoding.pixels, evenPixels, kCount / 2, evenPixels.size());
    for (size_t i = 0; i < source.size(); i += 4) {
      ASSERT_TRUE(got[i] == even[i + 1] && got[i + 1] == even[i + 2] && got[i + 2] == even[i]) << i;
      const Triple exact = BgrToVuy(recoding.to, VuyToBgr(recoding.from, ExactPixel(source, kCount, i / 2 + 1)));
      ASSERT_NEAR(got[i + 3], Code8(exact.c[2]), kTolerance) << i;
    }
  }
}

// Whatever the source has in the place of the luma that an odd width lacks.
TEST(Packed422Kernels8, MissingLumaRepeatsTheLast) {
  for (const RowKernelSet* kernels : {&kVuyx8ToUyvy8, &kUyvy8_601To709, &kUyvy8_709To601})
    for (const size_t count : {1u, 33u, 77u}) {
      const Bytes got = Convert(*kernels, RandomBytes(4 * count, count), count, PairBytes(count));
      EXPECT_EQ(got[got.size() - 1], got[got.size() - 3]);
    }
}

}  // namespace
}  // namespace vexel::testing
