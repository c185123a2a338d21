#include <algorithm>

#include "convert/Decode420.h"
#include "convert/Decode420Rgb512.h"
#include "convert/Vbmi.h"
#include "convert/YuvKernels.h"
#include "frame/Scratch.h"

namespace vexel {

using namespace decode420;

namespace {

// Weights of one line's chroma rows are in eighths.
constexpr int32_t kLineWeight = 8;

// A block one pixel wide has no chroma bytes.
constexpr uint16_t kNoChroma = 128 << 8;

size_t RowSamples(size_t samples) { return (samples + 2 * kRowSlack + 31) & ~size_t{31}; }

void RepeatEdges(uint16_t* row, size_t samples, size_t left, size_t right) {
  std::fill_n(row - left, left, row[0]);
  std::fill_n(row + samples, right, row[samples - 1]);
}

}  // namespace

bool Rows420::CanMake(VX_PixelFormat format) noexcept {
  const uint32_t bits = Bits(format) & ~kAlphaMask;
  if (AlphaKind(format) == kAlphaNone) return false;
  return bits == 0 || bits == (kVideoRangeBit | kYuvBit) || bits == (kVideoRangeBit | kYuvBit | kColorimetry709);
}

VX_Result Rows420::Prepare(const Picture420& src, VX_PixelFormat format, int32_t width, int32_t height, int32_t field,
                           int32_t quality, KernelVariant variant) noexcept {
  *this = Rows420();
  mSrc = src;
  mChromaWidth = ChromaWidth(src);
  mWidth = width;
  mHeight = height;
  mLinear = quality >= 2;
  mVariant = variant;
  if (const VX_Result result = ChooseLines(field, quality)) return result;
  ChooseKernels(format);
  return VX_Success;
}

VX_Result Rows420::ChooseLines(int32_t field, int32_t quality) noexcept {
  const int32_t w = mSrc.width, h = mSrc.height;
  if (w < 0 || h < 0 || mWidth < 0 || mHeight < 0) return VX_ErrUnsupportedConversion;
  mRatio = AnamorphicRatio(w, h, mWidth, mHeight);
  const bool isWide = mRatio != HorizontalRatio::None;
  const bool oneField = IsFieldPicture(mSrc.format);
  if ((isWide || mWidth == w) && mHeight == h) return VX_Success;
  if ((isWide || mWidth == w) && mHeight == h / 2) {
    const bool isField = field == 1 || field == 2;
    mAdvance = 2;
    mFirstLine = isField ? field - 1 : 0;
    mLines = isField || oneField ? 1 : 2;
    return VX_Success;
  }
  const bool isHalfSize = w == 2 * int64_t{mWidth} && mHeight == h / 2;
  if (!isHalfSize && (quality >= 3 || !IsReduction(w, h, mWidth, mHeight))) return VX_ErrUnsupportedConversion;
  mColumns = isHalfSize ? 2 : w / mWidth;
  mAdvance = isHalfSize ? 2 : h / mHeight;
  mLineStep = oneField ? 2 : 1;
  mLines = mAdvance / mLineStep;
  return VX_Success;
}

void Rows420::ChooseKernels(VX_PixelFormat format) noexcept {
  const bool wide = HasWideSamples(mSrc.format), pairs = IsBiplanar(mSrc.format);
  mMixLuma = (wide ? kMixPlane10 : kMixPlane8)[mVariant];
  mMixChroma = (pairs ? wide ? kMixPairs10 : kMixPairs8 : wide ? kMixPlane10 : kMixPlane8)[mVariant];
  mHalfChroma = mColumns == 1 && mRatio == HorizontalRatio::None;
  if (mRatio != HorizontalRatio::None)
    mResample = (mRatio == HorizontalRatio::FourThirds ? kFourThirds : kThreeHalves)[mVariant];
  // One line's own samples need no stage before the pixels, if none is missing.
  const bool isLine = mHalfChroma && mLines == 1;
  mChromaFromSource = isLine && (!wide || pairs) && mChromaWidth == (int64_t{mSrc.width} + 1) / 2;
  mLumaFromSource = isLine && (wide || mChromaFromSource);
  mLumaBytes = wide || !mLumaFromSource ? 2 : 1;
  mChromaBytes = !mChromaFromSource ? 2 : (wide ? 2 : 1) * (pairs ? 2 : 1);
  const PixelKernels& pixels = IsYuv(format) ? kToVuyx : kToBgrx;
  const OwnChromaKernels& own = mLinear ? pixels.mixed : pixels.nearest;
  mMatrix = MakeMatrix420(mSrc.format, format);
  mKeepsCodes = mChromaFromSource && mLinear && !wide && IsYuv(format) && mMatrix == kSameCodes;
  const auto kernel = [&]() -> const KernelVariants<MakePixels>& {
    if (!mHalfChroma) return pixels.full;
    if (!mChromaFromSource) return mLinear ? pixels.wideLinear : pixels.wideNearest;
    if (mKeepsCodes) return kToCodes[OwnChroma()];
    if (!pairs) return own.bytes;
    if (IsReversed(mSrc.format)) return wide ? own.swappedWidePairs : own.swappedPairs;
    return wide ? own.widePairs : own.pairs;
  };
  mMakePixels = kernel()[mVariant];
}

ByteChroma Rows420::OwnChroma() const noexcept {
  if (!IsBiplanar(mSrc.format)) return ByteChroma::Planes;
  return IsReversed(mSrc.format) ? ByteChroma::SwappedPairs : ByteChroma::Pairs;
}

PixelRow Rows420::OwnSamples() const noexcept {
  PixelRow row = mRow;
  row.chroma = static_cast<size_t>(mChromaWidth);
  return row;
}

bool Rows420::TakeStep(const PlannedStep& step) noexcept {
  if (!mKeepsCodes) return false;
  const bool to601 = step.kernel == &kVuyx8ToBgrx8_601, to709 = step.kernel == &kVuyx8ToBgrx8_709;
  if (step.kernel == &kVuyx8ToUyvy8)
    mMakePixels = kToUyvy[OwnChroma()][mVariant];
  else if ((to601 || to709) && mVariant == KernelVariant::Avx512 && HasVbmi())
    mMakePixels = CodesToBgrx512(OwnChroma(), to709);
  else
    return false;
  mKeepsCodes = false;
  return true;
}

size_t Rows420::PlaceRows(uint8_t* scratch) noexcept {
  size_t used = 0;
  const auto place = [&](auto*& row, size_t elements) {
    using Element = std::remove_reference_t<decltype(*row)>;
    row = scratch ? reinterpret_cast<Element*>(scratch + used) : nullptr;
    used += ScratchRounded(elements * sizeof(Element));
  };
  const auto placeRow = [&](uint16_t*& row, size_t samples) {
    place(row, RowSamples(samples));
    if (row) row += kRowSlack;
  };
  const auto width = static_cast<size_t>(mSrc.width), chroma = width / 2 + 1;
  if (!mLumaFromSource) placeRow(mY, width);
  if (!mChromaFromSource)
    for (uint16_t** row : {&mU, &mV}) placeRow(*row, chroma);
  if (mResample)
    for (uint16_t** row : {&mWideY, &mWideU, &mWideV}) placeRow(*row, static_cast<size_t>(mWidth));
  if (mResample || mLines > 1) {
    for (uint16_t*& row : mTemp) placeRow(row, width);
    place(mSums, RowSamples(width));
  }
  place(mTaps, 2 * static_cast<size_t>(mLines));
  return used;
}

size_t Rows420::ScratchBytes() const noexcept { return Rows420(*this).PlaceRows(nullptr); }
void Rows420::UseScratch(uint8_t* scratch) noexcept { PlaceRows(scratch); }

// Lines come in order, so a row that is already there is among the last few.
void Rows420::AddTap(int32_t row, uint32_t weight) noexcept {
  for (int32_t i = mTapCount - 1; i >= 0 && i >= mTapCount - 4; --i)
    if (mTaps[i].row == row) {
      mTaps[i].weight += weight;
      return;
    }
  mTaps[mTapCount++] = {row, weight};
}

// The two chroma rows about a line. Within the rows of the picture, or of one field, row k lies `offset` quarters of a
// line past line 2k: 2 in frame pictures, 1 in the upper field and 3 in the lower one.
void Rows420::AddChromaTaps(int32_t line) noexcept {
  const bool oneField = IsFieldPicture(mSrc.format);
  const int32_t parity = oneField ? line % 2 : 0, step = oneField ? 2 : 1;
  const int32_t rows = (ChromaHeight(mSrc) - parity + step - 1) / step;
  if (rows < 1) return AddTap(0, kLineWeight);  // a picture of one or two lines has chroma of the upper field only
  const int32_t ownLine = line / step, own = ownLine / 2;
  const auto add = [&](int32_t k, int32_t weight) {
    AddTap(std::clamp(k, 0, rows - 1) * step + parity, static_cast<uint32_t>(weight));
  };
  if (!mLinear) return add(own, kLineWeight);
  const int32_t offset = oneField ? 1 + 2 * parity : 2;
  const bool isAbove = ownLine % 2 == 0;  // the line lies above the chroma row that covers it
  const int32_t otherWeight = isAbove ? offset : 4 - offset;
  add(own, kLineWeight - otherWeight);
  add(isAbove ? own - 1 : own + 1, otherWeight);
}

void Rows420::MeanOfRows(const Plane& plane, uint64_t total) const noexcept {
  const uint32_t mixTotal = HasWideSamples(mSrc.format) ? kMixTotal10 : kMixTotal8;
  const auto row = [&](int32_t tap) { return plane.base + mTaps[tap].row * plane.rowBytes; };
  if (mixTotal % total == 0) {
    const auto scale = static_cast<uint32_t>(mixTotal / total);
    for (int32_t i = 0; i < mTapCount; i += 2) {
      const int32_t next = i + 1 < mTapCount ? i + 1 : i;
      const MixRows rows = {row(i), row(next), scale * mTaps[i].weight, next == i ? 0 : scale * mTaps[next].weight,
                            i > 0};
      plane.mix(rows, plane.out[0], plane.out[1], plane.samples);
    }
    return;
  }
  // One plane after the other: they share the sums. Weights are differences of a running total, so that they add up.
  for (int k = 0; k < 2; ++k) {
    if (!plane.out[k]) continue;
    uint64_t seen = 0, given = 0;
    for (int32_t i = 0; i < mTapCount; ++i) {
      plane.mix({row(i), row(i), mixTotal, 0, false}, mTemp[0], mTemp[1], plane.samples);
      seen += mTaps[i].weight;
      const uint64_t upTo = seen * 65536 / total;
      kAddWeighted[mVariant](mTemp[k], static_cast<uint32_t>(upTo - given), i == 0, mSums, plane.samples);
      given = upTo;
    }
    kFinishSums[mVariant](mSums, plane.out[k], plane.samples);
  }
}

const uint16_t* Rows420::ResampleLuma() noexcept {
  const auto width = static_cast<size_t>(mSrc.width);
  if (mResample) {
    RepeatEdges(mY, width, 2, 2);
    mResample(mY, mWideY, static_cast<size_t>(mWidth));
    return mWideY;
  }
  for (int32_t columns = mColumns; columns > 1; columns /= 2)
    kHalveRow[mVariant](mY, mY, width * static_cast<size_t>(columns) / 2 / static_cast<size_t>(mColumns));
  return mY;
}

void Rows420::MakeLuma(int32_t row) noexcept {
  if (mLumaFromSource) {
    mRow.y = mSrc.planes[0] + LineOf(row, 0) * mSrc.rowBytes[0];
    return;
  }
  mTapCount = 0;
  for (int32_t i = 0; i < mLines; ++i) mTaps[mTapCount++] = {LineOf(row, i), 1};
  MeanOfRows({mSrc.planes[0], mSrc.rowBytes[0], mMixLuma, {mY, nullptr}, static_cast<size_t>(mSrc.width)},
             static_cast<uint64_t>(mLines));
  mRow.y = reinterpret_cast<const uint8_t*>(ResampleLuma());
}

const uint16_t* Rows420::ResampleChroma(uint16_t* samples, uint16_t* resampled) noexcept {
  const auto width = static_cast<size_t>(mSrc.width), chroma = (width + 1) / 2;
  const auto readable = static_cast<size_t>(mChromaWidth);
  if (readable == 0)
    std::fill_n(samples, chroma + 1, kNoChroma);
  else
    RepeatEdges(samples, readable, 0, chroma - readable + 1);
  if (mResample) {
    uint16_t* const doubled = mTemp[0];
    (mLinear ? kDoubleLinear : kDoubleNearest)[mVariant](samples, doubled, width);
    RepeatEdges(doubled, width, 2, 2);
    mResample(doubled, resampled, static_cast<size_t>(mWidth));
    return resampled;
  }
  if (mColumns == 1) return samples;
  if (mLinear) kMeanOfPairs[mVariant](samples, samples, chroma);
  for (int32_t columns = mColumns / 2; columns > 1; columns /= 2)
    kHalveRow[mVariant](samples, samples, width * static_cast<size_t>(columns) / 2 / static_cast<size_t>(mColumns));
  return samples;
}

void Rows420::MakeChroma(int32_t row) noexcept {
  mTapCount = 0;
  for (int32_t i = 0; i < mLines; ++i) AddChromaTaps(LineOf(row, i));
  const Tap taps[2] = {mTaps[0], mTapCount > 1 ? mTaps[1] : Tap{mTaps[0].row, 0}};
  if (mChromaFromSource) return UseChroma(taps[0], taps[1]);
  if (mLines == 1) {
    if (std::equal(taps, taps + 2, mHeld)) return;
    std::copy(taps, taps + 2, mHeld);
  }
  MixChroma();
  mRow.u = reinterpret_cast<const uint8_t*>(ResampleChroma(mU, mWideU));
  mRow.v = reinterpret_cast<const uint8_t*>(ResampleChroma(mV, mWideV));
}

void Rows420::UseChroma(const Tap& a, const Tap& b) noexcept {
  const bool pairs = IsBiplanar(mSrc.format);
  const int first = IsReversed(mSrc.format) && !pairs ? 2 : 1, second = pairs ? 1 : 3 - first;
  const auto row = [&](int plane, const Tap& tap) { return mSrc.planes[plane] + tap.row * mSrc.rowBytes[plane]; };
  mRow.u = row(first, a), mRow.uB = row(first, b), mRow.weightA = a.weight;
  mRow.v = row(second, a), mRow.vB = row(second, b), mRow.weightB = b.weight;
}

void Rows420::MixChroma() noexcept {
  const bool reversed = IsReversed(mSrc.format);
  uint16_t *const out0 = reversed ? mV : mU, *const out1 = reversed ? mU : mV;
  const auto samples = static_cast<size_t>(mChromaWidth);
  if (samples == 0) return;
  const uint64_t total = uint64_t{kLineWeight} * static_cast<uint64_t>(mLines);
  if (IsBiplanar(mSrc.format)) {
    MeanOfRows({mSrc.planes[1], mSrc.rowBytes[1], mMixChroma, {out0, out1}, samples}, total);
  } else {
    MeanOfRows({mSrc.planes[1], mSrc.rowBytes[1], mMixChroma, {out0, nullptr}, samples}, total);
    MeanOfRows({mSrc.planes[2], mSrc.rowBytes[2], mMixChroma, {out1, nullptr}, samples}, total);
  }
}

void Rows420::BeginRow(int32_t row) noexcept {
  MakeLuma(row);
  MakeChroma(row);
}

void Rows420::Pixels(int32_t first, int32_t count, uint8_t* dst, bool stream) noexcept {
  const ptrdiff_t sample = mHalfChroma ? first / 2 : first, chroma = sample * mChromaBytes;
  PixelRow row = mRow;
  row.y += first * mLumaBytes;
  row.u += chroma, row.v += chroma;
  if (mChromaFromSource) {
    row.uB += chroma, row.vB += chroma;
    row.chroma = static_cast<size_t>(mChromaWidth - sample);
  }
  row.dst = dst;
  row.count = static_cast<size_t>(count);
  row.stream = stream;
  mMakePixels(row, mMatrix);
}

}  // namespace vexel
