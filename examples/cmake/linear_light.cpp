// Shows the plan from 8-bit RGB to linear light, and where mid grey ends up.
#include <cstdint>
#include <cstdio>
#include <vector>

#include <vexel/version.h>
#include <vexel/vexel.h>

int main() {
  constexpr VX_PixelFormat kFrom = VX_PixelFormat::BGRA_4444_8u, kTo = VX_PixelFormat::BGRA_4444_32f_Linear;
  std::printf("vexel %s (headers %s)\n", VX_GetVersion(), VEXEL_VERSION_STRING);
  VX_Initialize();

  VX_PixelFormat chain[9];
  int32_t count = 0;
  VX_Result result = VX_ExplainConversion(kFrom, kTo, 3, chain, &count);
  for (int32_t i = 0; i < count; ++i) std::printf("%s%s", i ? " > " : "", VX_PixelFormatName(chain[i]));

  const std::vector<uint8_t> grey(4, 128);
  std::vector<float> light(4);
  if (result == VX_Success) result = VX_Convert(grey.data(), 4, kFrom, light.data(), 16, kTo, 1, 1, 3);
  std::printf("\n%s: 128 of 255 is %.4f of full light\n", VX_ResultName(result), light[0]);

  VX_Terminate();
  return result == VX_Success ? 0 : 1;
}
