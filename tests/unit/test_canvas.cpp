#include <gtest/gtest.h>

#include <cstdio>
#include <fstream>
#include <iterator>
#include <sstream>
#include <string>
#include <unistd.h>

#include "vx/canvas.h"
#include "vx/imagehandler.h"

namespace {
bool near(const VxColor& a, const VxColor& b, int tol = 1) {
    return std::abs(a.r - b.r) <= tol && std::abs(a.g - b.g) <= tol && std::abs(a.b - b.b) <= tol &&
           std::abs(a.a - b.a) <= tol;
}

VxRef<VxRaster> quad() {
    // 2x2: red, green / blue, white; top row first.
    auto r = vxMake<VxRaster>(2, 2, VxRasterFormat::RGBA8);
    r->setColor(0, 0, VxColor(255, 0, 0));
    r->setColor(1, 0, VxColor(0, 255, 0));
    r->setColor(0, 1, VxColor(0, 0, 255));
    r->setColor(1, 1, VxColor(255, 255, 255));
    return r;
}
}  // namespace

TEST(Canvas, BlendsSourceOverWithStraightAlpha) {
    VxCanvas c(2, 1, VxColor(0, 0, 255, 255));
    c.blendPixel(0, 0, VxColor(255, 0, 0, 128));
    EXPECT_TRUE(near(c.pixel(0, 0), VxColor(128, 0, 127, 255))) << int(c.pixel(0, 0).r) << "," << int(c.pixel(0, 0).b);
    c.setPixel(1, 0, VxColor(0, 0, 0, 0));
    c.blendPixel(1, 0, VxColor(255, 0, 0, 128));
    // Over nothing, the colour stays unchanged rather than darkening.
    EXPECT_EQ(c.pixel(1, 0), VxColor(255, 0, 0, 128));
    c.blendPixel(1, 0, VxColor(0, 255, 0, 0));
    EXPECT_EQ(c.pixel(1, 0), VxColor(255, 0, 0, 128));
    c.blendPixel(5, 5, VxColor(1, 2, 3));  // outside: ignored
}

TEST(Canvas, DrawsRasterWhereTheTransformPutsIt) {
    VxCanvas c(100, 100, VxColor(0, 0, 0, 0));
    const VxTransform2 t = VxTransform2::fromView(VxRect(1000, 2000, 1200, 2200), 100, 100);  // 2 units a pixel
    // World x 1040..1080, y 2120..2160 -> columns 20..39, rows 20..39.
    c.drawRaster(*quad(), VxRect(1040, 2120, 1080, 2160), t, VxCanvas::Filter::Nearest);
    EXPECT_EQ(c.pixel(20, 20), VxColor(255, 0, 0));
    EXPECT_EQ(c.pixel(29, 29), VxColor(255, 0, 0));
    EXPECT_EQ(c.pixel(30, 20), VxColor(0, 255, 0));
    EXPECT_EQ(c.pixel(20, 30), VxColor(0, 0, 255));
    EXPECT_EQ(c.pixel(39, 39), VxColor(255, 255, 255));
    for (auto p : {std::make_pair(19, 25), std::make_pair(40, 25), std::make_pair(25, 19), std::make_pair(25, 40)})
        EXPECT_EQ(c.pixel(p.first, p.second).a, 0) << p.first << "," << p.second;

    // Bilinear: block centres keep their colour, the seam between red and green mixes them.
    VxCanvas b(100, 100, VxColor(0, 0, 0, 0));
    b.drawRaster(*quad(), VxRect(1040, 2120, 1080, 2160), t, VxCanvas::Filter::Bilinear);
    EXPECT_EQ(b.pixel(22, 22), VxColor(255, 0, 0));
    VxColor seam = b.pixel(29, 22);
    EXPECT_GT(seam.r, 100);
    EXPECT_GT(seam.g, 20);
    EXPECT_EQ(seam.a, 255);
    EXPECT_EQ(b.pixel(40, 25).a, 0);
}

TEST(Canvas, PaletteRasterShowsThroughTransparentEntries) {
    auto pal = vxMake<VxPalette>(std::vector<VxColor>{VxColor(0, 0, 0, 0), VxColor(255, 255, 0, 255)});
    auto r = vxMake<VxRaster>(2, 1, VxRasterFormat::Palette8, pal);
    r->setSample(1, 0, 0, 1);
    VxCanvas c(4, 2, VxColor(0, 0, 255, 255));
    c.drawRaster(*r, VxRect(0, 0, 4, 2), VxTransform2::fromView(VxRect(0, 0, 4, 2), 4, 2), VxCanvas::Filter::Nearest);
    EXPECT_EQ(c.pixel(0, 0), VxColor(0, 0, 255, 255));
    EXPECT_EQ(c.pixel(1, 1), VxColor(0, 0, 255, 255));
    EXPECT_EQ(c.pixel(2, 0), VxColor(255, 255, 0, 255));
    EXPECT_EQ(c.pixel(3, 1), VxColor(255, 255, 0, 255));
}

TEST(Canvas, PngWriteAndReadBack) {
    VxCanvas c(30, 20, VxColor(10, 20, 30, 255));
    c.drawRaster(*quad(), VxRect(0, 0, 10, 10), VxTransform2::fromView(VxRect(0, 0, 30, 20), 30, 20));
    c.blendPixel(29, 19, VxColor(200, 0, 0, 100));
    const std::string path = ::testing::TempDir() + "canvas_" + std::to_string(::getpid()) + ".png";
    ASSERT_TRUE(c.writePng(path));
    std::ifstream f(path, std::ios::binary);
    auto g = VxImageHandler::streamIn("png", nullptr, f);
    f.close();
    std::remove(path.c_str());
    ASSERT_TRUE(g);
    const VxRaster& r = *g->raster();
    ASSERT_EQ(r.width(), 30);
    ASSERT_EQ(r.height(), 20);
    for (int y = 0; y < 20; ++y)
        for (int x = 0; x < 30; ++x) ASSERT_EQ(r.color(x, y), c.pixel(x, y)) << x << "," << y;
    EXPECT_FALSE(c.writePng("/nonexistent-dir/x.png"));
}
