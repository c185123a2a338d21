#!/usr/bin/env bash
# Makes a picture with alpha: make_wheel.sh VEXEL OUT. A colour wheel, white in the middle, black toward its rim, which
# fades away.
set -euo pipefail
size=270
LC_ALL=C awk -v size=$size '
  function wave(angle) { return (1 + cos(angle)) / 2 }
  function put(value) { printf "%c", int(255 * (value < 0 ? 0 : value > 1 ? 1 : value) + 0.5) }
  BEGIN {
    third = 2 * atan2(0, -1) / 3
    for (row = size - 1; row >= 0; row--)
      for (column = 0; column < size; column++) {
        x = (column + 0.5) / size * 2 - 1
        y = (row + 0.5) / size * 2 - 1
        radius = sqrt(x * x + y * y)
        angle = atan2(y, x)
        white = 1 - radius / 0.4
        if (white < 0) white = 0
        light = radius < 0.5 ? 1 : 1 - (radius - 0.5) / 0.4
        for (k = 1; k >= -1; k--) put(light * (white + (1 - white) * wave(angle + k * third)))
        put((0.97 - radius) / 0.17)
      }
  }' | "$1" convert - "$2" --raw-format BGRA_4444_8u --size ${size}x$size --format BGRA_4444_8u
