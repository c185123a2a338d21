// The runtime's pseudo-random generator, our own so that dissolve patterns are the same on every platform.
#pragma once

#include <cstdint>

namespace vexel {

// The linear congruential generator of the classic C run-time library: 0 to 32767, one state per thread, which starts
// as if seeded with 1.
void SeedRuntimeRandom(uint32_t seed) noexcept;
int RuntimeRandom() noexcept;

}  // namespace vexel
