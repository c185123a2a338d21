#!/usr/bin/env bash
# pkgconfig_consumer.sh LIBDIR EXAMPLE BUILD_DIR CC CXX: a C program, and a C++17 program that controls the embedded host,
# built with what pkg-config says, and run.
set -euo pipefail
libdir=$1 example=$2 build=$3 cc=$4 cxx=$5
mkdir -p "$build"
export PKG_CONFIG_PATH=$libdir/pkgconfig
read -ra flags < <(pkg-config --cflags --libs vexel)
"$cc" -std=c11 -Wall -Wextra -Wpedantic -Werror "$example/convert.c" "${flags[@]}" -Wl,-rpath,"$libdir" -o "$build/convert"
# White, yellow, blue and black in BT.709 video range.
diff - <("$build/convert") <<'END'
U 128 Y 235 V 128 Y 235
U  16 Y 219 V 138 Y 219
U 240 Y  32 V 118 Y  32
U 128 Y  16 V 128 Y  16
END

cat >"$build/limit.cpp" <<'END'
#include <vexel/vexel.h>
#include <vexel_host/host.h>
int main() {
  vexel_host::SetThreadLimit(3);
  return VX_Initialize() == VX_Success && vexel_host::ThreadLimit() == 3 ? 0 : 1;
}
END
"$cxx" -std=c++17 -Wall -Wextra -Wpedantic -Werror "$build/limit.cpp" "${flags[@]}" -Wl,-rpath,"$libdir" -o "$build/limit"
"$build/limit"
