#include <gtest/gtest.h>

#include <algorithm>
#include <vector>

#include "frame/StreamCopy.h"
#include "support/Random.h"
#include "support/SmallCache.h"
#include "vexel/vexel.h"

namespace vexel {
namespace {

constexpr size_t kGuard = 160;
constexpr uint8_t kUntouched = 0xA5;

// Copies n bytes between all alignments that matter; guards on both sides must stay.
template <class Copy>
void CheckCopy(const Copy& copy, size_t n, const std::vector<size_t>& dstShifts, const std::vector<size_t>& srcShifts) {
  std::vector<uint8_t> src(n + 2 * kGuard), dst(src.size());
  testing::Random(n + 1).Fill(src.data(), src.size());
  const size_t srcBase = -reinterpret_cast<uintptr_t>(src.data()) % 64,
               dstBase = -reinterpret_cast<uintptr_t>(dst.data()) % 64;
  for (const size_t d : dstShifts)
    for (const size_t s : srcShifts) {
      std::fill(dst.begin(), dst.end(), kUntouched);
      uint8_t* const to = dst.data() + dstBase + d;
      const uint8_t* const from = src.data() + srcBase + s;
      copy(to, from, n);
      ASSERT_TRUE(std::equal(from, from + n, to)) << n << " bytes, shifts " << d << " and " << s;
      const auto isUntouched = [](uint8_t byte) { return byte == kUntouched; };
      ASSERT_TRUE(std::all_of(dst.data(), to, isUntouched) && std::all_of(to + n, dst.data() + dst.size(), isUntouched))
          << n << " bytes, shifts " << d << " and " << s;
    }
}

template <class Copy>
void CheckSizes(const Copy& copy) {
  std::vector<size_t> all(65);
  for (size_t i = 0; i < all.size(); ++i) all[i] = i;
  for (const size_t n : {0, 1, 63, 64, 65, 127, 128, 129, 255, 256, 257, 1000}) CheckCopy(copy, n, all, {0, 1, 16, 33});
  for (size_t n = 0; n <= 700; ++n) CheckCopy(copy, n, {0, 5, 63}, {0, 7});
  for (const size_t n : {4095, 4096, 65537, 300001}) CheckCopy(copy, n, {0, 1, 31}, {0, 17});
}

TEST(MemoryCopy, CopiesExactlyTheBytes) {
  CheckSizes([](void* dst, const void* src, size_t n) { ASSERT_EQ(VX_CopyMemory(dst, src, n), VX_Success); });
  EXPECT_EQ(VX_CopyMemory(nullptr, nullptr, 0), VX_Success);
}

TEST(MemoryCopy, StreamsFromHalfTheCache) {
  const auto copy = [](void* dst, const void* src, size_t n) { VX_CopyMemory(dst, src, n); };
  // With no cache known, everything of some length streams.
  for (const uint32_t cache : {0u, 8192u}) {
    const testing::SmallCache small(cache);
    CheckSizes(copy);
    for (const size_t n : {4095, 4096, 4097}) CheckCopy(copy, n, {0, 3}, {0, 5});
  }
  for (const uint32_t n : {VX_GetCacheSize() / 2 - 1, VX_GetCacheSize() / 2}) CheckCopy(copy, n, {3}, {5});
}

TEST(MemoryCopy, StreamCopyTakesAnyAlignment) {
  const KernelVariant variant = ActiveKernelVariant();
  CheckSizes([=](void* dst, const void* src, size_t n) {
    StreamCopy(dst, src, n, variant);
    StreamFence();
  });
}

}  // namespace
}  // namespace vexel
