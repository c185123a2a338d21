#include "support/Bench.h"

#include <benchmark/benchmark.h>
#include <immintrin.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <limits>
#include <map>
#include <set>
#include <vector>

#include "frame/KernelVariant.h"
#include "vexel_host/host.h"

namespace vexel::bench {
namespace {

// Cases and contenders in the order of their registration, in which the report lists them.
std::vector<std::string>& Registered() {
  static std::vector<std::string> names;
  return names;
}

// Those that are timed by the clock on the wall.
std::set<std::string>& Threaded() {
  static std::set<std::string> names;
  return names;
}

constexpr size_t kFloorStep = 4096;  // bytes of the larger side per step

__attribute__((target("avx2"))) void ReadBytes(const uint8_t* src, size_t bytes) {
  __m256i a = _mm256_setzero_si256(), b = a;
  size_t i = 0;
  for (; i + 64 <= bytes; i += 64) {
    a = _mm256_or_si256(a, _mm256_load_si256(reinterpret_cast<const __m256i*>(src + i)));
    b = _mm256_or_si256(b, _mm256_load_si256(reinterpret_cast<const __m256i*>(src + i + 32)));
  }
  benchmark::DoNotOptimize(_mm256_or_si256(a, b));
}

template <bool kStream>
__attribute__((target("avx2"))) void WriteBytes(uint8_t* dst, size_t bytes) {
  const __m256i value = _mm256_set1_epi8(0x5A);
  for (size_t i = 0; i + 32 <= bytes; i += 32) {
    if (kStream)
      _mm256_stream_si256(reinterpret_cast<__m256i*>(dst + i), value);
    else
      _mm256_store_si256(reinterpret_cast<__m256i*>(dst + i), value);
  }
}

template <bool kStream>
void Floor(const uint8_t* src, size_t srcBytes, uint8_t* dst, size_t dstBytes) {
  const size_t steps = std::max<size_t>(1, std::max(srcBytes, dstBytes) / kFloorStep);
  const size_t srcStep = srcBytes / steps / 64 * 64, dstStep = dstBytes / steps / 64 * 64;
  for (size_t i = 0; i < steps; ++i) {
    ReadBytes(src + i * srcStep, srcStep);
    WriteBytes<kStream>(dst + i * dstStep, dstStep);
  }
  if (srcStep * steps < srcBytes) ReadBytes(src + srcStep * steps, srcBytes - srcStep * steps);
  if (dstStep * steps < dstBytes) WriteBytes<kStream>(dst + dstStep * steps, dstBytes - dstStep * steps);
  if (kStream) _mm_sfence();
  benchmark::ClobberMemory();
}

// Collects the least time of each contender and prints one line per case.
class RatioReporter final : public benchmark::BenchmarkReporter {
 public:
  bool ReportContext(const Context&) override { return true; }
  void ReportRuns(const std::vector<Run>& runs) override {
    for (const Run& run : runs) {
      if (run.run_type != Run::RT_Iteration || run.error_occurred) continue;
      const std::string name = run.run_name.function_name;
      const size_t bar = name.rfind('|');
      const std::string key = name.substr(0, bar), contender = name.substr(bar + 1);
      auto& times = mTimes[key];
      auto it = std::find_if(times.begin(), times.end(), [&](const auto& t) { return t.first == contender; });
      if (it == times.end()) it = times.insert(times.end(), {contender, std::numeric_limits<double>::max()});
      const double seconds = Threaded().count(name) != 0 ? run.real_accumulated_time : run.cpu_accumulated_time;
      const double perPixel = 1e9 * seconds / static_cast<double>(run.iterations) / run.counters.at("px").value;
      it->second = std::min(it->second, perPixel);
    }
  }
  void Finalize() override {
    std::printf("| case | contender | ns/px | x floor | Vexel is |\n|---|---|---:|---:|---:|\n");
    for (const std::string& name : Registered()) {
      const std::string key = name.substr(0, name.rfind('|'));
      const auto times = mTimes.find(key);
      if (times == mTimes.end()) continue;
      std::stable_sort(times->second.begin(), times->second.end(), [&](const auto& a, const auto& b) {
        return RankOf(key + "|" + a.first) < RankOf(key + "|" + b.first);
      });
      Print(key, times->second);
      mTimes.erase(times);
    }
  }

 private:
  static ptrdiff_t RankOf(const std::string& name) {
    return std::find(Registered().begin(), Registered().end(), name) - Registered().begin();
  }
  using Times = std::vector<std::pair<std::string, double>>;
  static void Print(const std::string& key, const Times& times) {
    double floor = 0, ours = 0;
    for (const auto& [contender, time] : times) {
      if (contender.rfind("floor", 0) == 0) floor = floor == 0 ? time : std::min(floor, time);
      if (contender == "vexel") ours = time;
    }
    for (const auto& [contender, time] : times) {
      if (contender == "floor streamed") continue;
      const bool isFloor = contender == "floor cached";
      std::printf("| %s | %s | %.4f |", key.c_str(), isFloor ? "floor" : contender.c_str(), isFloor ? floor : time);
      if (floor > 0)
        std::printf(" %.2f |", (isFloor ? floor : time) / floor);
      else
        std::printf(" |");
      if (ours > 0 && contender != "vexel" && !isFloor)
        std::printf(" %.2fx as fast |\n", time / ours);
      else
        std::printf(" |\n");
    }
  }

  std::map<std::string, Times> mTimes;
};

}  // namespace

void Memory::Free::operator()(uint8_t* p) const { std::free(p); }

Memory::Memory(size_t bytes) : mBytes(bytes) {
  const size_t rounded = (bytes + 4095) & ~size_t{4095};
  mData.reset(static_cast<uint8_t*>(std::aligned_alloc(4096, std::max<size_t>(rounded, 4096))));
  std::memset(mData.get(), 0, std::max<size_t>(rounded, 4096));
}

void Memory::FillBytes(uint64_t seed) {
  uint64_t state = seed * 0x9E3779B97F4A7C15u + 1;
  for (size_t i = 0; i + 8 <= mBytes; i += 8) {
    state ^= state << 13, state ^= state >> 7, state ^= state << 17;
    std::memcpy(mData.get() + i, &state, 8);
  }
}

void Memory::FillFloats(uint64_t seed) {
  FillBytes(seed);
  for (size_t i = 0; i + 4 <= mBytes; i += 4) {
    uint32_t bits;
    std::memcpy(&bits, mData.get() + i, 4);
    const float value = static_cast<float>(bits >> 8) * 0x1p-24f;
    std::memcpy(mData.get() + i, &value, 4);
  }
}

void Check(VX_Result result, const std::string& what) {
  if (result == VX_Success) return;
  std::fprintf(stderr, "benchmark set-up failed: %s (%s)\n", what.c_str(), VX_ResultName(result));
  std::exit(1);
}

void FloorStreamed(const uint8_t* src, size_t srcBytes, uint8_t* dst, size_t dstBytes) {
  Floor<true>(src, srcBytes, dst, dstBytes);
}

void BenchCase::Register(const std::string& contender, int threads, std::function<void()> work) {
  const std::string name = mName + "|" + contender;
  Registered().push_back(name);
  benchmark::RegisterBenchmark(name.c_str(),
                               [work = std::move(work), pixels = mPixels, threads](benchmark::State& state) {
                                 vexel_host::SetThreadLimit(threads);
                                 work();
                                 for (auto _ : state) work();
                                 state.counters["px"] = static_cast<double>(pixels);
                               });
}

BenchCase& BenchCase::Add(const std::string& contender, std::function<void()> work) {
  Register(contender, 1, std::move(work));
  return *this;
}

BenchCase& BenchCase::AddThreaded(const std::string& contender, int threads, std::function<void()> work) {
  Threaded().insert(mName + "|" + contender);
  Register(contender, threads, std::move(work));
  return *this;
}

BenchCase& BenchCase::AddFloor(size_t srcBytes, size_t dstBytes) {
  // All floors share two areas.
  static std::unique_ptr<Memory> src, dst;
  const auto grow = [](std::unique_ptr<Memory>& area, size_t bytes) {
    if (!area || area->size() < bytes) area = std::make_unique<Memory>(bytes);
  };
  grow(src, srcBytes);
  grow(dst, dstBytes);
  // Asked for when it is timed: a later case may have let an area grow.
  Add("floor cached", [=] { Floor<false>(src->data(), srcBytes, dst->data(), dstBytes); });
  return Add("floor streamed", [=] { Floor<true>(src->data(), srcBytes, dst->data(), dstBytes); });
}

BenchCase& BenchCase::AddFloor(const uint8_t* src, size_t srcBytes, uint8_t* dst, size_t dstBytes, bool mayStream) {
  Add("floor cached", [=] { Floor<false>(src, srcBytes, dst, dstBytes); });
  if (mayStream) Add("floor streamed", [=] { Floor<true>(src, srcBytes, dst, dstBytes); });
  return *this;
}

}  // namespace vexel::bench

// --variant=NAME limits the kernels; the rest goes to Google Benchmark, with short interleaved repetitions by default.
int main(int argc, char** argv) {
  VX_Initialize();
  static char minTime[] = "--benchmark_min_time=0.05", repetitions[] = "--benchmark_repetitions=7",
              interleave[] = "--benchmark_enable_random_interleaving=true";
  std::vector<char*> arguments = {argv[0], minTime, repetitions, interleave};
  for (int i = 1; i < argc; ++i) {
    bool isVariant = false;
    for (int v = 0; v < vexel::kKernelVariantCount; ++v) {
      const auto variant = static_cast<vexel::KernelVariant>(v);
      if (std::string("--variant=") + vexel::KernelVariantName(variant) != argv[i]) continue;
      vexel::LimitKernelVariant(variant);
      isVariant = true;
    }
    if (!isVariant) arguments.push_back(argv[i]);
  }
  int count = static_cast<int>(arguments.size());
  benchmark::Initialize(&count, arguments.data());
  if (benchmark::ReportUnrecognizedArguments(count, arguments.data())) return 1;
  RegisterBenchmarks();
  vexel::bench::RatioReporter reporter;
  benchmark::RunSpecifiedBenchmarks(&reporter);
  VX_Terminate();
  return 0;
}
