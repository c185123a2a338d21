// Compositing over black: the integer rules code by code, the table of working formats, rows tested for their alpha.
#include <gtest/gtest.h>

#include <cmath>
#include <cstring>
#include <limits>
#include <string>
#include <vector>

#include "support/Formats.h"
#include "support/Image.h"

namespace vexel::testing {
namespace {

using F = VX_PixelFormat;

// Every code under every alpha. The quotients are rounded from double precision; 255 is odd, so no ties exist.
TEST(CompositeToBlack, EveryCodeUnderEveryAlpha) {
  for (const F format : {F::BGRA_4444_8u, F::ARGB_4444_8u, F::VUYA_4444_8u, F::VUYA_4444_8u_709})
    for (const float opacity : {1.0f, 0.999995f, 0.999f, 0.6f, 0.5f, 0.01f, 0.001f, 3.0f}) {
      if (format == F::VUYA_4444_8u_709 && opacity < 0.9999f) continue;  // goes through 601
      SCOPED_TRACE(FormatName(format) + " at " + std::to_string(opacity));
      const int alphaAt = static_cast<int>(AlphaAt(format));
      Image s(format, 256, 256), out(format, 256, 256);
      for (int i = 0; i < 256 * 256 * 4; ++i)
        s.bytes[i] = static_cast<uint8_t>(i % 4 == alphaAt ? i >> 10 : (i >> 2) + 85 * (i % 4));
      ASSERT_EQ(ToBlack(s, out, opacity), VX_Success);
      const double level = opacity > 0.999992f ? 255 : std::floor(double{opacity} * 255 + 0.5);
      for (int i = 0; i < 256 * 256 * 4; ++i) {
        const double alpha = std::round(s.bytes[i / 4 * 4 + alphaAt] * level / 255);
        const double black = !IsYuv(format) ? 0 : i % 4 == 2 ? 16 : 128;
        const double code = i % 4 == alphaAt ? 255 : black + std::round((s.bytes[i] - black) * alpha / 255);
        ASSERT_EQ(out.bytes[i], code) << "byte " << i;
      }
    }
}

TEST(CompositeToBlack, Floats) {
  for (const F format : {F::BGRA_4444_32f, F::ARGB_4444_32f, F::VUYA_4444_32f})
    for (const float opacity : {1.0f, 0.6f}) {
      const int alphaAt = static_cast<int>(AlphaAt(format));
      Image s(format, 500, 2), out(format, 500, 2);
      const float alphas[] = {0, 1, 0.999995f, 0.9999f, 1.5f, -0.5f, 2, 1 / 0.6f};
      for (int i = 0; i < 500; ++i) s.As<float>()[4 * i + alphaAt] = alphas[i % 8];
      ASSERT_EQ(ToBlack(s, out, opacity), VX_Success);
      for (int i = 0; i < 4000; ++i) {
        const float alpha = s.As<float>()[i / 4 * 4 + alphaAt] * opacity, c = s.As<float>()[i];
        const float value = i % 4 == alphaAt ? 1 : alpha > 0.999992f ? c : c * alpha;
        ASSERT_EQ(out.As<float>()[i], value) << FormatName(format) << " float " << i;
      }
    }
}

// What a destination is worked on in, by its name.
F WorkingByName(F dst, bool full, bool wide) {
  const std::string name = FormatName(dst);
  const bool yuv = name.find("VUY") == 0 || name.find("UYV") != std::string::npos || name.find("V210") == 0;
  const bool is709 = name.find("709") != std::string::npos;
  for (const char* const direct :
       {"BGRA_4444_8u", "ARGB_4444_8u", "VUYA_4444_8u", "BGRA_4444_32f", "ARGB_4444_32f", "VUYA_4444_32f"})
    if (name == direct || (full && name == std::string(direct) + "_709")) return dst;
  return FormatByName(std::string(yuv ? "VUYA" : "BGRA") + (wide ? "_4444_32f" : "_4444_8u") +
                      (yuv && is709 && full ? "_709" : ""));
}

TEST(CompositeToBlack, ConvertsIntoAndOutOfTheWorkingFormat) {
  for (const F dst : RasterFormats())
    for (const F src : {F::BGRA_4444_8u, F::PRGB_4444_15u, F::V210_422_10u, F::VUYA_4444_32f_709, F::UYVY_422_8u})
      for (const float opacity : {1.0f, 0.6f})
        for (const int32_t hint : {-1, 2, 3}) {
          SCOPED_TRACE(FormatName(src) + " in " + FormatName(dst) + " at " + std::to_string(opacity) + ", hint " +
                       std::to_string(hint));
          const Image s(src, 391, 2);
          Image out(dst, 391, 2), w = s.Converted(WorkingByName(dst, opacity == 1, hint > 2), hint);
          ASSERT_EQ(ToBlack(w, w, opacity), VX_Success);
          ASSERT_EQ(ToBlack(s, out, opacity, hint), VX_Success);
          ASSERT_EQ(out.bytes, w.Converted(dst, hint).bytes);
          Image black(dst, 391, 2);
          ASSERT_EQ(FillWith(VX_FillWithOpaqueBlack, black), VX_Success);
          for (const float none : {0.0f, 7e-6f, -1.0f, std::numeric_limits<float>::quiet_NaN()}) {
            ASSERT_EQ(ToBlack(s, out, none, hint), VX_Success);
            ASSERT_EQ(out.bytes, black.bytes);
          }
        }
}

// Rows by their alpha: '1' opaque, '0' clear, 'm' mixed. Opaque rows arrive as a plain conversion brings them, clear
// ones as a fill, mixed ones composited; the call in place gives the same.
TEST(CompositeToBlack, RowsAreTestedForTheirAlpha) {
  const struct {
    const char* rows;
    int32_t state;
  } cases[] = {{"111", 0}, {"000", 1}, {"0", 1}, {"1", 0}, {"m", 2}, {"101", 2}, {"0m1", 2}, {"11m", 2}};
  const struct {
    F src, dst;
  } pairs[] = {{F::BGRA_4444_8u, F::BGRA_4444_8u},   {F::ARGB_4444_8u, F::ARGB_4444_8u},
               {F::VUYA_4444_8u, F::VUYA_4444_8u},   {F::BGRA_4444_32f, F::BGRA_4444_32f},
               {F::ARGB_4444_32f, F::ARGB_4444_32f}, {F::PRGB_4444_8u, F::PRGB_4444_8u},
               {F::BGRA_4444_15u, F::BGRA_4444_15u}, {F::ARGB_4444_15u, F::V210_422_10u},
               {F::VUYP_4444_32f, F::BGRX_4444_8u},  {F::BGRA_4444_32f, F::UYVY_422_8u_709}};
  for (const auto& pair : pairs)
    for (const auto& c : cases)
      for (const int32_t hint : {0, 3})
        for (const int width : {1, 2, 17, 65, 400}) {
          SCOPED_TRACE(FormatName(pair.src) + " in " + FormatName(pair.dst) + " rows " + c.rows + " of " +
                       std::to_string(width));
          const int height = static_cast<int>(std::strlen(c.rows));
          Image straight(F::BGRA_4444_32f, width, height), out(pair.dst, width, height);
          for (int row = 0; row < height; ++row)
            for (int i = 0; i < width; ++i)
              reinterpret_cast<float*>(straight.UprightRow(row))[4 * i + 3] =
                  static_cast<float>(c.rows[row] == 'm' ? (i == width - 1 ? 0.5 : width % 2) : c.rows[row] - '0');
          const Image s = straight.Converted(pair.src);
          Image converted = s.Converted(pair.dst, hint), black = out, composited = out;
          ASSERT_EQ(ToBlack(s, composited, 1, hint), VX_Success);
          ASSERT_EQ(FillWith(VX_FillWithOpaqueBlack, black), VX_Success);
          int32_t state = -1;
          ASSERT_EQ(ToBlackTested(s, out, &state, hint), VX_Success);
          EXPECT_EQ(state, c.state);
          for (int row = 0; row < height; ++row) {
            Image& wanted = c.rows[row] == '1' ? converted : c.rows[row] == '0' ? black : composited;
            EXPECT_EQ(std::memcmp(out.UprightRow(row), wanted.UprightRow(row), static_cast<size_t>(out.rowBytes)), 0);
          }
        }
  // Opaque rows keep what the working format could not hold.
  Image s(F::V210_422_10u, 100, 3), out(F::V210_422_10u, 100, 3);
  int32_t state = -1;
  ASSERT_EQ(ToBlackTested(s, out, &state), VX_Success);
  EXPECT_EQ(out.bytes, s.bytes);
  EXPECT_EQ(state, 0);
}

TEST(CompositeToBlack, TellsAStateWhenNothingIsRefused) {
  Image s(F::BGRA_4444_8u, 4, 4), out = s;
  int32_t state = 77;
  EXPECT_EQ(ToBlackTested({nullptr, 16, s.format}, out, &state), VX_ErrNullSource);
  EXPECT_EQ(state, 77);
  EXPECT_EQ(ToBlackTested(s, {out.bytes.data(), 16, out.format, 4, 0}, &state), VX_Success);
  EXPECT_EQ(state, 0);
}

}  // namespace
}  // namespace vexel::testing
