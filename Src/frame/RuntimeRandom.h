// The runtime's pseudo-random generator, our own so that dissolve patterns are the same on every platform.
#pragma once

#include <cstdint>

namespace vexel {

// A sequence of the linear congruential generator of the classic C run-time library: 0 to 32767.
class RandomSequence {
 public:
  explicit constexpr RandomSequence(uint32_t seed) : mState(seed) {}
  constexpr int Next() {
    mState = mState * kFactor + kAddend;
    return static_cast<int>(mState >> 16 & 0x7FFF);
  }
  constexpr uint32_t State() const { return mState; }
  // As `draws` calls of Next, in a few steps.
  constexpr void Skip(uint64_t draws) {
    uint32_t factor = kFactor, addend = kAddend;
    for (; draws != 0; draws >>= 1) {
      if (draws & 1) mState = mState * factor + addend;
      addend *= factor + 1;
      factor *= factor;
    }
  }

 private:
  static constexpr uint32_t kFactor = 214013, kAddend = 2531011;
  uint32_t mState;
};

// Each thread has one, which starts as if seeded with 1.
RandomSequence& RuntimeRandomSequence() noexcept;
inline void SeedRuntimeRandom(uint32_t seed) noexcept { RuntimeRandomSequence() = RandomSequence(seed); }
inline int RuntimeRandom() noexcept { return RuntimeRandomSequence().Next(); }

}  // namespace vexel
