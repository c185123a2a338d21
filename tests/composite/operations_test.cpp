// What holds for every operation on pictures: what it refuses, where it reads and writes, the destination in the place
// of a source, any number of threads, ways past the cache, strides of gigabytes, failing allocations.
#include <vexel_host/host.h>
#include <xmmintrin.h>

#include "frame/RuntimeRandom.h"
#include "support/Arena.h"
#include "support/FailingAllocations.h"
#include "support/Formats.h"
#include "support/Image.h"
#include "support/Operations.h"
#include "support/Processor.h"
#include "support/Test.h"

namespace vexel::testing {
namespace {

using Sources = const ArenaFrame*;
using To = const ArenaFrame&;

bool IsAny(F) { return true; }
bool IsBytes(F f) { return f == F::BGRA_4444_8u; }
bool IsAddressed(F f) { return IsPixels(f) || f == kRgb10Format; }

// The codes of frames instead of rasters and of rasters that nothing leads from or to.
struct Refusals {
  VX_Result badSource, badDestination, noWayFrom, noWayTo;
};
constexpr Refusals kOwn{},
    kBlends = {VX_ErrUnsupportedFormat, VX_ErrUnsupportedDestinationFormat, VX_ErrFormatNotHandled,
               VX_ErrFormatNotHandled},
    kToBlacks = {VX_ErrUnsupportedFormat, VX_ErrUnsupportedDestinationFormat, VX_ErrUnsupportedFormat,
                 VX_ErrUnsupportedDestinationFormat},
    kMixes = {VX_ErrUnsupportedFormat, VX_ErrUnsupportedDestinationFormat, VX_ErrFailed, VX_ErrFailed},
    kChoices = {VX_ErrUnsupportedFormat, VX_ErrUnsupportedDestinationFormat, VX_ErrFailed,
                VX_ErrUnsupportedDestinationFormat};
constexpr Refusals All(VX_Result code) { return {code, code, code, code}; }

struct Operation {
  std::string name;
  int sources;
  std::function<VX_Result(Sources, To)> call;
  Refusals refusals;
  bool (*takes)(F) = IsAny;       // for the destination
  bool oneFormat = false;         // all pictures are of the destination's
  bool readsDestination = false;  // besides writing it
  int places = sources;           // so many sources may be the destination
};

// The width draws the mode. One row of a dissolve goes on with the thread's generator.
VX_Result BlendByWidth(Sources s, To to) {
  SeedRuntimeRandom(5);
  return Blend(static_cast<VX_BlendMode>(static_cast<uint32_t>(to.width) % 27), s[0], s[1], to, 0.6f);
}

// Row bytes are taken as whole words: rows with others are set one at a time.
VX_Result SetAlphaAtAnyStride(Sources s, To to) {
  if (s->rowBytes % 4 == 0 && to.rowBytes % 4 == 0) return SetAlpha(*s, to, 0.3f);
  VX_Result result = VX_Success;
  for (int y = 0; y < to.height; ++y)
    result = std::min(result, SetAlpha({s->Row(y), 64, s->format}, {to.Row(y), 64, to.format, to.width, 1}, 0.3f));
  return result;
}

std::vector<Operation> Operations() {
  static const float matte[4] = {0.16f, 0.5f, 1, 0.7f};
  static const uint8_t factors[4] = {255, 1, 0, 77};
  std::vector<Operation> all = {
      {"blend", 2, BlendByWidth, kBlends},
      {"tested to black", 1, [](Sources s, To to) { return ToBlackTested(s[0], to, nullptr); }, kToBlacks},
      {"dissolve", 2, [](Sources s, To to) { return Dissolve(s[0], s[1], to, 0.3f); }, kMixes},
      {"accumulate", 3,
       [](Sources s, To to) {
         return Accumulate({s[0], s[1], s[2]}, to, {0.5f, 0.25f, 0.3f});
       },
       kMixes},
      {"gain", 1, [](Sources s, To to) { return AlphaGain(s[0], to, to.width % 2 ? 0.4f : 3.5f); }, kMixes},
      {"invert", 1, [](Sources s, To to) { return InvertAlpha(s[0], to); }, All(VX_ErrUnsupportedFormat), IsPixels,
       true, true},
      {"set alpha", 1, SetAlphaAtAnyStride, All(VX_ErrFormatNotHandled), IsPixels, true},
      {"matte", 1, [](Sources s, To to) { return RemoveMatte(s[0], to, matte, F::BGRA_4444_32f); },
       All(VX_ErrUnsupportedFormat), IsMatted, true},
      {"multiply", 1,
       [](Sources s, To to) {
         return VX_MultiplyByConstant(to.width, to.height, s->base, s->rowBytes, to.base, to.rowBytes, factors, 7);
       },
       kOwn, IsBytes, true},
      {"set alpha channel", 0,
       [](Sources, To to) {
         return VX_SetAlphaChannel(static_cast<uint32_t>(to.width), static_cast<uint32_t>(to.height), to.base,
                                   to.rowBytes, to.format, true);
       },
       kOwn, IsSettable, true, true},
      {"choose by mask", 3, [](Sources s, To to) { return ChooseByMask(s[0], s[1], s[2], 3, to); }, kChoices,
       IsAddressed, false, false, 2},
      {"convert", 1, [](Sources s, To to) { return Convert(s[0], to); }, kOwn, IsAny, false, false, 0},
      {"opaque white", 0, [](Sources, To to) { return FillWith(VX_FillWithOpaqueWhite, to); },
       All(VX_ErrFormatNotHandled)},
      {"transparent black", 0, [](Sources, To to) { return FillWith(VX_FillWithTransparentBlack, to); },
       All(VX_ErrUnsupportedDestinationFormat), HasAlpha}};
  for (const float opacity : {0.0f, 0.6f, 1.0f}) {
    const std::string at = " at " + std::to_string(opacity);
    // At 0 one of the pictures does not count.
    all.push_back({"composite" + at, 2, [=](Sources s, To to) { return Composite(s[0], s[1], to, opacity); },
                   opacity == 0 ? kOwn : kBlends});
    all.push_back({"to black" + at, 1, [=](Sources s, To to) { return ToBlack(s[0], to, opacity); },
                   opacity == 0 ? kOwn : kToBlacks});
  }
  return all;
}

// How many sources' formats matter: all but a mask's.
int Formats(const Operation& o) { return std::min(o.sources, std::max(o.places, 1)); }

// Formats for the sources: the destination's, or others that go round.
std::vector<F> FormatsOf(const Operation& operation, F destination, bool mixed) {
  static const std::vector<F> rasters = RasterFormats();
  std::vector<F> formats(static_cast<size_t>(operation.sources), destination);
  for (size_t i = 0; mixed && !operation.oneFormat && i < static_cast<size_t>(Formats(operation)); ++i)
    formats[i] = rasters[(Bits(destination) * 7 + 11 * i + operation.name.size()) % rasters.size()];
  return formats;
}

// ---- Refusals

// A call that must not touch a pixel, under a control word of the caller's.
void ExpectCode(const Operation& operation, VX_Result expected, const std::vector<F>& formats, int32_t width,
                int32_t height, int null = -1, bool allNull = false) {
  ExpectRefusal(operation.name + " " + std::to_string(width) + "x" + std::to_string(height), expected,
                [&](void* memory) {
                  std::vector<ArenaFrame> frames;
                  for (int i = 0; i <= operation.sources; ++i)
                    frames.push_back({allNull || i == null ? nullptr : memory, i % 2 ? -64 : 64,
                                      formats[static_cast<size_t>(i)], width, height});
                  const unsigned callers = _mm_getcsr();
                  _mm_setcsr(0x7F95);
                  const VX_Result result = operation.call(frames.data(), frames.back());
                  EXPECT_EQ(_mm_getcsr(), 0x7F95u);
                  _mm_setcsr(callers);
                  return result;
                });
}

// The first reason counts: formats, then sizes, then buffers.
TEST(Operations, RefuseInOrderBeforeTheyTouchAPixel) {
  constexpr F kGood = F::BGRA_4444_8u, kWide = F::BGRA_4444_32f, kUnknown = FromBits(0xFFF7);
  for (const Operation& o : Operations()) {
    const std::vector<F> good(static_cast<size_t>(o.sources) + 1, kGood);
    if (o.refusals.badDestination == VX_Success) continue;
    const auto with = [&](int which, F format) {
      std::vector<F> formats = good;
      formats[static_cast<size_t>(which)] = format;
      return formats;
    };
    const auto expectNone = [&](VX_Result code, const std::vector<F>& formats) {
      ExpectCode(o, code, formats, -1, -1, -1, true);
    };
    for (const F frame : {FromBits(0x7F000004), F::YUV_420_MPEG2_FRAME, F::PALDV25}) {
      for (int i = 0; i < Formats(o) && !o.oneFormat; ++i) expectNone(o.refusals.badSource, with(i, frame));
      if (o.sources != 0 || frame == FromBits(0x7F000004))
        expectNone(o.refusals.badDestination, with(o.sources, frame));
    }
    for (int i = 0; i < Formats(o) && !o.oneFormat; ++i) expectNone(o.refusals.noWayFrom, with(i, kUnknown));
    expectNone(o.refusals.noWayTo, with(o.sources, kUnknown));
    for (const F format : RasterFormats())
      if (!o.takes(format)) expectNone(o.refusals.badDestination, with(o.sources, format));

    for (const auto& [width, height] :
         {std::pair{-1, 4}, {4, -1}, {INT_MIN, 4}, {4, INT_MIN}, {INT_MAX, 1}, {1 << 29, 2}})
      ExpectCode(o, VX_ErrArgumentOutOfRange, good, width, height, -1, true);
    for (int i = 0; i < Formats(o) && !o.oneFormat; ++i)
      ExpectCode(o, VX_ErrArgumentOutOfRange, with(i, kWide), INT_MAX / 8, 1, -1, true);
    if (o.takes(kWide))
      ExpectCode(o, VX_ErrArgumentOutOfRange, o.oneFormat ? std::vector<F>(good.size(), kWide) : with(o.sources, kWide),
                 INT_MAX / 8, 1, -1, true);
    ExpectCode(o, VX_Success, good, 0, 4, -1, true);
    ExpectCode(o, VX_Success, good, 4, 0, -1, true);
    for (int i = 0; i <= o.sources; ++i)
      ExpectCode(o, i == o.sources ? VX_ErrNullDestination : VX_ErrNullSource, good, 4, 4, i);
  }
}

// ---- Memory

// With the destination in the place of a source; the result must be that of a call with a picture of its own.
VX_Result CallInPlace(const Operation& operation, int place, Sources others, To to) {
  std::vector<ArenaFrame> sources(others, others + operation.sources - 1);
  Image held(to.format, to.width, to.height, Contents::Zeros);
  for (int row = 0; row < to.height; ++row) std::memcpy(held.Row(row), to.Row(row), static_cast<size_t>(held.rowBytes));
  Image apart = held;
  sources.insert(sources.begin() + place, held);
  EXPECT_EQ(operation.call(sources.data(), apart), VX_Success);
  sources[static_cast<size_t>(place)] = to;
  const VX_Result result = operation.call(sources.data(), to);
  for (int row = 0; row < to.height; ++row)
    EXPECT_EQ(std::memcmp(apart.Row(row), to.Row(row), static_cast<size_t>(apart.rowBytes)), 0) << operation.name;
  return result;
}

TEST(Operations, Arena) {
  for (const Operation& o : Operations())
    for (const F format : RasterFormats()) {
      if (!o.takes(format)) continue;
      ArenaCase c;
      c.name = o.name;
      c.destination = format;
      c.seed = Bits(format);
      c.widths = {1, 2, 3, 4, 5, 6, 7, 8, 9, 13, 15, 16, 17, 31, 33, 63, 64, 65, 129, 383, 385, 773};
      c.heights = {1, 2, 3, 4, 5, 8};
      c.run = o.call;
      c.destinationIsInput = o.readsDestination;
      c.sources = FormatsOf(o, format, false);
      c.passes = 2;
      EXPECT_TRUE(RunArena(c));
      c.sources = FormatsOf(o, format, true);
      c.passes = 1;
      EXPECT_TRUE(RunArena(c));
      const SmallCache small;
      EXPECT_TRUE(RunArena(c)) << "past the cache";
      c.destinationIsInput = true;
      c.widths = {1, 4, 17, 63, 130, 385};
      c.heights = {1, 3, 66};
      for (int place = 0; place < o.places; ++place) {
        c.sources.assign(static_cast<size_t>(o.sources) - 1, format);
        c.run = [&](Sources others, To to) { return CallInPlace(o, place, others, to); };
        EXPECT_TRUE(RunArena(c)) << "in place of source " << place;
        if (HasFailure()) return;
      }
    }
}

// ---- Rounding

// A caller's rounding mode reaches every kernel alike, and turns no full sample into an empty one.
TEST(Operations, RoundingModesGiveTheSameBytesInEveryVariant) {
  const unsigned callers = _mm_getcsr();
  const auto check = [&](const Operation& o, F source, F format, int width, Contents contents) {
    std::vector<Image> images;
    for (int i = 0; i < o.sources; ++i) images.emplace_back(source, width, 1, contents, images.size() + 1);
    const std::vector<ArenaFrame> sources(images.begin(), images.end());
    Image nearest(format, width, 1);
    for (const unsigned mode : {0x0000u, 0x2000u, 0x4000u, 0x6000u}) {
      Image plain(format, width, 1, Contents::Zeros);
      ForEachVariant([&](int variant) {
        Image out(format, width, 1, Contents::Zeros);
        _mm_setcsr((callers & ~0x6000u) | mode);
        EXPECT_EQ(o.call(sources.data(), out), VX_Success);
        _mm_setcsr(callers);
        if (variant == 0) plain = out;
        EXPECT_TRUE(out.bytes == plain.bytes) << "variant " << variant << ", mode " << mode;
      });
      if (mode == 0) nearest = plain;
      for (size_t i = 0; contents == Contents::Maximum && i < SampleCount(plain); ++i) {
        const double code = SampleAt(nearest.bytes.data(), i, format);
        EXPECT_NEAR(SampleAt(plain.bytes.data(), i, format), code, code / 50) << "mode " << mode;
      }
    }
  };
  const auto all = Operations();
  const auto& convert = *std::ranges::find(all, "convert", &Operation::name);
  check(convert, F::BGRA_4444_32f_Linear, F::BGRA_4444_8u, 259, Contents::Random);
  check(convert, F::BGRA_4444_8u, F::BGRA_4444_32f_Linear, 259, Contents::Random);
  for (const Operation& o : all)
    for (const F format : RasterFormats())
      for (const Contents contents : {Contents::Random, Contents::Extremes, Contents::Maximum})
        for (int width = 540; width < (o.name == "blend" ? 567 : 541); ++width) {
          if (!o.takes(format) || Depth(format) == kDepth32f) continue;
          check(o, format, format, width, contents);
          if (!o.oneFormat && AlphaKind(format) == kAlphaPremultiplied)
            check(o, FromBits((Bits(format) & ~kAlphaMask) | kAlphaStraight), format, width, contents);
          ASSERT_FALSE(HasFailure()) << o.name << " to " << FormatName(format) << ", " << width << " pixels, contents "
                                     << static_cast<int>(contents);
        }
}

// ---- Threads

// Whatever their number and the way to memory, rows come out as those of a picture of one row.
TEST(Operations, ThreadsAndWaysToMemoryChangeNothing) {
  constexpr int kWidth = 336, kHeight = 131;  // whole lines of the cache, not whole blocks of the kernels
  for (const Operation& o : Operations())
    for (const F format : {F::BGRA_4444_8u, F::V210_422_10u, F::XRGB_4444_32f, F::UYVY_422_8u}) {
      if (!o.takes(format)) continue;
      SCOPED_TRACE(o.name + " to " + FormatName(format));
      std::vector<Image> images;
      for (const F source : FormatsOf(o, format, true)) images.emplace_back(source, kWidth, kHeight, images.size());
      Image before(format, kWidth, kHeight, 9), expected = before, row(format, kWidth, 1);
      for (int y = 0; y < kHeight; ++y) {
        std::vector<ArenaFrame> rows;
        for (Image& image : images) rows.push_back({image.UprightRow(y), image.rowBytes, image.format, kWidth, 1});
        row.bytes.assign(expected.UprightRow(y), expected.UprightRow(y) + row.rowBytes);
        ASSERT_EQ(o.call(rows.data(), row), VX_Success);
        std::copy(row.bytes.begin(), row.bytes.end(), expected.UprightRow(y));
      }
      const std::vector<ArenaFrame> sources(images.begin(), images.end());
      for (const int threads : {1, 2, 3, 7, 16})
        for (const uint32_t cache : {1024u, VX_GetCacheSize()}) {
          const SmallCache small(cache);
          vexel_host::SetThreadLimit(threads);
          Image out = before;
          EXPECT_EQ(o.call(sources.data(), out), VX_Success);
          EXPECT_EQ(out.bytes, expected.bytes) << threads << " threads, a cache of " << cache;
        }
    }
  vexel_host::SetThreadLimit(0);
}

// ---- Far rows, wide rows

TEST(Operations, GiantStrides) {
  constexpr F kFormat = F::BGRA_4444_8u;
  for (const Operation& o : Operations())
    for (const int32_t rowBytes : {INT32_MAX - 63, INT32_MIN + 64})
      for (int which = 0; which <= o.sources; ++which) {
        std::vector<Image> images;
        for (int i = 0; i <= o.sources; ++i) images.emplace_back(kFormat, 37, 7, static_cast<uint64_t>(i));
        std::vector<ArenaFrame> frames(images.begin(), images.end());
        const ArenaFrame giant = GiantStrideFrame(kFormat, 37, 7, rowBytes);
        for (int row = 0; row < 7; ++row) std::memcpy(giant.Row(row), frames[which].Row(row), 37 * 4);
        Image expected = images.back();
        ASSERT_EQ(o.call(frames.data(), expected), VX_Success);
        frames[which] = giant;
        ASSERT_EQ(o.call(frames.data(), frames.back()), VX_Success);
        for (int row = 0; row < 7; ++row)
          ASSERT_EQ(std::memcmp(frames.back().Row(row), expected.Row(row), 37 * 4), 0) << o.name << " " << which;
      }
}

// Rows of pairs are converted whole, and these do not fit on the stack.
TEST(Operations, SurviveFailingAllocations) {
  constexpr int kWidth = 40000;
  for (const Operation& o : Operations()) {
    if (o.oneFormat || o.sources == 0) continue;
    std::vector<Image> images;
    for (int i = 0; i < o.sources; ++i) images.emplace_back(i % 2 ? F::V210_422_10u : F::UYVY_422_8u, kWidth, 2);
    Image out(F::BGRA_4444_32f, kWidth, 2);
    const std::vector<ArenaFrame> sources(images.begin(), images.end());
    const int count = ExpectSurvivesFailingAllocations(o.name, [&] { return o.call(sources.data(), out); });
    EXPECT_GE(count, o.name == "to black at 0.000000" ? 0 : 1) << o.name;
  }
}

}  // namespace
}  // namespace vexel::testing
