// Known bugs that a build can take in, to prove that the tests catch them (tests/seeded_bugs.sh). Never in a build that
// ships: VEXEL_SEED_BUG is the number of the bug, 0 for none, -1 for the one that the environment variable of the same
// name says, so that one build serves all.
#pragma once

#ifndef VEXEL_SEED_BUG
#define VEXEL_SEED_BUG 0
#endif

#if VEXEL_SEED_BUG < 0
#include <cstdlib>
#endif

namespace vexel {

enum class SeededBug {
  TailOverread = 1,       // row kernels read a whole block at the end of a row
  TailOverwrite = 2,      // ... and write one
  VariantRounding = 3,    // wide kernels truncate where the others round
  FlipMovesPadding = 4,   // VX_FlipInPlace
  FailureKeepsValue = 5,  // VX_AllocatePixelBuffer leaves the row bytes when out of memory
  ScratchLeak = 6,
  FpModeLeak = 7,  // the caller's floating-point mode does not come back
  LastBandLost = 8,
  GroupsRoundDown = 9,  // V210 sizes
};
inline constexpr int kSeededBugCount = 9;

#if VEXEL_SEED_BUG >= 0
constexpr bool Has(SeededBug bug) noexcept { return static_cast<int>(bug) == VEXEL_SEED_BUG; }
#else
inline bool Has(SeededBug bug) noexcept {
  static const int chosen = [] {
    const char* text = std::getenv("VEXEL_SEED_BUG");
    return text ? std::atoi(text) : 0;
  }();
  return static_cast<int>(bug) == chosen;
}
#endif

}  // namespace vexel
