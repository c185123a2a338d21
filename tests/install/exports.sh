#!/usr/bin/env bash
# exports.sh LIBRARY LIST: the library exports exactly the names of the list, one a line, sorted.
set -euo pipefail
export LC_ALL=C
if ! diff <(grep -v '^#' "$2") <(nm -D --defined-only "$1" | awk '{print $3}' | sort); then
  echo "The exports (>) differ from $2 (<). A new public function belongs into the list."
  exit 1
fi
