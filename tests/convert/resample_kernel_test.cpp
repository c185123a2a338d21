#include "support/Test.h"
#include "vexel/resample_kernel.h"

#include <sys/ptrace.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>

#include "zovcore/Config.h"

namespace VX {
namespace {

using Type = ResampleKernel::Type;

std::vector<int> Row(const ResampleKernel& kernel, int phase) {
  return {kernel.Weights(phase), kernel.Weights(phase) + kernel.Width()};
}

// Keys' cubic in the textbook form.
double Keys(double x, double a) {
  x = std::abs(x);
  if (x < 1) return (a + 2) * x * x * x - (a + 3) * x * x + 1;
  return x < 2 ? a * x * x * x - 5 * a * x * x + 8 * a * x - 4 * a : 0;
}

double Sinc(double x) { return x == 0 ? 1 : std::sin(M_PI * x) / (M_PI * x); }

// The cardinal spline of Spline36 by its published polynomials in expanded form.
double Spline(double x) {
  x = std::abs(x);
  if (x < 1) return 13.0 / 11 * x * x * x - 453.0 / 209 * x * x - 3.0 / 209 * x + 1;
  if (x < 2) return -6.0 / 11 * std::pow(x - 1, 3) + 270.0 / 209 * std::pow(x - 1, 2) - 156.0 / 209 * (x - 1);
  return x < 3 ? 1.0 / 11 * std::pow(x - 2, 3) - 45.0 / 209 * std::pow(x - 2, 2) + 26.0 / 209 * (x - 2) : 0;
}

// Every weight is the normalised filter truncated toward zero; at an exact boundary rounding may tip it by one.
void ExpectTable(const ResampleKernel& kernel, int width, const std::function<double(double)>& filter,
                 bool identityAt0 = false) {
  ASSERT_EQ(kernel.Width(), width);
  for (int phase = identityAt0 ? 1 : 0; phase < 128; ++phase) {
    double sum = 0;
    // Normalised over every tap that can be non-zero, trimmed or not.
    for (int k = -9; k <= 10; ++k)
      if (width > 6 || (k >= -(width / 2 - 1) && k <= width / 2)) sum += filter(k - phase / 128.0);
    int total = 0;
    for (int tap = 0; tap < width; ++tap) {
      const double exact = filter(tap - (width / 2 - 1) - phase / 128.0) * 16384 / sum;
      const int weight = kernel.Weights(phase)[tap];
      ASSERT_LE(std::abs(weight), std::abs(exact) + 1e-6) << "phase " << phase << " tap " << tap;
      ASSERT_GT(std::abs(weight), std::abs(exact) - 1 - 1e-6) << "phase " << phase << " tap " << tap;
      total += weight;
    }
    ASSERT_NEAR(total, 16384, width);
  }
}

std::function<double(double)> Cubic(double scale, double a) {
  return [=](double x) { return Keys(x * scale, a); };
}

TEST(ResampleKernel, Tables) {
  constexpr double kMedium = double{1.15f}, kSharp = double{1.05f}, kSoft = double{1.2f}, kSharpest = double{-2.2f};
  const struct {
    Type type;
    float scale;
    int width;
    std::function<double(double)> filter;
  } cases[] = {
      {Type::kCubic, 2, 4, Cubic(1, -0.75)},
      {Type::kCubicMedium, 2, 6, Cubic(1 / kMedium, -0.625)},
      {Type::kCubicSharp, 2, 6, Cubic(1 / kSharp, -1)},
      {Type::kCubicSoft, 2, 6, Cubic(1 / kSoft, -0.5)},
      {Type::kSpline36, 2, 6, Spline},
      {Type::kLanczos8, 2, 16, [](double d) { return std::abs(d) < 8 ? Sinc(d) * Sinc(d / 8) : 0; }},
      {Type::kCubic, 0.5f, 8, Cubic(0.5, -0.75)},
      {Type::kCubic, 0.1f, 16, Cubic(0.25, -0.75)},  // served as a quarter
      {Type::kCubic, 0.8f, 6, Cubic(double{0.8f}, -0.75)},
      {Type::kCubicMedium, 0.25f, 20, Cubic(double{0.25f / 1.15f}, -1)},
      {Type::kCubicSharp, 0.25f, 18, Cubic(double{0.25f / 1.05f}, kSharpest)},
      {Type::kCubicSharp, 0.525f, 8,
       Cubic(double{0.525f / 1.05f}, double{float(-1 + (1 - (double{0.525f} - 0.25) / 0.75) * (kSharpest + 1))})},
      {Type::kCubicSoft, 0.5f, 10, Cubic(double{0.5f / 1.2f}, -0.5)},
      {Type::kLanczos8, 0.5f, 8, Cubic(0.5, -0.75)},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(testing::Message() << "type " << c.type << " scale " << c.scale);
    ResampleKernel kernel(c.type);
    c.scale > 1 ? kernel.ScaleForUpSample(c.scale) : kernel.ScaleForDownSample(c.scale, c.scale);
    ExpectTable(kernel, c.width, c.filter);
  }
  ResampleKernel bilinear(Type::kBilinear), whole(Type::kCubic), sharp(Type::kCubicSharp);
  bilinear.ScaleForUpSample(1);
  for (int phase = 0; phase < 128; ++phase)
    EXPECT_EQ(Row(bilinear, phase), (std::vector{16384 - 128 * phase, 128 * phase}));
  whole.ScaleForDownSample(1, 1);
  EXPECT_EQ(Row(whole, 0), (std::vector{0, 0, 0, 0, 16384, 0, 0, 0, 0, 0}));
  ExpectTable(whole, 10, Cubic(1, -0.75), true);
  // Sharpness is a matter of the second argument alone; above 1 it extrapolates.
  sharp.ScaleForDownSample(1, 1.75f);
  ExpectTable(sharp, 10, Cubic(1, -1 - (kSharpest + 1)), true);
}

TEST(ResampleKernel, TheKeyIsTheSecondScaleOfBothDirections) {
  ResampleKernel kernel(Type::kCubic);
  kernel.ScaleForDownSample(0.5f, 0.5f);
  const auto half = Row(kernel, 40);
  kernel.ScaleForDownSample(0.3f, 0.505f);
  EXPECT_EQ(Row(kernel, 40), half);
  kernel.ScaleForUpSample(2);
  EXPECT_EQ(kernel.Width(), 4);
  kernel.ScaleForDownSample(0.5f, 0.995f);  // within 0.01 of the up-sampling key
  EXPECT_EQ(kernel.Width(), 4);
  kernel.ScaleForDownSample(0.5f, 0.6f);
  EXPECT_EQ(Row(kernel, 40), half);
  kernel.ScaleForDownSample(0.5f, 1.005f);
  kernel.ScaleForUpSample(3);  // keeps the cubic table keyed near 1
  EXPECT_EQ(Row(kernel, 40), half);
}

TEST(ResampleKernel, BrokenContractsThrowAndKeepTheTable) {
  const auto breaks = [](auto&& call) {
    try {
      call();
    } catch (const zovcore::config::Error& error) {
      return std::string(error.what()).find("An input contract violation has occurred!") != std::string::npos &&
             error.Level() == 0 && error.Code() == 105 && error.Subcode() == 25;
    }
    return false;
  };
  ResampleKernel kernel(Type::kCubic);
  kernel.ScaleForUpSample(2);
  const auto before = Row(kernel, 3);
  EXPECT_TRUE(breaks([&] { kernel.ScaleForDownSample(1.5f, 1.5f); }));
  EXPECT_TRUE(breaks([&] { kernel.ScaleForDownSample(NAN, 0.5f); }));
  EXPECT_TRUE(breaks([&] { kernel.ScaleForUpSample(0.99f); }));
  EXPECT_EQ(Row(kernel, 3), before);

  for (const int32_t type : {1, 6}) {
    ResampleKernel narrow(type);
    EXPECT_TRUE(breaks([&] { narrow.ScaleForDownSample(0.5f, 0.5f); })) << type;
    EXPECT_NO_THROW(narrow.ScaleForDownSample(0.5f, 0.5f)) << "the key has moved: not tried again";
  }
  ResampleKernel lanczos(Type::kLanczos8);
  EXPECT_TRUE(breaks([&] { lanczos.ScaleForDownSample(0.39f, 0.39f); }));
  for (const float scale : {NAN, INFINITY, 1e30f}) {  // no sharpness follows from these: a table, whatever it holds
    ResampleKernel endless(Type::kCubicSharp);
    EXPECT_NO_THROW(endless.ScaleForDownSample(0.5f, scale));
    EXPECT_EQ(endless.Width(), 10);
  }
  for (const int32_t type : {0, 8, -1}) {
    ResampleKernel unknown(type);
    EXPECT_EQ(unknown.Width(), 0);
    EXPECT_TRUE(breaks([&] { unknown.ScaleForUpSample(1); }));
    EXPECT_TRUE(breaks([&] { ResampleKernel(type).ScaleForDownSample(0.5f, 0.5f); }));
  }
}

// An attached debugger is stopped in first; when it goes on, the error is thrown.
TEST(ResampleKernel, BrokenContractsStopInADebuggerAndGoOn) {
  const pid_t child = fork();
  if (child == 0) {
    if (ptrace(PTRACE_TRACEME, 0, nullptr, nullptr) != 0) _exit(77);
    try {
      ResampleKernel(Type::kCubic).ScaleForUpSample(0.5f);
    } catch (const zovcore::config::Error&) {
      _exit(5);
    }
    _exit(1);
  }
  int status = 0;
  ASSERT_EQ(waitpid(child, &status, 0), child);
  if (WIFEXITED(status) && WEXITSTATUS(status) == 77) GTEST_SKIP() << "nothing may be traced here";
  const bool stopped = WIFSTOPPED(status) && WSTOPSIG(status) == SIGTRAP;
  EXPECT_TRUE(stopped) << status;
  if (WIFSTOPPED(status)) {
    ptrace(stopped ? PTRACE_CONT : PTRACE_KILL, child, nullptr, nullptr);
    ASSERT_EQ(waitpid(child, &status, 0), child);
  }
  EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 5) << status;
}

}  // namespace
}  // namespace VX
