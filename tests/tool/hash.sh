#!/usr/bin/env bash
# The same frames on every processor and with any number of threads; and the hash is that of the raw file.
. "$(dirname "$0")/common.sh"

isas=(plain)
for isa in ssse3 sse4.1 avx2 avx512; do
  "$vexel" convert "$clip420" x.raw --format UYVY_422_8u_709 --frames 0 --isa $isa >/dev/null 2>&1 && isas+=($isa)
done
echo "kernels: ${isas[*]}"

for format in UYVY_422_8u_709 V210_422_10u_709 BGRA_4444_8u PRGB_4444_15u VUYP_4444_32f BGRA_4444_32f_Linear \
  RGB_444_10u YUV_420_MPEG4_FRAME_709; do
  for clip in "$clip420" "$clip422"; do
    want=$(hash_of "$clip" x.raw --format $format --frames 7-9)
    [ "$want" = "$(md5sum <x.raw | cut -d' ' -f1)" ] || fail "$format: the hash is not the file's"
    for isa in "${isas[@]}"; do
      for threads in 1 7; do
        got=$(hash_of "$clip" x.raw --format $format --frames 7-9 --isa $isa --threads $threads)
        [ "$got" = "$want" ] || fail "$format of $clip with $isa on $threads threads: $got, not $want"
      done
    done
  done
done
exit $failed
