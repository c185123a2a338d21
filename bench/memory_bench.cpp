// Copies beside memcpy, and recycled frames beside the C library's heap and fresh pages. Times are per copy, block or
// frame.
#include "support/Bench.h"

#include <benchmark/benchmark.h>
#include <sys/mman.h>

#include <cstdlib>
#include <cstring>
#include <new>

#include "frame/StreamCopy.h"
#include "vexel/vexel.h"

using vexel::bench::BenchCase;

namespace {

constexpr size_t kHugePage = size_t{2} << 20;
constexpr size_t kLargest = size_t{256} << 20;

// In huge pages and written once: what is measured is the copy, not the mapping.
uint8_t* NewArea() {
  void* const area = std::aligned_alloc(kHugePage, kLargest + kHugePage);
  if (!area) throw std::bad_alloc();
  madvise(area, kLargest + kHugePage, MADV_HUGEPAGE);
  std::memset(area, 1, kLargest + kHugePage);
  return static_cast<uint8_t*>(area);
}

uint8_t* Source() {
  static uint8_t* const area = NewArea();
  return area + 128;
}

uint8_t* Destination() {
  static uint8_t* const area = NewArea();
  return area + 1040;
}

// Called through pointers that the compiler cannot see through, so that nothing is expanded in place.
void* (*volatile gMemcpy)(void*, const void*, size_t) = std::memcpy;
VX_Result (*volatile gCopyMemory)(void*, const void*, size_t) = VX_CopyMemory;

template <class Copy>
auto Copies(Copy copy, size_t bytes, size_t count) {
  return [=] {
    for (size_t i = 0; i < count; ++i) copy(Destination(), Source(), bytes);
  };
}

void AddCopies(size_t bytes) {
  const size_t count = bytes < 65536 ? 65536 / bytes : 1;
  BenchCase("copy " + std::to_string(bytes) + " bytes", count)
      .Add("vexel", Copies([f = gCopyMemory](auto... a) { f(a...); }, bytes, count))
      .Add("memcpy", Copies([f = gMemcpy](auto... a) { f(a...); }, bytes, count));
}

// A block that stays in the cache is written to one place after the other of a large area.
template <class Copy>
auto WriteOut(Copy copy, size_t block) {
  return [=] {
    for (size_t at = 0; at + block <= kLargest / 8; at += block) copy(Destination() + at, Source(), block);
    vexel::StreamFence();
  };
}

void AddWriteOut(size_t block) {
  const auto stream = [v = vexel::ActiveKernelVariant()](auto... a) { vexel::StreamCopy(a..., v); };
  BenchCase("write out by " + std::to_string(block) + " bytes", kLargest / 8 / block)
      .Add("vexel", WriteOut(stream, block))
      .Add("memcpy", WriteOut([f = gMemcpy](auto... a) { f(a...); }, block));
}

enum class Touch { Nothing, Pages, All };

void Use(void* block, size_t bytes, Touch touch) {
  benchmark::DoNotOptimize(block);
  auto* const at = static_cast<volatile uint8_t*>(block);
  if (touch == Touch::All)
    std::memset(block, 7, bytes);
  else if (touch == Touch::Pages)
    for (size_t i = 0; i < bytes; i += 4096) at[i] = 1;
  benchmark::ClobberMemory();
}

// One block taken, used and given back, as an operation does with an intermediate picture.
void AddFrames(const std::string& name, size_t bytes, Touch touch) {
  BenchCase(name, 1)
      .Add("vexel",
           [=] {
             void* raw;
             size_t rawSize;
             Use(VX_AllocateTransientMemoryBlock(bytes, &raw, &rawSize), bytes, touch);
             VX_FreeTransientMemoryBlock(raw, rawSize);
           })
      .Add("malloc",
           [=] {
             void* const block = std::malloc(bytes);
             Use(block, bytes, touch);
             std::free(block);
           })
      .Add("mmap", [=] {
        void* const block = mmap(nullptr, bytes, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
        Use(block, bytes, touch);
        munmap(block, bytes);
      });
}

}  // namespace

void RegisterBenchmarks() {
  for (size_t bytes = 64; bytes <= kLargest; bytes *= 2) {
    AddCopies(bytes);
    if (bytes <= 2048) AddCopies(bytes + 1);
    if (bytes < 65536) AddCopies(bytes + bytes / 2 + 1);
  }
  for (const size_t block : {size_t{4096}, size_t{16384}, size_t{65536}}) AddWriteOut(block);
  constexpr size_t kHd = size_t{1920} * 1080 * 4, kUhdFloat = size_t{3840} * 2160 * 16;
  AddFrames("block of 300 KB, taken and given back", 300000, Touch::Nothing);
  AddFrames("frame 1080p 8u, a byte per page written", kHd, Touch::Pages);
  AddFrames("frame 1080p 8u, written", kHd, Touch::All);
  AddFrames("frame 2160p 32f, a byte per page written", kUhdFloat, Touch::Pages);
  AddFrames("frame 2160p 32f, written", kUhdFloat, Touch::All);
}
