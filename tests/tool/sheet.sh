#!/usr/bin/env bash
# The demo: a sheet of the right size, and errors as small as they ought to be.
. "$(dirname "$0")/common.sh"

"$vexel" demo "$clip420" "$clip422" -o sheet.png >log 2>&1 || fail "demo: $(cat log)"
"$vexel" info sheet.png | grep -q '1504x1456' || fail "the sheet: $("$vexel" info sheet.png)"
[ "$(grep -c 'Mpixel/s' log)" = 12 ] || fail "demo: $(cat log)"
# The first clip is decoded to 8 bits, which 15 bits and float hold exactly; the filters of chroma differ a little.
[ "$(grep -cE 'through (15-bit RGB|linear float).*worst error [01] of 255' log)" = 2 ] || fail "demo: $(cat log)"
if grep -E 'worst error ([3-9][0-9]|[12][0-9][0-9]) of' log; then fail "an error too large"; fi
exit $failed
