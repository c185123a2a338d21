#include "frame/Lifecycle.h"

#include <cstdio>

#include "frame/DvModule.h"
#include "frame/Features.h"
#include "frame/ImagePrimitives.h"
#include "frame/Platform.h"
#include "frame/Trace.h"
#include "vexel/vexel.h"
#include "zovcore/Debug.h"
#include "zovcore/Threads.h"

namespace vexel {
namespace {

// Written by VX_Initialize and VX_Terminate only, which one thread calls.
uint32_t gInitCount = 0;

// Never destroyed: host threads may still be busy while the process ends.
boost::shared_ptr<zovcore::threads::AsyncExecutor>& Executor() noexcept {
  static auto& executor = *new boost::shared_ptr<zovcore::threads::AsyncExecutor>;
  return executor;
}

bool IsKeyTrue(const char* key) noexcept try {
  return zovcore::debug::DebugDatabase::Instance().GetEntry(key, "false") == "true";
} catch (...) {
  return false;
}

void SetFeatureSwitches(const Features& f) noexcept {
  gSwitches.sse.Set(f.sse);
  gSwitches.sse2.Set(f.sse2);
  gSwitches.sse3.Set(f.sse3);
  gSwitches.ssse3.Set(f.ssse3);
  gSwitches.sse41.Set(f.sse41);
  gSwitches.sse42.Set(f.sse42);
  gSwitches.avx.Set(f.avx);
  gSwitches.avx2.Set(f.avx2);
}

void ApplyKeys() noexcept {
  if (IsKeyTrue("VX.disableAVX")) gSwitches.avx.Set(false);
  if (IsKeyTrue("VX.disableAVX2")) gSwitches.avx2.Set(false);
  gSwitches.noAvx512.Set(IsKeyTrue("VX.disableAVX512"));
}

// Errors are passed over: start-up goes on in any case.
void InitialisePrimitives() noexcept {
  using primitives::Domain;
  static constinit TraceSite site("VX.InitIpp", 5);
  for (const Domain domain : {Domain::Channels, Domain::Fills, Domain::Arithmetic}) {
    const primitives::Status status = primitives::Initialise(domain);
    if (static_cast<int32_t>(status) <= 0 || !site.Enabled()) continue;
    char text[128];
    std::snprintf(text, sizeof text, "ippInit warning: %s", primitives::StatusText(status));
    site.Line(text);
  }
}

void CreateExecutor() noexcept try { Executor() = zovcore::threads::CreateCPUBoundExecutor(); } catch (...) {
  Executor().reset();  // bands then run on the calling thread
}

}  // namespace

namespace detail {

// Written by VX_Initialize only.
constinit CacheInfo gUnifiedCache;

}  // namespace detail

CacheInfo FallbackCache(const Features& features) noexcept {
  if (features.avx || features.avx2) return {3u << 20, 3};
  if (features.sse2) return {1u << 20, 2};
  return {};
}

bool HasExecutor() noexcept { return Executor() != nullptr; }

}  // namespace vexel

VX_Result VX_Initialize() noexcept {
  using namespace vexel;
  if (++gInitCount != 1) return VX_Success;
  const Features features = DetectFeatures(platform::kProcessor);
  SetFeatureSwitches(features);
  if (!platform::FindUnifiedCache(detail::gUnifiedCache)) detail::gUnifiedCache = FallbackCache(features);
  ApplyKeys();
  ChooseKernelVariant();
  InitialisePrimitives();
  LoadDvModule();
  CreateExecutor();
  return VX_Success;
}

VX_Result VX_Terminate() noexcept {
  using namespace vexel;
  if (gInitCount == 0 || --gInitCount != 0) return VX_Success;
  ReleaseDvModule();
  Executor().reset();
  return VX_Success;
}

uint32_t VX_GetCacheSize() noexcept { return vexel::UnifiedCache().bytes; }
