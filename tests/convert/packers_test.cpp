// Codec packers and camera converters against formulas of their own, sample by sample.
#include <numeric>
#include <xmmintrin.h>

#include "support/Arena.h"
#include "support/PaddedRows.h"
#include "support/Processor.h"
#include "support/Test.h"

namespace vexel {
namespace {

using Rows = testing::PaddedRows;
using Samples = std::vector<uint16_t>;
constexpr int kSizes[] = {1, 2, 3, 5, 6, 7, 8, 11, 13, 16, 17, 31, 33, 64, 67, 131};

constexpr uint32_t Top(uint32_t sample) { return sample / 64; }
uint32_t Word(uint32_t r, uint32_t g, uint32_t b) { return r * 4 + g * 4096 + b * 4194304; }
uint16_t Full16(int s) { return static_cast<uint16_t>(std::min((s + 0.5) * 65535 / 32768, 65535.0)); }
uint32_t Component(uint32_t word, int k) { return word / (4u << 10 * k) % 1024; }

// The sides without row bytes.
enum class Tight : uint8_t { None, Source, Destination, Both };

// A packer, the bytes of its rows for each so many pixels begun (none: it works in place), and what it writes to pixel
// x of a row (nothing: a test of its own knows).
struct Packer {
  const char* name;
  int srcBytes, srcPixels, dstBytes, dstPixels;
  Tight tight;
  void (*run)(const void* src, int srcRow, void* dst, int dstRow, int width, int height);
  void (*expected)(const Rows& src, Rows& dst, int row, size_t x) = nullptr;

  int SourceRow(int width) const { return (width + srcPixels - 1) / srcPixels * srcBytes; }
  int DestinationRow(int width) const { return (width + dstPixels - 1) / dstPixels * dstBytes; }
};

constexpr Packer kPackers[] = {
    {"RGB10 to DNxHD", 4, 1, 8, 1, Tight::Destination,
     [](auto s, int n, auto d, int, int w, int h) { VX_Convert_RGB_444_10u_To_DNxHD16u(s, n, d, w, h); },
     [](const Rows& s, Rows& d, int row, size_t x) {
       for (int k = 0; k < 3; ++k)
         d.Put(row, 4 * x + k, static_cast<uint16_t>(Component(s.Get<uint32_t>(row, x), k) * 64));
     }},
    {"DNxHD to RGB10", 8, 1, 4, 1, Tight::Source,
     [](auto s, int, auto d, int m, int w, int h) { VX_Convert_DNxHD16u_To_RGB_444_10u(s, d, m, w, h); },
     [](const Rows& s, Rows& d, int row, size_t x) {
       const auto at = [&](int k) { return Top(s.Get<uint16_t>(row, 4 * x + k)); };
       d.Put(row, x, Word(at(0), at(1), at(2)));
     }},
    {"BGR16 to RGB10", 6, 1, 4, 1, Tight::None,
     [](auto s, int n, auto d, int m, int w, int h) { VX_Convert_j2k_BGR16u_To_RGB_444_10u(s, n, d, m, w, h); },
     [](const Rows& s, Rows& d, int row, size_t x) {
       const auto at = [&](int k) { return Top(s.Get<uint16_t>(row, 3 * x + k)); };
       d.Put(row, x, Word(at(2), at(1), at(0)));
     }},
    {"RGB10 to BGR16", 4, 1, 6, 1, Tight::None,
     [](auto s, int n, auto d, int m, int w, int h) {
       VX_Convert_j2k_RGB_444_10u_To_10_Bits_Within_BGR16u(s, n, d, m, w, h);
     },
     [](const Rows& s, Rows& d, int row, size_t x) {
       for (int k = 0; k < 3; ++k)
         d.Put(row, 3 * x + 2 - k, static_cast<uint16_t>(Component(s.Get<uint32_t>(row, x), k)));
     }},
    {"RGB8 to BGRA8", 3, 1, 4, 1, Tight::None,
     [](auto s, int n, auto d, int m, int w, int h) { VX_ConvertRGB_444_8uToBGRA_4444_8u(s, n, d, m, w, h); },
     [](const Rows& s, Rows& d, int row, size_t x) {
       for (int k = 0; k < 4; ++k) d.Put(row, 4 * x + k, k == 3 ? uint8_t{255} : s.Get<uint8_t>(row, 3 * x + 2 - k));
     }},
    {"RGB16 to XRGB15", 6, 1, 8, 1, Tight::None,
     [](auto s, int n, auto d, int m, int w, int h) { VX_ConvertRGB_444_16u_To_XRGB_4444_15u(s, n, d, m, w, h); },
     [](const Rows& s, Rows& d, int row, size_t x) {
       d.Put(row, 4 * x, uint16_t{32768});
       for (int k = 0; k < 3; ++k)
         d.Put(row, 4 * x + 1 + k,
               static_cast<uint16_t>(std::lround(s.Get<uint16_t>(row, 3 * x + k) * 32768.0 / 65535)));
     }},
    {"V210 to UYVY10", 16, 6, 4, 1, Tight::None,
     [](auto s, int n, auto d, int m, int w, int h) {
       VX_Convert_j2k_V210_To_10_Bits_Within_UYVY16u(s, n, d, m, w, h);
     },
     [](const Rows& s, Rows& d, int row, size_t x) {
       for (size_t i = 2 * x; i < 2 * x + 2; ++i)
         d.Put(row, i, static_cast<uint16_t>(s.Get<uint32_t>(row, i / 3) / (1u << 10 * (i % 3)) % 1024));
     }},
    {"UYVY10 to V210", 4, 1, 16, 6, Tight::None,
     [](auto s, int n, auto d, int m, int w, int h) { VX_ConvertUYVY_422_10uToV210_422_10u(s, n, d, m, w, h); }},
    {"Canon Log 3", 8, 1, 16, 1, Tight::None,
     [](auto s, int n, auto d, int m, int w, int h) {
       VX_Convert_16uARGB_To_32fBGRX_Remove_CanonLog3_Apply_709(s, n, d, m, w, h, w & 1);
     }},
    {"15u to 16u", 0, 1, 8, 1, Tight::None,
     [](auto, int, auto d, int m, int w, int h) { VX_Convert_15u_To_16u_InPlace(d, m, w, h); },
     [](const Rows&, Rows& d, int row, size_t x) {
       for (size_t i = 4 * x; i < 4 * x + 4; ++i) d.Put(row, i, Full16(d.Get<uint16_t>(row, i)));
     }},
    {"15u to big-endian", 0, 1, 8, 1, Tight::None,
     [](auto, int, auto d, int m, int w, int h) { VX_Convert_15u_To_16u_BigEndian_InPlace(d, m, w, h); },
     [](const Rows&, Rows& d, int row, size_t x) {
       for (size_t i = 4 * x; i < 4 * x + 4; ++i) {
         const uint16_t full = Full16(d.Get<uint16_t>(row, i));
         d.Put(row, i, static_cast<uint16_t>(full << 8 | full >> 8));
       }
     }},
    {"byte swap", 0, 1, 4, 1, Tight::Both,
     [](auto, int, auto d, int m, int w, int) {
       VX_Convert_Uint32_BigEndian_InPlace(d, m < 0 ? -4 * w : 4 * w, w, 1);
     }},
    {"S-Gamut3", 0, 1, 8, 1, Tight::None,
     [](auto, int, auto d, int m, int w, int h) { VX_Convert_SGamut3_16u_To_SGamut3Cine_16u(d, m, w, h); },
     [](const Rows&, Rows& d, int row, size_t x) {  // wraps around
       const auto s = [&](size_t k) { return static_cast<double>(d.Get<uint16_t>(row, 4 * x + k)); };
       const double out[] = {1.1642234944 * s(0) - 0.1768455024 * s(1) + 0.012622008 * s(2),
                             0.0260509511 * s(0) + 0.9341657009 * s(1) + 0.039783348 * s(2),
                             0.0246996363 * s(0) + 0.0215592309 * s(1) + 0.9537411328 * s(2)};
       for (size_t k = 0; k < 3; ++k) d.Put(row, 4 * x + k, static_cast<uint16_t>(static_cast<int64_t>(out[k])));
     }},
    {"X'Y'Z'", 0, 1, 16, 1, Tight::None,
     [](auto, int, auto d, int m, int w, int h) { VX_Convert_j2k_ZYXx_32f_To_BGRX_32f_In_Place(d, m, w, h); }},
    {"chroma offset", 0, 1, 16, 2, Tight::None,
     [](auto, int, auto d, int m, int w, int h) { VX_Convert_j2k_UYVY_422_32f_Offset_In_Place(d, m, w, h, -0.5f); },
     [](const Rows&, Rows& d, int row, size_t x) {  // luma stays
       for (size_t i = 2 * x; x % 2 == 0 && i < 2 * x + 4; i += 2) d.Put(row, i, d.Get<float>(row, i) - 0.5f);
     }},
};

// Every pixel, and nothing else.
void ExpectPacked(const Packer& packer, int width, int height, int padding, bool upsideDown, size_t offset = 3) {
  const bool tightSource = packer.tight == Tight::Source, tightDestination = packer.tight == Tight::Destination;
  Rows src(static_cast<size_t>(packer.SourceRow(width)), height, tightSource ? 0 : padding, upsideDown && !tightSource,
           1);
  Rows dst(static_cast<size_t>(packer.DestinationRow(width)), height, tightDestination ? 0 : 3 * padding,
           !upsideDown && !tightDestination, 2, offset);
  Rows expected = dst;
  const auto run = [&](int w, int h) { packer.run(src.base(), src.rowBytes, dst.base(), dst.rowBytes, w, h); };
  run(width, height);
  for (int row = 0; row < height; ++row)
    for (int x = 0; x < width; ++x) packer.expected(src, expected, row, static_cast<size_t>(x));
  ASSERT_TRUE(dst.memory == expected.memory) << packer.name << ", " << width << " pixels";
  run(0, height), run(width, -1);
  ASSERT_TRUE(dst.memory == expected.memory) << packer.name << " of nothing";
}

// Past the cache, whole lines of rows are streamed, wherever in a line they start; not where no pixel starts one.
TEST(Packers, EachPixelAtAnySizeAndStrideAndNothingElse) {
  for (const Packer& packer : kPackers) {
    if (packer.expected == nullptr) continue;
    for (const int width : kSizes)
      for (const bool upsideDown : {false, true}) ExpectPacked(packer, width, 1 + width % 4, 3, upsideDown);
    const testing::SmallCache small;
    for (const int width : {1, 5, 32, 331, 1057})
      for (const size_t offset : {0, 3, 8, 48})
        for (const bool upsideDown : {false, true}) ExpectPacked(packer, width, 5, 8, upsideDown, offset);
  }
}

TEST(Packers, V210OfUyvyWithItsTail) {
  for (const int width : {1, 2, 5, 6, 7, 8, 12, 13, 47, 48, 53, 600, 601})
    for (const int room : {0, 16}) {
      const int groups = width / 6, height = 3;
      const size_t dstBytes = static_cast<size_t>(groups) * 16 + static_cast<size_t>(room);
      const bool stream = width >= 48;
      const testing::SmallCache cache(stream ? 1024 : VX_GetCacheSize());
      Rows src(static_cast<size_t>(width) * 4, height, 6, true, 1);
      Rows dst(dstBytes, height, stream ? 0 : 3, width % 2 != 0, 2, stream ? 16 : 3);
      Rows expected = dst;
      VX_ConvertUYVY_422_10uToV210_422_10u(src.base(), src.rowBytes, dst.base(), dst.rowBytes, width, height);
      const int words = 4 * (width % 6 != 0 && room ? groups + 1 : groups);
      for (int row = 0; row < height; ++row)
        for (int word = 0; word < words; ++word) {
          const auto sample = [&](int k) -> uint32_t {
            const int i = 3 * word + k;
            if (i < 2 * width) return src.Get<uint16_t>(row, static_cast<size_t>(i));
            return i % 2 ? 64 : 512;
          };
          expected.Put(row, static_cast<size_t>(word), sample(0) | sample(1) << 10 | sample(2) << 20);
        }
      ASSERT_EQ(dst.memory, expected.memory) << width << " pixels, room for " << dstBytes;
    }
}

TEST(Packers, WholeDomainOf16uTo15u) {
  Samples all(65536), back(all.size());
  std::iota(all.begin(), all.end(), uint16_t{0});
  VX_Scale16uBufferTo15uSIMD(all.data(), back.data(), all.size() - 3);
  for (size_t s = 0; s < all.size() - 3; ++s)
    ASSERT_EQ(back[s], std::lround(static_cast<double>(s) * 32768 / 65535)) << s;
  EXPECT_EQ(back[65535], 0);
  VX_Scale16uBufferTo15uSIMD(back.data() + 1, back.data() + 1, 33);
  EXPECT_EQ(back[33], 9);
  EXPECT_EQ(back[34], 17);
}

// Also the scaling of 15u, which computes in floats.
TEST(Packers, CallersFloatingPointFlagsComeBack) {
  Samples samples(4 * 67, 12345);
  const unsigned callers = _mm_getcsr();
  _mm_setcsr(0x1F80);
  VX_Convert_15u_To_16u_InPlace(samples.data(), 8 * 67, 67, 1);
  VX_Convert_15u_To_16u_BigEndian_InPlace(samples.data(), 8 * 67, 67, 1);
  const unsigned after = _mm_getcsr();
  _mm_setcsr(callers);
  EXPECT_EQ(after, 0x1F80u);
}

TEST(Packers, ByteSwapTakesPaddingAndNegativeRows) {
  for (const int rowBytes : {4, 12, 66, 67, -32, -71}) {
    const auto bytes = static_cast<size_t>(std::abs(rowBytes));
    Rows rows(bytes, 3, 0, rowBytes < 0, 5), expected = rows;
    const Rows original = rows;
    VX_Convert_Uint32_BigEndian_InPlace(rows.base(), rowBytes, -1, 3);
    for (int row = 0; row < 3; ++row)
      for (size_t i = 0; i < bytes / 4 * 4; ++i)
        expected.Put(row, i, original.Get<uint8_t>(row, i / 4 * 4 + 3 - i % 4));
    ASSERT_EQ(rows.memory, expected.memory);
  }
}

double CanonLight(double x) {
  if (x < 0.04076162) return -(std::pow(10, (0.07623209 - x) / 0.42889912) - 1) / 14.98325;
  if (x > 0.105357102) return (std::pow(10, (x - 0.069886632) / 0.42889912) - 1) / 14.98325;
  return (x - 0.073059361) / 2.3069815;
}

TEST(Packers, CanonLog3OfEveryCode) {
  for (const bool bigEndian : {false, true}) {
    const testing::SmallCache cache(bigEndian ? 1024 : VX_GetCacheSize());
    const auto stored = [&](size_t s) { return static_cast<uint16_t>(bigEndian ? s << 8 | s >> 8 : s); };
    Samples src(4 * 65536);
    for (size_t s = 0; s < 65536; ++s)
      for (size_t k = 1; k < 4; ++k) src[4 * s + k] = stored(s * (2 * k - 1) & 0xFFFF);
    std::vector<float> dst(4 * 65536 + 4, 7.0f);
    VX_Convert_16uARGB_To_32fBGRX_Remove_CanonLog3_Apply_709(src.data(), 8 * 257, dst.data(), 16 * 257, 255, 255,
                                                             bigEndian ? 2 : 0);
    for (size_t s = 0; s < 255 * 257; ++s) {
      const bool inside = s % 257 < 255;
      ASSERT_EQ(dst[4 * s + 3], inside ? 1.0f : 7.0f) << s;
      for (size_t k = 0; k < 3 && inside; ++k) {
        const float x = static_cast<float>(s * (5 - 2 * k) & 0xFFFF) / 65535.0f;
        const auto light = static_cast<float>(CanonLight(double{x}));
        const float expected = std::copysign(std::pow(std::fabs(light), 0.41666666f), light);
        ASSERT_LE(std::abs(std::bit_cast<int32_t>(dst[4 * s + k]) - std::bit_cast<int32_t>(expected)), 1)
            << s << ": " << dst[4 * s + k] << " instead of " << expected;
      }
    }
  }
}

TEST(Packers, FloatsToScaledIntegers) {
  using Limits = std::numeric_limits<float>;
  constexpr float kTies[] = {0.5f, 1.5f, 2.5f, 32767.4f, 32767.5f, 32768.5f, 32769, 0x1.fffffep30f, 0x1p31f, 3e9f, 0};
  std::vector<float> values = {Limits::max(), Limits::lowest(), Limits::infinity(), -Limits::infinity()};
  values.resize(21, Limits::quiet_NaN());
  for (const float tie : kTies) values.push_back(tie), values.push_back(-tie);
  testing::Random random(9);
  while (values.size() < 301) values.push_back(random.Float(-40000, 40000));
  for (const int scale : {0, 1, -1, 7, -16, 30, -40, 127, 140, -140, INT_MAX, INT_MIN}) {
    std::vector<int16_t> narrow(values.size() + 1, 77);
    std::vector<int32_t> wide(values.size() + 1, 77);
    const auto count = static_cast<int32_t>(values.size());
    testing::ForEachVariant([&](int variant) {
      VX_Convert_32f16sSfs(values.data(), narrow.data(), count, scale);
      VX_Convert_32f32sSfs(values.data(), wide.data(), count, scale);
      for (size_t i = 0; i < values.size(); ++i) {
        const double v =
            std::isinf(values[i]) ? double{values[i]} : std::ldexp(double{values[i]}, -std::clamp(scale, -900, 900));
        const double rounded = std::isnan(v) ? 0 : std::nearbyint(v);
        ASSERT_EQ(narrow[i], std::clamp(rounded, -32768.0, 32767.0)) << values[i] << " scale " << scale << variant;
        ASSERT_EQ(wide[i], std::clamp(rounded, -2147483648.0, 2147483647.0))
            << values[i] << " scale " << scale << variant;
      }
    });
    EXPECT_EQ(narrow.back(), 77);
    EXPECT_EQ(wide.back(), 77);
  }
}

TEST(Packers, DigitalCinemaToDisplay) {
  for (const int width : kSizes) {
    std::vector<float> rows(static_cast<size_t>(width) * 12 + 4);  // three, the last one first, and four that stay
    testing::Random random(3);
    for (float& v : rows) v = random.OneIn(9) ? 0.0f : random.Float(-0.3f, 1.3f);
    const std::vector<float> before = rows;
    VX_Convert_j2k_ZYXx_32f_To_BGRX_32f_In_Place(rows.data() + size_t{8} * width, -16 * width, width, 3);
    for (size_t i = 0; i < before.size(); ++i) {
      const size_t k = i % 4, pixel = i - k;
      if (k == 3 || pixel == static_cast<size_t>(width) * 12) {
        ASSERT_EQ(rows[i], before[i]);
        continue;
      }
      static constexpr double kRgb[3][3] = {
          {0.0556301, -0.2039770, 1.0569715}, {-0.9692436, 1.8759675, 0.0415551}, {3.2409699, -1.5373832, -0.4986108}};
      double light = 0;
      for (size_t c = 0; c < 3; ++c) {
        const double code = before[pixel + 2 - c];
        light += kRgb[k][c] * std::copysign(std::pow(std::fabs(code), 2.6), code) * 52.37 / 48;
      }
      // Compared as light, where the matrix's error does not grow.
      const double result = rows[i];
      ASSERT_NEAR(std::copysign(std::pow(std::fabs(result), 2.4), result), light, 4e-6) << width << ", " << i;
    }
  }
}

// The last byte of a side's row is the last one of the arena's, whose pixels are words here.
TEST(Packers, Arena) {
  for (const Packer& packer : kPackers) {
    const auto widthOf = [&](int words) {
      const int pixels = words * 4 / packer.dstBytes * packer.dstPixels;
      return std::max(pixels - words % packer.dstPixels, 0);
    };
    const auto words = [](int bytes) { return std::max((bytes + 3) / 4, 1); };
    testing::ArenaCase arenaCase;
    arenaCase.name = packer.name;
    arenaCase.destination = VX_PixelFormat::BGRA_4444_8u;
    arenaCase.destinationIsInput = true;
    arenaCase.everyContents = true;
    if (packer.tight != Tight::None) arenaCase.heights = {1};
    if (packer.srcBytes != 0) {
      arenaCase.sources = {VX_PixelFormat::BGRA_4444_8u};
      arenaCase.sourceSize = [&](int, testing::ArenaSize size) {
        return testing::ArenaSize{words(packer.SourceRow(widthOf(size.width))), size.height};
      };
    }
    arenaCase.run = [&](const testing::ArenaFrame* src, const testing::ArenaFrame& dst) {
      const int width = widthOf(dst.width);
      const auto flush = [&](const testing::ArenaFrame& frame, int rowBytes) {
        return frame.Row(0) + 4 * frame.width - rowBytes;
      };
      const bool isInPlace = packer.srcBytes == 0;
      packer.run(isInPlace ? nullptr : flush(*src, packer.SourceRow(width)), isInPlace ? 0 : src->rowBytes,
                 flush(dst, packer.DestinationRow(width)), dst.rowBytes, width, dst.height);
      return VX_Success;
    };
    EXPECT_TRUE(testing::RunArena(arenaCase));
  }
}

}  // namespace
}  // namespace vexel
