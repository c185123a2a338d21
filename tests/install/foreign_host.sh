#!/usr/bin/env bash
# foreign_host.sh SOURCE BUILD_DIR CMAKE CXX: with the package of another host the build takes that host, and leaves out
# its own and what only its own can serve.
set -euo pipefail
source=$1 build=$2 cmake=$3 cxx=$4
rm -rf "$build"
mkdir -p "$build"
echo 'add_library(vexel::host INTERFACE IMPORTED GLOBAL)' >"$build/otherhost-config.cmake"
"$cmake" -S "$source" -B "$build/out" -DVEXEL_HOST=otherhost -DCMAKE_PREFIX_PATH="$build" -DCMAKE_CXX_COMPILER="$cxx" \
  -DVEXEL_BUILD_TOOLS=OFF >/dev/null
targets=$("$cmake" --build "$build/out" --target help)
grep -q 'vexel_objects' <<<"$targets"
if grep -E 'vexel_tests|vexelhost' <<<"$targets"; then
  echo "these need the embedded host"
  exit 1
fi
