// What all benchmarks share: frames, the memory floor, and a report of ratios.
//
// A case is registered once per contender with the same name: BenchCase("BGRA8 to VUYA8 1080p").Add("vexel", f).Add(
// "libyuv", g). The report puts the contenders of a case side by side, each as ns per pixel and as a multiple of the
// memory floor measured in the same run, with repetitions interleaved at random.
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <string>

#include "vexel/vexel.h"

namespace vexel::bench {

struct Size {
  const char* name;
  int width, height;
  size_t Pixels() const { return static_cast<size_t>(width) * static_cast<size_t>(height); }
};
inline constexpr Size kHd = {"1080p", 1920, 1080}, kUhd = {"2160p", 3840, 2160};

// Zeroed, page-aligned memory that is already mapped.
class Memory {
 public:
  explicit Memory(size_t bytes);
  uint8_t* data() const { return mData.get(); }
  size_t size() const { return mBytes; }
  // Repeatable noise; for floats in [0, 1).
  void FillBytes(uint64_t seed = 1);
  void FillFloats(uint64_t seed = 1);

 private:
  struct Free {
    void operator()(uint8_t* p) const;
  };
  std::unique_ptr<uint8_t, Free> mData;
  size_t mBytes;
};

// Ends the program unless a call made beforehand succeeds.
void Check(VX_Result result, const std::string& what);

// Reads srcBytes and writes dstBytes in step, as fast as the memory allows, with streaming stores.
void FloorStreamed(const uint8_t* src, size_t srcBytes, uint8_t* dst, size_t dstBytes);

// One row of the report. The work of every contender is called in a timed loop, on one thread; `pixels` is what one
// call processes.
class BenchCase {
 public:
  BenchCase(std::string name, size_t pixels) : mName(std::move(name)), mPixels(pixels) {}
  BenchCase& Add(const std::string& contender, std::function<void()> work);
  // On so many of the host's threads, timed by the clock on the wall instead of the calling thread's.
  BenchCase& AddThreaded(const std::string& contender, int threads, std::function<void()> work);
  // The floor of a call that reads and writes so many bytes, with cached or streaming stores, whichever is faster, as
  // contender "floor"; in memory of its own, or where the contenders work. What is read before it is written cannot go
  // past the cache.
  BenchCase& AddFloor(size_t srcBytes, size_t dstBytes);
  BenchCase& AddFloor(const uint8_t* src, size_t srcBytes, uint8_t* dst, size_t dstBytes, bool mayStream = true);

 private:
  void Register(const std::string& contender, int threads, std::function<void()> work);

  std::string mName;
  size_t mPixels;
};

}  // namespace vexel::bench

// Registers the cases of a benchmark file; the shared main calls it once.
void RegisterBenchmarks();
