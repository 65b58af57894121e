// WMS maps drawn through the real layer from MapServer on loopback.
#include <gtest/gtest.h>

#include <cstdlib>

#include "ogc/errors.h"
#include "ogc/ogcwmslayer.h"
#include "sample_services.h"
#include "vx/mapview.h"
#include "vx/runtime.h"

namespace {

struct Events {
    std::vector<std::string> messages;
    Events() {
        VxRuntime::errorEvent().setHandler(0, [this](VxEngineObject*, const VxErrorEventArgs& a) {
            messages.push_back(a.message.str());
        });
    }
    ~Events() { VxRuntime::errorEvent().setHandler(0, nullptr); }
};

VxRef<VxOgcWmsLayer> wms(const std::string& path, std::vector<VxString> layers = {}, bool throws = true,
                         bool buffered = false) {
    VxOgcWmsLayerParams p;
    p.url = VxString(SampleServices::url(path));
    if (!layers.empty()) p.explicitLayers = layers;
    p.throwExceptions = throws;
    p.buffered = buffered;
    VxRef<VxOgcWmsLayer> l(new VxOgcWmsLayer(p));
    l->initialize(false);
    return l;
}

struct Drawn {
    VxRef<VxCanvas> canvas;
    size_t nodes = 0;
};

Drawn draw(VxOgcWmsLayer& l, const char* crs, const VxRect& area, int w, int h, const char* png = nullptr) {
    Drawn d;
    d.canvas = new VxCanvas(w, h);
    VxMapView view(VxCrs::fromUrn(crs), area, w, h);
    d.nodes = view.drawWithNodes({VxRef<VxLayer>(&l)}, *d.canvas);
    // Kept for a person to look at: build/tests/*.png
    if (png) d.canvas->writePng(png);
    return d;
}

std::vector<std::string> getMaps() {
    std::vector<std::string> out;
    for (const std::string& r : SampleServices::requestLog())
        if (r.find("REQUEST=GetMap") != std::string::npos) out.push_back(r);
    return out;
}

bool near(const VxColor& c, int r, int g, int b, int tolerance = 6) {
    return std::abs(c.r - r) <= tolerance && std::abs(c.g - g) <= tolerance && std::abs(c.b - b) <= tolerance &&
           c.a > 200;
}

class WmsDrawing : public SampleServicesTest {};

}  // namespace

// A city at lon 10, lat 50 must land on its pixel whatever the protocol's axis order.
TEST_F(WmsDrawing, AxisOrderOfBothVersionsPutsTheCityOnItsPixel) {
    for (const char* path : {"/wms", "/wms111"}) {
        SCOPED_TRACE(path);
        SampleServices::resetStats();
        auto l = wms(path, {"cities"});
        EXPECT_EQ(l->capabilities()->version, std::string(path) == "/wms" ? 1 : 0);
        Drawn d = draw(*l, "EPSG:4326", VxRect(0, 40, 20, 60), 200, 200,
                       std::string(path) == "/wms" ? "wms130-cities-4326.png" : "wms111-cities-4326.png");
        EXPECT_EQ(d.nodes, 1u);
        EXPECT_TRUE(near(d.canvas->pixel(100, 100), 0, 0, 255)) << "Centropolis missing at (100,100)";
        EXPECT_EQ(d.canvas->pixel(30, 160).a, 0);
        auto maps = getMaps();
        ASSERT_EQ(maps.size(), 1u);
        EXPECT_NE(maps[0].find(std::string(path) == "/wms" ? "BBOX=40.000000,0.000000,60.000000,20.000000"
                                                           : "BBOX=0.000000,40.000000,20.000000,60.000000"),
                  std::string::npos)
            << maps[0];
    }
}

TEST_F(WmsDrawing, ServiceWithoutTheViewCrsIsReprojected) {
    SampleServices::resetStats();
    auto l = wms("/wms4326", {"rgb4326"});
    // lon 0..20, lat 40..50 in Web Mercator.
    const VxRect area(0, 4865942.279503176, 2226389.8158654715, 6446275.841017158);
    Drawn d = draw(*l, "EPSG:3857", area, 200, 150, "wms4326-rgb-3857.png");
    ASSERT_EQ(d.nodes, 1u);
    auto maps = getMaps();
    ASSERT_EQ(maps.size(), 1u);
    EXPECT_NE(maps[0].find("CRS=EPSG:4326"), std::string::npos);
    // Source pixel (col 57, row 33) is (57, 66, 198): lon 5.75, lat 46.65 at its centre.
    double x = 5.75, y = 46.65;
    VxCrs::wgs84LongLat()->transform(VxCrs::fromUrn("EPSG:3857"), &x, &y, 1);
    const int px = static_cast<int>((x - area.minx) / area.width() * 200);
    const int py = static_cast<int>((area.maxy - y) / area.height() * 150);
    EXPECT_TRUE(near(d.canvas->pixel(px, py), 57, 66, 198, 12))
        << int(d.canvas->pixel(px, py).r) << "," << int(d.canvas->pixel(px, py).g) << ","
        << int(d.canvas->pixel(px, py).b);
}

TEST_F(WmsDrawing, WebMercatorViewAcrossTheAntimeridianTakesTwoRequests) {
    SampleServices::resetStats();
    auto l = wms("/wms4326", {"dateline4326"});
    const double x170 = 18924313.434856508, x190 = 21150703.250722975, y20 = 2273030.926987689;
    Drawn d = draw(*l, "EPSG:3857", VxRect(x170, -y20, x190, y20), 200, 200, "wms4326-dateline-3857.png");
    EXPECT_EQ(d.nodes, 2u);
    auto maps = getMaps();
    ASSERT_EQ(maps.size(), 2u);
    EXPECT_NE(maps[0].find(",-180.000000,"), std::string::npos) << maps[0];  // the second piece first
    EXPECT_NE(maps[1].find(",170.000000,"), std::string::npos) << maps[1];
    // Dateland covers the whole view on both sides of the seam.
    EXPECT_TRUE(near(d.canvas->pixel(50, 100), 230, 180, 40));
    EXPECT_TRUE(near(d.canvas->pixel(150, 100), 230, 180, 40));
}

TEST_F(WmsDrawing, GroupsMergeUntilALeafIsDisabledAndExplicitLayersAreListed) {
    SampleServices::resetStats();
    auto l = wms("/wms");
    const VxRect world(-20037508.34, -15000000, 20037508.34, 15000000);
    draw(*l, "EPSG:3857", world, 800, 600, "wms130-world-3857.png");
    l->findLayerByUniqueName("roads")->enabled(false);
    draw(*l, "EPSG:3857", world, 800, 600);
    auto maps = getMaps();
    ASSERT_EQ(maps.size(), 2u);
    EXPECT_NE(maps[0].find("LAYERS=world&"), std::string::npos) << maps[0];
    EXPECT_NE(maps[1].find("LAYERS=countries,overlays,rgb,elevation&"), std::string::npos) << maps[1];

    SampleServices::resetStats();
    auto e = wms("/wms", {"roads", "cities"});
    Drawn d = draw(*e, "EPSG:4326", VxRect(0, 40, 20, 60), 200, 200);
    maps = getMaps();
    ASSERT_EQ(maps.size(), 1u);
    EXPECT_NE(maps[0].find("LAYERS=roads,cities&"), std::string::npos) << maps[0];
    // Meridian Road (orange) runs along lon 10 north of 40: column 100 at lat 55.
    EXPECT_TRUE(near(d.canvas->pixel(100, 50), 255, 140, 0, 20));
}

TEST_F(WmsDrawing, OversizedViewIsRefusedWithoutARequest) {
    SampleServices::resetStats();
    Events events;
    auto l = wms("/wms", {"cities"}, false);
    draw(*l, "EPSG:4326", VxRect(-180, -90, 180, 90), 3000, 100);
    EXPECT_TRUE(getMaps().empty());
    ASSERT_EQ(events.messages.size(), 1u);
    EXPECT_EQ(events.messages[0],
              "Requested image size is too large. Consider putting the OgcWmsLayer into a TileLayer.");
    auto loud = wms("/wms", {"cities"}, true);
    EXPECT_THROW(draw(*loud, "EPSG:4326", VxRect(-180, -90, 180, 90), 3000, 100), VxXOgcError);
}

TEST_F(WmsDrawing, ServiceExceptionInBothModes) {
    // A style the server does not have makes MapServer answer with an exception.
    for (const char* path : {"/wms", "/wms111"}) {
        SCOPED_TRACE(path);
        Events events;
        auto quiet = wms(path, {"countries"}, false);
        quiet->getChildLayer(0)->style("nosuchstyle");
        Drawn d = draw(*quiet, "EPSG:4326", VxRect(0, 40, 20, 60), 100, 100);
        EXPECT_EQ(d.nodes, 0u);
        ASSERT_EQ(events.messages.size(), 1u);
        if (std::string(path) == "/wms") {  // 1.3.0: text/xml, read as a service exception
            EXPECT_EQ(events.messages[0].rfind("Service exception: ", 0), 0u) << events.messages[0];
            EXPECT_NE(events.messages[0].find("nosuchstyle"), std::string::npos);
        } else {  // 1.1.1: the exception content type fails the exchange
            EXPECT_EQ(events.messages[0], "Failed to get map image from WMS service.");
        }
        auto loud = wms(path, {"countries"}, true);
        loud->getChildLayer(0)->style("nosuchstyle");
        if (std::string(path) == "/wms") {
            EXPECT_THROW(draw(*loud, "EPSG:4326", VxRect(0, 40, 20, 60), 100, 100), VxXOgcError);
        } else {
            EXPECT_THROW(draw(*loud, "EPSG:4326", VxRect(0, 40, 20, 60), 100, 100), VxXRequestError);
        }
    }
}

TEST_F(WmsDrawing, BufferingCountsRequests) {
    for (bool buffered : {true, false}) {
        SCOPED_TRACE(buffered);
        auto l = wms("/wms", {"countries"}, true, buffered);
        SampleServices::resetStats();
        for (int i = 0; i < 3; ++i) draw(*l, "EPSG:4326", VxRect(0, 40, 20, 60), 100, 100);
        EXPECT_EQ(getMaps().size(), buffered ? 1u : 3u);
        draw(*l, "EPSG:4326", VxRect(1, 40, 21, 60), 100, 100);  // pan
        EXPECT_EQ(getMaps().size(), buffered ? 2u : 4u);
    }
}
