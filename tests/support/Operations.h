// The operations on pictures, each called with frames.
#pragma once

#include "support/Arena.h"
#include "support/Test.h"
#include "vexel/compositing.h"

namespace vexel::testing {

// Pixels wherever they are.
struct View {
  View(const void* pixels, int32_t bytes, VX_PixelFormat f) : base(pixels), rowBytes(bytes), format(f) {}
  View(const ArenaFrame& frame) : View(frame.base, frame.rowBytes, frame.format) {}

  const void* base;
  int32_t rowBytes;
  VX_PixelFormat format;
};

inline VX_Result Convert(const View& s, const ArenaFrame& to, int32_t quality = 3) {
  return VX_Convert(s.base, s.rowBytes, s.format, to.base, to.rowBytes, to.format, to.width, to.height, quality);
}

// From a source of its own size.
inline VX_Result Rotate(const ArenaFrame& s, const ArenaFrame& to, int32_t angle, bool flip) {
  return VX_RotateImageAndFlip(s.base, s.rowBytes, to.base, to.rowBytes, s.width, s.height, to.format, angle, flip);
}

inline VX_Result Composite(const View& s, const View& d, const ArenaFrame& to, float opacity, int32_t quality = 3) {
  return VX_Composite(s.base, s.rowBytes, s.format, d.base, d.rowBytes, d.format, to.base, to.rowBytes, to.format,
                      to.width, to.height, opacity, quality, false);
}

inline VX_Result Blend(VX_BlendMode mode, const View& s, const View& d, const ArenaFrame& to, float opacity = 1,
                       int32_t quality = 3) {
  return VX_CompositeWithBlendMode(s.base, s.rowBytes, s.format, d.base, d.rowBytes, d.format, to.base, to.rowBytes,
                                   to.format, to.width, to.height, opacity, static_cast<int32_t>(mode), quality, false);
}

inline VX_Result ToBlack(const View& s, const ArenaFrame& to, float opacity, int32_t hint = 0) {
  return VX_CompositeToBlack(s.base, s.rowBytes, s.format, to.base, to.rowBytes, to.format, to.width, to.height,
                             opacity, hint);
}

inline VX_Result ToBlackTested(const View& s, const ArenaFrame& to, int32_t* state, int32_t hint = 0) {
  return VX_CompositeToBlackAndTestSourceAlpha(s.base, s.rowBytes, s.format, to.base, to.rowBytes, to.format, to.width,
                                               to.height, state, hint);
}

inline VX_Result Dissolve(const View& a, const View& b, const ArenaFrame& to, float mix, int32_t hint = 3) {
  return VX_CrossDissolve(a.base, a.rowBytes, a.format, b.base, b.rowBytes, b.format, to.base, to.rowBytes, to.format,
                          to.width, to.height, mix, hint);
}

// Without weights each is 1.
inline VX_Result Accumulate(const std::vector<View>& sources, const ArenaFrame& to,
                            const std::vector<float>& weights = {}) {
  std::vector<const void*> bases;
  std::vector<int32_t> rowBytes;
  std::vector<VX_PixelFormat> formats;
  for (const View& v : sources) bases.push_back(v.base), rowBytes.push_back(v.rowBytes), formats.push_back(v.format);
  return VX_Accumulate(bases.data(), rowBytes.data(), formats.data(), static_cast<int32_t>(sources.size()), to.base,
                       to.rowBytes, to.format, to.width, to.height, weights.empty() ? nullptr : weights.data(), 3);
}

inline VX_Result AlphaGain(const View& s, const ArenaFrame& to, float gain, int32_t hint = 0) {
  return VX_AlphaGain(s.base, s.rowBytes, s.format, to.base, to.rowBytes, to.format, to.width, to.height, gain, hint);
}

inline VX_Result InvertAlpha(const View& s, const ArenaFrame& to) {
  return VX_InvertAlpha(s.base, s.rowBytes, to.base, to.rowBytes, to.format, to.width, to.height);
}

inline VX_Result SetAlpha(const View& s, const ArenaFrame& to, float alpha) {
  return VX_CopyAndSetAlpha(s.base, s.rowBytes, to.base, to.rowBytes, to.format, to.width, to.height, alpha);
}

inline VX_Result RemoveMatte(const View& s, const ArenaFrame& to, const void* matte, VX_PixelFormat matteFormat) {
  return VX_UnPremultiplyAgainstMatteColor(s.base, s.rowBytes, to.base, to.rowBytes, to.format, to.width, to.height,
                                           matte, matteFormat, 0);
}

// The mask's format does not count.
inline VX_Result ChooseByMask(const View& a, const View& b, const View& mask, int32_t bit, const ArenaFrame& to) {
  return VX_OneBitMaskComposite(a.base, a.rowBytes, a.format, b.base, b.rowBytes, b.format, mask.base, mask.rowBytes,
                                bit, to.base, to.rowBytes, to.format, to.width, to.height, 2);
}

using Fill = VX_Result (*)(void*, int32_t, int32_t, int32_t, VX_PixelFormat);
inline VX_Result FillWith(Fill fill, const ArenaFrame& to) {
  return fill(to.base, to.rowBytes, to.width, to.height, to.format);
}

}  // namespace vexel::testing
