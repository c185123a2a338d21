#pragma once

#include <cstdint>

namespace zovmediatypes {

// Which lines of a picture a buffer holds: all, the even ones counted from 0 (upper), or the odd ones (lower).
enum class FieldType : int32_t { Whole = 0, Upper = 1, Lower = 2 };

}  // namespace zovmediatypes
