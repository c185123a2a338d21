#include "support/FailingAllocations.h"

#include <gtest/gtest.h>
#include <vexel_host/host.h>

namespace vexel::testing {

int ExpectSurvivesFailingAllocations(const std::string& what, const std::function<VX_Result()>& call,
                                     VX_Result onFailure) {
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
