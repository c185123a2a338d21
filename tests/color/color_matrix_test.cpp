// Matrices, white points, adaptation and the classes' contract of layout and slots.
#include <cmath>
#include <cstring>
#include <limits>
#include <typeinfo>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "color/color_reference.h"
#include "vexel/color_space.h"

namespace vexel::testing {
namespace {

using VX::ColorSpace;
using VX::CSMatrix;

constexpr float kNaN = std::numeric_limits<float>::quiet_NaN();

CSMatrix FromArray(const Matrix& m) {
  CSMatrix out;
  for (int i = 0; i < 9; ++i) out[i / 3][i % 3] = static_cast<float>(m[static_cast<size_t>(i)]);
  return out;
}

void ExpectNear(const CSMatrix& got, const Matrix& expected, double tolerance) {
  for (size_t i = 0; i < 9; ++i)
    EXPECT_NEAR(got[static_cast<int>(i / 3)][i % 3], expected[i], tolerance) << "element " << i;
}

TEST(ColorMatrix, ComparesExactly) {
  EXPECT_TRUE(CSMatrix().IsUnity());
  for (int i = 0; i < 9; ++i) {
    CSMatrix m;
    m[i / 3][i % 3] = std::nextafter(m[i / 3][i % 3], 2.0f);
    EXPECT_FALSE(m.IsUnity()) << i;
    EXPECT_FALSE(m == CSMatrix()) << i;
    m[i / 3][i % 3] = kNaN;
    EXPECT_FALSE(m == m) << i;
  }
}

TEST(ColorMatrix, MultipliesTransposesAndTransforms) {
  const CSMatrix a(1, 2, 3, 4, 5, 6, 7, 8, 10), b(2, -1, 0, 0.5f, 3, 1, -2, 4, 6);
  ExpectNear(a * b, {-3, 17, 20, -1.5, 35, 41, -2, 57, 68}, 0);
  EXPECT_TRUE(a.Transposed() == CSMatrix(1, 4, 7, 2, 5, 8, 3, 6, 10));
  float v[3] = {1, -1, 2};
  a.Transform(v);
  EXPECT_THAT(v, ::testing::ElementsAre(5, 11, 19));
}

TEST(ColorMatrix, InvertsUnlessTheDeterminantIsBelowTheLimit) {
  bool ok = false;
  const Matrix m{3, 0.5, -1, 2, 4, 0.25, -0.5, 1, 2};
  ExpectNear(FromArray(m).Inverted(&ok), Inverse(m), 1e-6);
  EXPECT_TRUE(ok);
  for (const auto& [determinant, regular] :
       {std::pair{5e-7f, false}, {-5e-7f, false}, {1e-6f, true}, {-1.0f, true}, {0.0f, false}}) {
    ok = !regular;
    const CSMatrix diagonal(1, 0, 0, 0, 1, 0, 0, 0, determinant);
    EXPECT_EQ(diagonal.Inverted(&ok).IsUnity(), !regular) << determinant;
    EXPECT_EQ(ok, regular) << determinant;
    EXPECT_EQ(diagonal.Inverted().IsUnity(), !regular);
  }
  EXPECT_FALSE(CSMatrix(kNaN, 0, 0, 0, 1, 0, 0, 0, 1).Inverted(&ok).IsUnity());  // NaN is not below the limit.
}

TEST(ColorSpaceMatrices, FollowThePrimaries) {
  const float odd[6] = {0.7347f, 0.2653f, 0.1596f, 0.8404f, 0.0366f, 0.0001f};
  const VX::CustomColorSpace wide(odd, 6, ColorSpace::Illuminant(VX_IlluminantD50), 2);
  std::vector<const ColorSpace*> spaces{&wide};
  for (int i = 0; i < 7; ++i) spaces.push_back(&ColorSpace::WorkingSpace(static_cast<VX_WorkingSpace>(i)));
  for (const ColorSpace* space : spaces) {
    const Matrix expected = RgbToXyz(space->Primaries(), space->WhitePoint());
    // A few roundings of products of numbers up to 12 (the blue column of wide primaries before scaling).
    ExpectNear(space->RGBtoXYZ(), expected, 5e-6);
    ExpectNear(space->XYZtoRGB(), Inverse(expected), 2e-5);
    EXPECT_FALSE((space->RGBtoXYZ() * space->XYZtoRGB()).IsUnity() && space == &wide);
    for (const ColorSpace* other : spaces) {
      const Matrix adapt = Bradford(space->WhitePoint(), other->WhitePoint());
      const Matrix conversion =
          Product(Inverse(RgbToXyz(other->Primaries(), other->WhitePoint())), Product(adapt, expected));
      ExpectNear(ColorSpace::CalculateConversionMatrix(*space, *other), conversion, 3e-5);
    }
  }
  const VX::SRGBColorSpace srgb;
  const ColorSpace& rec2020 = ColorSpace::WorkingSpace(VX_WorkingSpaceRec2020);
  for (const auto& [space, luma] :
       {std::pair<const ColorSpace*, Rgb>{&srgb, {0.2126, 0.7152, 0.0722}}, {&rec2020, {0.2627, 0.6780, 0.0593}}})
    for (size_t i = 0; i < 3; ++i) EXPECT_NEAR(space->RGBtoXYZ()[1][i], luma[i], 5e-5);
}

TEST(ColorSpaceMatrices, AdaptByBradford) {
  const float* d65 = ColorSpace::Illuminant(VX_IlluminantD65);
  const float* d50 = ColorSpace::Illuminant(VX_IlluminantD50);
  EXPECT_TRUE(ColorSpace::CalculateAdaptationMatrix(d65, d65).IsUnity());
  // The published matrix, for whites given to four digits.
  ExpectNear(ColorSpace::CalculateAdaptationMatrix(d65, d50),
             {1.0478112, 0.0228866, -0.0501270, 0.0295424, 0.9904844, -0.0170491, -0.0092345, 0.0150436, 0.7521316},
             3e-4);
  ExpectNear(ColorSpace::CalculateAdaptationMatrix(d65, d50), Bradford(d65, d50), 1e-6);
  // Three floats are compared.
  const float same[3] = {0.31271f, 0.32902f, 1}, third[3] = {0.31271f, 0.32902f, 2};
  EXPECT_FALSE(ColorSpace::CalculateAdaptationMatrix(same, third).IsUnity());
  const float near[3] = {0.31271f + 5e-7f, 0.32902f - 5e-7f, 1};
  EXPECT_TRUE(ColorSpace::CalculateAdaptationMatrix(same, near).IsUnity());
}

TEST(ColorSpaceMatrices, SingularPrimariesGiveIdentityInverses) {
  const float flat[6] = {0.3f, 0.3f, 0.3f, 0.3f, 0.3f, 0.3f};
  const VX::CustomColorSpace space(flat, 6, ColorSpace::Illuminant(VX_IlluminantD65), 2);
  EXPECT_TRUE(space.XYZtoRGB().IsUnity());
  const VX::PQColorSpace zeros(nullptr, true);  // No primaries: everything is NaN, nothing crashes.
  float pixel[4] = {0.5f, 0.5f, 0.5f, 1};
  zeros.ConvertPixelsFromRec709(pixel, pixel, 1, true);
  zeros.ConvertPixelsToRec709(pixel, pixel, 1, true);
  EXPECT_EQ(pixel[3], 1);
}

TEST(ColorSpaces, WorkingSpacesAreSharedAndTyped) {
  const auto is = [](int value, const std::type_info& type) {
    const ColorSpace& space = ColorSpace::WorkingSpace(static_cast<VX_WorkingSpace>(value));
    EXPECT_EQ(&space, &ColorSpace::WorkingSpace(static_cast<VX_WorkingSpace>(value)));
    return typeid(space) == type;
  };
  const std::type_info* const types[] = {&typeid(VX::Rec709ColorSpace), &typeid(VX::Rec2020ColorSpace),
                                         &typeid(VX::DCIP3ColorSpace),  &typeid(VX::DCIP3ColorSpace),
                                         &typeid(VX::PQColorSpace),     &typeid(VX::PQColorSpace)};
  for (int i = 0; i < 6; ++i) EXPECT_TRUE(is(i, *types[i])) << i;
  for (const int other : {6, 17, -1, 1 << 30}) EXPECT_TRUE(is(other, typeid(VX::SRGBColorSpace)));
  EXPECT_EQ(ColorSpace::WorkingSpace(VX_WorkingSpaceDCIP3D60).WhitePoint()[0], 0.32168f);
  EXPECT_NEAR(ColorSpace::WorkingSpace(VX_WorkingSpacePQRec2020).LinearToEOTF(1), 1, 1e-5);
  EXPECT_EQ(ColorSpace::WorkingSpace(VX_WorkingSpacePQDCIP3).Primaries()[0], 0.68f);
}

TEST(ColorSpaces, CustomSpacesCarryMatricesOnly) {
  const float primaries[6] = {0.6f, 0.3f, 0.3f, 0.6f, 0.1f, 0.1f}, white[2] = {0.33f, 0.33f};
  const VX::CustomColorSpace space(primaries, 6, white, 2);
  EXPECT_EQ(std::memcmp(space.Primaries(), primaries, sizeof primaries), 0);
  EXPECT_EQ(std::memcmp(space.WhitePoint(), white, sizeof white), 0);
  EXPECT_EQ(space.LuminanceCoeffs(), nullptr);
  EXPECT_EQ(space.LinearToEOTF(-3), -3);
  EXPECT_EQ(space.EOTFToLinear(7), 7);
  const float in[4] = {1, 2, 3, 4};
  float out[4] = {9, 9, 9, 9};
  space.ConvertPixelsFromRec709(in, out, 1, true);
  space.ConvertPixelsToRec709(in, out, 1, true);
  space.CompressPixelsToSDR(in, out, 1, 1, 1, 0.5f);
  EXPECT_THAT(out, ::testing::Each(9));
  // Refused arguments leave an object that may be copied and destroyed.
  for (const auto& [p, n, w, m] : {std::tuple<const float*, int, const float*, int>{nullptr, 6, white, 2},
                                   {primaries, 6, nullptr, 2},
                                   {primaries, 5, white, 2},
                                   {primaries, 6, white, 3}}) {
    const VX::CustomColorSpace refused(p, static_cast<uint8_t>(n), w, static_cast<uint8_t>(m));
    EXPECT_EQ(refused.LuminanceCoeffs(), nullptr);
  }
}

// The order of slots and members is a contract with hosts that were built against it.
struct PqLayout : VX::PQColorSpace {
  using PQColorSpace::PQColorSpace;
  static bool MembersInOrder() {
    const PqLayout p(false, false);
    const void* members[] = {&p.mRGBtoXYZ,   &p.mXYZtoRGB,        &p.mMatricesValid, p.mPrimaries,
                             p.mLumaCoeffs,  &p.mRefWhite,        &p.mRefWhiteSet,   &p.mDCIP3,
                             &p.mFromRec709, &p.mFromRec709Valid, &p.mToRec709,      &p.mToRec709Valid,
                             &p + 1};
    return std::is_sorted(std::begin(members), std::end(members));
  }
};
struct P3Layout : VX::DCIP3ColorSpace {
  using DCIP3ColorSpace::DCIP3ColorSpace;
  using DCIP3ColorSpace::mIlluminant;
  static bool MembersInOrder() {
    const P3Layout p(VX_IlluminantD65);
    const void* members[] = {&p.mMatricesValid, &p.mGamma,           &p.mIlluminant,    p.mLumaCoeffs, &p.mFromRec709,
                             &p.mToRec709,      &p.mFromRec709Valid, &p.mToRec709Valid, &p + 1};
    return std::is_sorted(std::begin(members), std::end(members));
  }
};

TEST(ColorSpaces, KeepTheirLayout) {
  EXPECT_TRUE(PqLayout::MembersInOrder());
  EXPECT_TRUE(P3Layout::MembersInOrder());
  EXPECT_EQ(sizeof(CSMatrix), 36u);
  EXPECT_EQ(sizeof(VX::SRGBColorSpace), 88u);
  EXPECT_EQ(sizeof(VX::HLGColorSpace), sizeof(VX::GammaColorSpace));
  static_assert(std::is_abstract_v<ColorSpace> && !std::has_virtual_destructor_v<ColorSpace>);
#if defined(__GNUC__)  // Itanium C++ ABI
  const VX::Rec2020ColorSpace space;
  void** slots;
  std::memcpy(&slots, static_cast<const void*>(&space), sizeof slots);
  const void* self = &space;
  using Pointer = const float* (*)(const void*);
  EXPECT_EQ(reinterpret_cast<Pointer>(slots[0])(self), space.Primaries());
  EXPECT_EQ(reinterpret_cast<Pointer>(slots[1])(self), space.WhitePoint());
  EXPECT_EQ(reinterpret_cast<Pointer>(slots[2])(self), space.LuminanceCoeffs());
  using Curve = float (*)(const void*, float);
  EXPECT_EQ(reinterpret_cast<Curve>(slots[3])(self, 0.5f), space.LinearToEOTF(0.5f));
  EXPECT_EQ(reinterpret_cast<Curve>(slots[4])(self, 0.5f), space.EOTFToLinear(0.5f));
  const float in[4] = {0.1f, 0.5f, 0.9f, 1};
  const auto same = [](const auto& bySlot, const auto& byName) {
    float a[4], b[4];
    bySlot(a), byName(b);
    return std::memcmp(a, b, sizeof a) == 0;
  };
  const auto slot = [&]<class... Arguments>(int index, Arguments... arguments) {
    return [=](float* out) {
      reinterpret_cast<void (*)(const void*, const float*, float*, int, Arguments...)>(slots[index])(self, in, out, 1,
                                                                                                     arguments...);
    };
  };
  EXPECT_TRUE(same(slot(5, true), [&](float* out) { space.ConvertPixelsFromRec709(in, out, 1, true); }));
  EXPECT_TRUE(same(slot(6, true), [&](float* out) { space.ConvertPixelsToRec709(in, out, 1, true); }));
  EXPECT_TRUE(
      same(slot(7, 1.0f, 1.2f, 0.6f), [&](float* out) { space.CompressPixelsToSDR(in, out, 1, 1, 1.2f, 0.6f); }));
  EXPECT_TRUE(same(slot(8), [&](float* out) { space.ConvertPixelsFromYUVtoRGB(in, out, 1); }));
  EXPECT_TRUE(same(slot(9), [&](float* out) { space.ConvertPixelsFromRGBtoYUV(in, out, 1); }));
#endif
}

TEST(ColorSpaces, CopiesCarryTheirCaches) {
  VX::DCIP3ColorSpace p3(VX_IlluminantD60);
  const VX::PQColorSpace pq(true, true);
  const float in[4] = {0.2f, 0.5f, 0.9f, 1};
  float expected[4], got[4];
  p3.ConvertPixelsFromRec709(in, expected, 1, false);
  VX::DCIP3ColorSpace copy(p3), moved(std::move(p3)), assigned(VX_IlluminantD65);
  assigned = copy;
  for (const auto* space : {&copy, &moved, &assigned}) {
    space->ConvertPixelsFromRec709(in, got, 1, false);
    EXPECT_EQ(std::memcmp(got, expected, sizeof got), 0);
  }
  const P3Layout d60(VX_IlluminantD60);
  P3Layout other(VX_IlluminantD65);
  other = d60;
  EXPECT_EQ(other.mIlluminant, VX_IlluminantD60);
  pq.ConvertPixelsToRec709(in, expected, 1, false);
  const VX::PQColorSpace pqCopy(pq);
  pqCopy.ConvertPixelsToRec709(in, got, 1, false);
  EXPECT_EQ(std::memcmp(got, expected, sizeof got), 0);
  EXPECT_EQ(std::memcmp(pqCopy.LuminanceCoeffs(), pq.LuminanceCoeffs(), 12), 0);
}

}  // namespace
}  // namespace vexel::testing
