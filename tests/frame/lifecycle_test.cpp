// Start-up, what it detects, and what can be switched.
#include <boost/make_shared.hpp>
#include <map>
#include <unistd.h>

#include <gmock/gmock.h>

#include "frame/Bands.h"
#include "frame/CacheInfo.h"
#include "frame/DvModule.h"
#include "frame/Features.h"
#include "frame/KernelVariant.h"
#include "frame/Lifecycle.h"
#include "support/Test.h"
#include "vexel/version.h"
#include "vexel_host/host.h"
#include "zovcore/Debug.h"
#include "zovcore/Utility.h"

namespace vexel::testing {
namespace {

using zovcore::threads::AsyncExecutor;

// The library is stopped at first, and running with this run's kernels again at the end.
class Lifecycle : public ::testing::Test {
 protected:
  void SetUp() override { VX_Terminate(); }
  void TearDown() override {
    for (const char* key : {"VX.disableAVX", "VX.disableAVX2", "VX.disableAVX512", "Trace.VX.InitIpp"})
      vexel_host::RemoveDebugEntry(key);
    vexel_host::SetTraceSink({});
    vexel_host::SetModulesDirectory("");
    vexel_host::SetExecutor(nullptr);
    LimitKernelVariant(mMost);
    VX_SetDebugFlag(10, 0);
    VX_Initialize();
  }
  const KernelVariant mMost = ActiveKernelVariant();
};

class IdleExecutor : public AsyncExecutor {
 public:
  void RunPieces(const boost::function<void(int)>& function, int count) override {
    for (int i = 0; i < count; ++i) function(i);
  }
};

TEST_F(Lifecycle, LastTerminateReleasesTheExecutor) {
  const auto executor = boost::make_shared<IdleExecutor>();
  vexel_host::SetExecutor(executor);
  EXPECT_FALSE(HasExecutor());
  EXPECT_EQ(VX_Initialize(), VX_Success);
  EXPECT_EQ(VX_Initialize(), VX_Success);
  vexel_host::SetExecutor(nullptr);
  EXPECT_EQ(executor.use_count(), 2);
  EXPECT_EQ(VX_Terminate(), VX_Success);
  EXPECT_TRUE(HasExecutor());
  EXPECT_EQ(executor.use_count(), 2);
  EXPECT_EQ(VX_Terminate(), VX_Success);
  EXPECT_FALSE(HasExecutor());
  EXPECT_EQ(executor.use_count(), 1);
  EXPECT_EQ(VX_Terminate(), VX_Success) << "one too many is ignored";
  EXPECT_EQ(VX_Initialize(), VX_Success);
  EXPECT_TRUE(HasExecutor());
  VX_Terminate();
}

TEST_F(Lifecycle, KeysTurnFeaturesOffOnlyByExactlyTrue) {
  const Features features = DetectFeatures(platform::kProcessor);
  const auto start = [](const char* key, const char* text) {
    vexel_host::SetDebugEntry(key, text);
    VX_Initialize();
    VX_Terminate();
    vexel_host::RemoveDebugEntry(key);
  };
  for (const char* text : {"True", "TRUE", "1", "true ", "", "false"}) {
    start("VX.disableAVX", text);
    EXPECT_EQ(VX_hasAVX(), features.avx) << text;
    start("VX.disableAVX2", text);
    EXPECT_EQ(VX_hasAVX2(), features.avx2) << text;
  }
  start("VX.disableAVX", "true");
  EXPECT_FALSE(VX_hasAVX());
  EXPECT_EQ(VX_hasAVX2(), features.avx2) << "one key leaves the other switch alone";
  start("VX.disableAVX2", "true");
  EXPECT_FALSE(VX_hasAVX2());
  EXPECT_EQ(VX_hasAVX(), features.avx);
  LimitKernelVariant(KernelVariant::Avx512);
  start("VX.disableAVX512", "true");
  EXPECT_EQ(VX_hasAVX2(), features.avx2);
  EXPECT_EQ(ActiveKernelVariant(), std::min(ProcessorVariant(), KernelVariant::Avx2));
}

TEST_F(Lifecycle, FlagsSetTheirSwitchesAndStartUpResetsFeatures) {
  VX_Initialize();
  Switch* const switches[11] = {&gSwitches.motionPath, nullptr,          &gSwitches.sse,         &gSwitches.sse2,
                                &gSwitches.sse3,       &gSwitches.ssse3, &gSwitches.sse41,       &gSwitches.sse42,
                                &gSwitches.avx,        &gSwitches.avx2,  &gSwitches.forceTopLeft};
  const auto values = [&] {
    std::vector<bool> all;
    for (const Switch* one : switches) all.push_back(one && *one);
    return all;
  };
  const std::vector<bool> started = values();
  for (const int value : {0, 1, -5, 0}) {
    for (const uint32_t index : {0u, 1u, 2u, 3u, 4u, 5u, 6u, 7u, 8u, 9u, 10u, 11u, 12u, 1000u, UINT32_MAX}) {
      auto expected = values();
      if (index < 11 && switches[index]) expected[index] = value != 0;
      EXPECT_EQ(VX_SetDebugFlag(index, value), VX_Success);
      EXPECT_EQ(values(), expected) << index;
    }
    for (const bool has : {VX_hasSSE4(), VX_hasAVX(), VX_hasAVX2()}) EXPECT_EQ(has, value != 0);
  }
  for (const uint32_t index : {0u, 10u}) VX_SetDebugFlag(index, 1);
  VX_Terminate();
  VX_Initialize();
  EXPECT_TRUE(gSwitches.motionPath && gSwitches.forceTopLeft) << "not features: kept";
  for (const uint32_t index : {0u, 10u}) VX_SetDebugFlag(index, 0);
  EXPECT_EQ(values(), started);
  VX_Terminate();
}

TEST_F(Lifecycle, SwitchesAndProcessorChooseTheKernels) {
  VX_Initialize();
  LimitKernelVariant(KernelVariant::Avx512);
  const auto at = [](KernelVariant variant) { return std::min(variant, ProcessorVariant()); };
  const auto with = [&](bool sse2, bool sse41, bool avx, bool avx2) {
    VX_SetDebugFlag(3, sse2), VX_SetDebugFlag(6, sse41), VX_SetDebugFlag(8, avx), VX_SetDebugFlag(9, avx2);
    return ActiveKernelVariant();
  };
  EXPECT_EQ(with(true, true, false, true), at(KernelVariant::Avx512)) << "AVX2 is asked first";
  EXPECT_EQ(with(true, true, false, false), at(KernelVariant::Sse41));
  EXPECT_EQ(with(true, false, true, false), at(KernelVariant::Sse41)) << "AVX uses the SSE4.1 kernels";
  EXPECT_EQ(with(true, false, false, false), at(KernelVariant::Ssse3));
  EXPECT_EQ(with(false, false, false, false), KernelVariant::Plain);
  EXPECT_EQ(with(true, true, true, true), at(KernelVariant::Avx512));
  for (int i = 0; i < kKernelVariantCount; ++i) {
    const auto variant = static_cast<KernelVariant>(i);
    LimitKernelVariant(variant);
    EXPECT_EQ(ActiveKernelVariant(), at(variant));
    // A table picks the function of that variant, and a missing one falls back to the next lower.
    const KernelVariants<int (*)()> full(
        +[] { return 0; }, +[] { return 1; }, +[] { return 2; }, +[] { return 3; }, +[] { return 4; });
    EXPECT_EQ(full[variant](), i);
    const KernelVariants<int (*)()> holes(
        +[] { return 0; }, nullptr, +[] { return 2; }, nullptr, nullptr);
    EXPECT_EQ(holes[variant](), i < 2 ? 0 : 2);
  }
  VX_Terminate();
}

TEST_F(Lifecycle, DvModuleIsLoadedAndClosed) {
  vexel_host::SetModulesDirectory("/nonexistent");
  VX_Initialize();
  EXPECT_EQ(LoadedDvModule().handle, nullptr);
  VX_Terminate();

  vexel_host::SetModulesDirectory(VEXEL_TEST_DV_MODULE_DIR);
  EXPECT_EQ(zovcore::utility::ApplicationModulesDirectory(), VEXEL_TEST_DV_MODULE_DIR);
  void* const module = zovcore::utility::LoadModule(VEXEL_TEST_DV_MODULE_DIR "/mc_enc_dv.dll");
  ASSERT_NE(module, nullptr);
  const auto* const closed = static_cast<const int*>(zovcore::utility::FindModuleFunction(module, "gTimesClosed"));
  ASSERT_NE(closed, nullptr);
  const int before = *closed;
  VX_Initialize();
  const DvModule loaded = LoadedDvModule();
  EXPECT_EQ(loaded.newEncoder, zovcore::utility::FindModuleFunction(module, "DVNewEnc"));
  EXPECT_EQ(loaded.doneEncoder, zovcore::utility::FindModuleFunction(module, "DVDoneEnc"));
  EXPECT_EQ(loaded.compressBuffer, zovcore::utility::FindModuleFunction(module, "DVCompressBuffer"));
  EXPECT_TRUE(loaded.newEncoder && loaded.doneEncoder && loaded.compressBuffer);
  EXPECT_EQ(*closed, before);
  VX_Terminate();
  EXPECT_EQ(*closed, before + 1);
  EXPECT_EQ(LoadedDvModule().handle, nullptr);
  EXPECT_EQ(LoadedDvModule().newEncoder, nullptr);
  zovcore::utility::UnloadModule(module);
}

TEST_F(Lifecycle, WarningsOfThePrimitivesAreTraced) {
  std::vector<std::string> lines;
  vexel_host::SetTraceSink([&](std::string_view line) { lines.emplace_back(line); });
  const auto start = [&](KernelVariant most) {
    lines.clear();
    VX_Initialize();
    VX_Terminate();
    LimitKernelVariant(most);
    lines.clear();
    VX_Initialize();
    VX_Terminate();
  };
  // Only plain code gives a warning, one for each family.
  const std::string line = "<" + std::to_string(gettid()) +
                           "> <VX.InitIpp> <5> ippInit warning: plain code is used, without vector instructions\n";
  start(KernelVariant::Plain);
  EXPECT_THAT(lines, ::testing::ElementsAre(line, line, line));
  if (ProcessorVariant() != KernelVariant::Plain) {
    start(KernelVariant::Avx512);
    EXPECT_THAT(lines, ::testing::IsEmpty());
  }
  // The answer is asked for anew whenever the host's settings change.
  for (const auto& [setting, count] : {std::pair{"false", 0u}, {"5", 3u}, {"6", 0u}, {"true", 3u}, {"nonsense", 3u}}) {
    vexel_host::SetDebugEntry("Trace.VX.InitIpp", setting);
    start(KernelVariant::Plain);
    EXPECT_EQ(lines.size(), count) << setting;
  }
}

TEST_F(Lifecycle, BandsRunInOrderBeforeTheStart) {
  std::vector<int> firsts;
  EXPECT_TRUE(ForEachBand(100, [&](int first, int) { firsts.push_back(first); }));
  EXPECT_THAT(firsts, ::testing::ElementsAre(0, 32, 64, 96));
}

TEST(Diagnostics, OriginFollowsLayoutAndAlpha) {
  using enum VX_PixelFormat;
  const auto check = [](VX_PixelFormat format, bool topLeft) {
    EXPECT_EQ(VX_IsOriginTopLeft(format), topLeft) << std::hex << static_cast<uint32_t>(format);
    EXPECT_EQ(VX_IsOriginBottomLeft(format), !topLeft) << std::hex << static_cast<uint32_t>(format);
  };
  check(BGRA_4444_8u, false);
  check(UYVY_422_8u, true);
  check(Invalid, true);
  for (uint32_t bits = 0; bits < 0x2000; ++bits)
    check(static_cast<VX_PixelFormat>(bits), (bits & 0x30) != 0 || (bits & 0xC) == 0);
  VX_SetDebugFlag(10, 1);
  for (uint32_t bits = 0; bits < 0x2000; ++bits) check(static_cast<VX_PixelFormat>(bits), true);
  VX_SetDebugFlag(10, 0);
}

TEST(Diagnostics, Names) {
  EXPECT_STREQ(VX_RenderQualityName(2), "Low");
  for (const int quality : {-1, 0, 1, 3, 4, 5, INT32_MAX}) EXPECT_STREQ(VX_RenderQualityName(quality), "High");
  EXPECT_STREQ(VX_ResultName(VX_Success), "VX_Success");
  EXPECT_STREQ(VX_ResultName(VX_ErrOutOfMemory), "VX_ErrOutOfMemory");
  EXPECT_STREQ(VX_ResultName(VX_ErrFormatNotHandled), "VX_ErrFormatNotHandled");
  for (const int code : {1, -5, -15, -998, INT32_MIN})
    EXPECT_STREQ(VX_ResultName(static_cast<VX_Result>(code)), "Unknown result");
  EXPECT_STREQ(VX_GetVersion(), VEXEL_VERSION_STRING);
}

// ---- Detection on processors that are not this one

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
}  // namespace vexel::testing
