#!/usr/bin/env bash
# Builds the fuzz targets with clang, libFuzzer and the address and undefined-behaviour
# sanitizers, and runs each for the given number of seconds (default 60) from a corpus of its
# own in build/fuzz/corpus, seeded from the examples and the plug-in's property list. A crash or
# a sanitizer report fails the run and leaves the input that caused it in build/fuzz/crashes.
# A second argument runs only the target of that name.
set -euo pipefail
cd "$(dirname "$0")/.."
seconds=${1:-60}
only=${2:-}

cmake --preset fuzz >/dev/null
cmake --build --preset fuzz

seed() {
    local target=$1
    case $target in
        composition_fuzzer) cp examples/*/*.json "$2"/ ;;
        property_list_fuzzer) cp build/fuzz/plugins/libOrmond.prpl "$2"/ ;;
        instance_options_fuzzer) printf '\0\0\0\1\0\0\0\0\0\0\0\3' >"$2"/choice3 ;;
        image_source_fuzzer)
            local name=0
            for path in disc.png ../cards/grid.png /dev/zero . '' "$(printf 'n%.0s' {1..300}).png"; do
                printf '%s' "$path" >"$2"/$((name++))
            done
            ;;
    esac
}

mkdir -p build/fuzz/crashes
for target in composition_fuzzer image_source_fuzzer property_list_fuzzer instance_options_fuzzer; do
    [[ -n $only && $only != "$target" ]] && continue
    corpus=build/fuzz/corpus/${target%_fuzzer}
    mkdir -p "$corpus"
    seed "$target" "$corpus"
    dictionary=()
    [[ $target == composition_fuzzer ]] && dictionary=(-dict=fuzz/composition.dict)
    echo "== $target"
    build/fuzz/fuzz/$target "$corpus" "${dictionary[@]}" \
        -max_total_time="$seconds" -timeout=10 -rss_limit_mb=4096 -print_final_stats=1 \
        -print_funcs=0 -artifact_prefix=build/fuzz/crashes/$target-
done
