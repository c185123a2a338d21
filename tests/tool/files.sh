#!/usr/bin/env bash
# What goes into a file comes out of it: every kind of file that holds a format exactly gives back the same frames.
. "$(dirname "$0")/common.sh"

# Converts the source to FORMAT in FILE, reads that back with OPTIONS, and compares the frames; the last word tells
# whether reading FILE finds FORMAT itself ("found") or a deeper one that holds it ("held").
returns() {  # FORMAT FILE found|held OPTIONS...
  local format=$1 file=$2 found=$3
  shift 3
  convert "${source[@]}" there.raw --format "$format"
  convert "${source[@]}" "$file" --format "$format"
  convert "$file" back.raw --format "$format" --explain "$@"
  same there.raw back.raw "$format through $file"
  if [ "$found" = found ]; then
    grep -q "^plan: $format (a copy)" log || fail "$file is not read as $format: $(grep plan log)"
  fi
}

# Colour and alpha at random, of odd sizes.
head -c 6580 "$clip420" >noise.raw
source=(noise.raw --raw-format BGRA_4444_8u --size 47x35)
returns BGRA_4444_8u a.png found
returns BGRA_4444_8u a.tiff found
returns BGRA_4444_8u a.dpx found
returns BGRX_4444_8u b.png found
returns VUYA_4444_8u_709 c.y4m found --matrix 709
returns UYVY_422_8u d.y4m found
returns V210_422_10u e.y4m found
returns BGRA_4444_15u f.png held
returns BGRA_4444_15u f.tif held

source=("$clip422" --frames 3-5)
returns RGB_444_10u g_%02d.dpx found --frames 0-2
returns BGRX_4444_8u 'h_%d.tiff' found
returns BGRX_4444_32f_Linear 'i_%04d.exr' found
returns UYVY_422_8u_709 j.y4m found --matrix 709
returns V210_422_10u_709 k.y4m found --matrix 709
[ "$(ls i_*.exr | tr '\n' ' ')" = 'i_0003.exr i_0004.exr i_0005.exr ' ] || fail "the sequence is numbered $(ls i_*.exr)"

source=("$clip420" --frames 3-5)
returns YUV_420_MPEG4_FRAME_709 l.y4m found --matrix 709
returns YUYV_422_8u_709 m.y4m held --matrix 709

# JPEG loses, but not much: the worst error of a good quality over a smooth picture.
convert "$clip422" n.jpg --format BGRX_4444_8u
"$vexel" info n.jpg | grep -q 'library format VUYX_4444_32f' || fail "JPEG 4:4:4: $("$vexel" info n.jpg)"

# Y4M does not name its matrix: RGB is written with the one that readers assume, and a note says where YUV is not.
convert "$clip422" there.raw --format BGRX_4444_8u --frames 3
convert "$clip422" o.y4m --format BGRX_4444_8u --frames 3
! grep -q note log || fail "RGB to Y4M: $(cat log)"
convert o.y4m back.raw --format BGRX_4444_8u
worst=$(paste <(od -An -v -tu1 -w1 there.raw) <(od -An -v -tu1 -w1 back.raw) |
  awk '{ d = $1 - $2; d = d < 0 ? -d : d; if (d > w) w = d } END { print w + 0 }')
[ "$worst" -le 3 ] || fail "RGB through Y4M is $worst codes away"
convert "$clip422" o.y4m --format UYVY_422_8u_709 --frames 3
grep -q 'note: .*--matrix 709' log || fail "709 to Y4M: $(cat log)"

# The pictures of the examples are what they say.
"$vexel" info "$clip420" >info || fail "info"
grep -q '480x270, 12 frames/s, 24 frames' info || fail "info: $(cat info)"
grep -q 'library format YUV_420_MPEG4_FRAME_709' info || fail "info: $(cat info)"
"$vexel" info "$clip422" | grep -q 'library format V210_422_10u_709' || fail "info of $clip422"

# The catalogue, and its JSON: one entry per format, each known to convert by that name.
[ "$("$vexel" formats | wc -l)" = 94 ] || fail "formats lists $("$vexel" formats | wc -l) lines"
[ "$("$vexel" formats --json | grep -c '"name"')" = 93 ] || fail "formats --json"
"$vexel" formats | grep -cE '^UYVY_422_8u_709 +0x00000A11 +8u +4:2:2 +none +BT.709 +video +2 B/px, rows to 16 +top +from and to$' | grep -q 1 ||
  fail "formats: $("$vexel" formats | grep UYVY_422_8u_709)"
"$vexel" formats --markdown >formats.md
same formats.md "$media/../../docs/formats.md" "docs/formats.md (./vx docs writes it)"
exit $failed
