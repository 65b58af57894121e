#!/bin/sh
# Reads the largest WMS capabilities document in the corpus with our client (through a
# loopback negotiation and from memory) and with OWSLib, in one run, and compares.
#
#   bench/wms-capabilities-vs-owslib.sh [FILE] [ITERATIONS]
set -eu
cd "$(dirname "$0")/.."
FILE=${1:-../shared/corpus/wms/wms111-geoserver-massgis-1017layers.xml}
N=${2:-20}
[ -r "$FILE" ] || { echo "cannot read $FILE" >&2; exit 1; }

cmake -S . -B build-bench -DCMAKE_BUILD_TYPE=Release >/dev/null
cmake --build build-bench -j2 --target wms_capabilities_bench >/dev/null
BENCH=$(find build-bench -type f -name wms_capabilities_bench -perm -u+x | head -n 1)
[ -n "$BENCH" ] || { echo "wms_capabilities_bench was not built" >&2; exit 1; }

OURS=$("$BENCH" "$FILE" --iterations "$N")
# Debian's python3 carries python3-owslib; another python3 earlier in PATH may not.
PY=/usr/bin/python3
[ -x "$PY" ] || PY=python3
THEIRS=$("$PY" bench/owslib_parse.py "$FILE" "$N")
echo "== vxogc"; echo "$OURS"
echo "== OWSLib"; echo "$THEIRS"

# MB/s of the median (or best) run from a "what: best ... (X MB/s), median ... (Y MB/s)" line.
median_rate() { sed -n "s/^$1: .*median .*(\([0-9.]*\) MB\/s)$/\1/p"; }
best_rate() { sed -n "s/^$1: best [0-9.]* ms (\([0-9.]*\) MB\/s).*/\1/p"; }
PARSE=$(echo "$OURS" | median_rate parse)
NEGO=$(echo "$OURS" | median_rate 'negotiate+parse')
OWS=$(echo "$THEIRS" | median_rate parse)
BPARSE=$(echo "$OURS" | best_rate parse)
BNEGO=$(echo "$OURS" | best_rate 'negotiate+parse')
BOWS=$(echo "$THEIRS" | best_rate parse)
SIZE=$(wc -c <"$FILE")
awk -v size="$SIZE" -v p="$PARSE" -v n="$NEGO" -v o="$OWS" -v bp="$BPARSE" -v bn="$BNEGO" -v bo="$BOWS" -v it="$N" 'BEGIN {
  printf "wms capabilities %.1f MB: vxogc parse %.1f MB/s, negotiate+parse %.1f MB/s; OWSLib parse %.1f MB/s; ratio %.1fx", size / 1e6, p, n, o, p / o
  printf " (medians of %d; best runs: %.1f, %.1f, %.1f MB/s, ratio %.1fx)\n", it, bp, bn, bo, bp / bo }'
