#include <gtest/gtest.h>

#include <cmath>
#include <thread>
#include <vector>

#include "vx/rastervis.h"

namespace {
bool near(const VxColor& a, const VxColor& b, int tol = 1) {
    return std::abs(a.r - b.r) <= tol && std::abs(a.g - b.g) <= tol && std::abs(a.b - b.b) <= tol &&
           std::abs(a.a - b.a) <= tol;
}

VxRef<VxFeature> featureOf(const VxRef<VxRaster>& r, const VxRect& b) {
    return vxMake<VxFeature>(vxMake<VxRasterGeometry>(r, b), VxCrs::wgs84LongLat(), VxId::next());
}

// A 100 x 100 canvas showing world (0, 0)..(100, 100), one unit a pixel.
VxSGRenderState2 viewState(const VxRect& clip = VxRect(), double value = 0) {
    const VxRect area(0, 0, 100, 100);
    return VxSGRenderState2(VxTransform2::fromView(area, 100, 100), area, clip, value);
}

// The table a layer makes of a palette: an entry repeating the colour added last is left out.
VxRef<VxKeyedAttributeVariable> tableOf(const VxPalette& pal) {
    auto table = vxMake<VxKeyValueTable>();
    VxColor last;
    for (int i = 0; i < pal.size(); ++i) {
        if (i > 0 && pal.getColor(i) == last) continue;
        table->add(i, pal.getColor(i));
        last = pal.getColor(i);
    }
    return vxMake<VxKeyedAttributeVariable>(0, table, nullptr);
}

const VxColor kRed(255, 0, 0), kGreen(0, 255, 0), kBlue(0, 0, 255), kWhite(255, 255, 255);
}  // namespace

TEST(RasterVis, RgbVisDrawsTheRasterWithItsOpacity) {
    auto raster = vxMake<VxRaster>(2, 1, VxRasterFormat::RGBA8);
    raster->setColor(0, 0, kRed);
    raster->setColor(1, 0, VxColor(0, 0, 255, 0));
    auto f = featureOf(raster, VxRect(20, 40, 60, 60));  // columns 20..59, rows 40..59

    auto opaque = VxRasterVis::createRGBVis(nullptr, 255, 0);
    auto node = opaque->createPresentation2(f, VxCreatePresParams());
    ASSERT_TRUE(node);
    VxCanvas canvas(100, 100, kWhite);
    node->draw(canvas, viewState());
    EXPECT_EQ(canvas.pixel(20, 40), kRed);
    EXPECT_EQ(canvas.pixel(39, 59), kRed);
    EXPECT_EQ(canvas.pixel(40, 50), kWhite);  // transparent half
    EXPECT_EQ(canvas.pixel(19, 50), kWhite);
    EXPECT_EQ(canvas.pixel(30, 39), kWhite);

    auto half = VxRasterVis::createRGBVis(nullptr, 128, 1);
    VxCanvas c2(100, 100, kWhite);
    half->createPresentation2(f, VxCreatePresParams())->draw(c2, viewState());
    EXPECT_TRUE(near(c2.pixel(25, 45), VxColor(255, 127, 127, 255)));
    EXPECT_EQ(c2.pixel(19, 50), kWhite);

    // A render state's opacity reduction adds to the visualizer's.
    VxCanvas c3(100, 100, kWhite);
    node->draw(c3, viewState(VxRect(), 0.5));
    EXPECT_TRUE(near(c3.pixel(25, 45), VxColor(255, 127, 127, 255)));
    EXPECT_FALSE(opaque->createPresentation2(nullptr, VxCreatePresParams()));
}

TEST(RasterVis, ClipLimitsWhatIsDrawn) {
    auto raster = vxMake<VxRaster>(4, 4, VxRasterFormat::RGBA8);
    raster->clear(0, 255, 0, 255);
    auto node = VxRasterVis::createRGBVis(nullptr, 255, 1)->createPresentation2(
        featureOf(raster, VxRect(0, 0, 100, 100)), VxCreatePresParams());
    VxCanvas canvas(100, 100);
    node->draw(canvas, viewState(VxRect(10, 70, 30, 90)));  // columns 10..29, rows 10..29
    EXPECT_EQ(canvas.pixel(10, 10), kGreen);
    EXPECT_EQ(canvas.pixel(29, 29), kGreen);
    EXPECT_EQ(canvas.pixel(9, 15).a, 0);
    EXPECT_EQ(canvas.pixel(30, 15).a, 0);
    EXPECT_EQ(canvas.pixel(15, 9).a, 0);
    EXPECT_EQ(canvas.pixel(15, 30).a, 0);
    EXPECT_EQ(canvas.pixel(50, 50).a, 0);
}

TEST(RasterVis, ColorTableCoversRepeatedColoursAndLeavesTheRestTransparent) {
    // Indices 0 and 1 share red, so the table holds 0: red, 2: green, 3: blue.
    auto pal = vxMake<VxPalette>(std::vector<VxColor>{kRed, kRed, kGreen, kBlue});
    auto colors = tableOf(*pal);
    ASSERT_EQ(colors->table->size(), 3u);
    auto raster = vxMake<VxRaster>(4, 1, VxRasterFormat::Palette8, pal);
    for (int i = 0; i < 4; ++i) raster->setSample(i, 0, 0, i);
    auto f = featureOf(raster, VxRect(0, 90, 40, 100));  // ten columns per pixel, rows 0..9

    auto vis = VxRasterVis::createFromColorTable(colors);
    ASSERT_TRUE(vis);
    VxCanvas canvas(100, 100);
    vis->createPresentation2(f, VxCreatePresParams())->draw(canvas, viewState());
    EXPECT_EQ(canvas.pixel(5, 5), kRed);
    EXPECT_EQ(canvas.pixel(15, 5), kRed);
    // Class colours are not blended with their neighbours.
    EXPECT_EQ(canvas.pixel(19, 5), kRed);
    EXPECT_EQ(canvas.pixel(20, 5), kGreen);
    EXPECT_EQ(canvas.pixel(35, 5), kBlue);
    EXPECT_EQ(canvas.pixel(45, 5).a, 0);

    // Values below the first key have no colour, unless the variable gives a default.
    auto sparse = vxMake<VxKeyValueTable>();
    sparse->add(2, kGreen);
    VxCanvas c2(100, 100);
    VxRasterVis::createFromColorTable(vxMake<VxKeyedAttributeVariable>(0, sparse, nullptr))
        ->createPresentation2(f, VxCreatePresParams())->draw(c2, viewState());
    EXPECT_EQ(c2.pixel(5, 5).a, 0);
    EXPECT_EQ(c2.pixel(15, 5).a, 0);
    EXPECT_EQ(c2.pixel(25, 5), kGreen);
    EXPECT_EQ(c2.pixel(35, 5), kGreen);
    VxCanvas c3(100, 100);
    VxRasterVis::createFromColorTable(vxMake<VxKeyedAttributeVariable>(0, sparse, &kWhite))
        ->createPresentation2(f, VxCreatePresParams())->draw(c3, viewState());
    EXPECT_EQ(c3.pixel(5, 5), kWhite);
    EXPECT_EQ(c3.pixel(25, 5), kGreen);
}

TEST(RasterVis, ColorTableOnDataValuesAndItsCacheIsShared) {
    auto raster = vxMake<VxRaster>(3, 1, VxSampleType::Float32, 1);
    raster->setSample(0, 0, 0, 0.2);
    raster->setSample(1, 0, 0, 1.3);
    raster->setSample(2, 0, 0, std::nan(""));
    auto table = vxMake<VxKeyValueTable>();
    table->add(0, kRed);
    table->add(1, kBlue);
    auto node = VxRasterVis::createFromColorTable(vxMake<VxKeyedAttributeVariable>(0, table, nullptr))
                    ->createPresentation2(featureOf(raster, VxRect(0, 90, 30, 100)), VxCreatePresParams())
                    .cast<VxSGRasterNode2>();
    ASSERT_TRUE(node);
    VxCanvas canvas(100, 100);
    node->draw(canvas, viewState());
    EXPECT_EQ(canvas.pixel(5, 5), kRed);
    EXPECT_EQ(canvas.pixel(15, 5), kBlue);
    EXPECT_EQ(canvas.pixel(25, 5).a, 0);

    // Built once, whoever asks first.
    std::vector<VxRef<VxRaster>> seen(4);
    std::vector<std::thread> threads;
    for (auto& s : seen) threads.emplace_back([&s, &node] { s = node->coloredRaster(); });
    for (auto& t : threads) t.join();
    for (const auto& s : seen) EXPECT_EQ(s.get(), seen[0].get());
    EXPECT_EQ(node->coloredRaster().get(), seen[0].get());
}

TEST(RasterVis, ThreeDimensionalPresentationHoldsTheFeature) {
    auto f = featureOf(vxMake<VxRaster>(1, 1, VxRasterFormat::RGBA8), VxRect(0, 0, 1, 1));
    auto node = VxRasterVis::createRGBVis(nullptr, 255, 1)->createPresentation3(f, VxCreatePresParams());
    auto holder = node.cast<VxSGFeatureNode3>();
    ASSERT_TRUE(holder);
    EXPECT_EQ(holder->feature.get(), f.get());
    EXPECT_FALSE(VxRasterVis::createRGBVis(nullptr, 255, 1)->createPresentation3(nullptr, VxCreatePresParams()));
}
