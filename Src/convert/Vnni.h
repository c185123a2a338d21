// Whether the processor has AVX512-VNNI, which no kernel variant implies.
#pragma once

namespace vexel {

inline bool HasVnni() noexcept {
  static const bool has = __builtin_cpu_supports("avx512vnni");
  return has;
}

}  // namespace vexel
