// The numbers of Y'CbCr: the matrices of BT.601 and BT.709 and the code ranges of studio video.
#pragma once

namespace vexel {

// Rows of both directions, for R'G'B' and Y in 0..1 and chroma in -0.5..0.5. Negative where a table subtracts.
struct YuvMatrix {
  double vR, vG, vB;      // V = vR R + vG G + vB B
  double uR, uG, uB;      // U likewise
  double yR, yG, yB;      // Y likewise
  double bU, gU, gV, rV;  // B = Y + bU U; G = Y + gU U + gV V; R = Y + rV V
};

inline constexpr YuvMatrix kBt601 = {0.5,   -0.418688, -0.081312, -0.168736, -0.331264, 0.5,  0.299,
                                     0.587, 0.114,     1.772,     -0.344136, -0.714136, 1.402};
inline constexpr YuvMatrix kBt709 = {0.5,    -0.454153, -0.045847, -0.114572,   -0.385428,   0.5,   0.2126,
                                     0.7152, 0.0722,    1.8556,    -0.18732427, -0.46812427, 1.5748};
// Non-constant luminance.
inline constexpr YuvMatrix kBt2020 = {0.5,    -0.459786, -0.040214, -0.139630,   -0.360370,   0.5,   0.2627,
                                      0.6780, 0.0593,    1.8814,    -0.16455313, -0.57135313, 1.4746};

// Y'CbCr of one colorimetry to that of another: the product of the two matrices. Every row of a matrix that makes
// chroma sums to 0 and that of luma to 1, so the luma column is (0, 0, 1): grey stays what it is.
struct YuvRecoding {
  double vU, vV;  // V' = vU U + vV V
  double uU, uV;  // U' = uU U + uV V
  double yU, yV;  // Y' = yU U + yV V + Y
};

constexpr YuvRecoding Recode(const YuvMatrix& from, const YuvMatrix& to) {
  return {to.vG * from.gU + to.vB * from.bU, to.vR * from.rV + to.vG * from.gV, to.uG * from.gU + to.uB * from.bU,
          to.uR * from.rV + to.uG * from.gV, to.yG * from.gU + to.yB * from.bU, to.yR * from.rV + to.yG * from.gV};
}

inline constexpr YuvRecoding k601To709 = Recode(kBt601, kBt709);
inline constexpr YuvRecoding k709To601 = Recode(kBt709, kBt601);

// Studio codes of 8 bits; those of 10 bits are four times as large.
inline constexpr int kLumaBlack8 = 16, kLumaRange8 = 219, kChromaZero8 = 128, kChromaRange8 = 224;

}  // namespace vexel
