// A structured fuzz target: the input's bytes choose an operation, its formats, sizes and other arguments and the
// kernel variant, and the armed arena runs it. Formats that an operation refuses are run too and must write nothing.
//
//   cmake --preset ci-asan && cmake --build build/ci-asan --target vexel_fuzz && build/ci-asan/bin/vexel_fuzz
//   -max_total_time=60
#include <fuzzer/FuzzedDataProvider.h>

#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "frame/KernelVariant.h"
#include "support/Arena.h"
#include "support/Formats.h"
#include "support/Operations.h"

namespace vexel::testing {
namespace {

using F = VX_PixelFormat;

// The limits of the arena.
constexpr int kMostWidth = 900, kMostRows = 79;

class Input : public FuzzedDataProvider {
 public:
  using FuzzedDataProvider::FuzzedDataProvider;
  F Raster() {
    static const std::vector<F> rasters = RasterFormats();
    return rasters[ConsumeIntegralInRange<size_t>(0, rasters.size() - 1)];
  }
  // Mostly 0..1, sometimes any number, NaN and infinities included.
  float Fraction() {
    return ConsumeIntegral<uint8_t>() < 200 ? ConsumeProbability<float>() : ConsumeFloatingPoint<float>();
  }
};

// What an operation is called with, once for its verdict on the arguments (empty height) and once by the arena.
using Call = std::function<VX_Result(const ArenaFrame* sources, const ArenaFrame& destination)>;

struct Operation {
  std::vector<F> sources;
  F destination{};
  Call call;
  bool turns = false;  // width and height change places
};

Operation AnyConversion(Input& input) {
  const F src = input.Raster(), dst = input.Raster();
  const int quality = input.ConsumeIntegralInRange(-1, 6);
  return {{src}, dst, [=](const ArenaFrame* from, const ArenaFrame& to) { return Convert(*from, to, quality); }};
}

Operation AnyRotation(Input& input) {
  const F format = input.Raster();
  const int angle = 90 * input.ConsumeIntegralInRange(-3, 3);
  const bool flip = input.ConsumeBool();
  const auto rotate = [=](const ArenaFrame* from, const ArenaFrame& to) { return Rotate(*from, to, angle, flip); };
  return {{format}, format, rotate, angle % 180 != 0};
}

Operation AnyComposite(Input& input) {
  const auto mode = static_cast<VX_BlendMode>(input.ConsumeIntegralInRange(-1, 27));
  const int option = input.ConsumeIntegralInRange(-1, 6);
  const float opacity = input.Fraction();
  const F src = input.Raster(), background = input.Raster(), dst = input.Raster();
  return {{src, background}, dst, [=](const ArenaFrame* from, const ArenaFrame& to) {
            return Blend(mode, from[0], from[1], to, opacity, option);
          }};
}

Operation AnyToBlack(Input& input) {
  const int hint = input.ConsumeIntegralInRange(0, 4);
  const float opacity = input.Fraction();
  const bool test = input.ConsumeBool();
  const F src = input.Raster(), dst = input.Raster();
  return {{src}, dst, [=](const ArenaFrame* from, const ArenaFrame& to) {
            int32_t state;
            return test ? ToBlackTested(*from, to, &state, hint) : ToBlack(*from, to, opacity, hint);
          }};
}

Operation AnyDissolve(Input& input) {
  const int hint = input.ConsumeIntegralInRange(0, 4);
  const float mix = input.Fraction();
  const F a = input.Raster(), b = input.Raster(), dst = input.Raster();
  return {{a, b}, dst, [=](const ArenaFrame* from, const ArenaFrame& to) {
            return Dissolve(from[0], from[1], to, mix, hint);
          }};
}

Operation AnyGain(Input& input) {
  const int hint = input.ConsumeIntegralInRange(0, 4);
  const float gain = input.Fraction();
  const F src = input.Raster(), dst = input.Raster();
  return {{src}, dst, [=](const ArenaFrame* from, const ArenaFrame& to) { return AlphaGain(*from, to, gain, hint); }};
}

Operation AnySum(Input& input) {
  const std::vector<float> weights = {input.Fraction(), input.Fraction(), input.Fraction()};
  const std::vector<F> sources = {input.Raster(), input.Raster(), input.Raster()};
  const F dst = input.Raster();
  return {sources, dst, [=](const ArenaFrame* from, const ArenaFrame& to) {
            return Accumulate({from[0], from[1], from[2]}, to, weights);
          }};
}

Operation AnyFill(Input& input) {
  static constexpr auto kFills = {VX_FillWithOpaqueBlack, VX_FillWithTransparentBlack, VX_FillWithOpaqueWhite,
                                  VX_FillWithTransparentWhite};
  const auto fill = kFills.begin()[input.ConsumeIntegralInRange(0, 3)];
  return {{}, input.Raster(), [fill](const ArenaFrame*, const ArenaFrame& to) { return FillWith(fill, to); }};
}

constexpr Operation (*kOperations[])(Input&) = {AnyConversion, AnyRotation, AnyComposite, AnyToBlack,
                                                AnyDissolve,   AnyGain,     AnySum,       AnyFill};

// A refusal depends on formats and arguments only, not on the buffers.
VX_Result Verdict(const Operation& operation) {
  std::vector<ArenaFrame> sources;
  for (const F format : operation.sources) sources.push_back({nullptr, 0, format, 1, 0});
  return operation.call(sources.data(), {nullptr, 0, operation.destination, 1, 0});
}

void Run(Input& input) {
  const auto variant =
      static_cast<KernelVariant>(input.ConsumeIntegralInRange(0, static_cast<int>(ProcessorVariant())));
  const Operation operation = kOperations[input.ConsumeIntegralInRange<size_t>(0, std::size(kOperations) - 1)](input);

  ArenaCase arenaCase;
  arenaCase.name = "fuzzed";
  arenaCase.sources = operation.sources;
  arenaCase.destination = operation.destination;
  arenaCase.run = operation.call;
  arenaCase.expected = Verdict(operation);
  arenaCase.widths = {input.ConsumeIntegralInRange(1, operation.turns ? kMostRows : kMostWidth)};
  arenaCase.heights = {input.ConsumeIntegralInRange(1, operation.turns ? kMostRows : 9)};
  if (operation.turns) arenaCase.sourceSize = [](int, ArenaSize size) { return ArenaSize{size.height, size.width}; };
  arenaCase.seed = input.ConsumeIntegral<uint64_t>();

  LimitKernelVariant(variant);
  const ::testing::AssertionResult verdict = RunArena(arenaCase);
  LimitKernelVariant(KernelVariant::Avx512);
  if (verdict) return;
  std::fprintf(stderr, "%s\n", verdict.message());
  std::abort();
}

}  // namespace
}  // namespace vexel::testing

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  static const VX_Result started = VX_Initialize();
  if (started != VX_Success) std::abort();
  vexel::testing::Input input(data, size);
  vexel::testing::Run(input);
  return 0;
}
