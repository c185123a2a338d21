#!/usr/bin/env bash
# vexel composite and vexel blend-sheet: where the front lands, what modes and opacity do to it, and the sheet's size.
. "$(dirname "$0")/common.sh"

# Opaque grey pixels, given as octal codes, as a picture.
grey() {  # FILE SIZE CODES...
  local file=$1 size=$2 code
  shift 2
  for code in "$@"; do printf "\\$code\\$code\\$code\\377"; done >grey.raw
  convert grey.raw "$file" --raw-format BGRA_4444_8u --size "$size" --format BGRA_4444_8u
}

# Expects the greys of a composite, in decimal from the top left on.
gives() {  # GREYS ARGUMENTS...
  local expected=$1 got
  shift
  run composite "$@" out.png
  convert out.png out.raw --format BGRA_4444_8u
  got=$(od -An -v -w12 -tu1 out.raw | awk '{ for (i = 1; i <= NF; i += 4) print $i }' | xargs)
  [ "$got" = "$expected" ] || fail "composite $*: $got instead of $expected"
}

grey back.png 3x2 144 144 144 310 310 310  # 100 above 200
grey front.png 2x1 377 063                 # 255 and 51

gives "100 100 100 200 200 200" back.png front.png --opacity 0
gives "255 51 100 200 200 200" back.png front.png
gives "100 20 100 200 200 200" back.png front.png --mode multiply --offset 0,0
gives "100 20 100 200 200 200" back.png front.png --mode 17
gives "100 100 100 200 255 51" back.png front.png --offset 1,1
gives "51 100 100 200 200 200" back.png front.png --offset -1,0
gives "100 100 255 200 200 200" back.png front.png --offset 2,0
for far in 3,0 -2,0 0,2 0,-1 2147483647,0 -2147483648,-2147483648; do
  gives "100 100 100 200 200 200" back.png front.png --offset=$far
done
gives "162 80 100 200 200 200" \
  back.png front.png --mode Normal --opacity 0.4 --threads 2 --isa plain

refuses 1 'did you mean Multiply' composite back.png front.png no.png --mode Multiplay
for opacity in 1.5 -0.1 nan half; do
  refuses 2 'opacity' composite back.png front.png no.png --opacity=$opacity
done
refuses 2 'offset' composite back.png front.png no.png --offset 1
[ ! -e no.png ] || fail "a refused composite writes a picture"

# A deep back keeps its depth.
run composite "$clip422" front.png deep.exr --mode Screen
"$vexel" info deep.exr | grep -q '480x270' || fail "the deep picture: $("$vexel" info deep.exr)"

run blend-sheet "$clip422" "$clip420" sheet.png --opacity 0.5
"$vexel" info sheet.png | grep -q '1524x897' || fail "the sheet: $("$vexel" info sheet.png)"
run blend-sheet back.png front.png sheet.png
exit $failed
