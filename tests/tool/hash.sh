#!/usr/bin/env bash
# The same frames on every processor and with any number of threads; and the hash is that of the raw file.
. "$(dirname "$0")/common.sh"

isas=(plain)
for isa in ssse3 sse4.1 avx2 avx512; do
  "$vexel" convert "$clip420" x.raw --format UYVY_422_8u_709 --frames 0 --isa $isa >/dev/null 2>&1 && isas+=($isa)
done
echo "kernels: ${isas[*]}"

check() {  # CLIP FORMAT
  local want got isa threads
  want=$(hash_of "$1" x.raw --format $2 --frames 7-9)
  [ "$want" = "$(md5sum <x.raw | cut -d' ' -f1)" ] || fail "$2: the hash is not the file's"
  for isa in "${isas[@]}"; do
    got=$(hash_of "$1" x.raw --format $2 --frames 7-9 --isa $isa)
    [ "$got" = "$want" ] || fail "$2 of $1 with $isa: $got, not $want"
  done
  for threads in 1 7; do  # 7 work on bands of the 3 frames
    got=$(hash_of "$1" x.raw --format $2 --frames 7-9 --threads $threads)
    [ "$got" = "$want" ] || fail "$2 of $1 on $threads threads: $got, not $want"
  done
}

for format in UYVY_422_8u_709 BGRA_4444_8u VUYP_4444_32f BGRA_4444_32f_Linear; do check "$clip420" $format; done
for format in YUYV_422_8u BGRX_4444_8u PRGB_4444_15u RGB_444_10u YUV_420_MPEG4_FRAME_709; do check "$clip422" $format; done
exit $failed
