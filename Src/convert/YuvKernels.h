// Row kernels that know Y'CbCr: matrices, ranges, 4:2:2 and V210. Names carry the colorimetry where it matters: _601
// and _709. "Vuyx"/"Bgrx" kernels ignore the source's fourth channel and write it opaque; "Vuya"/"Bgra" kernels copy
// it, which serves straight and premultiplied pixels alike (premultiplied Y'CbCr is scaled about black).
#pragma once

#include "convert/RowKernel.h"

namespace vexel {

// Depth of 4:4:4:4 Y'CbCr: 8u video range <-> 32f with Y 0..1 and chroma about 0 (YuvDepthKernels.cpp).
extern const RowKernelSet kVuya8To32f, kVuyx8To32f, kVuya32fTo8, kVuyx32fTo8;
extern const RowKernelSet kVuya8ToVuyp32f;  // widens, then premultiplies

// Matrices in 32f (YuvMatrix32fKernels.cpp).
extern const RowKernelSet kBgra32fToVuya32f_601, kBgra32fToVuya32f_709, kBgrx32fToVuyx32f_601, kBgrx32fToVuyx32f_709;
extern const RowKernelSet kVuya32fToBgra32f_601, kVuya32fToBgra32f_709, kVuyx32fToBgrx32f_601, kVuyx32fToBgrx32f_709;
extern const RowKernelSet kVuya32f_601To709, kVuya32f_709To601, kVuyx32f_601To709, kVuyx32f_709To601;
extern const RowKernelSet kVuya8ToBgra32f_601, kVuya8ToBgra32f_709, kVuyx8ToBgrx32f_601, kVuyx8ToBgrx32f_709;
extern const RowKernelSet kBgra32fToVuya8_601, kBgra32fToVuya8_709;

// Matrices in 8u fixed point, within 0.52 code values of the exact ones (YuvMatrix8Kernels.cpp).
extern const RowKernelSet kBgra8ToVuya8_601, kBgra8ToVuya8_709, kBgrx8ToVuyx8_601, kBgrx8ToVuyx8_709;
extern const RowKernelSet kVuya8ToBgra8_601, kVuya8ToBgra8_709, kVuyx8ToBgrx8_601, kVuyx8ToBgrx8_709;
extern const RowKernelSet kVuya8_601To709, kVuya8_709To601, kVuyx8_601To709, kVuyx8_709To601;

// Packed 4:2:2, 8u. A row of an odd width ends with a whole pair whose second luma repeats the first; kSwap422_8u moves
// it as it is. Chroma is co-sited with the even pixel. All but kSwap422_8u take whole rows.
//
// Upwards, the odd pixel takes the mean of the chroma before and after it; the last one repeats the last sample. The
// matrices use the mean unrounded, and an even pixel comes out as from the 4:4:4 kernel (Packed422Kernels8.cpp).
extern const RowKernelSet kUyvy8ToBgrx8_601, kUyvy8ToBgrx8_709, kYuyv8ToBgrx8_601, kYuyv8ToBgrx8_709;
extern const RowKernelSet kUyvy8ToVuyx8, kYuyv8ToVuyx8;
extern const RowKernelSet kSwap422_8u;  // UYVY <-> YUYV
extern const RowKernelSet kUyvy8_601To709, kUyvy8_709To601, kYuyv8_601To709, kYuyv8_709To601;
// Downwards, chroma is low-passed with (-1, 2, 6, 2, -1) / 8 about the even pixel, in the form that undoes the
// interpolation exactly: with d[i] = odd[i] - ((even[i] + even[i + 1] + 1) >> 1), chroma is the clamped
// even[i] + ((d[i - 1] + d[i] + 2) >> 2). An interpolated row has d = 0 and comes back byte for byte, in odd widths
// too. Beyond either end the row repeats its end pixel (d = 0 before the first pair). The fourth channel is ignored, so
// that premultiplied pixels are served as well (Subsample422Kernels8.cpp).
extern const RowKernelSet kVuyx8ToUyvy8;
// In one pass the same bytes as kBgrx8ToVuyx8 then kVuyx8ToUyvy8, and as kPremultiplyLast8u before these.
extern const RowKernelSet kBgrx8ToUyvy8_601, kBgrx8ToUyvy8_709, kBgra8ToUyvy8_601, kBgra8ToUyvy8_709;

// Packed 4:2:2, 32f (Packed422Kernels32f.cpp). A row of an odd width ends with a whole pair.
extern const RowKernelSet kSwap422_32f;
extern const RowKernelSet kUyvy8To32f, kYuyv8To32f, kUyvy32fTo8, kYuyv32fTo8;
// Chroma is co-sited with the even pixel. Interpolation makes that of the odd ones with the taps (-1, 9, 9, -1) / 16,
// which repeat the last sample beyond the row's ends; "Nearest" repeats the pair's. Alpha is written opaque.
extern const RowKernelSet kUyvy32fToVuyx32f, kUyvy32fToVuyx32fNearest;
// The way back low-passes chroma as the lifting partner of the interpolation: with d[i] what the interpolation gets
// wrong at the odd pixel of pair i, chroma is even[i] - (d[i - 1] + d[i]) / 4, that is (1, 0, -8, 16, 46, 16, -8, 0, 1)
// / 64. An interpolated row comes back bit for bit. Beyond the ends d is 0, and the luma that an odd width lacks
// repeats the last. The fourth channel is ignored.
extern const RowKernelSet kVuyx32fToUyvy32f;

// V210: 6 pixels in 16 bytes; 10-bit studio codes, which are those of 8 bits times 4 (V210Kernels.cpp). Packing writes
// whole groups, black (64, 512) where the last one holds more than the row's pairs. Codes take the whole range 0..1023,
// those that SDI reserves for its timing included, so that bytes come back from V210 as they were; the way to bytes
// rounds to nearest and saturates.
extern const RowKernelSet kUyvy8ToV210, kV210ToUyvy8, kUyvy32fToV210, kV210ToUyvy32f;
// Chroma of an odd pixel is the mean of its two neighbours, at the row's end the last sample. Everything is computed
// from 10-bit codes and rounded once to 8; fixed point deviates from the exact value by less than 1/16 of a code before
// that.
extern const RowKernelSet kV210ToBgrx8_601, kV210ToBgrx8_709, kV210ToVuyx8, kV210_709ToVuyx8_601;

}  // namespace vexel
