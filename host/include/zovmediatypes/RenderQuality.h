#pragma once

#include <cstdint>

namespace zovmediatypes {

// A ladder: every integer is legal and means at least what the steps below it mean. From Medium on pictures are decoded
// in full and worked on in float, at Maximum they are resized in linear light.
enum class RenderQuality : int32_t { Lowest = 0, Draft = 1, Low = 2, Medium = 3, High = 4, Maximum = 5 };

}  // namespace zovmediatypes
