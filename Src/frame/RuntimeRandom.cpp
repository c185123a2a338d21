#include "frame/RuntimeRandom.h"

namespace vexel {
namespace {

thread_local uint32_t tState = 1;

}  // namespace

void SeedRuntimeRandom(uint32_t seed) noexcept { tState = seed; }

int RuntimeRandom() noexcept {
  tState = tState * 214013u + 2531011u;
  return static_cast<int>(tState >> 16 & 0x7FFF);
}

}  // namespace vexel
