// A small deterministic random generator: the same sequence on every machine and standard library.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>

namespace vexel::testing {

// SplitMix64.
class Random {
 public:
  explicit Random(uint64_t seed = 1) : mState(seed) {}

  uint64_t Next() {
    uint64_t z = (mState += 0x9E3779B97F4A7C15u);
    z = (z ^ (z >> 30)) * 0xBF58476D1CE4E5B9u;
    z = (z ^ (z >> 27)) * 0x94D049BB133111EBu;
    return z ^ (z >> 31);
  }
  uint32_t Bits32() { return static_cast<uint32_t>(Next() >> 32); }
  // Both ends included.
  int64_t Int(int64_t least, int64_t most) {
    return least + static_cast<int64_t>(Next() % (static_cast<uint64_t>(most - least) + 1));
  }
  // 0 <= result < 1, in steps of 2^-24.
  float Unit() { return static_cast<float>(Next() >> 40) * 0x1p-24f; }
  float Float(float least, float most) { return least + (most - least) * Unit(); }
  bool OneIn(uint32_t n) { return Next() % n == 0; }

  void Fill(void* memory, size_t bytes) {
    auto* p = static_cast<unsigned char*>(memory);
    for (; bytes >= 8; p += 8, bytes -= 8) {
      const uint64_t word = Next();
      std::memcpy(p, &word, 8);
    }
    const uint64_t word = Next();
    std::memcpy(p, &word, bytes);
  }

 private:
  uint64_t mState;
};

}  // namespace vexel::testing
