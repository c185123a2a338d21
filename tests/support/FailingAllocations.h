// Lets the allocations of an operation fail, one after another.
#pragma once

#include <vexel_host/host.h>

#include "support/Test.h"

namespace vexel::testing {

// Runs `call` with its n-th allocation failing, once and from there on, for n = 1, 2, ... until it needs fewer than n.
// Expects `onFailure` each time one failed, VX_Success otherwise and in a call after each failure, and the host's live
// bytes back where they were; so `call` must give back what it got. Returns the number of allocations of one call.
inline int ExpectSurvivesFailingAllocations(const std::string& what, const std::function<VX_Result()>& call,
                                            VX_Result onFailure = VX_ErrOutOfMemory) {
  constexpr uint64_t kMost = 1000;
  const size_t live = vexel_host::LiveBytes();
  uint64_t needed = 0;
  for (const bool sticky : {false, true})
    for (uint64_t n = 1; n <= kMost; ++n) {
      const std::string where = what + ": allocation " + std::to_string(n) + (sticky ? " and all after it" : "");
      const uint64_t before = vexel_host::AllocationCount();
      vexel_host::FailAllocation(n, sticky);
      const VX_Result result = call();
      vexel_host::FailAllocation(0, false);
      const bool failed = vexel_host::AllocationCount() - before >= n;
      EXPECT_EQ(result, failed ? onFailure : VX_Success) << where;
      EXPECT_EQ(vexel_host::LiveBytes(), live) << where;
      if (!failed) {
        needed = n - 1;
        break;
      }
      EXPECT_EQ(call(), VX_Success) << "the call after " << where;
      EXPECT_EQ(vexel_host::LiveBytes(), live) << "the call after " << where;
      if (n == kMost) ADD_FAILURE() << what << ": more than " << kMost << " allocations";
    }
  return static_cast<int>(needed);
}

}  // namespace vexel::testing
