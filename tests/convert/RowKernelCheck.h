// Rows for kernels under test, and the comparison of a kernel's variants with its plain definition.
#pragma once

#include <sys/mman.h>
#include <unistd.h>

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <limits>
#include <ostream>
#include <vector>

#include <gtest/gtest.h>

#include "convert/RowKernel.h"
#include "frame/FpModeGuard.h"
#include "support/Random.h"

namespace vexel::testing {

// Bytes between two unreadable pages.
class GuardedBytes {
 public:
  explicit GuardedBytes(size_t capacity) {
    const auto page = static_cast<size_t>(sysconf(_SC_PAGESIZE));
    mSize = (capacity + page - 1) / page * page;
    mMappedSize = mSize + 2 * page;
    mMapping = static_cast<uint8_t*>(mmap(nullptr, mMappedSize, PROT_NONE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0));
    if (mMapping == MAP_FAILED || mprotect(mMapping + page, mSize, PROT_READ | PROT_WRITE) != 0) std::abort();
    mData = mMapping + page;
  }
  ~GuardedBytes() { munmap(mMapping, mMappedSize); }
  GuardedBytes(const GuardedBytes&) = delete;
  GuardedBytes& operator=(const GuardedBytes&) = delete;

  // `bytes` bytes that begin right after, or end right before, an unreadable page.
  uint8_t* Row(size_t bytes, bool atEnd) { return atEnd ? mData + mSize - bytes : mData; }
  uint8_t* data() { return mData; }
  size_t size() const { return mSize; }

 private:
  uint8_t* mMapping;
  uint8_t* mData;
  size_t mSize, mMappedSize;
};

// How a row is laid out: whole units of some pixels each.
struct RowShape {
  size_t unitPixels, unitBytes;
  bool isFloat = false;

  size_t Bytes(size_t pixels) const { return (pixels + unitPixels - 1) / unitPixels * unitBytes; }
};
inline constexpr RowShape kPixels8{1, 4}, kPixels32f{1, 16, true}, kPairs8{2, 4}, kPairs32f{2, 16, true},
    kGroups10{6, 16};

struct KernelCase {
  const char* name;
  const RowKernelSet* kernels;
  RowShape source, destination;
};
inline std::ostream& operator<<(std::ostream& out, const KernelCase& kernelCase) { return out << kernelCase.name; }

// Mostly values of pictures, some far out of range, and everything that is special about floats.
inline float AnyFloat(Random& random) {
  using Limits = std::numeric_limits<float>;
  static constexpr float kSpecial[] = {0.0f,
                                       -0.0f,
                                       1.0f,
                                       0.5f,
                                       -0.5f,
                                       Limits::infinity(),
                                       -Limits::infinity(),
                                       Limits::quiet_NaN(),
                                       Limits::max(),
                                       Limits::lowest(),
                                       Limits::min(),
                                       Limits::denorm_min(),
                                       8421504.0f,
                                       8421505.5f,
                                       9803371.0f,
                                       -1e9f};
  if (random.OneIn(24)) return kSpecial[random.Int(0, std::size(kSpecial) - 1)];
  return random.OneIn(12) ? random.Float(-1e8f, 1e8f) : random.Float(-0.75f, 1.5f);
}

inline void FillRow(const RowShape& shape, uint8_t* row, size_t bytes, Random& random) {
  if (!shape.isFloat) return random.Fill(row, bytes);
  for (size_t i = 0; i + 4 <= bytes; i += 4) {
    const float value = AnyFloat(random);
    std::memcpy(row + i, &value, 4);
  }
}

// Index of the first byte that differs, or `bytes`. Which NaN comes out is nobody's promise: the compiler may swap the
// operands of an addition.
inline size_t FirstDifference(const RowShape& shape, const uint8_t* a, const uint8_t* b, size_t bytes) {
  if (!shape.isFloat) {
    for (size_t i = 0; i < bytes; ++i)
      if (a[i] != b[i]) return i;
    return bytes;
  }
  for (size_t i = 0; i + 4 <= bytes; i += 4) {
    float x, y;
    std::memcpy(&x, a + i, 4);
    std::memcpy(&y, b + i, 4);
    if (std::memcmp(&x, &y, 4) != 0 && !(std::isnan(x) && std::isnan(y))) return i;
  }
  return bytes;
}

// All variants give the plain kernel's bytes for rows of `least` to `most` pixels, without a step outside of the rows.
inline void ExpectVariantsAgree(const KernelCase& kernelCase, size_t most, size_t least = 0) {
  const size_t sourceMost = kernelCase.source.Bytes(most), destinationMost = kernelCase.destination.Bytes(most);
  GuardedBytes source(sourceMost), destination(destinationMost);
  std::vector<uint8_t> expected(destinationMost);
  Random random(most);
  for (size_t count = least; count <= most; ++count) {
    const bool atEnd = count % 2 != 0 || count > most / 2;
    const size_t sourceBytes = kernelCase.source.Bytes(count), bytes = kernelCase.destination.Bytes(count);
    uint8_t* in = source.Row(sourceBytes, atEnd);
    FillRow(kernelCase.source, in, sourceBytes, random);
    for (int v = 0; v < kKernelVariantCount; ++v) {
      const auto variant = static_cast<KernelVariant>(v);
      if (variant > ActiveKernelVariant()) break;
      const uint8_t fill = v % 2 != 0 ? 0xA5 : 0x5A;
      std::memset(destination.data(), fill, destination.size());
      uint8_t* out = destination.Row(bytes, atEnd);
      {
        const FpModeGuard guard;
        (*kernelCase.kernels)[variant](in, out, count);
      }
      if (variant == KernelVariant::Plain) expected.assign(out, out + bytes);
      const size_t at = FirstDifference(kernelCase.destination, out, expected.data(), bytes);
      ASSERT_EQ(at, bytes) << kernelCase << " " << KernelVariantName(variant) << ", " << count << " pixels";
      const auto untouched = [fill](uint8_t byte) { return byte == fill; };
      ASSERT_TRUE(std::all_of(destination.data(), out, untouched) &&
                  std::all_of(out + bytes, destination.data() + destination.size(), untouched))
          << kernelCase << " " << KernelVariantName(variant) << " writes outside of " << count << " pixels";
    }
  }
}

// Runs the active variant over typed rows.
template <class To, class From>
std::vector<To> RunKernel(const RowKernelSet& kernels, const std::vector<From>& source, size_t count,
                          size_t destinationSize) {
  std::vector<To> destination(destinationSize);
  const FpModeGuard guard;
  kernels[ActiveKernelVariant()](reinterpret_cast<const uint8_t*>(source.data()),
                                 reinterpret_cast<uint8_t*>(destination.data()), count);
  return destination;
}

}  // namespace vexel::testing
