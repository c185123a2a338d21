// Detection on processors that are not this one.
#include "frame/Features.h"

#include <gtest/gtest.h>

#include <map>
#include <vector>

#include "frame/CacheInfo.h"
#include "frame/Lifecycle.h"

namespace vexel {
namespace {

struct FakeProcessor {
  std::map<uint32_t, CpuidRegisters> leaves;
  uint32_t cacheLeaf = UINT32_MAX;
  std::vector<CpuidRegisters> caches;
  uint64_t xcr0 = 0;
  int xcr0Reads = 0, leaf7Reads = 0;
} gFake;

CpuidRegisters FakeCpuid(uint32_t leaf, uint32_t subleaf) {
  gFake.leaf7Reads += leaf == 7;
  if (leaf == gFake.cacheLeaf) return subleaf < gFake.caches.size() ? gFake.caches[subleaf] : CpuidRegisters{};
  return gFake.leaves[leaf];
}
uint64_t FakeXcr0() { return ++gFake.xcr0Reads, gFake.xcr0; }
constexpr Processor kFake{&FakeCpuid, &FakeXcr0};

// Everything up to AVX-512, with the operating system's support.
void FakeAll() {
  gFake = {};
  gFake.leaves[0].eax = 16;
  gFake.leaves[1].eax = 0x000906EA;
  gFake.leaves[1].edx = 1u << 25 | 1u << 26;
  for (const int bit : {0, 1, 9, 12, 19, 20, 25, 27, 28, 29}) gFake.leaves[1].ecx |= 1u << bit;
  for (const int bit : {3, 5, 8, 16, 17, 28, 30, 31}) gFake.leaves[7].ebx |= 1u << bit;
  gFake.xcr0 = 0xE7;
}

TEST(Features, SwitchesFollowTheirBits) {
  struct Case {
    uint32_t CpuidRegisters::*word;
    int bit;
    bool Features::*feature;
  };
  const Case cases[] = {{&CpuidRegisters::edx, 25, &Features::sse},   {&CpuidRegisters::edx, 26, &Features::sse2},
                        {&CpuidRegisters::ecx, 0, &Features::sse3},   {&CpuidRegisters::ecx, 9, &Features::ssse3},
                        {&CpuidRegisters::ecx, 19, &Features::sse41}, {&CpuidRegisters::ecx, 20, &Features::sse42}};
  for (const Case& only : cases) {
    gFake = {};
    gFake.leaves[1].*only.word = 1u << only.bit;
    const Features found = DetectFeatures(kFake);
    for (const Case& each : cases) EXPECT_EQ(found.*each.feature, &each == &only) << each.bit;
    EXPECT_FALSE(found.avx || found.avx2);
    EXPECT_EQ(gFake.xcr0Reads, 0) << "XGETBV faults without OSXSAVE";
  }
}

TEST(Features, AvxNeedsTheOperatingSystemAndAvx2TheVersionWord) {
  for (const uint64_t xcr0 : {0, 1, 2, 3, 4, 5, 6, 7}) {
    FakeAll();
    gFake.xcr0 = xcr0;
    const Features found = DetectFeatures(kFake);
    EXPECT_EQ(found.avx, xcr0 >= 6) << xcr0;
    EXPECT_EQ(found.avx2, xcr0 >= 6) << xcr0;
    EXPECT_EQ(gFake.leaf7Reads, xcr0 >= 6 ? 1 : 0) << xcr0;
  }
  for (const int bit : {27, 28}) {
    FakeAll();
    gFake.leaves[1].ecx &= ~(1u << bit);
    EXPECT_FALSE(DetectFeatures(kFake).avx || DetectFeatures(kFake).avx2) << bit;
    EXPECT_EQ(gFake.xcr0Reads, 0);
  }
  for (const auto& [version, expected] :
       {std::pair{6u, false}, {7u, true}, {0x80000000u, false}, {0x7FFFFFFFu, true}}) {
    FakeAll();
    gFake.leaves[1].eax = version;
    EXPECT_TRUE(DetectFeatures(kFake).avx);
    EXPECT_EQ(DetectFeatures(kFake).avx2, expected) << version;
  }
}

// A missing bit takes the kernels down to the best that does without it.
TEST(Features, VariantNeedsAllItsInstructions) {
  FakeAll();
  EXPECT_EQ(DetectVariant(kFake), KernelVariant::Avx512);
  const struct {
    uint32_t leaf;
    std::vector<int> bits;
    KernelVariant expected;
  } missing[] = {{7, {16, 17, 28, 30, 31}, KernelVariant::Avx2},
                 {7, {3, 5, 8}, KernelVariant::Sse41},
                 {1, {12, 27, 28, 29}, KernelVariant::Sse41},
                 {1, {1, 19, 20, 25}, KernelVariant::Ssse3},
                 {1, {0, 9}, KernelVariant::Plain}};
  for (const auto& [leaf, bits, expected] : missing)
    for (const int bit : bits) {
      FakeAll();
      (leaf == 7 ? gFake.leaves[7].ebx : gFake.leaves[1].ecx) &= ~(1u << bit);
      EXPECT_EQ(DetectVariant(kFake), expected) << leaf << " " << bit;
    }
  for (const auto& [xcr0, expected] :
       {std::pair{0x67u, KernelVariant::Avx2}, {0x07u, KernelVariant::Avx2}, {0x03u, KernelVariant::Sse41}}) {
    FakeAll();
    gFake.xcr0 = xcr0;
    EXPECT_EQ(DetectVariant(kFake), expected) << xcr0;
  }
}

constexpr CpuidRegisters CacheEntry(uint32_t type, uint32_t level, uint32_t ways, uint32_t sets) {
  return {type | level << 5, (ways - 1) << 22 | 63, sets - 1, 0};
}

// The unified one of the highest level counts, of one level the first.
TEST(Cache, IsReadFromCpuid) {
  constexpr uint32_t kIntel = 0x756E6547, kAmd = 0x68747541, kHygon = 0x6F677948;
  for (const uint32_t vendor : {kIntel, kAmd, kHygon}) {
    FakeAll();
    gFake.leaves[0].ebx = vendor;
    CacheInfo cache;
    EXPECT_FALSE(UnifiedCacheFromCpuid(kFake, cache)) << "no list at all";
    gFake.leaves[0x80000000].eax = 0x8000001E;
    gFake.leaves[0x80000001].ecx = 1u << 22;
    gFake.cacheLeaf = vendor == kIntel ? 4 : 0x8000001D;
    gFake.caches = {CacheEntry(1, 1, 8, 64),      CacheEntry(2, 1, 8, 64),     CacheEntry(3, 2, 16, 1024),
                    CacheEntry(3, 3, 12, 16384),  CacheEntry(3, 3, 13, 16384), CacheEntry(3, 1, 14, 16384),
                    CacheEntry(1, 4, 16, 131072), CacheEntry(0, 4, 1, 1),      CacheEntry(3, 5, 1, 1)};
    ASSERT_TRUE(UnifiedCacheFromCpuid(kFake, cache));
    EXPECT_EQ(cache.level, 3);
    EXPECT_EQ(cache.bytes, 12u * 64 * 16384);
    gFake.leaves[0x80000001].ecx = 0;  // AMD's list of caches comes with the topology extensions
    EXPECT_EQ(UnifiedCacheFromCpuid(kFake, cache), vendor == kIntel);
    gFake.caches = {CacheEntry(1, 1, 8, 64)};
    EXPECT_FALSE(UnifiedCacheFromCpuid(kFake, cache)) << "none that is unified";
  }
  LargestUnifiedCache huge;
  huge.Offer(true, 3, uint64_t{5} << 30);
  EXPECT_EQ(huge.Best().bytes, UINT32_MAX);
}

TEST(Cache, HasFallbacks) {
  const auto bytes = [](bool sse2, bool avx, bool avx2) {
    Features f;
    f.sse2 = sse2, f.avx = avx, f.avx2 = avx2;
    const CacheInfo cache = FallbackCache(f);
    return std::pair{cache.bytes, int{cache.level}};
  };
  EXPECT_EQ(bytes(false, false, false), std::pair(0u, 0));
  EXPECT_EQ(bytes(true, false, false), std::pair(1048576u, 2));
  EXPECT_EQ(bytes(false, true, false), std::pair(3145728u, 3));
  EXPECT_EQ(bytes(false, false, true), std::pair(3145728u, 3));
}

// Both sources tell the same about the machine at hand.
TEST(Cache, SystemAndProcessorAgree) {
  CacheInfo system, processor;
  if (!platform::FindUnifiedCache(system) || !UnifiedCacheFromCpuid(platform::kProcessor, processor))
    GTEST_SKIP() << "one source is missing here";
  EXPECT_EQ(system.level, processor.level);
  EXPECT_EQ(system.bytes, processor.bytes);
}

}  // namespace
}  // namespace vexel
