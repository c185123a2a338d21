// Joins the per-target functions of a kernel family. Use in the HWY_ONCE block, in the namespace that encloses
// HWY_NAMESPACE, where a namespace `plain` holds the scalar definitions of the same names and signatures:
//
//   const RowKernelSet kBgra8ToVuya8_601 = VX_KERNEL_VARIANTS(Bgra8ToVuya8_601);
//
// foreach_target compiles HWY_SCALAR as well, the baseline of any processor, which no table holds: bodies are left out
// of it by #if HWY_TARGET != HWY_SCALAR.
//
// We keep our own table instead of HWY_DYNAMIC_DISPATCH, whose chosen target is one process-wide value that the host's
// other users of Highway share.
#pragma once

#include <hwy/highway.h>

#include "frame/KernelVariant.h"

#define VX_KERNEL_VARIANTS(name) \
  { &plain::name, HWY_CHOOSE_SSSE3(name), HWY_CHOOSE_SSE4(name), HWY_CHOOSE_AVX2(name), HWY_CHOOSE_AVX3(name) }
