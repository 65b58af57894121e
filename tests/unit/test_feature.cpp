#include <gtest/gtest.h>

#include <cmath>
#include <set>
#include <thread>
#include <vector>

#include "vx/crs.h"
#include "vx/feature.h"

namespace {
const double kHalfWorld = 20037508.342789244;

VxRef<VxCrs> epsg(const char* code) { return VxCrs::fromAuthorityAndCode("EPSG", code); }

VxRef<VxFeature> featureOf(const VxRef<VxRaster>& r, const VxRect& b, const VxRef<VxCrs>& crs) {
    return vxMake<VxFeature>(vxMake<VxRasterGeometry>(r, b), crs, VxId::next());
}

// Opaque; red rises with the column, green with the row.
VxRef<VxRaster> gradient(int w, int h) {
    auto r = vxMake<VxRaster>(w, h, VxRasterFormat::RGBA8);
    for (int y = 0; y < h; ++y)
        for (int x = 0; x < w; ++x)
            r->setColor(x, y, VxColor(uint8_t(x * 255 / (w - 1)), uint8_t(y * 255 / (h - 1)), 128));
    return r;
}

// Output pixel (column, row) whose centre is nearest to world point (x, y).
std::pair<double, double> pixelOf(const VxFeature& f, double x, double y) {
    const VxRect& b = f.rasterGeometry()->bounds();
    const VxRaster& r = *f.rasterGeometry()->raster();
    return {(x - b.minx) / b.width() * r.width() - 0.5, (b.maxy - y) / b.height() * r.height() - 0.5};
}
}  // namespace

TEST(Feature, WarpPutsAMarkerWhereProjPutsItsCoordinate) {
    // 0.05 degree pixels; pixel (200, 200) is centred on lon 10, lat 50.
    auto src = vxMake<VxRaster>(401, 401, VxRasterFormat::RGBA8);
    src->clear(40, 40, 40, 255);
    src->setColor(200, 200, VxColor(255, 0, 0));
    const VxRect bounds(-0.025, 39.975, 20.025, 60.025);
    auto f = featureOf(src, bounds, VxCrs::wgs84LongLat());

    double mx = 10, my = 50;
    ASSERT_TRUE(VxCrs::wgs84LongLat()->transform(epsg("3857"), &mx, &my, 1));
    VxRect expected = bounds, second;
    VxCrs::wgs84LongLat()->projectTo(epsg("3857"), expected, second);

    for (bool bilinear : {false, true}) {
        VxProjectParams params;
        params.bilinear = bilinear;
        std::vector<VxRef<VxFeature>> out;
        ASSERT_TRUE(f->projectTo(epsg("3857"), out, &params, true));
        ASSERT_EQ(out.size(), 1u);
        const VxRaster& r = *out[0]->rasterGeometry()->raster();
        EXPECT_EQ(r.width(), 401);
        EXPECT_EQ(r.height(), 401);
        EXPECT_EQ(out[0]->crs().get(), epsg("3857").get());
        EXPECT_EQ(out[0]->id(), f->id());
        const VxRect& b = out[0]->rasterGeometry()->bounds();
        EXPECT_NEAR(b.minx, expected.minx, 1);
        EXPECT_NEAR(b.maxy, expected.maxy, 1);

        int bestX = -1, bestY = -1, best = 40;
        for (int y = 0; y < r.height(); ++y)
            for (int x = 0; x < r.width(); ++x) {
                const VxColor c = r.color(x, y);
                EXPECT_EQ(c.a, 255);  // a lat/lon rectangle is a rectangle in Mercator
                if (c.r > best) { best = c.r; bestX = x; bestY = y; }
            }
        ASSERT_GE(bestX, 0) << "marker lost, bilinear " << bilinear;
        const auto want = pixelOf(*out[0], mx, my);
        EXPECT_LE(std::fabs(bestX - want.first), 1.0) << bilinear;
        EXPECT_LE(std::fabs(bestY - want.second), 1.0) << bilinear;
    }
}

TEST(Feature, RoundTripThroughMercatorKeepsValues) {
    auto f = featureOf(gradient(256, 256), VxRect(0, 40, 20, 60), VxCrs::wgs84LongLat());
    std::vector<VxRef<VxFeature>> merc, back;
    ASSERT_TRUE(f->projectTo(epsg("3857"), merc, nullptr, true));
    ASSERT_EQ(merc.size(), 1u);
    ASSERT_TRUE(merc[0]->projectTo(VxCrs::wgs84LongLat(), back, nullptr, true));
    ASSERT_EQ(back.size(), 1u);
    const VxRect& b = back[0]->rasterGeometry()->bounds();
    EXPECT_NEAR(b.minx, 0, 1e-6);
    EXPECT_NEAR(b.maxx, 20, 1e-6);
    EXPECT_NEAR(b.miny, 40, 1e-6);
    EXPECT_NEAR(b.maxy, 60, 1e-6);
    const VxRaster& r = *back[0]->rasterGeometry()->raster();
    const VxRaster& s = *f->rasterGeometry()->raster();
    ASSERT_EQ(r.width(), 256);
    ASSERT_EQ(r.height(), 256);
    int worst = 0;
    for (int y = 2; y < 254; ++y)
        for (int x = 2; x < 254; ++x) {
            const VxColor a = r.color(x, y), e = s.color(x, y);
            worst = std::max({worst, std::abs(a.r - e.r), std::abs(a.g - e.g), std::abs(a.b - e.b)});
            ASSERT_EQ(a.a, 255) << x << "," << y;
        }
    // Two resamplings of a one-level-per-pixel ramp.
    EXPECT_LE(worst, 2);
}

TEST(Feature, GeographicRasterPastTheAntimeridianStaysContinuousInMercator) {
    auto f = featureOf(gradient(200, 100), VxRect(170, -20, 190, 20), VxCrs::wgs84LongLat());
    std::vector<VxRef<VxFeature>> out;
    ASSERT_TRUE(f->projectTo(epsg("3857"), out, nullptr, true));
    ASSERT_EQ(out.size(), 1u);
    const VxRect& b = out[0]->rasterGeometry()->bounds();
    EXPECT_NEAR(b.minx, kHalfWorld * 170 / 180, 1);
    EXPECT_NEAR(b.maxx, kHalfWorld * 190 / 180, 1);
    const VxRaster& r = *out[0]->rasterGeometry()->raster();
    for (int y : {0, 50, 99}) {
        int prev = -1;
        for (int x = 0; x < r.width(); ++x) {
            const VxColor c = r.color(x, y);
            ASSERT_EQ(c.a, 255) << x << "," << y;
            ASSERT_GE(c.r, prev) << "ramp broken at column " << x;
            prev = c.r;
        }
        EXPECT_LE(r.color(0, y).r, 2);
        EXPECT_GE(r.color(r.width() - 1, y).r, 253);
    }
}

TEST(Feature, MercatorRasterAcrossTheAntimeridianSplitsInTwo) {
    const double x0 = 19000000, x1 = 21000000;
    auto f = featureOf(gradient(300, 100), VxRect(x0, -1000000, x1, 1000000), epsg("3857"));
    std::vector<VxRef<VxFeature>> out;
    ASSERT_TRUE(f->projectTo(VxCrs::wgs84LongLat(), out, nullptr, true));
    ASSERT_EQ(out.size(), 2u);
    const VxRect& east = out[0]->rasterGeometry()->bounds();
    const VxRect& west = out[1]->rasterGeometry()->bounds();
    EXPECT_NEAR(east.minx, x0 / kHalfWorld * 180, 1e-6);
    EXPECT_DOUBLE_EQ(east.maxx, 180);
    EXPECT_DOUBLE_EQ(west.minx, -180);
    EXPECT_NEAR(west.maxx, x1 / kHalfWorld * 180 - 360, 1e-6);

    const VxRaster& a = *out[0]->rasterGeometry()->raster();
    const VxRaster& c = *out[1]->rasterGeometry()->raster();
    EXPECT_EQ(a.width() + c.width(), 300);
    EXPECT_EQ(a.height(), 100);
    EXPECT_EQ(c.height(), 100);
    // The pieces share the width as the source's columns fall into them.
    const double share = (kHalfWorld - x0) / (x1 - x0);
    EXPECT_NEAR(a.width(), 300 * share, 1);
    // The ramp runs on across the seam and every pixel is covered.
    const int y = 50;
    EXPECT_LE(a.color(0, y).r, 2);
    EXPECT_GE(c.color(c.width() - 1, y).r, 253);
    EXPECT_LE(std::abs(a.color(a.width() - 1, y).r - c.color(0, y).r), 3);
    for (const VxRaster* r : {&a, &c})
        for (int x = 0; x < r->width(); ++x) ASSERT_EQ(r->color(x, y).a, 255);
}

TEST(Feature, TargetAreaBringsAPieceNextToTheView) {
    // The second half of a view across the antimeridian, fetched in lon/lat at -180..-170.
    auto piece = featureOf(gradient(50, 50), VxRect(-180, -10, -170, 10), VxCrs::wgs84LongLat());
    std::vector<VxRef<VxFeature>> plain, placed, overlapping;
    ASSERT_TRUE(piece->projectTo(epsg("3857"), plain, nullptr, true));
    ASSERT_EQ(plain.size(), 1u);
    EXPECT_NEAR(plain[0]->rasterGeometry()->bounds().minx, -kHalfWorld, 1);

    VxProjectParams view;
    view.targetArea = VxRect(19000000, -1500000, 21500000, 1500000);
    ASSERT_TRUE(piece->projectTo(epsg("3857"), placed, &view, true));
    ASSERT_EQ(placed.size(), 1u);
    const VxRect& b = placed[0]->rasterGeometry()->bounds();
    EXPECT_NEAR(b.minx, kHalfWorld, 1);
    EXPECT_NEAR(b.maxx, kHalfWorld * 190 / 180, 1);
    EXPECT_EQ(b.height(), plain[0]->rasterGeometry()->bounds().height());

    // Already overlapping: left where it is.
    view.targetArea = VxRect(-20100000, -1500000, -19000000, 1500000);
    ASSERT_TRUE(piece->projectTo(epsg("3857"), overlapping, &view, true));
    EXPECT_NEAR(overlapping[0]->rasterGeometry()->bounds().minx, -kHalfWorld, 1);

    // In lon/lat the period is 360 degrees, also without warping.
    std::vector<VxRef<VxFeature>> same;
    view.targetArea = VxRect(175, -5, 185, 5);
    ASSERT_TRUE(piece->projectTo(VxCrs::wgs84LongLat(), same, &view, true));
    EXPECT_DOUBLE_EQ(same[0]->rasterGeometry()->bounds().minx, 180);
    EXPECT_DOUBLE_EQ(same[0]->rasterGeometry()->bounds().maxx, 190);
}

TEST(Feature, SameSystemSharesTheRasterButNotTheBounds) {
    auto f = featureOf(gradient(4, 4), VxRect(0, 0, 4, 4), VxCrs::wgs84LongLat());
    std::vector<VxRef<VxFeature>> out;
    ASSERT_TRUE(f->projectTo(VxCrs::wgs84LongLat(), out, nullptr, true));
    ASSERT_TRUE(f->projectTo(VxCrs::fromAuthorityAndCode("CRS", "84"), out, nullptr, true));
    ASSERT_EQ(out.size(), 2u);
    for (const auto& p : out) {
        EXPECT_EQ(p->rasterGeometry()->raster().get(), f->rasterGeometry()->raster().get());
        EXPECT_EQ(p->rasterGeometry()->bounds(), f->rasterGeometry()->bounds());
    }
    out[0]->move(10, 20);
    EXPECT_EQ(out[0]->rasterGeometry()->bounds(), VxRect(10, 20, 14, 24));
    EXPECT_EQ(f->rasterGeometry()->bounds(), VxRect(0, 0, 4, 4));
}

TEST(Feature, FailureAppendsNothing) {
    std::vector<VxRef<VxFeature>> out;
    auto empty = featureOf(gradient(4, 4), VxRect(), VxCrs::wgs84LongLat());
    EXPECT_FALSE(empty->projectTo(epsg("3857"), out, nullptr, true));
    auto f = featureOf(gradient(4, 4), VxRect(0, 0, 1, 1), VxCrs::wgs84LongLat());
    EXPECT_FALSE(f->projectTo(nullptr, out, nullptr, true));
    auto noRaster = vxMake<VxFeature>(vxMake<VxRasterGeometry>(nullptr, VxRect(0, 0, 1, 1)),
                                      VxCrs::wgs84LongLat());
    EXPECT_FALSE(noRaster->projectTo(epsg("3857"), out, nullptr, true));
    EXPECT_TRUE(out.empty());
}

TEST(Feature, PaletteRastersKeepTheirPaletteAndMarkOutsideTransparent) {
    auto pal = vxMake<VxPalette>(std::vector<VxColor>{VxColor(255, 0, 0), VxColor(0, 0, 255)});
    auto src = vxMake<VxRaster>(64, 64, VxRasterFormat::Palette8, pal);
    for (int y = 0; y < 64; ++y)
        for (int x = 0; x < 64; ++x) src->setSample(x, y, 0, ((x / 8) + (y / 8)) % 2);
    // Lambert equal area over Europe: a lon/lat rectangle becomes a curved shape, so the
    // corners of the result lie outside the source.
    auto f = featureOf(src, VxRect(0, 40, 30, 60), VxCrs::wgs84LongLat());
    std::vector<VxRef<VxFeature>> out;
    ASSERT_TRUE(f->projectTo(epsg("3035"), out, nullptr, true));
    ASSERT_EQ(out.size(), 1u);
    const VxRaster& r = *out[0]->rasterGeometry()->raster();
    ASSERT_EQ(r.format(), VxRasterFormat::Palette8);
    ASSERT_EQ(r.palette()->size(), 3);
    EXPECT_EQ(r.palette()->getColor(0), VxColor(255, 0, 0));
    EXPECT_EQ(r.palette()->getColor(1), VxColor(0, 0, 255));
    EXPECT_EQ(r.palette()->getColor(2).a, 0);
    EXPECT_EQ(pal->size(), 2);  // the source's palette is left alone
    EXPECT_EQ(r.sample(0, 0), 2);
    EXPECT_EQ(r.sample(r.width() - 1, 0), 2);
    const int centre = static_cast<int>(r.sample(r.width() / 2, r.height() / 2));
    EXPECT_TRUE(centre == 0 || centre == 1);
    int counts[3] = {0, 0, 0};
    for (int y = 0; y < r.height(); ++y)
        for (int x = 0; x < r.width(); ++x) counts[static_cast<int>(r.sample(x, y))]++;
    EXPECT_GT(counts[0], 1000);
    EXPECT_GT(counts[1], 1000);

    // A palette that already has a transparent entry lends it.
    auto withClear = vxMake<VxPalette>(std::vector<VxColor>{VxColor(1, 2, 3, 0), VxColor(0, 255, 0)});
    auto src2 = vxMake<VxRaster>(16, 16, VxRasterFormat::Palette8, withClear);
    src2->clear(1, 0, 0, 0);
    for (int y = 0; y < 16; ++y)
        for (int x = 0; x < 16; ++x) src2->setSample(x, y, 0, 1);
    std::vector<VxRef<VxFeature>> out2;
    ASSERT_TRUE(featureOf(src2, VxRect(0, 40, 30, 60), VxCrs::wgs84LongLat())->projectTo(epsg("3035"), out2, nullptr, true));
    const VxRaster& r2 = *out2[0]->rasterGeometry()->raster();
    EXPECT_EQ(r2.palette().get(), withClear.get());
    EXPECT_EQ(r2.sample(0, 0), 0);
    EXPECT_EQ(r2.sample(8, 8), 1);
}

TEST(Feature, DataRastersKeepTheirSampleTypeAndSampleWhereProjSays) {
    // Each value names its source pixel: column * 256 + row.
    const int n = 256;
    auto src = vxMake<VxRaster>(n, n, VxSampleType::Float32, 1);
    for (int y = 0; y < n; ++y)
        for (int x = 0; x < n; ++x) src->setSample(x, y, 0, x * n + y);
    const VxRect bounds(0, 40, 30, 60);
    auto f = featureOf(src, bounds, VxCrs::wgs84LongLat());
    std::vector<VxRef<VxFeature>> out;
    ASSERT_TRUE(f->projectTo(epsg("3035"), out, nullptr, true));
    const VxRaster& r = *out[0]->rasterGeometry()->raster();
    const VxRect& b = out[0]->rasterGeometry()->bounds();
    ASSERT_EQ(r.format(), VxRasterFormat::Float32);
    EXPECT_TRUE(std::isnan(r.sample(0, 0)));  // outside: no value, drawn transparent

    // Compare with PROJ asked for every pixel: the approximation may move a sample by up to
    // an eighth of a pixel.
    std::vector<double> wx, wy;
    std::vector<std::pair<int, int>> at;
    for (int y = 0; y < r.height(); y += 3)
        for (int x = 0; x < r.width(); ++x) {
            at.emplace_back(x, y);
            wx.push_back(b.minx + (x + 0.5) * b.width() / r.width());
            wy.push_back(b.maxy - (y + 0.5) * b.height() / r.height());
        }
    ASSERT_TRUE(epsg("3035")->transform(VxCrs::wgs84LongLat(), wx.data(), wy.data(), wx.size()));
    int inside = 0, off = 0;
    for (size_t k = 0; k < at.size(); ++k) {
        const double u = (wx[k] - bounds.minx) / bounds.width() * n;
        const double v = (bounds.maxy - wy[k]) / bounds.height() * n;
        const double value = r.sample(at[k].first, at[k].second);
        const bool in = u >= 0 && u < n && v >= 0 && v < n;
        if (std::fabs(u - std::round(u)) > 0.2 && std::fabs(v - std::round(v)) > 0.2) {
            ASSERT_EQ(in, !std::isnan(value)) << at[k].first << "," << at[k].second;
        }
        if (!in || std::isnan(value)) continue;
        ++inside;
        const int sx = static_cast<int>(value) / n, sy = static_cast<int>(value) % n;
        // A different pixel only where the exact point lies within the allowed error of
        // that pixel's border.
        auto distance = [](double c, int cell) { return std::max({0.0, cell - c, c - (cell + 1)}); };
        ASSERT_LE(distance(u, sx), 0.13) << at[k].first << "," << at[k].second << " u " << u << " got " << sx;
        ASSERT_LE(distance(v, sy), 0.13) << at[k].first << "," << at[k].second << " v " << v << " got " << sy;
        if (sx != static_cast<int>(u) || sy != static_cast<int>(v)) ++off;
    }
    EXPECT_GT(inside, static_cast<int>(at.size()) / 2);
    EXPECT_LT(off, inside / 10);
}

TEST(Feature, ClipKeepsWholePixelsInside) {
    auto f = featureOf(gradient(10, 10), VxRect(0, 0, 100, 100), VxCrs::wgs84LongLat());
    auto part = f->clipByRect(VxRect(25, 0, 60, 30));
    ASSERT_TRUE(part);
    const VxRaster& r = *part->rasterGeometry()->raster();
    EXPECT_EQ(part->rasterGeometry()->bounds(), VxRect(20, 0, 60, 30));
    ASSERT_EQ(r.width(), 4);
    ASSERT_EQ(r.height(), 3);
    // Top-left of the part is source column 2, row 7.
    EXPECT_EQ(r.color(0, 0), f->rasterGeometry()->raster()->color(2, 7));
    EXPECT_EQ(r.color(3, 2), f->rasterGeometry()->raster()->color(5, 9));
    EXPECT_FALSE(f->clipByRect(VxRect(200, 200, 300, 300)));
    auto whole = f->clipByRect(VxRect(-50, -50, 150, 150));
    ASSERT_TRUE(whole);
    EXPECT_EQ(whole->rasterGeometry()->raster().get(), f->rasterGeometry()->raster().get());
}

TEST(Feature, IdsAreUniqueAcrossThreads) {
    std::vector<std::vector<uint64_t>> got(4);
    std::vector<std::thread> threads;
    for (auto& g : got)
        threads.emplace_back([&g] { for (int i = 0; i < 1000; ++i) g.push_back(VxId::next().value); });
    for (auto& t : threads) t.join();
    std::set<uint64_t> all;
    for (const auto& g : got) all.insert(g.begin(), g.end());
    EXPECT_EQ(all.size(), 4000u);
    EXPECT_EQ(all.count(0), 0u);
}
