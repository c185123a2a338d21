#!/usr/bin/env bash
# vexel pack and vexel unpack: bytes of each packing, both ways on a clip, refusals.
. "$(dirname "$0")/common.sh"

# One row of raw bytes, packed, as hexadecimal.
packs() {  # PACKING SIZE BYTES EXPECTED
  printf "$3" | "$vexel" pack - - --to "$1" --size "$2" 2>log | od -An -v -tx1 | tr -d ' \n' >hex
  [ "$(head -c ${#4} hex)" = "$4" ] || fail "$1 of $3 is $(head -c 40 hex), not $4: $(cat log)"
}
# U 512, Y 64, V 513, Y 1023, then black to the end of the group
packs v210 2x1 '\x00\x02\x40\x00\x01\x02\xff\x03' 00021120ff030804
packs dnxhd16u 1x1 '\xfc\x0f\x80\x00' c0ff000080000000
packs be16 1x1 '\x00\x80\x00\x00\x00\x40\x01\x00' ffff000080000002
packs be32 2x1 'abcdefgh' 6463626168676665

# A clip: packing gives what conversion gives, and comes back.
while read -r packing format; do
  run pack "$clip422" "p.$packing" --to "$packing"
  run unpack "p.$packing" "$packing.raw" --from "$packing" --size 480x270
  run pack "$packing.raw" "again.$packing" --to "$packing" --size 480x270
  same "p.$packing" "again.$packing" "$packing again"
  convert "$clip422" "$format.raw" --format "$format"
  case $packing in
    v210) same p.v210 "$format.raw" "pack and convert" ;;
    *) same "$packing.raw" "$format.raw" "unpack and convert" ;;
  esac
  run unpack "p.$packing" "$packing.png" --from "$packing" --size 480x270
  convert "$clip422" direct.png --format "$format"
  same "$packing.png" direct.png "the picture of $packing"
done <<END
v210 V210_422_10u_709
dnxhd16u RGB_444_10u
be16 ARGB_4444_15u
be32 RGB_444_10u
END

refuses 1 'v210, dnxhd16u' pack "$clip422" x.raw --to v211
refuses 2 '--size' unpack p.v210 x.raw --from v210
refuses 1 '--size' pack p.v210 x.raw --to v210 --raw-format V210_422_10u
refuses 1 'raw frames need --size' pack be16.raw x.raw --to be16
refuses 1 'no frame' unpack /dev/null x.raw --from v210 --size 4x4
refuses 1 'middle of a frame' unpack "$0" x.raw --from be16 --size 999x999
refuses 1 'its extension may be' unpack p.v210 x.v211 --from v210 --size 480x270
[ ! -e x.raw ] || fail "a refused command wrote a file"
exit $failed
