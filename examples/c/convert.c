/* Fills a picture with colour bars in 8-bit BGRA, converts it to packed 4:2:2 and prints a pixel pair of each bar.
 *
 *   cc convert.c $(pkg-config --cflags --libs vexel) -o convert && ./convert */
#include <stdio.h>
#include <string.h>

#include <vexel/vexel.h>

enum { kWidth = 64, kHeight = 2, kBarWidth = 16 };

static void FillBars(uint8_t* pixels, int32_t rowBytes) {
  static const uint8_t bars[4][4] = {{255, 255, 255, 255}, {0, 255, 255, 255}, {255, 0, 0, 255}, {0, 0, 0, 255}};
  for (int y = 0; y < kHeight; ++y)
    for (int x = 0; x < kWidth; ++x) memcpy(pixels + y * rowBytes + 4 * x, bars[x / kBarWidth], 4);
}

int main(void) {
  void *srcBlock, *src, *dstBlock, *dst;
  int32_t srcRowBytes, dstRowBytes;
  size_t srcSize, dstSize;
  const VX_PixelFormat bgra = VX_PixelFormat_BGRA_4444_8u, uyvy = VX_PixelFormat_UYVY_422_8u_709;
  VX_Result result;

  VX_Initialize();
  result = VX_AllocatePixelBuffer(bgra, kWidth, kHeight, &srcBlock, &src, &srcRowBytes, &srcSize);
  if (result == VX_Success)
    result = VX_AllocatePixelBuffer(uyvy, kWidth, kHeight, &dstBlock, &dst, &dstRowBytes, &dstSize);
  if (result == VX_Success) {
    FillBars(src, srcRowBytes);
    result = VX_Convert(src, srcRowBytes, bgra, dst, dstRowBytes, uyvy, kWidth, kHeight, 3);
  }
  if (result != VX_Success) {
    fprintf(stderr, "%s\n", VX_ResultName(result));
    return 1;
  }
  for (int x = kBarWidth / 2; x < kWidth; x += kBarWidth) {
    const uint8_t* pair = (const uint8_t*)dst + 2 * x;
    printf("U %3d Y %3d V %3d Y %3d\n", pair[0], pair[1], pair[2], pair[3]);
  }
  VX_FreePixelBuffer(uyvy, dstBlock, dstSize);
  VX_FreePixelBuffer(bgra, srcBlock, srcSize);
  VX_Terminate();
  return 0;
}
