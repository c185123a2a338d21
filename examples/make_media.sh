#!/usr/bin/env bash
# Makes the two small clips of examples/media from FFmpeg's own picture generators. They are committed, so this is only
# needed to change them: it takes an ffmpeg with libx264.
set -euo pipefail
cd "$(dirname "$0")/media"

encode() {  # FILTERS PIXEL_FORMAT QUALITY OUT
  ffmpeg -v error -y -f lavfi -i "$1" -vf "scale=out_color_matrix=bt709:out_range=tv,format=$2" -t 2 \
    -c:v libx264 -threads 1 -preset veryslow -crf "$3" -g 12 -colorspace bt709 -color_primaries bt709 -color_trc bt709 \
    -color_range tv -movflags +faststart -fflags +bitexact -flags +bitexact "$4"
  ls -l "$4"
}

# 8-bit 4:2:0: a zoom into the Mandelbrot set, fine detail and saturated colour.
encode "mandelbrot=size=480x270:rate=12:start_scale=1.6:end_scale=0.8:end_pts=24:maxiter=800:inner=convergence" \
  yuv420p 22 fractal_h264_420.mp4

# 10-bit 4:2:2: slow waves of colour, which show every lost bit, and a strip of bars.
waves="r='540+420*sin(X/190+T/2)*cos(Y/210-T/3)':g='470+330*sin(X/260+Y/170-T/2+1)':b='560+400*cos(X/330-Y/120+T/3+2)'"
encode "nullsrc=size=480x216:rate=12,format=gbrp10,geq=$waves[waves];
  smptehdbars=size=480x54:rate=12,format=gbrp10[bars];[waves][bars]vstack" \
  yuv422p10le 18 waves_h264_422_10bit.mp4
