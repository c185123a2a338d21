#!/usr/bin/env bash
# needs.sh LIBRARY: at run time the library needs its host and the C and C++ run-time libraries, nothing else.
set -euo pipefail
allowed='^(libvexelhost\.so\.[0-9]+|libstdc\+\+\.so\.6|libc\+\+\.so\.1|libc\+\+abi\.so\.1|libm\.so\.6|libgcc_s\.so\.1|libc\.so\.6|ld-linux-x86-64\.so\.2)$'
needed=$(readelf -d "$1" | sed -n 's/.*(NEEDED).*\[\(.*\)\]/\1/p')
[ -n "$needed" ] || { echo "readelf found nothing in $1"; exit 1; }
if extra=$(grep -vE "$allowed" <<<"$needed"); then
  echo "the library needs: $extra"
  exit 1
fi
soname=$(readelf -d "$1" | sed -n 's/.*(SONAME).*\[\(.*\)\]/\1/p')
[ "$soname" = libvexel.so.1 ] || { echo "the SONAME is $soname"; exit 1; }
