#!/usr/bin/env bash
# A 1024x768 view drawn from the local MapServer, split into request, decode, reprojection
# and presentation; once served in the view's CRS and once requested in EPSG:4326 and
# reprojected to Web Mercator.   usage: bench/wms-draw.sh [ITERATIONS]
set -euo pipefail
cd "$(dirname "$0")/.."
N="${1:-10}"
BUILD=build-bench
cmake -S . -B "$BUILD" -DCMAKE_BUILD_TYPE=Release >/dev/null
cmake --build "$BUILD" -j"$(nproc)" --target wms_draw_bench >/dev/null
bash scripts/make-sample-data.sh "$BUILD/samples" >/dev/null
RUN="$(mktemp -d)"
python3 scripts/sample-services.py --port 0 --data "$BUILD/samples" --port-file "$RUN/port" >"$RUN/log" 2>&1 &
PID=$!
trap 'kill $PID 2>/dev/null; wait $PID 2>/dev/null; rm -rf "$RUN"' EXIT
for _ in $(seq 1 300); do [ -s "$RUN/port" ] && break; sleep 0.1; done
BASE="http://127.0.0.1:$(cat "$RUN/port")"
# lon -5..25, lat 35..55 in Web Mercator
BBOX=-556597.45,4163881.14,2782987.27,7361866.11
"$BUILD/bench/wms_draw_bench" "$BASE/wms" EPSG:3857 "$BBOX" rgb,countries "$N"
"$BUILD/bench/wms_draw_bench" "$BASE/wms4326" EPSG:3857 "$BBOX" rgb4326,countries4326 "$N"
