// What nearly every test needs.
#pragma once

#include <algorithm>
#include <bit>
#include <climits>
#include <cmath>
#include <cstdint>
#include <cstring>
#include <functional>
#include <limits>
#include <string>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "formats/FormatBits.h"
#include "support/Random.h"
#include "vexel/vexel.h"

namespace vexel::testing {

using F = VX_PixelFormat;

inline constexpr float kInfinity = std::numeric_limits<float>::infinity();
inline constexpr float kNaN = std::numeric_limits<float>::quiet_NaN();

}  // namespace vexel::testing
