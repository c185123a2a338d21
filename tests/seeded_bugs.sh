#!/bin/sh
# Proves that the unit tests catch the seeded bugs: builds once with all of them, then runs the tests with each switched
# on in turn. The tests must pass without a bug and fail with one.
#   tests/seeded_bugs.sh BUILD_DIRECTORY [GTEST_FILTER]
set -eu
build=${1:?usage: tests/seeded_bugs.sh BUILD_DIRECTORY [GTEST_FILTER]}
filter=${2:-*}
source=$(dirname "$0")/..
cmake -S "$source" -B "$build" -G Ninja -DVEXEL_BUILD_TOOLS=OFF -DVEXEL_BUILD_TESTS=ON -DVEXEL_SEED_BUG=-1 >/dev/null
cmake --build "$build" --target vexel_tests

run() { VEXEL_SEED_BUG=$1 "$build/bin/vexel_tests" --gtest_brief=1 --gtest_filter="$filter" >"$build/seeded_bug_$1.log" 2>&1; }

if ! run 0; then
  echo "the tests fail without any bug: $build/seeded_bug_0.log"
  exit 1
fi
count=$(sed -n 's/.*kSeededBugCount = \([0-9]*\);.*/\1/p' "$source/Src/frame/SeededBug.h")
missed=0
for bug in $(seq "$count"); do
  if run "$bug"; then
    echo "seeded bug $bug: NOT CAUGHT"
    missed=1
  else
    log=$build/seeded_bug_$bug.log
    echo "seeded bug $bug: caught: $(grep -m1 -E '^Arena: |: Failure$' "$log" || tail -n 1 "$log")"
  fi
done
exit $missed
