// Images for pixman as a peer.
#pragma once

#ifdef VEXEL_PEER_PIXMAN
#include <pixman.h>

#include <cstdint>
#include <memory>

#include "support/Bench.h"

namespace vexel::bench {

// Reads or writes pixels that stay where they are.
inline std::shared_ptr<pixman_image_t> PixmanImage(pixman_format_code_t format, Size size, const uint8_t* pixels,
                                                   int rowBytes) {
  auto* const words = reinterpret_cast<uint32_t*>(const_cast<uint8_t*>(pixels));
  return {pixman_image_create_bits(format, size.width, size.height, words, rowBytes), pixman_image_unref};
}

}  // namespace vexel::bench
#endif
