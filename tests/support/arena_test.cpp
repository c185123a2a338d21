// Proves the harness: operations with a fault each, which the arena must name.
#include <gmock/gmock.h>

#include "support/Arena.h"

#include <xmmintrin.h>

#include <csignal>

#include "frame/KernelVariant.h"
#include "support/Test.h"

namespace vexel::testing {
namespace {

// What happens to the last row besides a copy.
using Spoil = std::function<void(uint8_t* src, uint8_t* dst, size_t bytes)>;

volatile uint8_t gByte;

ArenaCase CopyAnd(const Spoil& spoil, F format = F::BGRA_4444_8u, VX_Result result = VX_Success) {
  ArenaCase c;
  c.name = "copy";
  c.sources = {format};
  c.destination = format;
  c.run = [=](const ArenaFrame* sources, const ArenaFrame& destination) {
    const auto bytes = static_cast<size_t>(UnpaddedRowBytes(format, destination.width));
    for (int row = 0; row < destination.height && result == VX_Success; ++row)
      std::memcpy(destination.Row(row), sources[0].Row(row), bytes);
    const int last = destination.height - 1;
    spoil(sources[0].Row(last), destination.Row(last), bytes);
    return result;
  };
  return c;
}

void Nothing(uint8_t*, uint8_t*, size_t) {}
bool LiesInside(const uint8_t* p) { return (reinterpret_cast<uintptr_t>(p) & 4095) != 0; }

TEST(Arena, PassesWhatIsRight) {
  for (const auto format :
       {F::BGRA_4444_8u, F::XRGB_4444_15u, F::V210_422_10u, F::UYVY_422_8u, F::BGRA_4444_32f_Linear, FromBits(0x40)}) {
    ArenaCase c = CopyAnd(Nothing, format);
    c.everyContents = true;
    EXPECT_TRUE(RunArena(c));
  }
}

TEST(ArenaDeathTest, NamesIllegalAccesses) {
  const auto exit = ::testing::KilledBySignal(SIGABRT);
  const struct {
    Spoil spoil;
    const char* text;
  } cases[] = {
      {[](uint8_t* src, uint8_t*, size_t bytes) { gByte = src[bytes]; },
       "copy: BGRA_4444_8u .* illegal read of source 0, row ., 0 bytes past its end"},
      {[](uint8_t* src, uint8_t*, size_t) { gByte = src[-1]; }, "illegal read of source 0, row ., 1 bytes before"},
      {[](uint8_t* src, uint8_t*, size_t) { *src = 0; }, "illegal write of source 0, row ., byte 0"},
      {[](uint8_t*, uint8_t* dst, size_t bytes) { dst[bytes + 3] = 0; },
       "illegal write of the destination, row ., 3 bytes past its end"},
      // A masked vector load that sanitizers do not see, and one width in 130 at that.
      {[](uint8_t* src, uint8_t*, size_t bytes) { gByte = bytes == 77 * 4 ? src[bytes + 15] : 0; },
       "77x. .* illegal read of source 0, row ., 15 bytes past"}};
  for (const auto& c : cases) EXPECT_EXIT(RunArena(CopyAnd(c.spoil)), exit, c.text);
  const auto touches = [](void* memory) { return gByte = *static_cast<uint8_t*>(memory), VX_ErrFailed; };
  EXPECT_EXIT(ExpectRefusal("a call", VX_ErrFailed, touches), exit, "a call: touched an unreadable buffer");
}

TEST(Arena, NamesWrongResults) {
  static int runs;
  const auto floats = [](uint32_t plain, uint32_t other) {
    return [=](uint8_t*, uint8_t* dst, size_t) { std::memcpy(dst, ++runs % 2 ? &plain : &other, 4); };
  };
  auto refused = CopyAnd(Nothing);
  refused.expected = VX_ErrFailed;
  const std::pair<ArenaCase, const char*> cases[] = {
      // Writes into padding that can be written.
      {CopyAnd([](uint8_t*, uint8_t* dst, size_t) { dst[LiesInside(dst) ? -1 : 0] ^= LiesInside(dst); }),
       "wrote outside the picture: row"},
      // A byte that is not written, a result that depends on the padding, one variant that differs in one bit.
      {CopyAnd([](uint8_t*, uint8_t* dst, size_t bytes) {
         if (bytes == 129 * 4) dst[40] = static_cast<uint8_t>(++runs);
       }),
       "byte 40"},
      {CopyAnd([](uint8_t* src, uint8_t* dst, size_t bytes) {
         if (LiesInside(src + bytes)) dst[bytes - 1] = src[bytes];
       }),
       "wrong bits"},
      {CopyAnd(
           [](uint8_t*, uint8_t* dst, size_t) { dst[0] ^= ActiveKernelVariant() != KernelVariant::Plain ? 0x80 : 0; }),
       ActiveKernelVariant() != KernelVariant::Plain ? "byte 0" : ""},
      // Floats: -0 is not 0, but NaNs are alike.
      {CopyAnd(floats(0, 0x80000000), F::BGRA_4444_32f), "wrong bits"},
      {CopyAnd(floats(0x7FC00000, 0xFFC00001), F::BGRA_4444_32f), ""},
      {CopyAnd([](uint8_t*, uint8_t*, size_t) { _mm_setcsr(_mm_getcsr() | 0x8000); }),
       "left another floating-point mode"},
      {refused, "returned VX_Success instead of VX_ErrFailed"},
      {[&] { return refused.run = CopyAnd(Nothing, F::BGRA_4444_8u, VX_ErrFailed).run, refused; }(), ""},
      {[&] {
         const auto writes = [](uint8_t*, uint8_t* dst, size_t) { *dst = 1; };
         return refused.run = CopyAnd(writes, F::BGRA_4444_8u, VX_ErrFailed).run, refused;
       }(),
       "refused, but wrote"}};
  const uint32_t mode = _mm_getcsr();
  for (const auto& [arenaCase, text] : cases) {
    const ::testing::AssertionResult result = RunArena(arenaCase);
    EXPECT_EQ(static_cast<bool>(result), *text == 0) << text;
    EXPECT_THAT(result.message(), ::testing::HasSubstr(text));
  }
  EXPECT_EQ(_mm_getcsr(), mode);
}

}  // namespace
}  // namespace vexel::testing
