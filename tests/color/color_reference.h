// The colour spaces in double precision, written from their formulas and independent of the library's code.
//
// Tolerances are derived, not chosen: with noise on, every step of a reference is disturbed by up to four roundings of
// single precision, and the spread over some runs tells how far honest float arithmetic may stray for that very pixel.
#pragma once

#include <array>

#include "support/Test.h"

namespace vexel::testing {

using Rgb = std::array<double, 3>;
using Matrix = std::array<double, 9>;

class Noise {
 public:
  Noise(uint64_t seed, double size) : mRandom(seed), mSize(size) {}
  double operator()(double v) { return mSize == 0 ? v : v * (1 + mSize * (2 * mRandom.Unit() - 1)); }
  bool IsOff() const { return mSize == 0; }
  Rgb operator()(const Rgb& c) { return {(*this)(c[0]), (*this)(c[1]), (*this)(c[2])}; }

 private:
  Random mRandom;
  double mSize;
};

inline Rgb Times(const Matrix& m, const Rgb& c, Noise& noise) {
  Rgb out;
  for (size_t r = 0; r < 3; ++r)
    out[r] = noise(m[3 * r] * c[0]) + noise(m[3 * r + 1] * c[1]) + noise(m[3 * r + 2] * c[2]);
  return noise(out);
}

inline Matrix Product(const Matrix& a, const Matrix& b) {
  Matrix out{};
  for (size_t i = 0; i < 9; ++i)
    for (size_t k = 0; k < 3; ++k) out[i] += a[i / 3 * 3 + k] * b[3 * k + i % 3];
  return out;
}

inline Matrix Inverse(const Matrix& m) {
  Matrix out;
  double determinant = 0;
  for (size_t r = 0; r < 3; ++r)
    for (size_t c = 0; c < 3; ++c) {
      const size_t r1 = (r + 1) % 3, r2 = (r + 2) % 3, c1 = (c + 1) % 3, c2 = (c + 2) % 3;
      out[3 * c + r] = m[3 * r1 + c1] * m[3 * r2 + c2] - m[3 * r1 + c2] * m[3 * r2 + c1];
      if (r == 0) determinant += m[c] * out[3 * c];
    }
  for (double& v : out) v /= determinant;
  return out;
}

inline Rgb XyzOf(double x, double y) { return {x / y, 1, (1 - x - y) / y}; }

// Columns scaled so that equal amounts make the white.
inline Matrix RgbToXyz(const float* primaries, const float* white) {
  Matrix p;
  for (size_t i = 0; i < 3; ++i) {
    const Rgb column = XyzOf(primaries[2 * i], primaries[2 * i + 1]);
    for (size_t r = 0; r < 3; ++r) p[3 * r + i] = column[r];
  }
  Noise exact(0, 0);
  const Rgb scale = Times(Inverse(p), XyzOf(white[0], white[1]), exact);
  for (size_t i = 0; i < 9; ++i) p[i] *= scale[i % 3];
  return p;
}

inline Matrix Bradford(const float* from, const float* to) {
  const Matrix cones{0.8951, 0.2664, -0.1614, -0.7502, 1.7135, 0.0367, 0.0389, -0.0685, 1.0296};
  Noise exact(0, 0);
  const Rgb source = Times(cones, XyzOf(from[0], from[1]), exact);
  const Rgb target = Times(cones, XyzOf(to[0], to[1]), exact);
  Matrix gain{};
  for (size_t i = 0; i < 3; ++i) gain[4 * i] = target[i] / source[i];
  return Product(Inverse(cones), Product(gain, cones));
}

inline double SignedPow(double v, double y) { return std::copysign(std::pow(std::abs(v), y), v); }

inline Rgb Each(const Rgb& c, Noise& noise, const std::function<double(double)>& f) {
  return {noise(f(c[0])), noise(f(c[1])), noise(f(c[2]))};
}

inline Rgb CompressGamut(Rgb c, const Rgb& luma, Noise& noise) {
  if (const double least = std::min({c[0], c[1], c[2]}); least < 0) {
    const double y = noise(luma[0] * c[0] + luma[1] * c[1] + luma[2] * c[2]);
    double t = 1;
    for (const double v : c)
      if (v < 0) t = std::min(t, noise(y / (y - v)));
    for (double& v : c) v = noise(y + noise((v - y) * t));
    if (y >= 0 && noise.IsOff())  // Disturbed runs show how far a zero may be missed.
      for (double& v : c) v = std::max(v, 0.0);
  }
  if (const double most = std::max({c[0], c[1], c[2]}); most > 1) {
    const double least = std::min({c[0], c[1], c[2]});
    double pivot = 0;
    for (size_t i = 0; i < 3; ++i) pivot += luma[i] * (c[i] - least) / (most - least);
    pivot = noise(std::clamp(pivot, 0.15, 0.9));
    for (double& v : c) v = noise(noise((v - pivot) * (1 - pivot) / (most - pivot)) + pivot);
  }
  return c;
}

struct PqCurve {
  static constexpr double kM1 = 0.1593017578125, kM2 = 78.84375, kC1 = 0.8359375, kC2 = 18.8515625, kC3 = 18.6875;
  // Linear 1 is 100 cd/m2.
  static double Encode(double light, Noise& noise) {
    const double y = noise(std::pow(noise(std::abs(light) * 0.01), kM1));
    return std::pow(noise((kC1 + kC2 * y) / (1 + kC3 * y)), kM2);
  }
  static double Decode(double signal, Noise& noise) {
    const double e = noise(std::pow(std::abs(signal), 1 / kM2));
    const double ratio = noise(std::max(0.0, noise(e - kC1) / noise(kC2 - noise(kC3 * e))));
    return 100 * std::pow(ratio, 1 / kM1);
  }
};

struct HlgCurve {
  static constexpr double kA = 0.17883277, kB = 0.02372241, kC = 1.0042934;
  static double Encode(double e, Noise& noise) {
    return e < 1.0 / 12 ? std::sqrt(3 * e) : noise(kA * std::log(noise(e - kB))) + kC;
  }
  static double Decode(double x) { return x < 0.5 ? x * x / 3 : std::exp((x - kC) / kA) + kB; }
  static double Luma(const Rgb& c) { return 0.2627 * c[0] + 0.678 * c[1] + 0.0593 * c[2]; }
};

inline double SrgbDecode(double v) {
  const double m = std::abs(v);
  return std::copysign(m > 0.04045 ? std::pow((m + 0.055) / 1.055, 2.4) : m / 12.92, v);
}
inline double SrgbEncode(double v) {
  const double m = std::abs(v);
  return std::copysign(m > 0.0031308 ? 1.055 * std::pow(m, 1 / 2.4) - 0.055 : 12.92 * m, v);
}

struct ToneReference {
  std::function<double(double)> decode, encode;
  Matrix toXyz, fromXyz;
  double whiteX, whiteY;

  Rgb operator()(const Rgb& in, double a, double b, double c, Noise& noise) const {
    const Rgb light = Each(in, noise, decode);
    const Rgb xyz = Times(toXyz, light, noise);
    const double sum = noise(xyz[0] + xyz[1] + xyz[2]);
    const double x = sum > 1e-6 ? noise(xyz[0] / sum) : whiteX, y = sum > 1e-6 ? noise(xyz[1] / sum) : whiteY;
    const double k = c / b, e = (1 - k) / (1 - c);
    const double t = noise(noise(0.5 * std::log10(std::max(0.0, xyz[1]) * a * 99.99 + 1)) - 1);
    const double u = std::min(1.0, std::abs(t));
    double w = u > k ? (1 - std::pow(noise(1 - noise((u - k) / (1 - k))), e * b)) * (1 - c) + c : u * b;
    w = noise(std::copysign(w, t));
    const double luminance = noise((noise(std::pow(10, noise(w + 1))) - 1) * 0.01010101);
    const Rgb out = Times(fromXyz, noise({x * luminance / y, luminance, noise(1 - x - y) * luminance / y}), noise);
    return Each(out, noise, encode);
  }
};

}  // namespace vexel::testing
