// First uses of the library, each in a process of its own. By eight threads at once: every table and cache that is made
// on first use is made under contention; ThreadSanitizer sees the races, and without it the results of all threads must
// still agree. By a caller of another rounding mode: later results must not tell.
//   vexel_first_use plans | conversions | planar | colour
#include <barrier>
#include <cfenv>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>
#include <vector>

#include "support/Formats.h"
#include "vexel/color_space.h"
#include "vexel/vexel.h"

namespace vexel::testing {
namespace {

constexpr int kThreads = 8, kWidth = 14, kHeight = 6;

// Results in any order.
class Digest {
 public:
  void Add(size_t item, const void* bytes, size_t count) {
    uint64_t hash = 0xcbf29ce484222325u ^ item;
    for (size_t i = 0; i < count; ++i) hash = (hash ^ static_cast<const uint8_t*>(bytes)[i]) * 0x100000001b3u;
    mSum += hash;
  }
  uint64_t Sum() const { return mSum; }

 private:
  uint64_t mSum = 0;
};

// Plain code points everywhere: bytes below 0x3f are small floats too.
std::vector<uint8_t> Content(VX_PixelFormat format) {
  std::vector<uint8_t> bytes(static_cast<size_t>(VX_PixelFormatSize(format, kWidth, kHeight)));
  for (size_t i = 0; i < bytes.size(); ++i) bytes[i] = static_cast<uint8_t>(i * 7 % 61);
  return bytes;
}

void Convert(VX_PixelFormat from, VX_PixelFormat to, size_t item, Digest& digest) {
  const std::vector<uint8_t> source = Content(from);
  std::vector<uint8_t> destination(static_cast<size_t>(VX_PixelFormatSize(to, kWidth, kHeight)));
  const auto rowBytes = [](VX_PixelFormat f) { return static_cast<int32_t>(VX_PixelFormatSize(f, kWidth, 1)); };
  const VX_Result result =
      VX_Convert(source.data(), rowBytes(from), from, destination.data(), rowBytes(to), to, kWidth, kHeight, 3);
  digest.Add(item, &result, sizeof result);
  digest.Add(item, destination.data(), destination.size());
}

// Each thread starts elsewhere.
template <class Use>
void ForEachItem(size_t count, size_t start, const Use& use) {
  for (size_t i = 0; i < count; ++i) use((i + start * count / kThreads) % count);
}

void UsePlans(size_t start, Digest& digest) {
  static const std::vector<VX_PixelFormat> formats = RasterFormats();
  ForEachItem(formats.size() * formats.size(), start, [&](size_t item) {
    VX_PixelFormat chain[9] = {};
    int32_t length = 0;
    VX_ExplainConversion(formats[item / formats.size()], formats[item % formats.size()], 3, chain, &length);
    digest.Add(item, chain, sizeof chain);
  });
}

void UseConversions(size_t start, Digest& digest) {
  static const std::vector<VX_PixelFormat> formats = RasterFormats();
  ForEachItem(formats.size() * formats.size() / 5, start, [&](size_t item) {  // every fifth pair meets all formats
    Convert(formats[5 * item / formats.size()], formats[5 * item % formats.size()], item, digest);
  });
  const std::vector<uint8_t> codes = Content(VX_PixelFormat::ARGB_4444_15u);
  std::vector<float> display(4 * kWidth * kHeight);
  VX_Convert_16uARGB_To_32fBGRX_Remove_CanonLog3_Apply_709(codes.data(), 8 * kWidth, display.data(), 16 * kWidth,
                                                           kWidth, kHeight, 0);
  digest.Add(0, display.data(), 4 * display.size());
}

void UsePlanar(size_t start, Digest& digest) {
  static const std::vector<VX_PixelFormat> formats = Formats420();
  ForEachItem(formats.size(), start, [&](size_t item) {
    Convert(formats[item], VX_PixelFormat::BGRA_4444_8u, item, digest);
    Convert(VX_PixelFormat::VUYA_4444_32f_709, formats[item], item, digest);
  });
}

void UseColour(size_t start, Digest& digest) {
  std::vector<float> pixels(4 * 33), converted(pixels.size());
  for (size_t i = 0; i < pixels.size(); ++i) pixels[i] = static_cast<float>(i % 37) / 29.0f;
  const int count = static_cast<int>(pixels.size() / 4);
  const auto add = [&](size_t item) { digest.Add(item, converted.data(), converted.size() * sizeof(float)); };
  // The last two look their signals up in tables.
  static const VX::PQColorSpace pq(true, false);
  static const VX::HLGColorSpace hlg;
  ForEachItem(8, start, [&](size_t item) {
    const VX::ColorSpace& space = item == 6   ? static_cast<const VX::ColorSpace&>(pq)
                                  : item == 7 ? static_cast<const VX::ColorSpace&>(hlg)
                                              : VX::ColorSpace::WorkingSpace(static_cast<VX_WorkingSpace>(item));
    space.ConvertPixelsFromRec709(pixels.data(), converted.data(), count, true);
    add(item);
    space.ConvertPixelsToRec709(pixels.data(), converted.data(), count, false);
    add(item + 10);
    space.CompressPixelsToSDR(pixels.data(), converted.data(), count, 1.0f, 0.5f, 0.5f);
    add(item + 20);
    digest.Add(item + 30, &space.RGBtoXYZ()[0][0], 9 * sizeof(float));
    digest.Add(item + 40, &space.XYZtoRGB()[0][0], 9 * sizeof(float));
    const VX::PQColorSpace copy(pq);  // while others fill its caches
    copy.ConvertPixelsToRec709(pixels.data(), converted.data(), count, false);
    add(item + 60);
    if (const float* luma = space.LuminanceCoeffs()) digest.Add(item + 50, luma, 3 * sizeof(float));
  });
}

using Use = void (*)(size_t start, Digest& digest);
struct Scenario {
  const char* name;
  Use use;
};
constexpr Scenario kScenarios[] = {
    {"plans", UsePlans}, {"conversions", UseConversions}, {"planar", UsePlanar}, {"colour", UseColour}};

// What a new process gives after its first use under a rounding mode; 0 if it gives nothing.
uint64_t SumAfterFirstUse(Use use, int rounding) {
  int pipes[2];
  uint64_t sum = 0;
  if (pipe(pipes) != 0) return 0;
  if (const pid_t child = fork(); child != 0) {
    close(pipes[1]);
    if (read(pipes[0], &sum, sizeof sum) != sizeof sum) sum = 0;
    close(pipes[0]);
    return waitpid(child, nullptr, 0) == child ? sum : 0;
  }
  Digest first, second;
  VX_Initialize();
  std::fesetround(rounding);
  use(0, first);
  std::fesetround(FE_TONEAREST);
  use(0, second);
  sum = second.Sum();
  _exit(write(pipes[1], &sum, sizeof sum) == sizeof sum ? 0 : 1);
}

}  // namespace
}  // namespace vexel::testing

using namespace vexel::testing;

int main(int argc, char** argv) {
  Use use = nullptr;
  for (const Scenario& scenario : kScenarios)
    if (argc == 2 && std::strcmp(argv[1], scenario.name) == 0) use = scenario.use;
  if (!use) return std::fprintf(stderr, "usage: vexel_first_use plans|conversions|planar|colour\n"), 2;

  const uint64_t expected = SumAfterFirstUse(use, FE_TONEAREST);
  for (const int rounding : {FE_UPWARD, FE_DOWNWARD, FE_TOWARDZERO})
    if (SumAfterFirstUse(use, rounding) != expected) return std::puts("a first use left its rounding mode"), 1;

  VX_Initialize();
  Digest digests[kThreads];
  {
    std::barrier start(kThreads);
    std::vector<std::jthread> threads;
    for (size_t i = 0; i < kThreads; ++i)
      threads.emplace_back([&, i] {
        start.arrive_and_wait();
        use(i, digests[i]);
      });
  }
  VX_Terminate();
  for (const Digest& digest : digests)
    if (digest.Sum() != expected) return std::puts("the threads disagree"), 1;
  return 0;
}
