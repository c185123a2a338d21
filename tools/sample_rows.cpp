#include "sample_rows.h"

#include <bit>
#include <cmath>
#include <cstring>

#include "format_catalogue.h"

namespace tool {
namespace {

// value = (code - offset) / scale, for one component.
struct Scaling {
  float offset;
  float scale;
  uint32_t maximum;

  float ToFloat(uint32_t code) const { return (static_cast<float>(code) - offset) / scale; }
  uint32_t ToCode(float value) const {
    const float code = value * scale + offset;
    if (!(code > 0.0f)) return 0;  // NaN too
    return code >= static_cast<float>(maximum) ? maximum : static_cast<uint32_t>(std::lrint(code));
  }
};

// In double until the end: 16-bit limits are exact in float as well.
Scaling ScalingOf(const SampleCoding& coding, VX_PixelFormat format, int component) {
  const uint32_t maximum = UINT32_MAX >> (32 - coding.depth);  // depth 32 is float, which takes no scaling
  const bool chroma = IsYuv(format) && (component == 1 || component == 2);
  if (component == 3 || !IsYuv(format)) return {0.0f, static_cast<float>(maximum), maximum};
  if (coding.fullRange)
    return {chroma ? std::ldexp(1.0f, coding.depth - 1) : 0.0f, static_cast<float>(maximum), maximum};
  const float unit = std::ldexp(1.0f, coding.depth - 8);
  return chroma ? Scaling{128 * unit, 224 * unit, maximum} : Scaling{16 * unit, 219 * unit, maximum};
}

// Where component R/Y, G/U, B/V, A of a 4:4:4:4 pixel is stored.
int ChannelOf(VX_PixelFormat format, int component) {
  const int bgra = component == 3 ? 3 : 2 - component;
  return IsReversed(format) ? 3 - bgra : bgra;
}

uint8_t* Bytes(std::byte* row) { return reinterpret_cast<uint8_t*>(row); }
const uint8_t* Bytes(const std::byte* row) { return reinterpret_cast<const uint8_t*>(row); }

void StoreWord(std::byte* row, size_t index, uint32_t word) { std::memcpy(row + index * 4, &word, 4); }
uint32_t LoadWord(const std::byte* row, size_t index) {
  uint32_t word;
  std::memcpy(&word, row + index * 4, 4);
  return word;
}

// ---- 4:4:4:4 ------------------------------------------------------------------------------------------------------

void Pack4444_8u(const SampleRow& samples, const SampleCoding&, VX_PixelFormat format, std::byte* row, int width) {
  for (int c = 0; c < 4; ++c) {
    const uint32_t* in = samples.components[c].data();
    uint8_t* out = Bytes(row) + ChannelOf(format, c);
    for (int x = 0; x < width; ++x) out[4 * x] = static_cast<uint8_t>(in[x]);
  }
}

void Unpack4444_8u(const std::byte* row, VX_PixelFormat format, const SampleCoding&, SampleRow& samples, int width) {
  for (int c = 0; c < 4; ++c) {
    const uint8_t* in = Bytes(row) + ChannelOf(format, c);
    uint32_t* out = samples.components[c].data();
    for (int x = 0; x < width; ++x) out[x] = in[4 * x];
  }
}

void Pack4444_32f(const SampleRow& samples, const SampleCoding& coding, VX_PixelFormat format, std::byte* row,
                  int width) {
  for (int c = 0; c < 4; ++c) {
    const Scaling scaling = ScalingOf(coding, format, c);
    const uint32_t* in = samples.components[c].data();
    const size_t channel = static_cast<size_t>(ChannelOf(format, c));
    for (int x = 0; x < width; ++x)
      StoreWord(row, static_cast<size_t>(x) * 4 + channel,
                coding.isFloat ? in[x] : std::bit_cast<uint32_t>(scaling.ToFloat(in[x])));
  }
}

void Unpack4444_32f(const std::byte* row, VX_PixelFormat format, const SampleCoding& coding, SampleRow& samples,
                    int width) {
  for (int c = 0; c < 4; ++c) {
    const Scaling scaling = ScalingOf(coding, format, c);
    uint32_t* out = samples.components[c].data();
    const size_t channel = static_cast<size_t>(ChannelOf(format, c));
    for (int x = 0; x < width; ++x) {
      const uint32_t word = LoadWord(row, static_cast<size_t>(x) * 4 + channel);
      out[x] = coding.isFloat ? word : scaling.ToCode(std::bit_cast<float>(word));
    }
  }
}

// ---- Packed 4:2:2: U Y V Y, or Y U Y V where reversed -------------------------------------------------------------

struct PairOrder {
  size_t y0, u, y1, v;
};
PairOrder PairOrderOf(VX_PixelFormat format) {
  return IsReversed(format) ? PairOrder{0, 1, 2, 3} : PairOrder{1, 0, 3, 2};
}

void Pack422_8u(const SampleRow& samples, const SampleCoding&, VX_PixelFormat format, std::byte* row, int width) {
  const PairOrder at = PairOrderOf(format);
  const uint32_t *y = samples.components[0].data(), *u = samples.components[1].data(),
                 *v = samples.components[2].data();
  uint8_t* out = Bytes(row);
  for (int x = 0; x < width; x += 2, out += 4) {
    out[at.y0] = static_cast<uint8_t>(y[x]);
    out[at.u] = static_cast<uint8_t>(u[x / 2]);
    out[at.y1] = static_cast<uint8_t>(y[x + 1 < width ? x + 1 : x]);
    out[at.v] = static_cast<uint8_t>(v[x / 2]);
  }
}

void Unpack422_8u(const std::byte* row, VX_PixelFormat format, const SampleCoding&, SampleRow& samples, int width) {
  const PairOrder at = PairOrderOf(format);
  const uint8_t* in = Bytes(row);
  for (int x = 0; x < width; x += 2, in += 4) {
    samples.components[0][x] = in[at.y0];
    samples.components[0][x + 1] = in[at.y1];
    samples.components[1][x / 2] = in[at.u];
    samples.components[2][x / 2] = in[at.v];
  }
}

void Pack422_32f(const SampleRow& samples, const SampleCoding& coding, VX_PixelFormat format, std::byte* row,
                 int width) {
  const PairOrder at = PairOrderOf(format);
  const Scaling luma = ScalingOf(coding, format, 0), chroma = ScalingOf(coding, format, 1);
  const auto store = [&](size_t index, const Scaling& scaling, uint32_t code) {
    StoreWord(row, index, coding.isFloat ? code : std::bit_cast<uint32_t>(scaling.ToFloat(code)));
  };
  const uint32_t* y = samples.components[0].data();
  for (int x = 0; x < width; x += 2) {
    const size_t base = static_cast<size_t>(x) * 2;
    store(base + at.y0, luma, y[x]);
    store(base + at.y1, luma, y[x + 1 < width ? x + 1 : x]);
    store(base + at.u, chroma, samples.components[1][x / 2]);
    store(base + at.v, chroma, samples.components[2][x / 2]);
  }
}

void Unpack422_32f(const std::byte* row, VX_PixelFormat format, const SampleCoding& coding, SampleRow& samples,
                   int width) {
  const PairOrder at = PairOrderOf(format);
  const Scaling luma = ScalingOf(coding, format, 0), chroma = ScalingOf(coding, format, 1);
  const auto load = [&](size_t index, const Scaling& scaling) {
    const uint32_t word = LoadWord(row, index);
    return coding.isFloat ? word : scaling.ToCode(std::bit_cast<float>(word));
  };
  for (int x = 0; x < width; x += 2) {
    const size_t base = static_cast<size_t>(x) * 2;
    samples.components[0][x] = load(base + at.y0, luma);
    samples.components[0][x + 1] = load(base + at.y1, luma);
    samples.components[1][x / 2] = load(base + at.u, chroma);
    samples.components[2][x / 2] = load(base + at.v, chroma);
  }
}

// ---- 10-bit words -------------------------------------------------------------------------------------------------

// V210: three samples to a word, lowest bits first, in the order U Y V Y; six pixels are four words. What the last
// group has no pixels for is 0.
void PackV210(const SampleRow& samples, const SampleCoding&, VX_PixelFormat, std::byte* row, int width) {
  const uint32_t* y = samples.components[0].data();
  for (int x = 0, word = 0; x < width; x += 6, word += 4) {
    uint32_t group[12] = {512, 64, 512, 64, 512, 64, 512, 64, 512, 64, 512, 64};
    for (int i = 0; i < 6 && x + i < width; i += 2) {
      group[2 * i] = samples.components[1][(x + i) / 2];
      group[2 * i + 1] = y[x + i];
      group[2 * i + 2] = samples.components[2][(x + i) / 2];
      group[2 * i + 3] = y[x + i + 1 < width ? x + i + 1 : x + i];
    }
    for (int i = 0; i < 4; ++i)
      StoreWord(row, static_cast<size_t>(word + i), group[3 * i] | group[3 * i + 1] << 10 | group[3 * i + 2] << 20);
  }
}

void UnpackV210(const std::byte* row, VX_PixelFormat, const SampleCoding&, SampleRow& samples, int width) {
  uint32_t group[12];
  for (int x = 0, word = 0; x < width; x += 6, word += 4) {
    for (int i = 0; i < 4; ++i) {
      const uint32_t packed = LoadWord(row, static_cast<size_t>(word + i));
      for (int j = 0; j < 3; ++j) group[3 * i + j] = packed >> (10 * j) & 1023;
    }
    for (int pair = 0; pair < 3 && x + 2 * pair < width; ++pair) {
      samples.components[1][x / 2 + pair] = group[4 * pair];
      samples.components[0][x + 2 * pair] = group[4 * pair + 1];
      samples.components[2][x / 2 + pair] = group[4 * pair + 2];
      samples.components[0][x + 2 * pair + 1] = group[4 * pair + 3];
    }
  }
}

// RGB 4:4:4 in 10 bits: R in bits 2 to 11, G in 12 to 21, B in 22 to 31.
void PackRgb10(const SampleRow& samples, const SampleCoding&, VX_PixelFormat, std::byte* row, int width) {
  for (int x = 0; x < width; ++x)
    StoreWord(row, static_cast<size_t>(x),
              samples.components[0][x] << 2 | samples.components[1][x] << 12 | samples.components[2][x] << 22);
}

void UnpackRgb10(const std::byte* row, VX_PixelFormat, const SampleCoding&, SampleRow& samples, int width) {
  for (int x = 0; x < width; ++x)
    for (int c = 0; c < 3; ++c) samples.components[c][x] = LoadWord(row, static_cast<size_t>(x)) >> (2 + 10 * c) & 1023;
}

struct RowPacking {
  PackRow pack;
  UnpackRow unpack;
};

RowPacking PackingFor(VX_PixelFormat format) {
  if (!IsRaster(format)) return {};
  if (format == kRgb444_10u) return {PackRgb10, UnpackRgb10};
  if (IsV210(format)) return {PackV210, UnpackV210};
  if (IsPacked422(format)) {
    if (Is8Bit(format)) return {Pack422_8u, Unpack422_8u};
    return {Pack422_32f, Unpack422_32f};
  }
  if (Is8Bit(format)) return {Pack4444_8u, Unpack4444_8u};
  if (IsFloat(format)) return {Pack4444_32f, Unpack4444_32f};
  return {};  // 15u: no file holds it
}

}  // namespace

PackRow RowPackerFor(VX_PixelFormat format) { return PackingFor(format).pack; }
UnpackRow RowUnpackerFor(VX_PixelFormat format) { return PackingFor(format).unpack; }

}  // namespace tool
