#!/usr/bin/env bash
# Every refusal: its exit status, what it says, and that it says so on standard error only.
. "$(dirname "$0")/common.sh"

head -c 12288 "$clip420" >noise.raw  # 64 x 48 pixels of 4 bytes
convert noise.raw picture.png --raw-format BGRA_4444_8u --size 64x48 --format BGRA_4444_8u
head -c 600 picture.png >torn.png
echo 'no picture' >text.png
: >empty.png
to_bgra=(--format BGRA_4444_8u)
raw=(--raw-format BGRA_4444_8u --size 64x48)

refuses 2 'a command is required'
refuses 2 'COMMAND --help'
refuses 2 'unknown option "--frames" before a command' --frames 3 convert
refuses 2 'Run "vexel convert --help"' convert picture.png
refuses 2 'unknown command "xyzzy"$' xyzzy
refuses 2 'unknown command "convrt"; did you mean convert\?' convrt
refuses 2 'out is required' convert picture.png
refuses 2 '--format is required' convert picture.png x.png
refuses 2 '--isa' convert picture.png x.png "${to_bgra[@]}" --isa neon
refuses 2 '--threads' convert picture.png x.png "${to_bgra[@]}" --threads 0
refuses 1 'unknown format "UYVY_422_8U_709"; did you mean UYVY_422_8u_709' convert picture.png x.png --format UYVY_422_8U_709
refuses 1 'unknown format "BGRA_444_8u"; did you mean BGRA_4444_8u' convert picture.png x.png --format BGRA_444_8u
refuses 1 'unknown format "nonsense" \("vexel formats" lists all\)' convert picture.png x.png --format nonsense
refuses 1 'cannot read "nowhere.mov": No such file or directory' convert nowhere.mov x.png "${to_bgra[@]}"
refuses 1 'cannot read "nowhere.mov": No such file or directory' info nowhere.mov
refuses 1 'cannot read "text.png"|cannot decode "text.png"' convert text.png x.png "${to_bgra[@]}"
refuses 1 'cannot decode "torn.png": it holds no whole frame' convert torn.png x.png "${to_bgra[@]}"
refuses 1 'cannot write "no/where.png": No such file or directory' convert picture.png no/where.png "${to_bgra[@]}"
refuses 1 'cannot tell from its name.*"x.foo"' convert picture.png x.foo "${to_bgra[@]}"
refuses 1 'unknown container "gif"' convert picture.png x.png "${to_bgra[@]}" --container gif
refuses 1 'holds one picture.*out_%04d.png' convert "$clip420" x.png "${to_bgra[@]}" --frames 0-3
refuses 1 '"x_%04d.raw" would be one file of all frames' convert "$clip420" x_%04d.raw "${to_bgra[@]}"
refuses 1 'cannot tell from its name.*"x.foo"' demo picture.png -o x.foo
refuses 1 'not a sequence pattern' demo nowhere.png -o x_%d_%d.png
refuses 1 'not a sequence pattern' convert "$clip420" 'x_%d_%d.png' "${to_bgra[@]}"
refuses 1 'has only 24 frames' convert "$clip420" x.png "${to_bgra[@]}" --frames 24
refuses 1 'not a range of frames' convert "$clip420" x.png "${to_bgra[@]}" --frames 5-3
refuses 1 'need their size' convert noise.raw x.png --raw-format BGRA_4444_8u "${to_bgra[@]}"
refuses 1 '"64" is not a size' convert noise.raw x.png --raw-format BGRA_4444_8u --size 64 "${to_bgra[@]}"
refuses 1 'ends in the middle of a frame' convert noise.raw x.raw --raw-format BGRA_4444_8u --size 65x48 "${to_bgra[@]}"
refuses 1 'nothing is ever scaled' convert picture.png x.png "${to_bgra[@]}" --size 32x24
refuses 1 'cannot hold a 2147483647x2147483647' convert noise.raw x.raw --raw-format BGRA_4444_8u --size 2147483647x2147483647 "${to_bgra[@]}"
refuses 1 'cannot convert BGRA_4444_8u to PALDV25 at 64x48: VX_ErrFormatNotHandled \(-1000\)' convert noise.raw x.raw "${raw[@]}" --format PALDV25
refuses 1 'cannot convert BGRA_4444_8u to YUV_420_MPEG4_FRAME at 64x48: VX_ErrFormatNotHandled \(-1000\)' convert noise.raw x.raw "${raw[@]}" --format YUV_420_MPEG4_FRAME
refuses 1 'unknown format "BGRX"; did you mean BGRX_4444_8u' convert picture.png x.png --format BGRX
refuses 1 'cannot read "empty.png": the file is empty' convert empty.png x.png "${to_bgra[@]}"
refuses 2 '--quality.*range 0 to 5' convert picture.png x.png "${to_bgra[@]}" --quality x
refuses 1 'cannot read standard input' convert - x.png "${to_bgra[@]}"
refuses 1 'unknown matrix "907"' convert "$clip420" x.png "${to_bgra[@]}" --matrix 907
refuses 1 'no library format holds yuv422p10le frames coded with the BT.2020 matrix' convert "$clip422" x.png "${to_bgra[@]}" --matrix 2020

# Fewer frames than asked for are written, and said to be.
convert "$clip420" short.raw --format BGRA_4444_8u --frames 22-30
grep -q 'note: .* ends with frame 23' log || fail "a short file goes unnoticed: $(cat log)"

# Frames of several sizes fit no single file. A sequence is found wherever it begins, which no directory and no name below
# zero does.
run fill size_10.png --format BGRX_4444_8u --size 64x48 --color black
run fill size_11.png --format BGRX_4444_8u --size 32x48 --color white
cp size_10.png size_-3.png
mkdir size_5.png
for name in x.raw x.y4m; do
  refuses 1 'frame 1 is 32x48, those before are 64x48' convert size_%d.png $name "${to_bgra[@]}"
  [ ! -e $name ] || fail "$name of frames of two sizes"
done
convert size_%d.png size_again_%d.png "${to_bgra[@]}" && run info size_again_1.png
grep -q 32x48 log || fail "numbered pictures of two sizes: $(cat log)"

# A failure after the first frame leaves nothing behind, and an older file as it was; so does an interruption.
ls >before
refuses 1 'ends in the middle of a frame' convert noise.raw x.raw --raw-format BGRA_4444_8u --size 64x40 "${to_bgra[@]}"
cp picture.png kept.raw
refuses 1 'ends in the middle of a frame' convert noise.raw kept.raw --raw-format BGRA_4444_8u --size 64x40 "${to_bgra[@]}"
same picture.png kept.raw "a failed conversion over a file"
mkfifo endless
for signal in HUP INT TERM; do
  exec 3<>endless  # as its reader too, so that nothing waits for a tool that does not start
  # The shell lets its background jobs ignore SIGINT, which the tool would respect.
  env --default-signal=INT "$vexel" convert endless kept.raw "${raw[@]}" "${to_bgra[@]}" --threads 1 >log 2>&1 3<&- &
  cat noise.raw noise.raw >&3
  for ((i = 0; i < 100; ++i)); do
    [ -z "$(ls *.part 2>/dev/null)" ] && kill -0 $! 2>/dev/null || break
    sleep 0.1
  done
  kill -$signal $! 2>/dev/null
  wait $! 2>/dev/null
  [ "$(kill -l $?)" = $signal ] || fail "an interruption goes unnoticed: $(cat log)"
  exec 3<&-
done
same picture.png kept.raw "an interrupted conversion over a file"
rm -f endless kept.raw
[ "$(ls | grep -vx -e err -e out -e before)" = "$(grep -vx -e err -e out -e before before)" ] || fail "left behind: $(ls)"

# A file converted onto itself, through a link, keeps its permissions; what is not a file is written in place.
cp noise.raw self.raw && chmod 640 self.raw && ln -s self.raw link.raw
convert link.raw link.raw "${raw[@]}" --format BGRX_4444_8u
convert noise.raw other.raw "${raw[@]}" --format BGRX_4444_8u
same self.raw other.raw "a file converted onto itself"
[ -L link.raw ] && [ "$(stat -c %a self.raw)" = 640 ] || fail "a file converted onto itself: $(ls -l)"
ln -s later.raw early.raw
for name in early "$(printf '%0251d')"; do
  convert noise.raw "$name.raw" "${raw[@]}" --format BGRX_4444_8u
  same "$name.raw" other.raw "a link to nothing, and the longest name"
done
same later.raw other.raw "a link to nothing"
mkfifo pipe.raw
timeout 10 cat pipe.raw >piped &
convert noise.raw pipe.raw "${raw[@]}" --format BGRX_4444_8u
if [ -p pipe.raw ]; then
  : <>pipe.raw  # lets a reader go that nobody wrote to
  wait $!
else
  kill $!
fi
same piped other.raw "a named pipe"
rm -f pipe.raw

# What is used of a damaged file is said to be.
convert "$clip422" torn.jpg --format BGRX_4444_8u
head -c 9000 torn.jpg >torn2.jpg
convert torn2.jpg x.png "${to_bgra[@]}"
grep -q 'note: "torn2.jpg" is damaged' log || fail "a damaged file goes unnoticed: $(cat log)"

# A write error that only shows when the data leaves the buffers.
if [ -e /dev/full ]; then
  "$vexel" convert picture.png - "${to_bgra[@]}" >/dev/full 2>err
  [ $? = 1 ] || fail "a full device goes unnoticed"
  grep -q 'cannot write standard output: No space left on device' err || fail "a full device: $(cat err)"
fi
# Frames are not for a terminal.
if command -v script >/dev/null; then
  script -qec "'$vexel' convert picture.png - ${to_bgra[*]}" /dev/null </dev/null >shown
  grep -q 'cannot write standard output: it is a terminal' shown && [ "$(wc -c <shown)" -lt 500 ] || fail "a terminal gets frames"
fi
exit $failed
