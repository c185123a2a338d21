#!/usr/bin/env bash
# pkgconfig_consumer.sh LIBDIR EXAMPLE BUILD_DIR CC: a C program built with what pkg-config says, and run.
set -euo pipefail
libdir=$1 example=$2 build=$3 cc=$4
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
