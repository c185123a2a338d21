// Encoding of rasters and of decoded pictures into planar 4:2:0 blocks.
#include <algorithm>
#include <cstring>

#include "convert/Decode420.h"
#include "convert/Encode420Kernels.h"
#include "convert/RgbKernels.h"
#include "convert/RowConverter.h"
#include "convert/YuvKernels.h"
#include "convert/YuvMatrices.h"
#include "frame/FpModeGuard.h"
#include "frame/Scratch.h"
#include "frame/StreamCopy.h"

namespace vexel {

using namespace encode420;
using decode420::ByteChroma;

namespace {

// What the kernels take.
VX_PixelFormat WorkingFormat(VX_PixelFormat dst) noexcept {
  return IsVideoRange(dst) ? VX_PixelFormat::VUYX_4444_8u_709 : VX_PixelFormat::BGRX_4444_8u;
}

// Kernels, and the format of the rows that they read.
struct Input {
  const PairKernels* kernels;
  VX_PixelFormat rows;
};

// Whether a plan begins with the one to the format that it has after some of its steps.
bool BeginsWith(const Plan& plan, VX_PixelFormat src, int steps, int32_t quality) noexcept {
  Plan start;
  const auto isSame = [](const PlannedStep& a, const PlannedStep& b) { return a.kernel == b.kernel; };
  return MakePlan(src, plan.steps[static_cast<size_t>(steps - 1)].to, quality, &start) == VX_Success &&
         start.stepCount == steps &&
         std::equal(plan.steps.begin(), plan.steps.begin() + steps, start.steps.begin(), isSame);
}

// Rows are converted no further than to what kernels read: they do not look at the fourth channel, and know the last
// steps of some chains.
Input InputOf(VX_PixelFormat src, VX_PixelFormat working, int32_t quality) noexcept {
  const Input whole = {IsYuv(working) ? &kFromVuyx : &kFromBgrx, working};
  Plan plan;
  if (src == working || MakePlan(src, working, quality, &plan) != VX_Success) return whole;
  int steps = plan.stepCount;
  const auto endsWith = [&](const RowKernelSet& kernel) {
    const bool ends = steps > 0 && plan.steps[static_cast<size_t>(steps - 1)].kernel == &kernel;
    if (ends) --steps;
    return ends;
  };
  const PairKernels* kernels = whole.kernels;
  if (endsWith(kOpaqueLast8u))
    kernels = endsWith(kPremultiplyLast8u) ? &kFromBgra : kernels;
  else if (endsWith(kUyvy8ToVuyx8))
    kernels = &kFromUyvy;
  else if (endsWith(kYuyv8ToVuyx8))
    kernels = &kFromYuyv;
  if (steps == 0) return {kernels, src};
  return BeginsWith(plan, src, steps, quality) ? Input{kernels, plan.steps[static_cast<size_t>(steps - 1)].to} : whole;
}

constexpr int16_t Factor(double value) { return static_cast<int16_t>(value * 32768 + (value < 0 ? -0.5 : 0.5)); }

// The green factor takes the rounding of the others, so that grey keeps its code and has no chroma.
constexpr BgrFactors FactorsOf(double b, double r, int total) {
  return {Factor(b), static_cast<int16_t>(total - Factor(b) - Factor(r)), Factor(r)};
}
constexpr Factors FactorsOf(const YuvMatrix& m) {
  return {FactorsOf(m.yB, m.yR, 32768), FactorsOf(m.uB, m.uR, 0), FactorsOf(m.vB, m.vR, 0)};
}
constexpr Factors kFactors601 = FactorsOf(kBt601), kFactors709 = FactorsOf(kBt709);

size_t Pad(size_t bytes) noexcept { return (bytes + 63) & ~size_t{63}; }

// The lines of a picture in the format that the kernels take, top line first: of a raster or of a 4:2:0 picture.
class Lines {
 public:
  explicit Lines(int32_t width) noexcept : mWidth(width) {}

  // Both come before the memory is known. Codes as those of the decoder and of the planner.
  VX_Result Decode(const Picture420& src, VX_PixelFormat format, int32_t quality) noexcept {
    mDecodes = true;
    mSrcRowBytes = int64_t{mWidth} * 3 / (HasWideSamples(src.format) ? 1 : 2);
    return mDecoder.Prepare(src, format, src.width, src.height, 0, quality);
  }
  VX_Result Convert(VX_PixelFormat from, VX_PixelFormat to, int32_t quality) noexcept {
    Plan plan;
    mConverts = from != to;
    if (mConverts && mDecodes && MakePlan(from, to, quality, &plan) == VX_Success && plan.stepCount == 1)
      mConverts = !mDecoder.TakeStep(plan.steps[0]);
    if (!mDecodes) mSrcRowBytes = UnpaddedRowBytes(from, mWidth);
    return mConverts ? mConverter.Prepare(from, to, quality, mWidth) : VX_Success;
  }

  void SetRaster(const uint8_t* top, ptrdiff_t rowBytes) noexcept {
    mTop = top;
    mRowBytes = rowBytes;
  }

  size_t ScratchBytes() const noexcept;
  void UseScratch(uint8_t* scratch) noexcept;

  int64_t RowBytes() const noexcept { return mSrcRowBytes; }

  // The decoder, if what it makes is encoded as it is and keeps the codes of a 4:2:0 picture.
  Rows420* Codes() noexcept { return mDecodes && !mConverts && mDecoder.KeepsCodes() ? &mDecoder : nullptr; }

  // Where a line is read from, as far as it is in memory before.
  uintptr_t Address(int64_t line) const noexcept {
    if (mDecodes) return reinterpret_cast<uintptr_t>(mSlots[0]);
    return reinterpret_cast<uintptr_t>(mTop) + static_cast<uintptr_t>(line * mRowBytes);
  }

  // How many pixels Get makes at most: what passes through memory on the way stays in the first-level cache.
  int32_t PartPixels() const noexcept { return IsInParts() ? std::min(mWidth, kMostPixels) : mWidth; }

  // Part of a line, `count` pixels from a multiple of PartPixels on. The pixel before, if any, stands before it; the
  // parts come in order. Stays until another part takes the slot, 0 or 1.
  const uint8_t* Get(int64_t line, int slot, int32_t first, int32_t count) noexcept;

 private:
  bool IsInParts() const noexcept {
    return mDecodes && mDecoder.ReadsSource() && (!mConverts || mConverter.IsPointWise());
  }
  size_t SlotBytes() const noexcept { return kBefore + Pad(4 * static_cast<size_t>(PartPixels())); }
  int SlotCount() const noexcept { return mDecodes || mConverts ? mDecodes && mConverts ? 3 : 2 : 0; }

  static constexpr size_t kBefore = 64;         // bytes before a slot, for a pixel
  static constexpr int32_t kMostPixels = 1920;  // shorter parts would read samples before they have left for the cache

  int32_t mWidth;
  bool mDecodes = false, mConverts = false;
  Rows420 mDecoder;
  RowConverter mConverter;
  const uint8_t* mTop = nullptr;
  ptrdiff_t mRowBytes = 0;
  int64_t mSrcRowBytes = 0;
  uint8_t* mSlots[3] = {};  // the last one for what is decoded, then converted
};

size_t Lines::ScratchBytes() const noexcept {
  const size_t converterBytes = mConverts ? Pad(mConverter.ScratchBytes()) : 0;
  return static_cast<size_t>(SlotCount()) * SlotBytes() + converterBytes + (mDecodes ? mDecoder.ScratchBytes() : 0);
}

void Lines::UseScratch(uint8_t* scratch) noexcept {
  for (int i = 0; i < SlotCount(); ++i, scratch += SlotBytes()) mSlots[i] = scratch + kBefore;
  if (mConverts) {
    mConverter.UseScratch(scratch);
    scratch += Pad(mConverter.ScratchBytes());
  }
  if (mDecodes) mDecoder.UseScratch(scratch);
}

const uint8_t* Lines::Get(int64_t line, int slot, int32_t first, int32_t count) noexcept {
  uint8_t* const made = mSlots[slot];
  if (first != 0) std::memcpy(made - 4, made + 4 * (PartPixels() - 1), 4);
  const uint8_t* pixels = mTop + line * mRowBytes;
  if (mDecodes) {
    uint8_t* const decoded = mConverts ? mSlots[2] : made;
    mDecoder.BeginRow(static_cast<int32_t>(line));
    mDecoder.Pixels(first, count, decoded);
    pixels = decoded;
  }
  if (!mConverts) return pixels;
  if (!IsInParts()) {
    mConverter.Convert(pixels, made);
    return made;
  }
  const auto bytes = 4 * static_cast<size_t>(count);  // of four channels on either side
  for (size_t i = 0; i < bytes; i += 4 * kChainBlock)
    mConverter.ConvertBlock(pixels + i, made + i, std::min(bytes - i, 4 * kChainBlock) / 4);
  return made;
}

// The lines that make a chroma row. Each line belongs to one pair; a picture of an odd number of line pairs in fields
// has a pair more than chroma rows.
struct Pair {
  int64_t a, b;
};

class Encoder {
 public:
  Encoder(VX_PixelFormat format, void* dst, int32_t width, int32_t height, const PairKernels* kernels) noexcept
      : mFormat(format), mWidth(width), mHeight(height), mKernels(*kernels) {
    VX_GetPlanarBuffers(dst, format, width, height, mPlanes, mRowBytes);
    if (IsReversed(format)) std::swap(mPlanes[1], mPlanes[2]);
  }

  VX_Result Run(Lines& lines) const noexcept;

 private:
  Pair PairOf(int64_t row) const noexcept;
  template <class Kernel>
  Kernel Choose(const ByWeights<Kernel>& kernels, int64_t row) const noexcept;
  void CopyLuma(const uint8_t* luma, int64_t line, bool stream) const noexcept;
  void Recode(Rows420& lines, bool stream) const noexcept;
  bool GoesPastCache(const Lines& lines) const noexcept;
  int32_t ChromaColumns() const noexcept { return ChromaWidth(PictureFromBlock(mPlanes[0], mFormat, mWidth, mHeight)); }
  int64_t ChromaRows() const noexcept { return mHeight / 2 + mHeight % 2; }
  uint8_t* PlaneRow(int plane, int64_t row) const noexcept {
    return static_cast<uint8_t*>(mPlanes[plane]) + row * mRowBytes[plane];
  }

  VX_PixelFormat mFormat;
  int32_t mWidth, mHeight;
  const PairKernels& mKernels;
  void* mPlanes[3];
  int32_t mRowBytes[3];
  KernelVariant mVariant = ActiveKernelVariant();
};

Pair Encoder::PairOf(int64_t row) const noexcept {
  if (!IsFieldPicture(mFormat)) return {2 * row, 2 * row + 1};
  const int64_t first = row / 2 * 4 + row % 2;
  return {first, first + 2};
}

template <class Kernel>
Kernel Encoder::Choose(const ByWeights<Kernel>& kernels, int64_t row) const noexcept {
  if (!IsFieldPicture(mFormat)) return kernels.even[mVariant];
  return (row % 2 == 0 ? kernels.nearFirst : kernels.nearSecond)[mVariant];
}

// Whether reading the source would push the planes out of the cache before anyone looks at them, and they suit stores
// past it.
bool Encoder::GoesPastCache(const Lines& lines) const noexcept {
  const uint32_t cache = VX_GetCacheSize();
  uintptr_t places = 0;
  for (int i = 0; i < 3; ++i) places |= reinterpret_cast<uintptr_t>(mPlanes[i]) | static_cast<uintptr_t>(mRowBytes[i]);
  const int64_t planeBytes = int64_t{mWidth} * mHeight * 3 / 2;
  return places % 64 == 0 && cache != 0 && lines.RowBytes() * mHeight + planeBytes >= int64_t{cache / 2};
}

void Encoder::CopyLuma(const uint8_t* luma, int64_t line, bool stream) const noexcept {
  const auto bytes = static_cast<size_t>(mWidth);
  if (stream)
    StreamCopy(PlaneRow(0, line), luma, bytes, mVariant);
  else
    std::memcpy(PlaneRow(0, line), luma, bytes);
}

// Without making pixels.
void Encoder::Recode(Rows420& lines, bool stream) const noexcept {
  const bool isPlanes = lines.OwnChroma() == ByteChroma::Planes, swaps = lines.OwnChroma() == ByteChroma::SwappedPairs;
  const auto begin = [&](int64_t line) {
    lines.BeginRow(static_cast<int32_t>(line));
    const decode420::PixelRow samples = lines.OwnSamples();
    CopyLuma(samples.y, line, stream);
    return samples;
  };
  const int64_t chromaRows = ChromaRows();
  for (int64_t row = 0; row <= chromaRows; ++row) {
    const Pair pair = PairOf(row);
    if (pair.a >= mHeight) continue;
    const decode420::PixelRow a = begin(pair.a), b = pair.b < mHeight ? begin(pair.b) : a;
    if (row == chromaRows) continue;
    Choose(isPlanes ? kRecodePlanes : kRecodePairs, row)(
        a, b, PlaneRow(swaps ? 2 : 1, row), PlaneRow(swaps ? 1 : 2, row), static_cast<size_t>(ChromaColumns()));
  }
}

VX_Result Encoder::Run(Lines& lines) const noexcept {
  const Factors& factors = Colorimetry(mFormat) == 0 ? kFactors601 : kFactors709;
  const int32_t chromaWidth = ChromaColumns();
  const int64_t chromaRows = ChromaRows(), pairs = chromaRows + (IsFieldPicture(mFormat) ? 1 : 0);
  const size_t noChromaBytes = Pad(static_cast<size_t>(chromaWidth) + 1);
  VX_SCRATCH(scratch, noChromaBytes + lines.ScratchBytes());
  if (!scratch) return VX_ErrOutOfMemory;
  lines.UseScratch(scratch.get() + noChromaBytes);
  const bool stream = GoesPastCache(lines);
  if (Rows420* const codes = lines.Codes()) {
    Recode(*codes, stream);
    if (stream) StreamFence();
    return VX_Success;
  }
  const int32_t part = lines.PartPixels();
  for (int64_t row = 0; row < pairs; ++row) {
    const Pair pair = PairOf(row), next = PairOf(row + 1);
    if (pair.a >= mHeight) continue;
    const int64_t lineB = pair.b < mHeight ? pair.b : pair.a;
    const bool hasChroma = row < chromaRows, streams = stream && hasChroma;  // scratch memory may lie anywhere
    const EncodeLines encode = Choose(mKernels, row);
    const auto chroma = [&](int plane) { return hasChroma ? PlaneRow(plane, row) : scratch.get(); };
    for (int32_t x = 0; x < mWidth; x += part) {
      const int32_t count = std::min(part, mWidth - x), half = x / 2;
      const uint8_t* const a = lines.Get(pair.a, 0, x, count);
      const uint8_t* const b = lineB == pair.a ? a : lines.Get(lineB, 1, x, count);
      encode({a, b, PlaneRow(0, pair.a) + x, PlaneRow(0, lineB) + x, chroma(1) + half, chroma(2) + half,
              lines.Address(next.a), lines.Address(next.b), static_cast<size_t>(count),
              static_cast<size_t>(x + count < mWidth ? count / 2 : chromaWidth - half), streams, x != 0},
             factors);
    }
  }
  if (stream) StreamFence();
  return VX_Success;
}

}  // namespace

bool CanEncode420(VX_PixelFormat format) noexcept {
  if (!Is420(format) || IsBiplanar(format) || Depth(format) != kDepth8u) return false;
  return Colorimetry(format) == kColorimetry709 || (Colorimetry(format) == 0 && !IsVideoRange(format));
}

VX_Result Encode420(const void* src, int32_t srcRowBytes, VX_PixelFormat srcFormat, void* dst, VX_PixelFormat dstFormat,
                    int32_t width, int32_t height, int32_t quality) noexcept {
  if (IsSpecial(srcFormat) || !CanEncode420(dstFormat)) return VX_ErrFormatNotHandled;
  const FpModeGuard fpMode;
  Lines lines(width);
  const Input input = InputOf(srcFormat, WorkingFormat(dstFormat), quality);
  if (const VX_Result result = lines.Convert(srcFormat, input.rows, quality)) return result;
  if (width < 1 || height < 1) return VX_Success;
  if (!src) return VX_ErrNullSource;
  if (!dst) return VX_ErrNullDestination;
  const auto* top = static_cast<const uint8_t*>(src);
  if (VX_IsOriginBottomLeft(srcFormat))
    lines.SetRaster(top + (height - 1) * ptrdiff_t{srcRowBytes}, -ptrdiff_t{srcRowBytes});
  else
    lines.SetRaster(top, srcRowBytes);
  return Encoder(dstFormat, dst, width, height, input.kernels).Run(lines);
}

VX_Result Recode420(const void* src, VX_PixelFormat srcFormat, VX_PixelFormat decoded, int32_t decodeQuality, void* dst,
                    VX_PixelFormat dstFormat, int32_t width, int32_t height, int32_t quality) noexcept {
  if (!CanDecode420(srcFormat)) return VX_ErrUnsupportedFormat;
  if (!CanEncode420(dstFormat)) return VX_ErrFormatNotHandled;
  const FpModeGuard fpMode;
  const Picture420 picture = PictureFromBlock(src, srcFormat, width, height);
  Lines lines(width);
  if (const VX_Result result = lines.Decode(picture, decoded, decodeQuality)) return result;
  const Input input = InputOf(decoded, WorkingFormat(dstFormat), quality);
  if (const VX_Result result = lines.Convert(decoded, input.rows, quality)) return result;
  if (width < 1 || height < 1) return VX_Success;
  if (!src) return VX_ErrNullSource;
  if (!dst) return VX_ErrNullDestination;
  TraceFullSize420(picture);
  return Encoder(dstFormat, dst, width, height, input.kernels).Run(lines);
}

}  // namespace vexel
