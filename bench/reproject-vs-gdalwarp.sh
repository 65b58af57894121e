#!/bin/sh
# Builds the reprojection benchmark optimised and runs it against gdalwarp.
#   bench/reproject-vs-gdalwarp.sh [runs]
set -e
src=$(cd "$(dirname "$0")/.." && pwd)
build=${BUILD_DIR:-$src/build-bench}
cmake -S "$src" -B "$build" -DCMAKE_BUILD_TYPE=Release >/dev/null
cmake --build "$build" --target reproject_bench -j2 >/dev/null
dir=$(mktemp -d)
trap 'rm -rf "$dir"' EXIT
"$build/bench/reproject_bench" --runs "${1:-5}" --dir "$dir"
