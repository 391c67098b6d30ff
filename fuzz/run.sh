#!/usr/bin/env bash
# Builds the fuzz targets and runs each of them: fuzz/run.sh [SECONDS [FORMAT...]]
# SECONDS (60) count for each format: tga, png, jpeg, description, binary, json. Fails on the first
# fault; the input that leads to it lies in build/fuzz/faults/ then, and the target reproduces it
# when given its path.
set -euo pipefail
cd -- "$(dirname -- "${BASH_SOURCE[0]}")/.."

seconds=${1:-60}
shift $(($# > 0 ? 1 : 0))
formats=("$@")
[ ${#formats[@]} -gt 0 ] || formats=(tga png jpeg description binary json)

cmake --preset fuzz
cmake --build --preset fuzz --parallel "${JOBS:-$(nproc)}" --target "${formats[@]/#/fuzz_}"

# A larger block counts as one that could not be had, which the readers must survive.
export ASAN_OPTIONS=allocator_may_return_null=1:max_allocation_size_mb=64
for format in "${formats[@]}"; do
    # These have to pay for their memory: 4096 bytes are good for about a megabyte. The index of
    # names, which stay to the end of the process, grows beyond that in documents.
    malloc_limit=512
    [ "$format" = tga ] && malloc_limit=2
    [ "$format" = binary ] && malloc_limit=32
    corpus=build/fuzz/corpus/$format
    mkdir -p "$corpus" build/fuzz/faults
    echo "== $format"
    "build/fuzz/bin/fuzz_$format" -max_total_time="$seconds" -max_len=4096 -timeout=10 \
        -rss_limit_mb=2048 -malloc_limit_mb="$malloc_limit" -print_final_stats=1 -verbosity=1 \
        -artifact_prefix="build/fuzz/faults/$format-" "$corpus" "fuzz/seeds/$format"
done
