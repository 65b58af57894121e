// Times warping a 2048 x 2048 RGBA GeoTIFF from EPSG:4326 to EPSG:3857 (bilinear, one thread)
// against gdalwarp on the same file, and checks that both results agree.
//
//   reproject_bench [--runs N] [--size S] [--dir DIR]
#include <sys/stat.h>

#include <algorithm>
#include <chrono>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <functional>
#include <iterator>
#include <string>
#include <vector>

#include "vx/crs.h"
#include "vx/feature.h"
#include "vx/tiffhandler.h"

namespace {

double bestOf(int runs, const std::function<bool()>& job) {
    double best = HUGE_VAL;
    for (int i = 0; i < runs; ++i) {
        const auto t0 = std::chrono::steady_clock::now();
        if (!job()) return -1;
        const std::chrono::duration<double> d = std::chrono::steady_clock::now() - t0;
        best = std::min(best, d.count());
    }
    return best;
}

// Smooth colour ramps with a fine grid on top, so that resampling errors would show.
VxRef<VxRaster> makeSource(int n) {
    auto r = vxMake<VxRaster>(n, n, VxRasterFormat::RGBA8);
    for (int y = 0; y < n; ++y) {
        uint8_t* p = r->row(y);
        for (int x = 0; x < n; ++x, p += 4) {
            const bool line = x % 64 == 0 || y % 64 == 0;
            p[0] = line ? 0 : static_cast<uint8_t>(x * 255 / (n - 1));
            p[1] = line ? 0 : static_cast<uint8_t>(y * 255 / (n - 1));
            p[2] = static_cast<uint8_t>(128 + 100 * std::sin(x * 0.01) * std::cos(y * 0.013));
            p[3] = 255;
        }
    }
    return r;
}

bool readFile(const std::string& path, std::vector<uint8_t>& out) {
    std::ifstream in(path, std::ios::binary);
    if (!in) return false;
    out.assign(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
    return true;
}

}  // namespace

int main(int argc, char** argv) {
    int runs = 5, n = 2048;
    std::string dir = "/tmp/vx-reproject-bench";
    for (int i = 1; i + 1 < argc; i += 2) {
        if (!std::strcmp(argv[i], "--runs")) runs = std::max(1, std::atoi(argv[i + 1]));
        else if (!std::strcmp(argv[i], "--size")) n = std::max(16, std::atoi(argv[i + 1]));
        else if (!std::strcmp(argv[i], "--dir")) dir = argv[i + 1];
    }
    mkdir(dir.c_str(), 0755);
    const std::string input = dir + "/src-4326.tif", ours = dir + "/vxogc-3857.tif",
                      theirs = dir + "/gdalwarp-3857.tif";
    const VxRect bounds(-20, 30, 20, 60);
    const VxRef<VxCrs> geo = VxCrs::wgs84LongLat();
    const VxRef<VxCrs> merc = VxCrs::fromAuthorityAndCode("EPSG", "3857");

    VxTiffWriteOptions in;
    in.bounds = bounds;
    in.epsg = 4326;
    in.geographic = true;
    if (!VxTiffHandler::writeTiff(*makeSource(n), input, in)) {
        std::fprintf(stderr, "cannot write %s\n", input.c_str());
        return 1;
    }

    // Warp alone, on the decoded raster.
    std::vector<uint8_t> bytes;
    if (!readFile(input, bytes)) return 1;
    VxRef<VxRasterGeometry> decoded = VxTiffHandler::decode(bytes.data(), bytes.size());
    if (!decoded) return 1;
    decoded->bounds(decoded->sourceBounds());
    const VxRef<VxFeature> feature = vxMake<VxFeature>(decoded, geo);
    VxProjectParams bilinear;
    VxRef<VxFeature> result;
    const double warpOnly = bestOf(runs, [&] {
        std::vector<VxRef<VxFeature>> out;
        if (!feature->projectTo(merc, out, &bilinear, true) || out.size() != 1) return false;
        result = out[0];
        return true;
    });

    // File to file, as gdalwarp does it: read, decode, warp, encode, write.
    const double fileToFile = bestOf(runs, [&] {
        std::vector<uint8_t> data;
        if (!readFile(input, data)) return false;
        VxRef<VxRasterGeometry> g = VxTiffHandler::decode(data.data(), data.size());
        if (!g) return false;
        g->bounds(g->sourceBounds());
        std::vector<VxRef<VxFeature>> out;
        if (!vxMake<VxFeature>(g, geo)->projectTo(merc, out, &bilinear, true) || out.size() != 1) return false;
        VxTiffWriteOptions o;
        o.bounds = out[0]->rasterGeometry()->bounds();
        o.epsg = 3857;
        return VxTiffHandler::writeTiff(*out[0]->rasterGeometry()->raster(), ours, o);
    });

    const std::string cmd = "gdalwarp -q -t_srs EPSG:3857 -r bilinear -ts " + std::to_string(n) + " " +
                            std::to_string(n) + " -wo NUM_THREADS=1 -overwrite '" + input + "' '" + theirs + "'";
    const double gdal = bestOf(runs, [&] { return std::system(cmd.c_str()) == 0; });
    if (warpOnly < 0 || fileToFile < 0 || gdal < 0) {
        std::fprintf(stderr, "a run failed (warp %g, file %g, gdalwarp %g)\n", warpOnly, fileToFile, gdal);
        return 1;
    }

    const double mp = double(n) * n / 1e6;
    std::printf("reproject %dx%d 4326->3857: vxogc %.3f s (%.1f MP/s), gdalwarp %.3f s (%.1f MP/s), ratio %.2f\n",
                n, n, fileToFile, mp / fileToFile, gdal, mp / gdal, fileToFile / gdal);
    std::printf("  vxogc warp alone (no file input/output): %.3f s (%.1f MP/s); best of %d runs each\n",
                warpOnly, mp / warpOnly, runs);

    // Agreement: gdalwarp once more (untimed) onto exactly our grid, then compare pixels.
    const VxRect& ob = result->rasterGeometry()->bounds();
    char extent[256];
    std::snprintf(extent, sizeof extent, " -te %.6f %.6f %.6f %.6f", ob.minx, ob.miny, ob.maxx, ob.maxy);
    const std::string same = dir + "/gdalwarp-same-grid.tif";
    const std::string sameCmd = "gdalwarp -q -t_srs EPSG:3857 -r bilinear -ts " + std::to_string(n) + " " +
                                std::to_string(n) + extent + " -wo NUM_THREADS=1 -overwrite '" + input +
                                "' '" + same + "'";
    std::vector<uint8_t> gbytes;
    VxRef<VxRasterGeometry> g;
    if (std::system(sameCmd.c_str()) == 0 && readFile(same, gbytes))
        g = VxTiffHandler::decode(gbytes.data(), gbytes.size());
    if (!g || !g->raster() || g->raster()->bands() < 4) {
        std::printf("  agreement: cannot read %s\n", same.c_str());
        return 0;
    }
    const VxRaster& a = *result->rasterGeometry()->raster();
    const VxRaster& b = *g->raster();
    if (a.width() != b.width() || a.height() != b.height()) {
        std::printf("  agreement: sizes differ\n");
        return 0;
    }
    double sum = 0;
    int worst = 0;
    size_t count = 0, coverage = 0;
    for (int y = 0; y < a.height(); ++y)
        for (int x = 0; x < a.width(); ++x) {
            const VxColor p = a.color(x, y), q = b.color(x, y);
            if ((p.a == 0) != (q.a == 0)) ++coverage;
            if (p.a != 255 || q.a != 255) continue;
            for (int d : {std::abs(p.r - q.r), std::abs(p.g - q.g), std::abs(p.b - q.b)}) {
                sum += d;
                worst = std::max(worst, d);
            }
            ++count;
        }
    std::printf("  agreement with gdalwarp on the same grid: mean |difference| %.3f levels, largest %d, "
                "over %zu opaque pixels; %zu pixels covered by one only\n",
                count ? sum / (3.0 * count) : 0.0, worst, count, coverage);
    return 0;
}
