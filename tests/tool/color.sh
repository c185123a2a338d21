#!/usr/bin/env bash
# vexel color: known colours, round trips, P010 and the refusals.
. "$(dirname "$0")/common.sh"

color() { run color "$@"; }

# The first pixel of a picture in full floats: blue green red alpha.
first_pixel() {
  convert "$1" pixel.raw --format BGRA_4444_32f
  od -An -v -tf4 -N16 pixel.raw
}

near() {  # FILE BLUE GREEN RED ALPHA TOLERANCE
  first_pixel "$1" | awk -v b="$2" -v g="$3" -v r="$4" -v a="$5" -v t="$6" 'function far(x, y) { return x - y > t || y - x > t }
    { exit far($1, b) || far($2, g) || far($3, r) || far($4, a) }' || fail "$1 is not $2 $3 $4 $5 but $(first_pixel "$1")"
}

# White at 100 cd/m2, half transparent, and a grey.
printf '\377\377\377\200\200\200\200\377' >two.raw
convert two.raw two.png --raw-format BGRA_4444_8u --size 2x1 --format BGRA_4444_8u
color two.png pq.png --from srgb --to pq
near pq.png 0.50808 0.50808 0.50808 0.50196 0.0001
color two.png hlg.png --from rec709 --to hlg
near hlg.png 0.62962 0.62962 0.62962 0.50196 0.0001
color pq.png hlg2.png --from pq --to hlg
near hlg2.png 0.62962 0.62962 0.62962 0.50196 0.0005

# A saturated green of BT.2020 has no place in sRGB.
printf '\000\377\000\377' >green.raw
convert green.raw green.png --raw-format BGRA_4444_8u --size 1x1 --format BGRA_4444_8u
color green.png inside.png --from rec2020 --to srgb --compress-gamut
color green.png toned.png --from srgb --to srgb --tone 1,1.2,0.6

# There and back, whatever the way. Files with more than 8 bits keep them.
convert "$clip420" source.png --format BGRX_4444_8u --frames 5
convert source.png deep.png --format BGRX_4444_32f
for space in rec709 rec2020 p3-d60 p3-d65 pq pq-p3 hlg; do
  color deep.png there.tiff --from srgb --to $space
  color there.tiff back.png --from $space --to srgb
  convert back.png back.raw --format BGRA_4444_8u
  convert source.png source.raw --format BGRA_4444_8u
  # The tables of PQ and HLG have 4,096 and 2,048 steps, files 16 bits and no negative values.
  worst=$(paste <(od -An -v -tu1 -w1 source.raw) <(od -An -v -tu1 -w1 back.raw) |
    awk '{ d = $1 - $2; d = d < 0 ? -d : d; if (d > w) w = d } END { print w + 0 }')
  [ "$worst" -le 3 ] || fail "sRGB to $space and back is $worst codes away"
done

# P010: luma 940 << 6 and neutral chroma are white, whose PQ signal 1 is 10,000 cd/m2; luma 64 << 6 is black.
printf '\000\353\000\020\000\353\000\020\000\200\000\200' >p010.raw
p010=(--raw-format YUV_420_MPEG4_FRAME_PICTURE_BIPLANAR_10u_as16u_2020_HDR --size 2x2)
color p010.raw p010.png "${p010[@]}" --from pq --to pq
near p010.png 0.99998 0.99998 0.99998 1 0.0005
color p010.raw p010.png "${p010[@]}" --from pq --to srgb --tone 1,1.2,0.6
near p010.png 1 1 1 1 0.001

color --plot .
for plot in transfer primaries tone; do grep -q '</svg>' $plot.svg || fail "$plot.svg is not complete"; done

refuses 1 'did you mean srgb' color two.png x.png --from sgrb --to pq
refuses 1 'standard range' color two.png x.png --from srgb --to pq --tone 1,1.2,0.6
refuses 1 'no tone curve' color two.png x.png --from srgb --to srgb --tone 1,0.5,0.6
refuses 1 'no tone curve' color two.png x.png --from srgb --to srgb --tone 1,1.2
refuses 2 'needs IN' color two.png x.png --from srgb
refuses 1 'a JPEG holds 8 bits' color two.png x.jpg --from srgb --to PQ
refuses 1 '--size belongs to raw frames' color two.png x.png --from srgb --to pq --size 2x1
refuses 1 'cannot write .*: Not a directory' color --plot transfer.svg
refuses 1 'size' color p010.raw x.png --raw-format BGRA_4444_8u --size 2 --from srgb --to pq
[ ! -e x.png ] && [ ! -e x.jpg ] || fail "a refused command wrote a file"
exit $failed
