// Data movement between rows of separate components, as files hold them, and rows of library formats. Nothing here
// changes a colour: integer codes are copied, or scaled into float by the range they are coded in.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "vexel/vexel.h"

namespace tool {

// How the samples of a row are coded.
struct SampleCoding {
  int depth = 8;          // bits of an integer sample
  bool isFloat = false;   // samples are the bits of 32-bit floats
  bool fullRange = true;  // YUV only; RGB and alpha are always full range
};

// One row, component by component: R, G, B, A or Y, U, V, A. Chroma has half the columns where the library format is
// 4:2:2.
struct SampleRow {
  explicit SampleRow(int width) {
    for (auto& component : components) component.resize(static_cast<size_t>(width) + 1);  // room to pair an odd pixel
  }
  std::vector<uint32_t> components[4];
};

// Packs a row into a raster format / unpacks it. The depth of integer formats must be that of the coding, float formats
// take any. Returns null for formats that no file layout maps to.
using PackRow = void (*)(const SampleRow& samples, const SampleCoding& coding, VX_PixelFormat format, std::byte* row,
                         int width);
using UnpackRow = void (*)(const std::byte* row, VX_PixelFormat format, const SampleCoding& coding, SampleRow& samples,
                           int width);
PackRow RowPackerFor(VX_PixelFormat format);
UnpackRow RowUnpackerFor(VX_PixelFormat format);

}  // namespace tool
