#!/usr/bin/env bash
# cmake_consumer.sh PREFIX EXAMPLE BUILD_DIR CMAKE CXX: a C++ project that finds the package, built and run.
set -euo pipefail
prefix=$1 example=$2 build=$3 cmake=$4 cxx=$5
rm -rf "$build"
"$cmake" -S "$example" -B "$build" -DCMAKE_PREFIX_PATH="$prefix" -DCMAKE_CXX_COMPILER="$cxx" -DCMAKE_BUILD_TYPE=Release \
  -DCMAKE_EXPORT_COMPILE_COMMANDS=ON
"$cmake" --build "$build"
if grep -- '-std=[a-z]*++2' "$build/compile_commands.json"; then
  echo "the example asks for C++17, and the package for more"
  exit 1
fi
"$build/linear_light" | tee "$build/output"
# 128 of 255, to the power of 2.4.
grep -q 'VX_Success: 128 of 255 is 0.1913 of full light' "$build/output"
