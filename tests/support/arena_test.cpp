// Proves the harness: operations with a fault each, which the arena must name.
#include "support/Arena.h"

#include <gmock/gmock.h>
#include <xmmintrin.h>

#include <cmath>
#include <csignal>
#include <cstring>
#include <memory>

#include "frame/KernelVariant.h"
#include "formats/FormatBits.h"

namespace vexel::testing {
namespace {

using ::testing::HasSubstr;

size_t RowBytesOf(const ArenaFrame& frame) { return static_cast<size_t>(UnpaddedRowBytes(frame.format, frame.width)); }

// A copy, followed by what `spoil` does to the last row.
ArenaCase CopyAnd(std::function<void(uint8_t* src, uint8_t* dst, size_t bytes)> spoil,
                  VX_PixelFormat format = VX_PixelFormat::BGRA_4444_8u) {
  ArenaCase arenaCase;
  arenaCase.name = "copy";
  arenaCase.sources = {format};
  arenaCase.destination = format;
  arenaCase.run = [spoil](const ArenaFrame* sources, const ArenaFrame& destination) {
    const size_t bytes = RowBytesOf(destination);
    for (int row = 0; row < destination.height; ++row) std::memcpy(destination.Row(row), sources[0].Row(row), bytes);
    const int last = destination.height - 1;
    spoil(sources[0].Row(last), destination.Row(last), bytes);
    return VX_Success;
  };
  return arenaCase;
}

std::string FailureOf(const ArenaCase& arenaCase) { return RunArena(arenaCase).message(); }

volatile uint8_t gByte;

TEST(Arena, PassesWhatIsRight) {
  for (const auto format : {VX_PixelFormat::BGRA_4444_8u, VX_PixelFormat::XRGB_4444_15u, VX_PixelFormat::V210_422_10u,
                            VX_PixelFormat::UYVY_422_8u, VX_PixelFormat::BGRA_4444_32f_Linear, FromBits(0x40)}) {
    auto arenaCase = CopyAnd([](uint8_t*, uint8_t*, size_t) {}, format);
    arenaCase.everyContents = true;
    EXPECT_TRUE(RunArena(arenaCase));
  }
}

TEST(ArenaDeathTest, NamesIllegalAccesses) {
  const auto exit = ::testing::KilledBySignal(SIGABRT);
  const auto dies = [&](const ArenaCase& arenaCase, const char* text) { EXPECT_EXIT(RunArena(arenaCase), exit, text); };
  dies(CopyAnd([](uint8_t* src, uint8_t*, size_t bytes) { gByte = src[bytes]; }),
       "copy: BGRA_4444_8u .* illegal read of source 0, row ., 0 bytes past its end");
  dies(CopyAnd([](uint8_t* src, uint8_t*, size_t) { gByte = src[-1]; }),
       "illegal read of source 0, row ., 1 bytes before");
  dies(CopyAnd([](uint8_t* src, uint8_t*, size_t) { *src = 0; }), "illegal write of source 0, row ., byte 0");
  dies(CopyAnd([](uint8_t*, uint8_t* dst, size_t bytes) { dst[bytes + 3] = 0; }),
       "illegal write of the destination, row ., 3 bytes past its end");
  // A masked vector load that sanitizers do not see, and one width in 130 at that.
  dies(CopyAnd([](uint8_t* src, uint8_t*, size_t bytes) {
         if (bytes == 77 * 4) gByte = src[bytes + 15];
       }),
       "77x. .* illegal read of source 0, row ., 15 bytes past");
  EXPECT_EXIT(ExpectRefusal("a call", VX_ErrUnsupportedFormat,
                            [](void* memory) {
                              gByte = *static_cast<uint8_t*>(memory);
                              return VX_ErrUnsupportedFormat;
                            }),
              exit, "a call: touched an unreadable buffer");
}

TEST(Arena, NamesWrongResults) {
  // Writes into padding that can be written.
  EXPECT_THAT(FailureOf(CopyAnd([](uint8_t*, uint8_t* dst, size_t) {
                if ((reinterpret_cast<uintptr_t>(dst) & 4095) != 0) dst[-1] ^= 1;
              })),
              HasSubstr("wrote outside the picture: row"));
  // A byte that is not written, a result that depends on the padding, one variant that differs in one bit.
  EXPECT_THAT(FailureOf(CopyAnd([](uint8_t*, uint8_t* dst, size_t bytes) {
                static uint8_t before;
                if (bytes != 129 * 4) return;
                dst[40] = before;
                before ^= 1;
              })),
              HasSubstr("byte 40"));
  EXPECT_THAT(FailureOf(CopyAnd([](uint8_t* src, uint8_t* dst, size_t bytes) {
                if ((reinterpret_cast<uintptr_t>(src + bytes) & 4095) != 0) dst[bytes - 1] = src[bytes];
              })),
              HasSubstr("wrong bits"));
  if (ActiveKernelVariant() != KernelVariant::Plain) {
    EXPECT_THAT(FailureOf(CopyAnd([](uint8_t*, uint8_t* dst, size_t) {
                  if (ActiveKernelVariant() != KernelVariant::Plain) dst[0] ^= 0x80;
                })),
                HasSubstr("byte 0"));
  }
  // Floats: -0 is not 0, but NaNs are alike.
  const auto floatCase = [](uint32_t plain, uint32_t other) {
    auto runs = std::make_shared<int>(0);
    return CopyAnd([=](uint8_t*, uint8_t* dst, size_t) { std::memcpy(dst, ++*runs % 2 ? &plain : &other, 4); },
                   VX_PixelFormat::BGRA_4444_32f);
  };
  EXPECT_THAT(FailureOf(floatCase(0, 0x80000000)), HasSubstr("wrong bits"));
  EXPECT_TRUE(RunArena(floatCase(0x7FC00000, 0xFFC00001)));
}

TEST(Arena, NamesALostFloatingPointMode) {
  const uint32_t mode = _mm_getcsr();
  EXPECT_THAT(FailureOf(CopyAnd([](uint8_t*, uint8_t*, size_t) { _mm_setcsr(_mm_getcsr() | 0x8000); })),
              HasSubstr("left another floating-point mode"));
  EXPECT_EQ(_mm_getcsr(), mode);
}

TEST(Arena, NamesWrongCodes) {
  auto refused = CopyAnd([](uint8_t*, uint8_t*, size_t) {});
  refused.expected = VX_ErrFailed;
  EXPECT_THAT(FailureOf(refused), HasSubstr("returned VX_Success instead of VX_ErrFailed"));
  refused.run = [](const ArenaFrame*, const ArenaFrame&) { return VX_ErrFailed; };
  EXPECT_TRUE(RunArena(refused));
  refused.run = [](const ArenaFrame*, const ArenaFrame& destination) {
    *destination.Row(destination.height - 1) = 1;
    return VX_ErrFailed;
  };
  EXPECT_THAT(FailureOf(refused), HasSubstr("refused, but wrote"));
}

}  // namespace
}  // namespace vexel::testing
