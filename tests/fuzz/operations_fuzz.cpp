// A structured fuzz target: the input's bytes choose an operation, its formats, sizes and other arguments and the
// kernel variant, and the armed arena runs it. Formats that an operation refuses are run too and must write nothing.
//
//   cmake --preset ci-asan && cmake --build build/ci-asan --target vexel_fuzz && build/ci-asan/bin/vexel_fuzz
//   -max_total_time=60
#include <fuzzer/FuzzedDataProvider.h>

#include <cstdio>
#include <cstdlib>
#include <vector>

#include "frame/KernelVariant.h"
#include "frame/RuntimeRandom.h"
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

Operation AnyOperation(Input& input) {
  static constexpr Fill kFills[] = {VX_FillWithOpaqueBlack, VX_FillWithTransparentBlack, VX_FillWithOpaqueWhite,
                                    VX_FillWithTransparentWhite};
  using Sources = const ArenaFrame*;
  using To = const ArenaFrame&;
  const int option = input.ConsumeIntegralInRange(-1, 6), choice = input.ConsumeIntegralInRange(-1, 27);
  const int angle = choice % 4 * 90;
  const bool other = input.ConsumeBool();
  const F a = input.Raster(), b = input.Raster(), c = input.Raster(), to = input.Raster();
  const float x = input.Fraction(), y = input.Fraction(), z = input.Fraction();
  const Operation all[] = {
      {{a}, to, [=](Sources s, To d) { return Convert(*s, d, option); }},
      {{to}, to, [=](Sources s, To d) { return Rotate(*s, d, other ? -angle : angle, option > 2); }, angle % 180 != 0},
      {{a, b},
       to,
       [=](Sources s, To d) {
         SeedRuntimeRandom(1);  // which Dissolve of a single row goes on from
         return Blend(static_cast<VX_BlendMode>(choice), s[0], s[1], d, x, option);
       }},
      {{a}, to, [=](Sources s, To d) { return ToBlack(*s, d, x, option); }},
      {{a}, to, [=](Sources s, To d) { return ToBlackTested(*s, d, nullptr, option); }},
      {{a, b}, to, [=](Sources s, To d) { return Dissolve(s[0], s[1], d, x, option); }},
      {{a}, to, [=](Sources s, To d) { return AlphaGain(*s, d, x, option); }},
      {{a, b, c},
       to,
       [=](Sources s, To d) {
         return Accumulate({s[0], s[1], s[2]}, d, {x, y, z});
       }},
      {{}, to, [=](Sources, To d) { return FillWith(kFills[choice & 3], d); }}};
  return all[input.ConsumeIntegralInRange<size_t>(0, std::size(all) - 1)];
}

// A refusal depends on formats and arguments only, not on the buffers.
VX_Result Verdict(const Operation& operation) {
  std::vector<ArenaFrame> sources;
  for (const F format : operation.sources) sources.push_back({nullptr, 0, format, 1, 0});
  return operation.call(sources.data(), {nullptr, 0, operation.destination, 1, 0});
}

void Run(Input& input) {
  const auto variant =
      static_cast<KernelVariant>(input.ConsumeIntegralInRange(0, static_cast<int>(ProcessorVariant())));
  const Operation operation = AnyOperation(input);

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
