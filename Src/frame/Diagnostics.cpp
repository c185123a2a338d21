// Switches, names and the origin rule.
#include <iterator>

#include "formats/FormatBits.h"
#include "frame/Features.h"
#include "vexel/vexel.h"
#include "vexel/version.h"

using vexel::gSwitches;

bool VX_hasSSE4() noexcept { return gSwitches.sse41; }
bool VX_hasAVX() noexcept { return gSwitches.avx; }
bool VX_hasAVX2() noexcept { return gSwitches.avx2; }

VX_Result VX_SetDebugFlag(uint32_t index, int32_t value) noexcept {
  vexel::Switch* const switches[] = {&gSwitches.motionPath, nullptr,          &gSwitches.sse,         &gSwitches.sse2,
                                     &gSwitches.sse3,       &gSwitches.ssse3, &gSwitches.sse41,       &gSwitches.sse42,
                                     &gSwitches.avx,        &gSwitches.avx2,  &gSwitches.forceTopLeft};
  if (index >= std::size(switches) || !switches[index]) return VX_Success;
  switches[index]->Set(value != 0);
  vexel::ChooseKernelVariant();
  return VX_Success;
}

bool VX_IsOriginTopLeft(VX_PixelFormat format) noexcept {
  using namespace vexel;
  return gSwitches.forceTopLeft || Layout(format) != kLayout4444 || AlphaKind(format) == kAlphaNone;
}

bool VX_IsOriginBottomLeft(VX_PixelFormat format) noexcept { return !VX_IsOriginTopLeft(format); }

const char* VX_RenderQualityName(int32_t renderQuality) noexcept { return renderQuality == 2 ? "Low" : "High"; }

const char* VX_ResultName(VX_Result result) noexcept {
  switch (result) {
#define VX_RESULT_NAME(name) \
  case name:                 \
    return #name;
    VX_RESULT_NAME(VX_Success)
    VX_RESULT_NAME(VX_ErrReserved1)
    VX_RESULT_NAME(VX_ErrInvalidRectangle)
    VX_RESULT_NAME(VX_ErrUnsupportedFormat)
    VX_RESULT_NAME(VX_ErrUnsupportedDestinationFormat)
    VX_RESULT_NAME(VX_ErrDestinationTooNarrow)
    VX_RESULT_NAME(VX_ErrDestinationTooShort)
    VX_RESULT_NAME(VX_ErrNullSource)
    VX_RESULT_NAME(VX_ErrNullDestination)
    VX_RESULT_NAME(VX_ErrUnsupportedConversion)
    VX_RESULT_NAME(VX_ErrOutOfMemory)
    VX_RESULT_NAME(VX_ErrArgumentOutOfRange)
    VX_RESULT_NAME(VX_ErrReserved18)
    VX_RESULT_NAME(VX_ErrFailed)
    VX_RESULT_NAME(VX_ErrFormatNotHandled)
#undef VX_RESULT_NAME
  }
  return "Unknown result";
}

const char* VX_GetVersion() noexcept { return VEXEL_VERSION_STRING; }
