#!/usr/bin/env bash
# Prints the size of the test suite against the code it tests, in lines that are neither blank
# nor only a comment, and fails when the tests exceed the share given (default 40 %).
set -euo pipefail
cd "$(dirname "$0")/.."
limit=${1:-40}

count() {
    find "$@" -name '*.cpp' -o -name '*.h' | xargs cat | grep -v '^\s*$' | grep -cv '^\s*//'
}
# Tests written as shell scripts count too, less their # comments.
count_shell() {
    find "$@" -name '*.sh' | xargs -r cat | grep -v '^\s*$' | grep -cv '^\s*#' || true
}
code=$(count renderer src host)
tests=$(($(count tests) + $(count_shell tests)))
share=$((100 * tests / code))
echo "tests: $tests lines, code: $code lines, tests are $share % of the code (limit $limit %)"
((100 * tests <= limit * code))
