#!/usr/bin/env bash
# Sets up, builds and runs the whole test suite: the optimised build, then the same tests
# under the address and undefined-behaviour sanitizers, then the threaded tests under the
# thread sanitizer, then each fuzz target for 30 seconds. OSTREL_QUICK=1 runs the optimised
# build only.
set -euo pipefail
cd "$(dirname "$0")/.."

bash scripts/setup.sh

# Under the thread sanitizer only the programs with threaded cases are built and run.
run_preset() {
    local preset=$1 start=$SECONDS built
    shift
    cmake --preset "$preset" >/dev/null
    cmake --build --preset "$preset" "$@"
    built=$SECONDS
    ctest --preset "$preset"
    echo "== $preset: built in $((built - start)) s, tested in $((SECONDS - built)) s"
}

run_preset default
if [[ ${OSTREL_QUICK:-0} != 1 ]]; then
    run_preset asan
    run_preset tsan --target threaded_tests
    bash scripts/fuzz.sh 30
fi
