#!/usr/bin/env bash
# The main job on a fresh machine: installs dependencies, builds, makes the sample data,
# serves it with MapServer on a free loopback port and renders a few maps through the
# vxogc program into out/.
#   usage: scripts/main-job.sh [OUTDIR]      (default: out)
set -euo pipefail
cd "$(dirname "$0")/.."
ROOT="$PWD"
OUT="${1:-out}"
BUILD="$ROOT/build"
SAMPLES="$BUILD/samples"

bash scripts/install-deps.sh
cmake -S . -B "$BUILD" -DCMAKE_BUILD_TYPE=RelWithDebInfo >/dev/null
cmake --build "$BUILD" -j"$(nproc)"
bash scripts/make-sample-data.sh "$SAMPLES"

RUN="$(mktemp -d)"
SERVER_PID=""
stop_server() {
  if [ -n "$SERVER_PID" ] && kill -0 "$SERVER_PID" 2>/dev/null; then
    kill -TERM "$SERVER_PID"
    wait "$SERVER_PID" 2>/dev/null || true
  fi
  rm -rf "$RUN"
}
trap stop_server EXIT

python3 scripts/sample-services.py --port 0 --data "$SAMPLES" --port-file "$RUN/port" \
  >"$RUN/server.log" 2>&1 &
SERVER_PID=$!
for _ in $(seq 1 300); do
  [ -s "$RUN/port" ] && break
  if ! kill -0 "$SERVER_PID" 2>/dev/null; then
    echo "main-job: the sample server did not start:" >&2
    cat "$RUN/server.log" >&2
    exit 1
  fi
  sleep 0.1
done
[ -s "$RUN/port" ] || { echo "main-job: the sample server reported no port" >&2; exit 1; }
BASE="http://127.0.0.1:$(cat "$RUN/port")"
echo "main-job: sample services at $BASE (/wms, /wms111, /wms4326, /wcs)"

VXOGC="$BUILD/vxogc"
if [ ! -x "$VXOGC" ]; then
  echo "main-job: $VXOGC was not built" >&2
  exit 1
fi
probe="$("$VXOGC" render 2>&1 || true)"
if grep -q "unknown command 'render'" <<<"$probe"; then
  echo "main-job: this build of vxogc has no 'render' command yet; cannot draw the maps" >&2
  exit 1
fi

mkdir -p "$OUT"
render() {
  local name="$1"; shift
  echo "main-job: rendering $OUT/$name"
  "$VXOGC" render --throw "$@" -o "$OUT/$name"
}

# Whole world in Web Mercator, every layer, WMS 1.3.0.
render world-3857.png --wms "$BASE/wms" --crs EPSG:3857 \
  --bbox -20037508.34,-15028131.26,20037508.34,15028131.26 --size 1024x768

# Europe in geographic coordinates from a server that speaks WMS 1.1.1 only.
render europe-4326.png --wms "$BASE/wms111" --crs EPSG:4326 \
  --bbox -10,35,30,60 --size 1024x640 --layers countries,rgb,elevation,roads,parcels,cities

# Web Mercator across the antimeridian: 140E to 140W (220E), 30S to 30N.
# The service offers EPSG:4326 only, so the view falls into two requests, one each side.
render dateline-3857.png --wms "$BASE/wms4326" --crs EPSG:3857 \
  --bbox 15584728.71,-3503549.84,24490287.97,3503549.84 --size 1024x806 \
  --layers dateline4326,countries4326

# A layer offered in EPSG:4326 only, shown in Web Mercator (the client reprojects).
render rgb4326-3857.png --wms "$BASE/wms4326" --crs EPSG:3857 \
  --bbox -556597.45,4163881.14,2782987.27,7361866.11 --size 1024x980 \
  --layers rgb4326,countries4326

echo "main-job: maps written to $(cd "$OUT" && pwd):"
ls -l "$OUT"/*.png
