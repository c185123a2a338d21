#include <cmath>

#include "vexel/color_space.h"

namespace VX {

CSMatrix::CSMatrix() noexcept : mElements{1, 0, 0, 0, 1, 0, 0, 0, 1} {}

CSMatrix::CSMatrix(float m00, float m01, float m02, float m10, float m11, float m12, float m20, float m21,
                   float m22) noexcept
    : mElements{m00, m01, m02, m10, m11, m12, m20, m21, m22} {}

CSMatrix::CSMatrix(int) noexcept {}  // NOLINT: uninitialised on purpose.

CSMatrix::CSMatrix(const CSMatrix& other) noexcept = default;
CSMatrix::CSMatrix(CSMatrix&& other) noexcept = default;
CSMatrix& CSMatrix::operator=(const CSMatrix& other) noexcept = default;
CSMatrix& CSMatrix::operator=(CSMatrix&& other) noexcept = default;

float* CSMatrix::operator[](int row) noexcept { return mElements + 3 * row; }
const float* CSMatrix::operator[](int row) const noexcept { return mElements + 3 * row; }

bool CSMatrix::operator==(const CSMatrix& other) const noexcept {
  for (int i = 0; i < 9; ++i)
    if (!(mElements[i] == other.mElements[i])) return false;
  return true;
}

bool CSMatrix::IsUnity() const noexcept { return *this == CSMatrix(); }

CSMatrix CSMatrix::operator*(const CSMatrix& b) const noexcept {
  CSMatrix product(0);
  for (int r = 0; r < 3; ++r)
    for (int c = 0; c < 3; ++c) {
      float sum = 0;
      for (int i = 0; i < 3; ++i) sum += (*this)[r][i] * b[i][c];
      product[r][c] = sum;
    }
  return product;
}

CSMatrix CSMatrix::Transposed() const noexcept {
  const float* m = mElements;
  return CSMatrix(m[0], m[3], m[6], m[1], m[4], m[7], m[2], m[5], m[8]);
}

CSMatrix CSMatrix::Inverted(bool* ok) const noexcept {
  const float *m0 = (*this)[0], *m1 = (*this)[1], *m2 = (*this)[2];
  const float c0 = m1[1] * m2[2] - m2[1] * m1[2];
  const float c1 = m1[2] * m2[0] - m2[2] * m1[0];
  const float c2 = m2[1] * m1[0] - m1[1] * m2[0];
  const float determinant = m0[0] * c0 + m0[1] * c1 + m0[2] * c2;
  const bool singular = std::fabs(determinant) < 1e-6f;
  if (ok) *ok = !singular;
  if (singular) return CSMatrix();

  const float scale = 1.0f / determinant;
  const float a01 = m2[1] * m0[2] - m0[1] * m2[2], a02 = m0[1] * m1[2] - m1[1] * m0[2];
  const float a11 = m0[0] * m2[2] - m2[0] * m0[2], a12 = m1[0] * m0[2] - m0[0] * m1[2];
  const float a21 = m2[0] * m0[1] - m0[0] * m2[1], a22 = m0[0] * m1[1] - m1[0] * m0[1];
  return CSMatrix(c0 * scale, a01 * scale, a02 * scale, c1 * scale, a11 * scale, a12 * scale, c2 * scale, a21 * scale,
                  a22 * scale);
}

void CSMatrix::Transform(float* v) const noexcept {
  const float x = v[0], y = v[1], z = v[2];
  for (int r = 0; r < 3; ++r) v[r] = (*this)[r][0] * x + (*this)[r][1] * y + (*this)[r][2] * z;
}

}  // namespace VX
