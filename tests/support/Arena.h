// The armed arena: runs an operation on pictures whose rows lie flush against unreadable pages, over odd sizes,
// strides, alignments and contents, and compares the kernel variant under test with plain code bit by bit.
//
// Found this way: reads and writes outside the rows (a fault names the case and ends the process), writes into padding
// or into sources, results that depend on padding or on what the destination held, and differing variants. The memory
// is mapped once; sources are written through a second, writable view of the same pages.
#pragma once

#include "convert/RowKernel.h"
#include "support/Test.h"

namespace vexel::testing {

enum class Guard : uint8_t {
  Behind,   // an unreadable page directly behind each row
  Before,   // one directly before each row
  Shifted,  // as Before, but some samples past it, for every alignment
  Packed,   // all rows in one block, close together or without any gap, an unreadable page behind the block
};

enum class Contents : uint8_t {
  Random,    // 8u: any byte, 15u: 0..32768, 32f: -0.25..1.25 with exact 0, 1 and -0
  Extremes,  // the ends of the ranges; 15u: above 32768 too; 32f: NaN, infinities, denormals, huge numbers
  Zeros,
  Maximum,     // every sample 255, 32768, 1.0 or all ten bits set
  ClearAlpha,  // random colour under one alpha; Random for formats without it
  TinyAlpha,
  OpaqueAlpha,
};
inline constexpr int kContentsCount = 7;

// Fills a row's samples.
void FillSamples(uint8_t* row, size_t bytes, VX_PixelFormat format, Contents contents, Random& random);

// A picture in the arena. 4:2:0 pictures are one block, its planes' rows as VX_GetPlanarBuffers lays them out.
struct ArenaFrame {
  void* base = nullptr;
  int32_t rowBytes = 0;
  VX_PixelFormat format{};
  int32_t width = 0;
  int32_t height = 0;

  uint8_t* Row(int row) const { return static_cast<uint8_t*>(base) + ptrdiff_t{row} * rowBytes; }
};

struct ArenaSize {
  int32_t width, height;
};

std::vector<int> Range(int first, int last);

struct ArenaCase {
  std::string name;
  std::vector<VX_PixelFormat> sources = {};
  VX_PixelFormat destination{};
  size_t elementBytes = 0;  // if not 0: rows of elements of this size instead of the formats' pixels, at any address
  // sources points to as many frames as there are source formats. May be called any number of times.
  std::function<VX_Result(const ArenaFrame* sources, const ArenaFrame& destination)> run = {};

  bool destinationIsInput = false;  // in place: the destination holds pixels, equal ones in both runs
  VX_Result expected = VX_Success;  // any other code: the destination must stay as it was
  std::vector<int> widths = Range(1, 130);
  std::vector<int> heights = Range(1, 8);  // one is drawn for each width and guard
  // The size of a source for a destination size; the same if empty.
  std::function<ArenaSize(int source, ArenaSize destination)> sourceSize = {};
  bool everyContents = false;  // for each width and guard all contents, instead of one drawn
  int passes = 1;
  uint64_t seed = 1;
};

// The first deviation found, if any. Limits: rows of 16,384 bytes, 80 rows, 4 sources.
::testing::AssertionResult RunArena(const ArenaCase& arenaCase);

// An arena case's `run` for a row kernel with one source.
std::function<VX_Result(const ArenaFrame*, const ArenaFrame&)> RunRows(const RowKernelSet& kernel);

// The middle of a large region that cannot be read or written; any row address computed from it stays inside for up to
// 15 rows at any stride. For calls that must refuse before they touch a pixel.
void* UnreadableMemory();

// Expects a call that gets unreadable buffers to return `expected`. A fault names `what` and ends the process.
void ExpectRefusal(const std::string& what, VX_Result expected, const std::function<VX_Result(void* memory)>& call);

// A picture of up to 15 rows, each at `rowBytes` (up to +-2^31) from the one before; only the bytes of the rows are
// mapped, as far as pages allow. Rows are zero at first. One at a time.
ArenaFrame GiantStrideFrame(VX_PixelFormat format, int32_t width, int32_t height, int32_t rowBytes);

}  // namespace vexel::testing
