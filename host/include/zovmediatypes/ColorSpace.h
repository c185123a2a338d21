#pragma once

#include <cstdint>

namespace zovmediatypes::color {

// A colour space by its code points: primaries, transfer characteristics and matrix coefficients as ITU-T H.273 counts
// them, with the depth in bits and the range of the samples. All zero is no colour space.
struct ColorSpace {
  int32_t mPrimaries;
  int32_t mTransfer;
  int32_t mMatrix;
  int32_t mBitDepth;
  bool mIsFullRange;
  bool mIsRGB;

  friend constexpr bool operator==(const ColorSpace& a, const ColorSpace& b) {
    return a.mPrimaries == b.mPrimaries && a.mTransfer == b.mTransfer && a.mMatrix == b.mMatrix &&
           a.mBitDepth == b.mBitDepth && a.mIsFullRange == b.mIsFullRange && a.mIsRGB == b.mIsRGB;
  }
  friend constexpr bool operator!=(const ColorSpace& a, const ColorSpace& b) { return !(a == b); }
};

}  // namespace zovmediatypes::color
