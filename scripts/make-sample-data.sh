#!/usr/bin/env bash
# Generates the sample data the local MapServer serves: vector layers, two GeoTIFFs,
# the mapfiles (world, wgs84) and their MapServer configuration files (world.conf, wgs84.conf).
#   usage: make-sample-data.sh OUTDIR
# Idempotent: when OUTDIR already holds data made from the same inputs it does nothing.
# Every coordinate and pixel value is written here, so tests can predict what they get.
set -euo pipefail

if [ $# -ne 1 ]; then
  echo "usage: $0 OUTDIR" >&2
  exit 2
fi

ROOT="$(cd "$(dirname "$0")/.." && pwd)"
SRC="$ROOT/samples"
mkdir -p "$1"
OUT="$(cd "$1" && pwd)"

for tool in ogr2ogr gdal_translate gdalbuildvrt flock; do
  command -v "$tool" >/dev/null || { echo "make-sample-data: $tool not found (install gdal-bin)" >&2; exit 1; }
done

# Test programs may start several servers at once: one generator at a time.
exec 9>"$OUT/.lock"
flock 9

# Inputs that decide the output; a changed input or another OUTDIR regenerates.
STAMP="$OUT/.stamp"
want="$( (cat "$0" "$SRC"/mapserver/*.in "$SRC"/vector/*.geojson; echo "$OUT") | sha256sum | cut -d' ' -f1)"
if [ -f "$STAMP" ] && [ "$(cat "$STAMP")" = "$want" ]; then
  exit 0
fi

export PROJ_NETWORK=OFF
TMP="$(mktemp -d "$OUT/.tmp.XXXXXX")"
trap 'rm -rf "$TMP"' EXIT

# Vector layers as shapefiles (MapServer reads them natively).
for layer in countries cities roads dateline parcels; do
  rm -f "$OUT/$layer".{shp,shx,dbf,prj,cpg}
  ogr2ogr -q -f "ESRI Shapefile" "$OUT/$layer.shp" "$SRC/vector/$layer.geojson" -nln "$layer"
done

# ASCII grid writer: ncols nrows xll yll cellsize awk-expression-of-(col,row) file.
# Row 0 is the northern row, as in the GeoTIFF.
write_grid() {
  awk -v nc="$1" -v nr="$2" -v xll="$3" -v yll="$4" -v cs="$5" -v f="$7" '
    BEGIN {
      printf "ncols %d\nnrows %d\nxllcorner %s\nyllcorner %s\ncellsize %s\n", nc, nr, xll, yll, cs
      for (row = 0; row < nr; row++) {
        line = ""
        for (col = 0; col < nc; col++) {
          if (f == "r") v = col
          else if (f == "g") v = 2 * row
          else if (f == "b") v = 255 - col
          else if (f == "elev") v = sprintf("%.1f", 100.5 + col + 1000 * row)
          line = line (col ? " " : "") v
        }
        print line
      }
    }' > "$6"
}

# rgb.tif: 200x100 Byte RGB over lon 0..20, lat 40..50 (0.1 degree pixels).
#   R = col, G = 2*row, B = 255 - col
write_grid 200 100 0 40 0.1 "$TMP/r.asc" r
write_grid 200 100 0 40 0.1 "$TMP/g.asc" g
write_grid 200 100 0 40 0.1 "$TMP/b.asc" b
gdalbuildvrt -q -separate "$TMP/rgb.vrt" "$TMP/r.asc" "$TMP/g.asc" "$TMP/b.asc"
rm -f "$OUT/rgb.tif"
gdal_translate -q -ot Byte -a_srs EPSG:4326 -co PHOTOMETRIC=RGB -co TILED=NO \
  "$TMP/rgb.vrt" "$OUT/rgb.tif"

# elevation.tif: 100x100 Float32 over lon 5..15, lat 45..55 (0.1 degree pixels).
#   value = 100.5 + col + 1000*row  (exact in Float32)
write_grid 100 100 5 45 0.1 "$TMP/elev.asc" elev
rm -f "$OUT/elevation.tif"
gdal_translate -q -ot Float32 -a_srs EPSG:4326 "$TMP/elev.asc" "$OUT/elevation.tif"
rm -f "$OUT"/*.aux.xml

# Mapfiles and one MapServer 8 configuration file per map.
for map in world wgs84; do
  sed "s|@DATA@|$OUT|g" "$SRC/mapserver/$map.map.in" > "$OUT/$map.map"
  sed -e "s|@DATA@|$OUT|g" -e "s|@MAP@|$map|g" "$SRC/mapserver/mapserver.conf.in" > "$OUT/$map.conf"
done
rm -f "$OUT/mapserver.conf"

echo "$want" > "$STAMP"
echo "make-sample-data: sample data in $OUT"
