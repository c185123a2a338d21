#!/usr/bin/env bash
# vexel kernels: the list, and a picture of each kernel.
. "$(dirname "$0")/common.sh"

"$vexel" kernels >list || fail "kernels: no list"
[ "$(wc -l <list)" = 8 ] || fail "kernels: $(cat list)"
grep -Eq '^cubic +2 +4 +8 +16 ' list || fail "the cubic's taps: $(grep '^cubic ' list)"
grep -Eq '^spline36 +6 +6 +- +- ' list || fail "Spline36 makes nothing smaller: $(grep spline36 list)"
"$vexel" kernels --plot new/plots || fail "kernels --plot"
[ "$(ls new/plots | wc -l)" = 15 ] || fail "plots: $(ls new/plots)"
grep -L '</svg>' new/plots/*.svg | grep . && fail "unfinished plots"
grep -l 'nan\|inf' new/plots/*.svg && fail "plots of no numbers"
"$vexel" kernels --plot list/plots 2>err && fail "a plot into no directory"
grep -q 'list/plots/.*Not a directory' err || fail "no reason given: $(cat err)"

sed -n '/^name  /,/^lanczos8 /p' "$media/../../docs/resampling.md" >documented
same list documented "the list in docs/resampling.md"
exit $failed
