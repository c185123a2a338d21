#!/usr/bin/env bash
# Frames through pipes: only frames on standard output, no progress bar, and a reader that leaves is noticed.
. "$(dirname "$0")/common.sh"

convert "$clip422" direct.raw --format V210_422_10u_709 --frames 0-3
"$vexel" convert "$clip422" - --format V210_422_10u_709 --frames 0-3 --hash --explain 2>err >piped.raw
same direct.raw piped.raw "standard output"
grep -q '^plan: V210_422_10u_709 (a copy)' err || fail "the plan is not on standard error: $(cat err)"
grep -q "^md5 $(md5sum <direct.raw | cut -d' ' -f1)" err || fail "the hash is not on standard error: $(cat err)"
if grep -q $'[\r\033]' err; then fail "a progress bar in a pipe"; fi

# Raw and Y4M from one tool into another.
"$vexel" convert "$clip422" - --format UYVY_422_8u_709 --frames 0-3 2>/dev/null |
  "$vexel" convert - two.raw --raw-format UYVY_422_8u_709 --size 480x270 --format UYVY_422_8u_709 >log 2>&1 || fail "$(cat log)"
"$vexel" convert "$clip422" - --format UYVY_422_8u_709 --frames 0-3 --container y4m 2>/dev/null |
  "$vexel" convert - three.raw --matrix 709 --format UYVY_422_8u_709 >log 2>&1 || fail "$(cat log)"
convert "$clip422" one.raw --format UYVY_422_8u_709 --frames 0-3
same one.raw two.raw "raw through a pipe"
same one.raw three.raw "Y4M through a pipe"

# A picture in and a picture out.
convert "$clip420" still.png --format BGRX_4444_8u
"$vexel" convert - - --format BGRX_4444_8u --container png <still.png >again.png 2>log || fail "$(cat log)"
same still.png again.png "a picture through pipes"

"$vexel" convert "$clip420" - --format BGRA_4444_32f 2>err | head -c 100 >/dev/null
[ "${PIPESTATUS[0]}" = 1 ] || fail "a closed pipe goes unnoticed"
grep -q 'cannot write standard output: Broken pipe' err || fail "a closed pipe: $(cat err)"
exit $failed
