#include "frame/Features.h"

namespace vexel {
namespace {

constexpr bool Bit(uint32_t word, int bit) { return (word >> bit & 1) != 0; }

constexpr uint64_t kAvxState = 0x6;      // XCR0: SSE and AVX registers
constexpr uint64_t kAvx512State = 0xE6;  // and the mask and upper vector registers

}  // namespace

constinit Switches gSwitches;

Features DetectFeatures(const Processor& processor) {
  Features f;
  const CpuidRegisters leaf1 = processor.cpuid(1, 0);
  f.sse = Bit(leaf1.edx, 25);
  f.sse2 = Bit(leaf1.edx, 26);
  f.sse3 = Bit(leaf1.ecx, 0);
  f.ssse3 = Bit(leaf1.ecx, 9);
  f.sse41 = Bit(leaf1.ecx, 19);
  f.sse42 = Bit(leaf1.ecx, 20);
  const bool osSavesExtendedState = Bit(leaf1.ecx, 27);
  f.avx = osSavesExtendedState && Bit(leaf1.ecx, 28) && (processor.xcr0() & kAvxState) == kAvxState;
  // The version word, compared signed, stands in for the highest leaf; hosts rely on which processors this lets
  // through.
  if (f.avx && static_cast<int32_t>(leaf1.eax) >= 7) f.avx2 = Bit(processor.cpuid(7, 0).ebx, 5);
  return f;
}

KernelVariant DetectVariant(const Processor& processor) {
  const uint32_t highestLeaf = processor.cpuid(0, 0).eax;
  if (highestLeaf < 1) return KernelVariant::Plain;
  const CpuidRegisters leaf1 = processor.cpuid(1, 0);
  const auto has1 = [&](int bit) { return Bit(leaf1.ecx, bit); };
  if (!Bit(leaf1.edx, 26) || !has1(0) || !has1(9)) return KernelVariant::Plain;
  const bool sse4 = has1(19) && has1(20) && has1(1) && has1(25);  // SSE4.1, SSE4.2, PCLMUL, AES
  if (!sse4) return KernelVariant::Ssse3;

  const bool avx = has1(27) && has1(28) && has1(12) && has1(29);  // OSXSAVE, AVX, FMA, F16C
  if (!avx || highestLeaf < 7) return KernelVariant::Sse41;
  const uint64_t state = processor.xcr0();
  const CpuidRegisters leaf7 = processor.cpuid(7, 0);
  const auto has7 = [&](int bit) { return Bit(leaf7.ebx, bit); };
  const bool avx2 = (state & kAvxState) == kAvxState && has7(5) && has7(3) && has7(8);  // AVX2, BMI1, BMI2
  if (!avx2) return KernelVariant::Sse41;
  const bool avx512 = (state & kAvx512State) == kAvx512State && has7(16) && has7(17) && has7(28) && has7(30) &&
                      has7(31);  // F, DQ, CD, BW, VL
  return avx512 ? KernelVariant::Avx512 : KernelVariant::Avx2;
}

}  // namespace vexel
