#!/usr/bin/env bash
# vexel fill and vexel dissolve: the bytes that come out, black DV as a decoder sees it, and refusals.
. "$(dirname "$0")/common.sh"

# The file holds nothing but one run of bytes, COUNT times.
holds() {  # FILE COUNT BYTES
  local width got
  width=$(wc -w <<<"$3")
  got=$(od -An -v -tx1 -w"$width" "$1" | sort | uniq -c | sed 's/^ *//; s/  */ /g')
  [ "$got" = "$2 $3" ] || fail "$1: $got, not $2 $3"
}

fill() {  # FORMAT COLOUR COUNT BYTES
  run fill f.raw --format "$1" --size 5x3 --color "$2"
  holds f.raw "$3" "$4"
}
fill BGRA_4444_8u black 15 '00 00 00 ff'
fill VUYA_4444_8u_709 transparent-white 15 '80 80 eb 00'
fill UYVY_422_8u white 9 '80 eb 80 eb'
fill ARGB_4444_15u white 15 '00 80 00 80 00 80 00 80'
fill PRGB_4444_8u '#80402080' 15 '80 40 20 10'
fill BGRX_4444_8u '#123456' 15 '56 34 12 ff'
run fill f.png --format BGRA_4444_8u --size 5x3 --color '#12345678'
convert f.png g.raw --format BGRA_4444_8u
holds g.raw 15 '56 34 12 78'

# What a decoder makes of five frames.
for format in NTSCDV25 PALDV25; do
  run fill one.dv --format $format --color black
  mv log said
  cat one.dv one.dv one.dv one.dv one.dv >five.dv
  convert five.dv decoded.raw --format UYVY_422_8u
  [ $format = NTSCDV25 ] && lines=480 || lines=576
  grep -q "^one.dv: 720x$lines, $format\$" said || fail "$format: $(cat said)"
  [ "$(stat -c %s one.dv)" = $((lines * 250)) ] || fail "$format: $(stat -c %s one.dv) bytes"
  holds decoded.raw $((5 * 360 * lines)) '80 10 80 10'
  "$vexel" info five.dv | grep -q "dvvideo, 720x$lines, .* 5 frames" || fail "$format: $("$vexel" info five.dv)"
  "$vexel" info five.dv | grep -q 'audio, pcm_s16le' || fail "$format has no sound"
done

run fill a.png --format BGRX_4444_8u --size 7x5 --color '#00c800'
run fill b.png --format BGRX_4444_8u --size 7x5 --color '#ff6400'
for mix in '0 00 c8 00' '1 00 64 ff' '0.5 00 96 80' '0.25 00 af 40'; do
  run dissolve a.png b.png m.png --mix "${mix%% *}"
  convert m.png m.raw --format BGRX_4444_8u
  holds m.raw 35 "${mix#* } ff"
done
run dissolve "$clip420" "$clip420" same.png --mix 0.3
convert "$clip420" first.png --frames 0 --format BGRX_4444_8u
convert same.png same.raw --format BGRX_4444_8u
convert first.png first.raw --format BGRX_4444_8u
same same.raw first.raw "a picture mixed with itself"

run fill small.png --format BGRX_4444_8u --size 7x4 --color black
refuses 1 "PALDV25 has a size of its own" fill f.dv --format PALDV25 --size 720x576 --color black
refuses 1 "NTSCDV25 takes black only" fill f.dv --format NTSCDV25 --color transparent-white
refuses 1 "NTSCDV50 has no encoder" fill f.dv --format NTSCDV50 --color '#123456'
refuses 1 "a DV frame is a file of its own" fill f.png --format PALDV25 --color black
refuses 1 'UYVY_422_8u has no alpha.*--color black' fill x.raw --format UYVY_422_8u --size 4x4 --color transparent-black
refuses 1 '"red" is not a colour; write black' fill x.raw --format BGRA_4444_8u --size 4x4 --color red
refuses 1 '"#12345g" is not a colour' fill x.raw --format BGRA_4444_8u --size 4x4 --color '#12345g'
refuses 1 'four channels.*V210_422_10u takes black and white' fill x.raw --format V210_422_10u --size 4x4 --color '#123456'
refuses 1 'cannot fill PALDV25 with white: VX_ErrFormatNotHandled \(-1000\)' fill x.dv --format PALDV25 --color white
refuses 1 '--size is required' fill x.raw --format BGRA_4444_8u --color black
refuses 2 '--color is required' fill x.raw --format BGRA_4444_8u --size 4x4
refuses 1 'is 7x5 and .* is 7x4; a dissolve takes' dissolve a.png small.png x.png --mix 0.5
refuses 2 '--mix' dissolve a.png b.png x.png --mix 1.5
refuses 2 '--mix' dissolve a.png b.png x.png --mix nan
refuses 1 'cannot mix .* into PALDV25' dissolve a.png b.png x.raw --mix 0.5 --format PALDV25
ls x.* 2>/dev/null && fail "a refused command wrote a file"
exit $failed
