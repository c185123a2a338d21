# Sourced by the scripts here: NAME.sh TOOL MEDIA_DIRECTORY, run in an empty directory of their own.
set -uo pipefail
vexel=$1 media=$2
clip420=$media/fractal_h264_420.mp4 clip422=$media/waves_h264_422_10bit.mp4
failed=0
rm -rf ./*

fail() {
  echo "FAILED: $*"
  failed=1
}

same() {  # A B WHAT
  cmp -s "$1" "$2" || fail "$3: $1 and $2 differ"
}

convert() {
  "$vexel" convert "$@" >log 2>&1 || fail "convert $*: $(cat log)"
}

# The MD5 that --hash prints for a conversion.
hash_of() {
  "$vexel" convert "$@" --hash 2>log | sed -n 's/^md5 //p' | grep . || echo "none: $(cat log)"
}

run() {  # COMMAND ARGUMENTS...
  "$vexel" "$@" >log 2>&1 || fail "$*: $(cat log)"
}

refuses() {  # STATUS PATTERN ARGUMENTS...
  local status=$1 pattern=$2 got
  shift 2
  "$vexel" "$@" >out 2>err </dev/null
  got=$?
  [ "$got" = "$status" ] || fail "vexel $*: status $got, not $status"
  grep -qE -- "$pattern" err || fail "vexel $*: said $(cat err)"
  [ ! -s out ] || fail "vexel $*: wrote to standard output"
}
