// What the arena's pictures hold.
#include "support/Arena.h"
#include "support/Test.h"

namespace vexel::testing {
namespace {

template <class Sample>
struct Values;

template <>
struct Values<uint8_t> {
  static constexpr uint8_t kMaximum = 255, kTiny = 1;
  static uint8_t Usual(Random& random) { return static_cast<uint8_t>(random.Bits32()); }
  static uint8_t Extreme(Random& random) {
    static constexpr uint8_t kValues[] = {0, 1, 15, 16, 17, 127, 128, 129, 234, 235, 236, 239, 240, 241, 254, 255};
    return kValues[random.Bits32() % 16];
  }
};

template <>
struct Values<uint16_t> {
  static constexpr uint16_t kMaximum = 32768, kTiny = 1;
  static uint16_t Usual(Random& random) { return static_cast<uint16_t>(random.Int(0, 32768)); }
  static uint16_t Extreme(Random& random) {
    static constexpr uint16_t kValues[] = {0, 1, 2, 16383, 16384, 16385, 32766, 32767, 32768, 32769, 65534, 65535};
    const uint32_t bits = random.Bits32();
    return bits & 0x10000 ? static_cast<uint16_t>(bits) : kValues[bits % 12];
  }
};

// V210 and 10-bit RGB words; the bits that hold no sample are random too.
template <>
struct Values<uint32_t> {
  static constexpr uint32_t kMaximum = 0xFFFFFFFF, kTiny = 1;
  static uint32_t Usual(Random& random) { return random.Bits32(); }
  static uint32_t Extreme(Random& random) {
    static constexpr uint32_t kCodes[] = {0, 3, 4, 63, 64, 65, 511, 512, 513, 939, 940, 941, 960, 961, 1019, 1023};
    const uint32_t bits = random.Bits32();
    return kCodes[bits & 15] << 20 | kCodes[bits >> 4 & 15] << 10 | kCodes[bits >> 8 & 15];
  }
};

template <>
struct Values<float> {
  static constexpr float kMaximum = 1.0f, kTiny = 0x1p-20f;
  static float Usual(Random& random) {
    const uint64_t bits = random.Next();
    static constexpr float kExact[] = {0.0f, 1.0f, -0.0f, 0.5f};
    if ((bits & 15) == 0) return kExact[bits >> 4 & 3];
    return static_cast<float>(bits >> 40) * 0x1.8p-24f - 0.25f;
  }
  static float Extreme(Random& random) {
    using Limits = std::numeric_limits<float>;
    static constexpr float kNan = Limits::quiet_NaN(), kInf = Limits::infinity(), kMost = Limits::max(),
                           kLeast = Limits::denorm_min();
    static constexpr float kValues[] = {0.0f,   -0.0f,   1.0f,      -1.0f,        kNan,         kInf,        -kInf,
                                        kLeast, -kLeast, 0x1p-127f, 0x1p-126f,    kMost,        -kMost,      0x1p31f,
                                        1e9f,   -3e9f,   0.5f,      254.5f / 255, 255.5f / 255, 0x1.fffep-1f};
    const uint64_t bits = random.Next();
    if (bits & 1) return kValues[(bits >> 1) % std::size(kValues)];
    // Any finite number; its sign and exponent are random.
    const uint32_t any = static_cast<uint32_t>(bits >> 32);
    return std::bit_cast<float>((any & 0x7F800000) == 0x7F800000 ? any ^ 0x40000000 : any);
  }
};

// The index of the alpha sample in a pixel, or -1.
int AlphaIndex(VX_PixelFormat format) {
  if (Layout(format) != kLayout4444 || AlphaKind(format) == kAlphaNone) return -1;
  return IsReversed(format) ? 0 : 3;
}

template <class Sample>
void Fill(uint8_t* row, size_t bytes, int alphaIndex, Contents contents, Random& random) {
  using V = Values<Sample>;
  const size_t count = bytes / sizeof(Sample);
  const auto put = [&](size_t i, Sample value) { std::memcpy(row + i * sizeof(Sample), &value, sizeof(Sample)); };
  if (contents == Contents::Random && sizeof(Sample) == 1) return random.Fill(row, bytes);
  for (size_t i = 0; i < count; ++i) switch (contents) {
      case Contents::Extremes:
        put(i, V::Extreme(random));
        break;
      case Contents::Zeros:
        put(i, Sample{0});
        break;
      case Contents::Maximum:
        put(i, V::kMaximum);
        break;
      default:
        put(i, V::Usual(random));
    }
  if (alphaIndex < 0 || contents < Contents::ClearAlpha) return;
  const Sample alpha = contents == Contents::ClearAlpha  ? Sample{0}
                       : contents == Contents::TinyAlpha ? V::kTiny
                                                         : V::kMaximum;
  for (size_t i = static_cast<size_t>(alphaIndex); i < count; i += 4) put(i, alpha);
}

}  // namespace

void FillSamples(uint8_t* row, size_t bytes, VX_PixelFormat format, Contents contents, Random& random) {
  const int alphaIndex = AlphaIndex(format);
  switch (Depth(format)) {
    case kDepth8u:
      return Fill<uint8_t>(row, bytes, alphaIndex, contents, random);
    case kDepth15u:
      return Fill<uint16_t>(row, bytes, alphaIndex, contents, random);
    case kDepth10u:
      if (Is420(format)) return Fill<uint16_t>(row, bytes, -1, contents, random);
      return Fill<uint32_t>(row, bytes, -1, contents, random);
    default:
      return Fill<float>(row, bytes, alphaIndex, contents, random);
  }
}

}  // namespace vexel::testing
