// Powers, logarithms and exponentials: their vector forms, one array at a time, and what these give.
#include "frame/Power.h"
#include "support/Test.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "color/power_test.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "frame/Power-inl.h"

#if HWY_TARGET != HWY_SCALAR
HWY_BEFORE_NAMESPACE();
namespace vexel::testing {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;
namespace power = vexel::HWY_NAMESPACE;

// What the loops work on.
struct Block {
  static constexpr size_t kCount = 3 * hn::MaxLanes(hn::ScalableTag<float>());
  HWY_ALIGN float values[kCount];
  HWY_ALIGN float scratch[power::kPowerScratch * kCount];
};

// change(Block&) for all values.
template <class Change>
void ForEachBlock(const float* src, float* dst, size_t count, const Change& change) {
  Block block;
  for (size_t i = 0; i < count; i += Block::kCount) {
    std::memcpy(block.values, src + i, sizeof block.values);
    change(block);
    std::memcpy(dst + i, block.values, sizeof block.values);
  }
}

void Powers(const float* src, float* dst, size_t count, const PowerExponent& y) {
  ForEachBlock(src, dst, count,
               [&](Block& block) HWY_ATTR { power::PowersAny(block.values, Block::kCount, block.scratch, y); });
}

// Loops that have not met a minus sign yet and loops that have, by turns.
void SignedPowers(const float* src, float* dst, size_t count, const PowerExponent& y) {
  bool turn = false;
  ForEachBlock(src, dst, count, [&](Block& block) HWY_ATTR {
    bool negative = turn = !turn;
    power::SignedPowersAny(block.values, Block::kCount, block.scratch, y, negative);
  });
}

// A step without effect before and after the function.
struct Same {
  template <class... V>
  VX_POWER_STEP auto operator()(hn::Vec<hn::ScalableTag<float>> v, V...) const {
    return v;
  }
};
void LogsTo(const float* src, float* dst, size_t count, const vexel::power::ScaledLog2& log) {
  ForEachBlock(src, dst, count, [&](Block& block) HWY_ATTR {
    power::Logs(block.values, Block::kCount, block.scratch, log, Same(), Same());
  });
}
void ExpsOf(const float* src, float* dst, size_t count, const vexel::power::SplitFloat& log2Base) {
  ForEachBlock(src, dst, count,
               [&](Block& block) HWY_ATTR { power::Exps(block.values, Block::kCount, log2Base, Same(), Same()); });
}
using Y = PowerExponent;  // which these do not have
void Logs(const float* src, float* dst, size_t n, const Y&) { LogsTo(src, dst, n, vexel::power::kNaturalLog); }
void Log10s(const float* src, float* dst, size_t n, const Y&) { LogsTo(src, dst, n, vexel::power::kDecimalLog); }
void Exps(const float* src, float* dst, size_t n, const Y&) { ExpsOf(src, dst, n, vexel::power::kLog2EShort); }
void Exp10s(const float* src, float* dst, size_t n, const Y&) { ExpsOf(src, dst, n, vexel::power::kLog2Of10Short); }

}  // namespace HWY_NAMESPACE
}  // namespace vexel::testing
HWY_AFTER_NAMESPACE();
#endif  // HWY_TARGET

#if HWY_ONCE

#include <xmmintrin.h>

#include "frame/KernelTable.h"
#include "support/Ulp.h"

namespace vexel::testing {
namespace plain {

using Y = PowerExponent;
template <auto kFunction>
void Map(const float* src, float* dst, size_t count, const Y& y) {
  for (size_t i = 0; i < count; ++i) dst[i] = kFunction(src[i], y);
}
constexpr auto& Powers = Map<[](float x, const Y& y) { return Power(x, y); }>;
constexpr auto& SignedPowers = Map<[](float x, const Y& y) { return SignedPower(x, y); }>;
constexpr auto& Logs = Map<[](float x, const Y&) { return Log(x); }>;
constexpr auto& Log10s = Map<[](float x, const Y&) { return Log10(x); }>;
constexpr auto& Exps = Map<[](float x, const Y&) { return Exp(x); }>;
constexpr auto& Exp10s = Map<[](float x, const Y&) { return Exp10(x); }>;

}  // namespace plain

namespace {

using Arrays = KernelVariants<void (*)(const float* src, float* dst, size_t count, const PowerExponent& y)>;
const Arrays kPowers = VX_KERNEL_VARIANTS(Powers), kSignedPowers = VX_KERNEL_VARIANTS(SignedPowers),
             kLogs = VX_KERNEL_VARIANTS(Logs), kLog10s = VX_KERNEL_VARIANTS(Log10s), kExps = VX_KERNEL_VARIANTS(Exps),
             kExp10s = VX_KERNEL_VARIANTS(Exp10s);
const PowerExponent kNone(1);

// Arrays are multiples of three of the longest vectors.
constexpr size_t kPowerBlock = 48;

// The exponents of the colour spaces, and the ends of the ranges of the two cores.
const std::vector<float> kExponents = {2.4f,      1.0f / 2.4f,  2.6f,      1.0f / 2.6f, 0.1593017578125f,
                                       78.84375f, 0.012683313f, 6.277395f, 0.2f,        1.0f / 6.0f,
                                       2.2f,      1.0f / 2.2f,  0.5f,      1.0f,        0x1p-10f,
                                       4.0f,      0.98f,        0.9801f,   4.0001f,     0.000976562f,
                                       80.0f,     80.5f,        1000.0f,   1e-20f,      1e-42f,
                                       1e8f,      -0.41666f,    -2.4f};

std::vector<float> Grid(uint32_t firstBits, uint32_t lastBits, uint32_t step) {
  std::vector<float> grid;
  for (uint64_t bits = firstBits; bits <= lastBits; bits += step)
    grid.push_back(std::bit_cast<float>(static_cast<uint32_t>(bits)));
  grid.resize((grid.size() + kPowerBlock - 1) / kPowerBlock * kPowerBlock, grid.back());
  return grid;
}

struct Domain {
  const char* name;
  uint32_t firstBits, lastBits, step;
};

// All exponents (denormals too) coarsely, the picture's range finely; the steps are primes, so that mantissas vary.
const Domain kPositive[] = {{"all", 0, 0x7f800000, 60013}, {"pictures", 0x37800000, 0x41200000, 12007}};

void ExpectWithinOneUlp(const std::string& what, const Domain& domain,
                        const std::function<long double(long double)>& reference, const Arrays& arrays,
                        const PowerExponent& y = kNone) {
  const std::vector<float> in = Grid(domain.firstBits, domain.lastBits, domain.step);
  std::vector<float> out(in.size());
  arrays[ActiveKernelVariant()](in.data(), out.data(), in.size(), y);
  int failures = 0;
  for (size_t i = 0; i < in.size() && failures < 3; ++i) {
    const auto expected = static_cast<float>(reference(in[i]));
    if (UlpDistance(expected, out[i]) <= 1) continue;
    ++failures;
    ADD_FAILURE() << what << " of " << in[i] << ": " << out[i] << " instead of " << expected;
  }
}

TEST(Power, StaysWithinOneUlpOfTheCorrectlyRoundedResult) {
  for (const Domain& domain : kPositive)
    for (const float y : kExponents)
      ExpectWithinOneUlp(
          "power " + std::to_string(y), domain, [y](long double x) { return std::pow(x, static_cast<long double>(y)); },
          kPowers, PowerExponent(y));
}

TEST(Power, LogarithmsAndExponentialsStayWithinOneUlp) {
  const Domain both[] = {{"positive", 0, 0x7f800000, 40009}, {"negative", 0x80000000, 0xff800000, 40009}};
  const Domain nearOne{"near one", 0x3f000000, 0x40000000, 1009};
  for (const Domain& domain : {kPositive[0], kPositive[1], nearOne}) {
    ExpectWithinOneUlp(
        "log", domain, [](long double x) { return std::log(x); }, kLogs);
    ExpectWithinOneUlp(
        "log10", domain, [](long double x) { return std::log10(x); }, kLog10s);
  }
  for (const Domain& domain : both) {
    ExpectWithinOneUlp(
        "exp", domain, [](long double x) { return std::exp(x); }, kExps);
    ExpectWithinOneUlp(
        "exp10", domain, [](long double x) { return std::pow(10.0L, x); }, kExp10s);
  }
}

// The argument's rounding alone would move these by up to 2e-6.
TEST(Power, OfOneLessKeepsTheDigitsOfItsArgument) {
  const PowerExponent y(78.84375f);
  for (uint32_t bits = 0x33000000; bits < 0x3e280000; bits += 1009)
    for (const float u : {std::bit_cast<float>(bits), -std::bit_cast<float>(bits)}) {
      if (u < -0.04f) continue;
      const auto expected = static_cast<double>(std::pow(1.0L - u, 78.84375L));
      ASSERT_NEAR(PowerOfOneLess(u, y), expected, 0x1p-23 * std::max(1.0, expected)) << u;
    }
  EXPECT_TRUE(std::isnan(PowerOfOneLess(kNaN, y)));
}

std::vector<float> AnyFloats(Random& random) {
  std::vector<float> values(kPowerBlock * 100);
  for (float& v : values) {
    v = std::bit_cast<float>(random.Bits32());
    if (random.OneIn(2)) v = random.Float(-0.5f, 1.5f);
    if (random.OneIn(40)) v = std::bit_cast<float>(random.Bits32() & 0x807fffff);
    if (random.OneIn(40)) v = 0;
  }
  const float special[] = {0.0f, -0.0f, 1.0f, -1.0f, kInfinity, -kInfinity, kNaN, 0x1p-149f, 0x1p-126f, 3.4028235e38f};
  for (const float s : special) values[random.Next() % values.size()] = s;
  return values;
}

TEST(Power, EveryVariantGivesTheSameBitsWithAndWithoutFlushToZero) {
  Random random(5);
  const uint32_t mode = _mm_getcsr();
  const auto compare = [&](const std::vector<float>& in, const Arrays& arrays, const PowerExponent& y) {
    std::vector<float> expected(in.size()), got(in.size());
    arrays[KernelVariant::Plain](in.data(), expected.data(), in.size(), y);
    for (int v = 0; v <= static_cast<int>(ProcessorVariant()); ++v)
      for (const uint32_t flush : {0u, 0x8000u}) {
        _mm_setcsr(mode | flush);
        arrays[static_cast<KernelVariant>(v)](in.data(), got.data(), in.size(), y);
        _mm_setcsr(mode);
        for (size_t i = 0; i < in.size(); ++i)
          ASSERT_TRUE(SameBits(expected[i], got[i])) << "variant " << v << " flush " << flush << " of " << in[i] << ": "
                                                     << got[i] << " instead of " << expected[i];
      }
  };
  std::vector<float> exponents = kExponents;
  exponents.insert(exponents.end(), {0.0f, -0.0f, kInfinity, -kInfinity, kNaN});
  for (const float y : exponents) {
    SCOPED_TRACE(y);
    const std::vector<float> in = AnyFloats(random);
    compare(in, kPowers, PowerExponent(y));
    compare(in, kSignedPowers, PowerExponent(y));
  }
  for (const Arrays* arrays : {&kLogs, &kLog10s, &kExps, &kExp10s}) compare(AnyFloats(random), *arrays, kNone);
}

TEST(Power, SpecialValuesFollowTheLanguage) {
  for (const float y : {0.0f, -0.0f, 0.3f, 2.4f, 78.0f, -2.4f, kInfinity, -kInfinity, kNaN})
    for (const float x : {0.0f, 1.0f, 0.5f, 2.0f, kInfinity, kNaN, 0x1p-140f})
      EXPECT_EQ(UlpDistance(static_cast<float>(std::pow(static_cast<double>(x), static_cast<double>(y))), Power(x, y)),
                0)
          << x << " to the power of " << y;
  EXPECT_EQ(Power(-0.0f, 2.4f), 0.0f);
  EXPECT_TRUE(std::isnan(Power(-1.0f, 2.4f)));
  EXPECT_TRUE(std::isnan(Power(-kInfinity, 2.4f)));
  const PowerExponent gamma(2.4f);
  for (const float x : {0.0f, 0.2f, 1.0f, 3.0f, kInfinity})
    EXPECT_TRUE(SameBits(SignedPower(-x, gamma), -SignedPower(x, gamma))) << x;
  EXPECT_EQ(Log(0.0f), -kInfinity);
  EXPECT_TRUE(std::isnan(Log(-1.0f)));
  EXPECT_EQ(Exp(1000.0f), kInfinity);
  EXPECT_EQ(Exp10(-1000.0f), 0.0f);
}

}  // namespace
}  // namespace vexel::testing

#endif  // HWY_ONCE
