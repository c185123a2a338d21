// The state that lives from VX_Initialize to VX_Terminate.
#pragma once

#include "frame/CacheInfo.h"
#include "frame/Features.h"

namespace vexel {

// Whether the host's fan-out may be used.
bool HasExecutor() noexcept;

namespace detail {

extern CacheInfo gUnifiedCache;

}  // namespace detail

// The cache found at start-up; zero before.
inline CacheInfo UnifiedCache() noexcept { return detail::gUnifiedCache; }

// What is assumed where the cache cannot be found out.
CacheInfo FallbackCache(const Features& features) noexcept;

}  // namespace vexel
