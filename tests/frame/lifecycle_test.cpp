#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <boost/make_shared.hpp>
#include <fstream>
#include <string>
#include <vector>

#include "frame/Bands.h"
#include "frame/DvModule.h"
#include "frame/Features.h"
#include "frame/KernelVariant.h"
#include "frame/Lifecycle.h"
#include "vexel/version.h"
#include "vexel/vexel.h"
#include "vexel_host/host.h"
#include "zovcore/Debug.h"
#include "zovcore/Utility.h"

namespace vexel {
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
    for (uint32_t index = 0; index < 11; ++index) {
      auto expected = values();
      if (switches[index]) expected[index] = value != 0;
      EXPECT_EQ(VX_SetDebugFlag(index, value), VX_Success);
      EXPECT_EQ(values(), expected) << index;
    }
    EXPECT_EQ(VX_hasSSE4(), value != 0);
    EXPECT_EQ(VX_hasAVX(), value != 0);
    EXPECT_EQ(VX_hasAVX2(), value != 0);
    for (const uint32_t index : {1u, 11u, 12u, 1000u, UINT32_MAX}) {
      const auto expected = values();
      EXPECT_EQ(VX_SetDebugFlag(index, 1), VX_Success);
      EXPECT_EQ(values(), expected) << index;
    }
  }
  VX_SetDebugFlag(0, 1);
  VX_SetDebugFlag(10, 1);
  VX_Terminate();
  VX_Initialize();
  EXPECT_TRUE(gSwitches.motionPath && gSwitches.forceTopLeft) << "not features: kept";
  VX_SetDebugFlag(0, 0);
  VX_SetDebugFlag(10, 0);
  EXPECT_EQ(values(), started);
  VX_Terminate();
}

TEST_F(Lifecycle, SwitchesAndProcessorChooseTheKernels) {
  VX_Initialize();
  LimitKernelVariant(KernelVariant::Avx512);
  const auto at = [](KernelVariant variant) { return std::min(variant, ProcessorVariant()); };
  for (const uint32_t index : {3u, 6u, 8u, 9u}) VX_SetDebugFlag(index, 1);
  EXPECT_EQ(ActiveKernelVariant(), at(KernelVariant::Avx512));
  VX_SetDebugFlag(8, 0);
  EXPECT_EQ(ActiveKernelVariant(), at(KernelVariant::Avx512)) << "AVX2 is asked first";
  VX_SetDebugFlag(9, 0);
  EXPECT_EQ(ActiveKernelVariant(), at(KernelVariant::Sse41));
  VX_SetDebugFlag(6, 0);
  EXPECT_EQ(ActiveKernelVariant(), at(KernelVariant::Ssse3));
  VX_SetDebugFlag(8, 1);
  EXPECT_EQ(ActiveKernelVariant(), at(KernelVariant::Sse41)) << "AVX uses the SSE4.1 kernels";
  VX_SetDebugFlag(8, 0);
  VX_SetDebugFlag(3, 0);
  EXPECT_EQ(ActiveKernelVariant(), KernelVariant::Plain);
  for (const uint32_t index : {3u, 6u, 8u, 9u}) VX_SetDebugFlag(index, 1);
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

}  // namespace
}  // namespace vexel
