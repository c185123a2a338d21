// Matrices of 8-bit 4:4:4 pixels, over all colours.
#include <cmath>
#include <vector>

#include <gtest/gtest.h>

#include "convert/RowKernelCheck.h"
#include "convert/YuvKernels.h"
#include "convert/YuvReference.h"

namespace vexel::testing {
namespace {

struct Matrix {
  const char* name;
  const RowKernelSet* kernels;
  Triple (*exact)(const Triple&);
};
const Matrix kMatrices[] = {
    {"BGR to VUY 601", &kBgra8ToVuya8_601, [](const Triple& p) { return BgrToVuy(k601, p); }},
    {"BGR to VUY 709", &kBgra8ToVuya8_709, [](const Triple& p) { return BgrToVuy(k709, p); }},
    {"VUY to BGR 601", &kVuya8ToBgra8_601, [](const Triple& p) { return VuyToBgr(k601, p); }},
    {"VUY to BGR 709", &kVuya8ToBgra8_709, [](const Triple& p) { return VuyToBgr(k709, p); }},
    {"VUY 601 to 709", &kVuya8_601To709, [](const Triple& p) { return BgrToVuy(k709, VuyToBgr(k601, p)); }},
    {"VUY 709 to 601", &kVuya8_709To601, [](const Triple& p) { return BgrToVuy(k601, VuyToBgr(k709, p)); }},
};

// All 2^24 colours against the equations. Every matrix is affine, so it is known by where it takes four colours.
TEST(YuvMatrix8, EveryColourIsRoundedRight) {
  constexpr size_t kRow = 65536;
  std::vector<uint8_t> in(4 * kRow), out(4 * kRow);
  for (const Matrix& matrix : kMatrices) {
    const Triple origin = matrix.exact({{0, 0, 0}});
    Triple steps[3];
    for (int k = 0; k < 3; ++k) {
      Triple unit{};
      unit.c[k] = 1;
      steps[k] = matrix.exact(unit);
      for (int j = 0; j < 3; ++j) steps[k].c[j] -= origin.c[j];
    }
    double worst = 0;
    size_t notNearest = 0;
    for (int c2 = 0; c2 < 256; ++c2) {
      for (size_t i = 0; i < kRow; ++i) {
        in[4 * i] = static_cast<uint8_t>(i);
        in[4 * i + 1] = static_cast<uint8_t>(i >> 8);
        in[4 * i + 2] = static_cast<uint8_t>(c2);
      }
      (*matrix.kernels)[ActiveKernelVariant()](in.data(), out.data(), kRow);
      for (size_t j = 0; j < 3; ++j) {
        for (size_t i = 0; i < kRow; ++i) {
          const double exact = origin.c[j] + steps[0].c[j] * static_cast<double>(i & 255) +
                               steps[1].c[j] * static_cast<double>(i >> 8) + steps[2].c[j] * c2;
          const double error = std::abs(out[4 * i + j] - Code8(exact));
          worst = std::max(worst, error);
          notNearest += error > 0.5 + 1e-9;
        }
      }
    }
    const double share = static_cast<double>(notNearest) / (3.0 * 256 * kRow);
    EXPECT_LT(worst, 0.52) << matrix.name;
    EXPECT_LT(share, 0.004) << matrix.name;
    RecordProperty(matrix.name, std::to_string(worst) + ", not nearest " + std::to_string(share));
  }
}

// Nearest codes alone could tint a grey.
TEST(YuvMatrix8, GreysStayGrey) {
  for (const RowKernelSet* kernels : {&kVuya8ToBgra8_601, &kVuya8ToBgra8_709})
    for (int grey = 0; grey < 256; ++grey) {
      const auto got =
          RunKernel<uint8_t>(*kernels, std::vector<uint8_t>{128, 128, static_cast<uint8_t>(grey), 9}, 1, 4);
      EXPECT_EQ(got, (std::vector<uint8_t>{got[0], got[0], got[0], 9})) << grey;
    }
}

}  // namespace
}  // namespace vexel::testing
