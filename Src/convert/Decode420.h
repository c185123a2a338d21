// The 4:2:0 decoder as a source of rows.
#pragma once

#include "convert/Decode420Kernels.h"
#include "convert/Planar420.h"
#include "convert/Planner.h"
#include "frame/KernelVariant.h"

namespace vexel {

// Widths that the decoder resamples to while converting.
enum class HorizontalRatio : uint8_t { None, FourThirds, ThreeHalves };

// The anamorphic case that these sizes are, if the feature switches allow one.
HorizontalRatio AnamorphicRatio(int64_t srcWidth, int64_t srcHeight, int64_t dstWidth, int64_t dstHeight) noexcept;

// Widths in the ratio 1, 2, 4 or 8, heights in an even one.
bool IsReduction(int64_t srcWidth, int64_t srcHeight, int64_t dstWidth, int64_t dstHeight) noexcept;

// The kernels' factors from a 4:2:0 format to an 8-bit raster format.
decode420::Matrix MakeMatrix420(VX_PixelFormat src, VX_PixelFormat dst) noexcept;

// The line of trace that belongs to every decode at full size.
void TraceFullSize420(const Picture420& src) noexcept;

// Makes the rows of a decoded picture one at a time, top line first: the caller may hand each one on and needs no whole
// frame between. It makes 8-bit BGR or video-range VUY with a fourth channel last, written opaque.
//
// A decoded row is the mean of one or more picture lines as the full-size decoder would show them before rounding, and
// a reduced pixel the mean of its pixels in those lines. Lines: full size, the line itself. Half height, the line of
// the field asked for, or for whole pictures both lines of a frame picture, the upper field's of a field picture.
// Reductions, all lines of the block; in field pictures only those of the upper field, so that two moments never mix.
//
// Quality 2 and above interpolates chroma linearly at its siting; below, every pixel takes the chroma sample that
// covers it (in field pictures the one of its own field).
class Rows420 {
 public:
  static bool CanMake(VX_PixelFormat format) noexcept;

  // Checks the sizes and chooses the kernels. VX_ErrUnsupportedConversion for sizes that are not reached; planes are
  // not looked at. An empty size is legal where the rules reach it.
  VX_Result Prepare(const Picture420& src, VX_PixelFormat format, int32_t width, int32_t height, int32_t field,
                    int32_t quality, KernelVariant variant = ActiveKernelVariant()) noexcept;

  // Takes over a step that a conversion of the rows begins with, if a kernel makes its bytes at once: the rows then
  // have the step's format.
  bool TakeStep(const PlannedStep& step) noexcept;

  // 64-byte-aligned memory is fastest; none is read before it is written.
  size_t ScratchBytes() const noexcept;
  void UseScratch(uint8_t* scratch) noexcept;

  // Whether beginning a row costs nothing: pixels are made of the picture's own samples.
  bool ReadsSource() const noexcept { return mLumaFromSource && mChromaFromSource; }

  // Whether rows of full size keep luma as it is and mix chroma of the picture's own bytes, and of what kind these are;
  // then, the samples of the row that has begun.
  bool KeepsCodes() const noexcept { return mKeepsCodes; }
  decode420::ByteChroma OwnChroma() const noexcept;
  decode420::PixelRow OwnSamples() const noexcept;

  // Makes the samples of a row ready, then any part of it: `count` pixels from an even `first` on. Past the cache,
  // which takes a dst on a line of it, if `stream` says so; StreamFence (frame/StreamCopy.h) is the caller's.
  void BeginRow(int32_t row) noexcept;
  void Pixels(int32_t first, int32_t count, uint8_t* dst, bool stream = false) noexcept;

 private:
  struct Tap {
    int32_t row;
    uint32_t weight;
    bool operator==(const Tap&) const = default;
  };
  // Rows to average: of luma, of a chroma plane, or of both chroma planes interleaved.
  struct Plane {
    const uint8_t* base;
    ptrdiff_t rowBytes;
    decode420::MixSamples mix;
    uint16_t* out[2];
    size_t samples;
  };

  VX_Result ChooseLines(int32_t field, int32_t quality) noexcept;
  void ChooseKernels(VX_PixelFormat format) noexcept;
  size_t PlaceRows(uint8_t* scratch) noexcept;

  int32_t LineOf(int32_t row, int32_t index) const noexcept { return row * mAdvance + mFirstLine + index * mLineStep; }
  void AddTap(int32_t row, uint32_t weight) noexcept;
  void AddChromaTaps(int32_t line) noexcept;
  void MeanOfRows(const Plane& plane, uint64_t total) const noexcept;
  void MakeLuma(int32_t row) noexcept;
  void MakeChroma(int32_t row) noexcept;
  void UseChroma(const Tap& a, const Tap& b) noexcept;
  void MixChroma() noexcept;
  const uint16_t* ResampleLuma() noexcept;
  const uint16_t* ResampleChroma(uint16_t* samples, uint16_t* resampled) noexcept;

  Picture420 mSrc{};
  int32_t mWidth = 0, mHeight = 0, mChromaWidth = 0;
  bool mLinear = false;

  // Row r is the mean of mLines lines, mLineStep apart, from mAdvance * r + mFirstLine on; its pixels are means of
  // mColumns pixels, or lie in mRatio to the picture's.
  int32_t mAdvance = 1, mFirstLine = 0, mLineStep = 1, mLines = 1, mColumns = 1;
  HorizontalRatio mRatio = HorizontalRatio::None;

  KernelVariant mVariant = KernelVariant::Plain;
  decode420::MixSamples mMixLuma = nullptr, mMixChroma = nullptr;
  decode420::ResampleRow mResample = nullptr;
  decode420::MakePixels mMakePixels = nullptr;
  decode420::Matrix mMatrix{};
  bool mHalfChroma = true, mLumaFromSource = true, mChromaFromSource = false, mKeepsCodes = false;

  // Scratch: averaged rows, resampled ones, a row or two on their way, sums, and what is being averaged.
  uint16_t *mY = nullptr, *mU = nullptr, *mV = nullptr;
  uint16_t *mWideY = nullptr, *mWideU = nullptr, *mWideV = nullptr;
  uint16_t* mTemp[2] = {};
  uint32_t* mSums = nullptr;
  Tap* mTaps = nullptr;
  int32_t mTapCount = 0;

  // The chroma rows behind mU and mV, where single lines are decoded: lines that share them need them once.
  Tap mHeld[2] = {{-1, 0}, {-1, 0}};
  // What Pixels reads, from its first pixel on.
  decode420::PixelRow mRow{};
  ptrdiff_t mLumaBytes = 1, mChromaBytes = 2;  // per pixel; per two or, where not halved, per pixel
};

}  // namespace vexel
