// 10-bit RGB words (R in bits 2-11, G 12-21, B 22-31, bits 0 and 1 zero; 1023 is 1.0) and the BGRX formats.
//
// Everything rounds to the nearest code or float; there are no ties but 15u 16384, which is 512. 15u above 32768 counts
// as 32768; 32f converts as in all narrowing: NaN and what int32 cannot hold give 0.
#include <cstddef>
#include <cstdint>

#include "convert/PlainPixels.h"
#include "convert/RgbKernels.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "convert/Rgb10Kernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "convert/PixelVectors-inl.h"
#include "frame/KernelTable.h"

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel {
namespace HWY_NAMESPACE {
namespace {

using U64 = Full<uint64_t>;

HWY_INLINE U32 Mask(U32 v, uint32_t mask) { return hn::And(v, hn::Set(hn::ScalableTag<uint32_t>(), mask)); }
HWY_INLINE U64 Mask(U64 v, uint64_t mask) { return hn::And(v, hn::Set(hn::ScalableTag<uint64_t>(), mask)); }

// Applies op to 16-bit lanes.
template <class V, class Op>
HWY_INLINE V On16(V v, const Op& op) {
  const hn::ScalableTag<int16_t> d;
  return hn::BitCast(hn::DFromV<V>(), op(d, hn::BitCast(d, v)));
}

// 255 x / 1023 = x / 4 - x / 1364, so rounding it is (x + 2 - ceil(x / 341)) / 4 rounded down.
struct To8 {
  template <class D>
  HWY_INLINE I16 operator()(D d, I16 x) const {
    const auto above =
        hn::Add(hn::VecFromMask(d, hn::Gt(x, hn::Set(d, 341))), hn::VecFromMask(d, hn::Gt(x, hn::Set(d, 682))));
    return hn::ShiftRight<2>(hn::Add(hn::Add(x, hn::Set(d, 1)), above));
  }
};

// 1023 x / 255 = 4 x + 3 x / 255.
struct From8 {
  template <class D>
  HWY_INLINE I16 operator()(D d, I16 x) const {
    const auto rest = hn::ShiftRight<8>(hn::Add(hn::Mul(x, hn::Set(d, 3)), hn::Set(d, 129)));
    return hn::Add(hn::ShiftLeft<2>(x), rest);
  }
};

// 32768 x / 1023 = 32 x + 32 x / 1023, of which the second term rounds as x / 32 does.
struct To15 {
  template <class D>
  HWY_INLINE I16 operator()(D d, I16 x) const {
    return hn::Add(hn::ShiftLeft<5>(x), hn::ShiftRight<5>(hn::Add(x, hn::Set(d, 16))));
  }
};

// The rounding signed multiply sees 32768 as -32768 and gives -1023.
struct From15 {
  template <class D>
  HWY_INLINE I16 operator()(D d, I16 x) const {
    const hn::ScalableTag<uint16_t> du;
    const auto limited = hn::Min(hn::BitCast(du, x), hn::Set(du, 32768));
    return hn::Abs(hn::MulFixedPoint15(hn::BitCast(d, limited), hn::Set(d, 1023)));
  }
};

struct Rgb10ToBgrx8Op {
  HWY_INLINE U32 operator()(U32 word) const {
    const auto blueRed = hn::Or(hn::ShiftRight<22>(word), Mask(hn::ShiftLeft<14>(word), 0x03FF0000));
    const auto green = Mask(hn::ShiftRight<12>(word), 0x3FF);
    const auto codes = hn::Or(On16(blueRed, To8()), hn::ShiftLeft<8>(On16(green, To8())));
    return hn::Or(codes, hn::Set(hn::ScalableTag<uint32_t>(), 0xFF000000));
  }
};

struct Bgrx8ToRgb10Op {
  HWY_INLINE U32 operator()(U32 pixel) const {
    const auto blueRed = On16(Mask(pixel, 0x00FF00FF), From8());
    const auto green = On16(Mask(hn::ShiftRight<8>(pixel), 0xFF), From8());
    return hn::Or(hn::Or(hn::ShiftLeft<22>(blueRed), hn::ShiftLeft<12>(green)),
                  Mask(hn::ShiftRight<14>(blueRed), 0xFFC));
  }
};

struct Rgb10ToBgrx15Body {
  HWY_INLINE U16 Load(const uint8_t* in) const {
    const auto word = LoadPromoted<uint64_t, uint32_t>(in);
    const auto green = Mask(hn::ShiftLeft<4>(word), uint64_t{0x3FF} << 16);
    const auto red = Mask(hn::ShiftLeft<30>(word), uint64_t{0x3FF} << 32);
    const auto codes = On16(hn::Or(hn::Or(hn::ShiftRight<22>(word), green), red), To15());
    return WriteAlpha<AlphaWrite::OpaqueLast, uint16_t>(hn::BitCast(hn::ScalableTag<uint16_t>(), codes));
  }
  HWY_INLINE void operator()(const uint8_t* in, uint8_t* out) const {
    const auto v0 = Load(in), v1 = Load(in + HWY_MAX_BYTES / 2);
    StoreVector(v0, out, 0);
    StoreVector(v1, out, 1);
  }
};

struct Bgrx15ToRgb10Body {
  // The word in the lower half of each lane.
  HWY_INLINE U32 Load(const uint8_t* in, size_t index) const {
    const auto codes = On16(LoadVector<uint64_t>(in, index), From15());
    const auto greenRed = hn::Or(Mask(hn::ShiftRight<4>(codes), 0x3FF000), Mask(hn::ShiftRight<30>(codes), 0xFFC));
    return hn::BitCast(hn::ScalableTag<uint32_t>(), hn::Or(hn::ShiftLeft<22>(codes), greenRed));
  }
  HWY_INLINE void operator()(const uint8_t* in, uint8_t* out) const {
    StoreVector(hn::ConcatEven(hn::ScalableTag<uint32_t>(), Load(in, 1), Load(in, 0)), out);
  }
};

struct Rgb10ToBgrx32fBody {
  HWY_INLINE F32 Widen(U32 code) const {
    const hn::ScalableTag<float> df;
    return hn::Div(hn::ConvertTo(df, hn::BitCast(hn::ScalableTag<int32_t>(), code)), hn::Set(df, 1023.0f));
  }
  HWY_INLINE void operator()(const uint8_t* in, uint8_t* out) const {
    const hn::ScalableTag<float> df;
    const auto word = LoadVector<uint32_t>(in);
    const auto blue = Widen(hn::ShiftRight<22>(word));
    const auto green = Widen(Mask(hn::ShiftRight<12>(word), 0x3FF));
    const auto red = Widen(Mask(hn::ShiftRight<2>(word), 0x3FF));
    hn::StoreInterleaved4(blue, green, red, hn::Set(df, 1.0f), df, reinterpret_cast<float*>(out));
  }
};

struct Bgrx32fToRgb10Body {
  HWY_INLINE U32 Narrow(F32 v) const {
    const hn::ScalableTag<int32_t> d;
    const auto code = ConvertNearest(hn::Mul(v, hn::Set(hn::ScalableTag<float>(), 1023.0f)));
    return hn::BitCast(hn::ScalableTag<uint32_t>(), hn::Min(hn::Max(code, hn::Zero(d)), hn::Set(d, 1023)));
  }
  HWY_INLINE void operator()(const uint8_t* in, uint8_t* out) const {
    F32 blue, green, red, ignored;
    hn::LoadInterleaved4(hn::ScalableTag<float>(), reinterpret_cast<const float*>(in), blue, green, red, ignored);
    const auto word = hn::Or(hn::ShiftLeft<22>(Narrow(blue)), hn::ShiftLeft<12>(Narrow(green)));
    StoreVector(hn::Or(word, hn::ShiftLeft<2>(Narrow(red))), out);
  }
};

HWY_ATTR void Rgb10ToBgrx8(const uint8_t* src, uint8_t* dst, size_t count) {
  MapRow<uint8_t>(src, dst, count, EachVector<uint32_t, Rgb10ToBgrx8Op>());
}
HWY_ATTR void Bgrx8ToRgb10(const uint8_t* src, uint8_t* dst, size_t count) {
  MapRow<uint8_t>(src, dst, count, EachVector<uint32_t, Bgrx8ToRgb10Op>());
}
HWY_ATTR void Rgb10ToBgrx15(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<HWY_MAX_BYTES / 4, 4, 8>(src, dst, count, Rgb10ToBgrx15Body());
}
HWY_ATTR void Bgrx15ToRgb10(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<HWY_MAX_BYTES / 4, 8, 4>(src, dst, count, Bgrx15ToRgb10Body());
}
HWY_ATTR void Rgb10ToBgrx32f(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<HWY_MAX_BYTES / 4, 4, 16>(src, dst, count, Rgb10ToBgrx32fBody());
}
HWY_ATTR void Bgrx32fToRgb10(const uint8_t* src, uint8_t* dst, size_t count) {
  RowLoop<HWY_MAX_BYTES / 4, 16, 4>(src, dst, count, Bgrx32fToRgb10Body());
}

}  // namespace
}  // namespace HWY_NAMESPACE
}  // namespace vexel
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#if HWY_ONCE
namespace vexel {
namespace plain {
namespace {

// Maps words to pixels; channel(code) gives a channel of type To.
template <class To, class Channel>
void MapFromRgb10(const uint8_t* src, uint8_t* dst, size_t count, const Channel& channel) {
  MapPixels<uint32_t, To, 1, 4>(src, dst, count, [&](const uint32_t* word, To* out) {
    ForChannels<3>([&](size_t k) { out[k] = channel((*word >> (22 - 10 * k)) & 1023); });
    out[3] = kFullScale<To>;
  });
}

template <class From, class Code>
void MapToRgb10(const uint8_t* src, uint8_t* dst, size_t count, const Code& code) {
  MapPixels<From, uint32_t, 4, 1>(src, dst, count, [&](const From* in, uint32_t* word) {
    *word = 0;
    ForChannels<3>([&](size_t k) { *word |= static_cast<uint32_t>(code(in[k])) << (22 - 10 * k); });
  });
}

void Rgb10ToBgrx8(const uint8_t* src, uint8_t* dst, size_t count) {
  MapFromRgb10<uint8_t>(src, dst, count, [](uint32_t x) { return static_cast<uint8_t>((x * 255 + 511) / 1023); });
}
void Rgb10ToBgrx15(const uint8_t* src, uint8_t* dst, size_t count) {
  MapFromRgb10<uint16_t>(src, dst, count, [](uint32_t x) { return static_cast<uint16_t>((x * 32768 + 511) / 1023); });
}
void Rgb10ToBgrx32f(const uint8_t* src, uint8_t* dst, size_t count) {
  MapFromRgb10<float>(src, dst, count, [](uint32_t x) { return static_cast<float>(x) / 1023.0f; });
}
void Bgrx8ToRgb10(const uint8_t* src, uint8_t* dst, size_t count) {
  MapToRgb10<uint8_t>(src, dst, count, [](uint8_t c) { return (c * 1023 + 127) / 255; });
}
void Bgrx15ToRgb10(const uint8_t* src, uint8_t* dst, size_t count) {
  MapToRgb10<uint16_t>(src, dst, count, [](uint16_t c) { return (Clamp(c, 0, 32768) * 1023 + 16384) / 32768; });
}
void Bgrx32fToRgb10(const uint8_t* src, uint8_t* dst, size_t count) {
  MapToRgb10<float>(src, dst, count, [](float c) { return Clamp(ConvertNearest(c * 1023.0f), 0, 1023); });
}

}  // namespace
}  // namespace plain

const RowKernelSet kRgb10ToBgrx8 = VX_KERNEL_VARIANTS(Rgb10ToBgrx8);
const RowKernelSet kRgb10ToBgrx15 = VX_KERNEL_VARIANTS(Rgb10ToBgrx15);
const RowKernelSet kRgb10ToBgrx32f = VX_KERNEL_VARIANTS(Rgb10ToBgrx32f);
const RowKernelSet kBgrx8ToRgb10 = VX_KERNEL_VARIANTS(Bgrx8ToRgb10);
const RowKernelSet kBgrx15ToRgb10 = VX_KERNEL_VARIANTS(Bgrx15ToRgb10);
const RowKernelSet kBgrx32fToRgb10 = VX_KERNEL_VARIANTS(Bgrx32fToRgb10);

}  // namespace vexel
#endif  // HWY_ONCE
