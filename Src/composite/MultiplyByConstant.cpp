// An 8-bit image times a constant pixel.
#include "frame/ImagePrimitives.h"
#include "vexel/compositing.h"

VX_Result VX_MultiplyByConstant(int32_t width, int32_t height, const void* src, int32_t srcRowBytes, void* dst,
                                int32_t dstRowBytes, const uint8_t constant[4], int32_t scale) noexcept {
  using namespace vexel::primitives;
  if (!constant) return VX_ErrFailed;
  const uint8_t factors[4] = {constant[0], constant[1], constant[2], constant[3]};
  const Status status = MultiplyByConstants4(static_cast<const uint8_t*>(src), srcRowBytes, factors,
                                             static_cast<uint8_t*>(dst), dstRowBytes, width, height, scale);
  return status == Status::Ok ? VX_Success : VX_ErrFailed;
}
