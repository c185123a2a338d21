// Detection on processors that are not this one.
#include "frame/Features.h"

#include <gtest/gtest.h>

#include "frame/CacheInfo.h"
#include "frame/Lifecycle.h"

namespace vexel {
namespace {

struct FakeProcessor {
  CpuidRegisters leaf0{}, leaf1{}, leaf7{}, ext0{}, ext1{};
  uint32_t cacheLeaf = 0;
  CpuidRegisters caches[4]{};
  uint64_t xcr0 = 0;
  int xcr0Reads = 0, leaf7Reads = 0;
} gFake;

CpuidRegisters FakeCpuid(uint32_t leaf, uint32_t subleaf) {
  if (leaf == gFake.cacheLeaf && leaf != 0) return subleaf < 4 ? gFake.caches[subleaf] : CpuidRegisters{};
  switch (leaf) {
    case 0:
      return gFake.leaf0;
    case 1:
      return gFake.leaf1;
    case 7:
      return ++gFake.leaf7Reads, gFake.leaf7;
    case 0x80000000:
      return gFake.ext0;
    case 0x80000001:
      return gFake.ext1;
    default:
      return {};
  }
}

uint64_t FakeXcr0() { return ++gFake.xcr0Reads, gFake.xcr0; }

constexpr Processor kFake{&FakeCpuid, &FakeXcr0};

// Everything up to AVX-512, with the operating system's support.
FakeProcessor Full() {
  FakeProcessor p;
  p.leaf0.eax = 16;
  p.leaf1.eax = 0x000906EA;
  p.leaf1.edx = 1u << 25 | 1u << 26;
  for (const int bit : {0, 1, 9, 12, 19, 20, 25, 27, 28, 29}) p.leaf1.ecx |= 1u << bit;
  for (const int bit : {3, 5, 8, 16, 17, 28, 30, 31}) p.leaf7.ebx |= 1u << bit;
  p.xcr0 = 0xE7;
  return p;
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
    gFake.leaf1.*only.word = 1u << only.bit;
    const Features found = DetectFeatures(kFake);
    for (const Case& each : cases) EXPECT_EQ(found.*each.feature, &each == &only) << each.bit;
    EXPECT_FALSE(found.avx || found.avx2);
    EXPECT_EQ(gFake.xcr0Reads, 0) << "XGETBV faults without OSXSAVE";
  }
}

TEST(Features, AvxNeedsTheOperatingSystem) {
  for (const uint64_t xcr0 : {0, 1, 2, 3, 4, 5, 6, 7}) {
    gFake = Full();
    gFake.xcr0 = xcr0;
    const Features found = DetectFeatures(kFake);
    EXPECT_EQ(found.avx, xcr0 >= 6) << xcr0;
    EXPECT_EQ(found.avx2, xcr0 >= 6) << xcr0;
    EXPECT_EQ(gFake.leaf7Reads, xcr0 >= 6 ? 1 : 0) << xcr0;
  }
  for (const int bit : {27, 28}) {
    gFake = Full();
    gFake.leaf1.ecx &= ~(1u << bit);
    EXPECT_FALSE(DetectFeatures(kFake).avx || DetectFeatures(kFake).avx2) << bit;
    EXPECT_EQ(gFake.xcr0Reads, 0);
  }
}

TEST(Features, Avx2DependsOnTheVersionWord) {
  for (const auto& [version, expected] :
       {std::pair{6u, false}, {7u, true}, {0x80000000u, false}, {0x7FFFFFFFu, true}}) {
    gFake = Full();
    gFake.leaf1.eax = version;
    EXPECT_TRUE(DetectFeatures(kFake).avx);
    EXPECT_EQ(DetectFeatures(kFake).avx2, expected) << version;
  }
}

// A missing bit takes the kernels down to the best that does without it.
TEST(Features, VariantNeedsAllItsInstructions) {
  gFake = Full();
  EXPECT_EQ(DetectVariant(kFake), KernelVariant::Avx512);
  const auto without = [](CpuidRegisters FakeProcessor::*leaf, uint32_t CpuidRegisters::*word, int bit) {
    gFake = Full();
    gFake.*leaf.*word &= ~(1u << bit);
    return DetectVariant(kFake);
  };
  for (const int bit : {16, 17, 28, 30, 31})
    EXPECT_EQ(without(&FakeProcessor::leaf7, &CpuidRegisters::ebx, bit), KernelVariant::Avx2) << bit;
  for (const int bit : {3, 5, 8})
    EXPECT_EQ(without(&FakeProcessor::leaf7, &CpuidRegisters::ebx, bit), KernelVariant::Sse41) << bit;
  for (const int bit : {12, 27, 28, 29})
    EXPECT_EQ(without(&FakeProcessor::leaf1, &CpuidRegisters::ecx, bit), KernelVariant::Sse41) << bit;
  for (const int bit : {1, 19, 20, 25})
    EXPECT_EQ(without(&FakeProcessor::leaf1, &CpuidRegisters::ecx, bit), KernelVariant::Ssse3) << bit;
  for (const int bit : {0, 9})
    EXPECT_EQ(without(&FakeProcessor::leaf1, &CpuidRegisters::ecx, bit), KernelVariant::Plain) << bit;
  for (const auto& [xcr0, expected] :
       {std::pair{0x67u, KernelVariant::Avx2}, {0x07u, KernelVariant::Avx2}, {0x03u, KernelVariant::Sse41}}) {
    gFake = Full();
    gFake.xcr0 = xcr0;
    EXPECT_EQ(DetectVariant(kFake), expected) << xcr0;
  }
}

TEST(Cache, TakesTheUnifiedOneOfTheHighestLevel) {
  LargestUnifiedCache largest;
  EXPECT_FALSE(largest.Found());
  largest.Offer(false, 4, 1 << 20);
  EXPECT_FALSE(largest.Found());
  largest.Offer(true, 2, 2 << 20);
  largest.Offer(true, 3, 32 << 20);
  largest.Offer(true, 3, 64 << 20);
  largest.Offer(true, 1, 128 << 20);
  EXPECT_EQ(largest.Best().level, 3);
  EXPECT_EQ(largest.Best().bytes, 32u << 20) << "of one level the first";
  LargestUnifiedCache huge;
  huge.Offer(true, 3, uint64_t{5} << 30);
  EXPECT_EQ(huge.Best().bytes, UINT32_MAX);
}

constexpr CpuidRegisters CacheEntry(uint32_t type, uint32_t level, uint32_t ways, uint32_t sets) {
  return {type | level << 5, (ways - 1) << 22 | 63, sets - 1, 0};
}

TEST(Cache, IsReadFromCpuid) {
  constexpr uint32_t kIntel = 0x756E6547, kAmd = 0x68747541;
  for (const auto& [vendor, leaf] : {std::pair{kIntel, 4u}, {kAmd, 0x8000001Du}}) {
    gFake = Full();
    gFake.leaf0.ebx = vendor;
    gFake.ext0.eax = 0x8000001E;
    gFake.ext1.ecx = 1u << 22;
    gFake.cacheLeaf = leaf;
    gFake.caches[0] = CacheEntry(1, 1, 8, 64);
    gFake.caches[1] = CacheEntry(3, 2, 16, 1024);
    gFake.caches[2] = CacheEntry(3, 3, 12, 16384);
    CacheInfo cache;
    ASSERT_TRUE(UnifiedCacheFromCpuid(kFake, cache));
    EXPECT_EQ(cache.level, 3);
    EXPECT_EQ(cache.bytes, 12u * 64 * 16384);
    gFake.ext1.ecx = 0;  // AMD's list of caches comes with the topology extensions
    EXPECT_EQ(UnifiedCacheFromCpuid(kFake, cache), vendor == kIntel);
    gFake = Full();
    gFake.leaf0.ebx = vendor;
    EXPECT_FALSE(UnifiedCacheFromCpuid(kFake, cache)) << "no list at all";
  }
}

TEST(Cache, HasFallbacks) {
  Features f;
  EXPECT_EQ(FallbackCache(f).bytes, 0u);
  EXPECT_EQ(FallbackCache(f).level, 0);
  f.sse2 = true;
  EXPECT_EQ(FallbackCache(f).bytes, 1048576u);
  EXPECT_EQ(FallbackCache(f).level, 2);
  for (bool Features::*feature : {&Features::avx, &Features::avx2}) {
    Features g;
    g.*feature = true;
    EXPECT_EQ(FallbackCache(g).bytes, 3145728u);
    EXPECT_EQ(FallbackCache(g).level, 3);
  }
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
