#!/usr/bin/env bash
# headers.sh INCLUDE_DIR CC CXX: every installed header compiles alone; those of the flat interface as C11 and C++17, the
# others as C++17 and C++20. Every one has a guard: it is included twice.
set -euo pipefail
include=$1 cc=$2 cxx=$3
flat='^vexel/(vexel|compositing|pixel_formats|version)\.h$'
failed=0 count=0
compile() {  # COMPILER LANGUAGE STANDARD HEADER
  printf '#include <%s>\n#include <%s>\nextern int unit;\n' "$4" "$4" |
    "$1" -x "$2" -std="$3" -Wall -Wextra -Wpedantic -Werror -fsyntax-only -I"$include" - ||
    { echo "$4 does not compile alone as $3"; failed=1; }
}
while read -r header; do
  count=$((count + 1))
  if [[ $header =~ $flat ]]; then
    compile "$cc" c c11 "$header"
  else
    compile "$cxx" c++ c++20 "$header"
  fi
  compile "$cxx" c++ c++17 "$header"
done < <(cd "$include" && find . -name '*.h' | sed 's|^\./||' | sort)
[ "$count" -ge 8 ] || { echo "only $count headers are installed"; exit 1; }
exit $failed
