// Lets the allocations of an operation fail, one after another.
#pragma once

#include <functional>
#include <string>

#include "vexel/vexel.h"

namespace vexel::testing {

// Runs `call` with its n-th allocation failing, once and from there on, for n = 1, 2, ... until it needs fewer than n.
// Expects `onFailure` each time one failed, VX_Success otherwise and in a call after each failure, and the host's live
// bytes back where they were; so `call` must give back what it got. Returns the number of allocations of one call.
int ExpectSurvivesFailingAllocations(const std::string& what, const std::function<VX_Result()>& call,
                                     VX_Result onFailure = VX_ErrOutOfMemory);

}  // namespace vexel::testing
