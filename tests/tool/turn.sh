#!/usr/bin/env bash
# vexel transpose and vexel rotate: where the corners go, as seen, and that turns add up.
. "$(dirname "$0")/common.sh"

# The pixels as bytes, from the top row on.
pixels() {
  convert "$1" pixels.raw --format BGRA_4444_8u
  od -An -v -tx1 pixels.raw | tr -d ' \n'
}

looks() {  # FILE LETTERS
  convert "$1" letters.raw --format BGRA_4444_8u
  local letters
  letters=$(tr -d '\377' <letters.raw | sed 's/\(.\)\1\1/\1/g')
  [ "$letters" = "$2" ] || fail "$1 is not $2 but $letters"
}

# Grey pixels a b c above d e f, opaque.
for c in a b c d e f; do printf '%s%s%s\377' $c $c $c; done >six.raw
convert six.raw six.png --raw-format BGRA_4444_8u --size 3x2 --format BGRA_4444_8u
run transpose six.png transposed.png
for angle in 0 90 180 270 -90; do run rotate six.png "r$angle.png" --angle "$angle"; done
run rotate six.png flipped.png --angle 0 --flip
run rotate six.png flipped90.png --angle 90 --flip
looks six.png abcdef
looks transposed.png adbecf
looks r0.png abcdef
looks r90.png daebfc
looks r180.png fedcba
looks r270.png cfbead
looks r-90.png cfbead
looks flipped.png defabc
looks flipped90.png adbecf

# A noisy picture, of odd size and with alpha, comes back bit for bit.
head -c 6580 "$clip420" >noise.raw
convert noise.raw noise.png --raw-format BGRA_4444_8u --size 47x35 --format BGRA_4444_8u
run transpose noise.png t.png
run transpose t.png back.png
[ "$(pixels back.png)" = "$(pixels noise.png)" ] || fail "transposing twice changes the picture"
[ "$(pixels t.png)" != "$(pixels noise.png)" ] || fail "transposing does nothing"
run transpose noise.png plain.png --isa plain --threads 1
[ "$(pixels plain.png)" = "$(pixels t.png)" ] || fail "plain kernels transpose otherwise"
cp noise.png turned.png
for _ in 1 2 3 4; do run rotate turned.png next.png --angle 90 && mv next.png turned.png; done
[ "$(pixels turned.png)" = "$(pixels noise.png)" ] || fail "four quarter turns change the picture"
refuses 2 '--isa' rotate noise.png x.png --angle 90 --isa neon
refuses 2 'angle' rotate noise.png x.png --angle 45
[ ! -e x.png ] || fail "a refused rotation writes a picture"

exit $failed
