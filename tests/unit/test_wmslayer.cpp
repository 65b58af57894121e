#include <gtest/gtest.h>

#include <atomic>

#include "ogc/errors.h"
#include "ogc/ogcwmslayer.h"
#include "support/logcapture.h"
#include "support/loopback_server.h"

namespace {

std::string caps130(const std::string& formats, const std::string& layers, const std::string& service = "") {
    return "<WMS_Capabilities version=\"1.3.0\" xmlns=\"http://www.opengis.net/wms\" "
           "xmlns:xlink=\"http://www.w3.org/1999/xlink\"><Service><Name>WMS</Name>" + service +
           "</Service><Capability><Request><GetMap>" + formats +
           "<DCPType><HTTP><Get><OnlineResource xlink:href=\"http://127.0.0.1:1/map?\"/></Get></HTTP></DCPType>"
           "</GetMap></Request>" + layers + "</Capability></WMS_Capabilities>";
}

std::string caps111(const std::string& formats, const std::string& layers) {
    return "<WMT_MS_Capabilities version=\"1.1.1\"><Service><Name>OGC:WMS</Name></Service><Capability><Request>"
           "<GetMap>" + formats +
           "<DCPType><HTTP><Get><OnlineResource xmlns:xlink=\"http://www.w3.org/1999/xlink\" "
           "xlink:href=\"http://127.0.0.1:1/map?\"/></Get></HTTP></DCPType></GetMap></Request>" + layers +
           "</Capability></WMT_MS_Capabilities>";
}

const char* kPng = "<Format>image/png</Format>";
const char* kRoads =
    "<Layer><Title>root</Title><CRS>EPSG:4326</CRS><CRS>EPSG:3857</CRS><Layer><Name>roads</Name></Layer></Layer>";

// One loopback service whose capabilities document the test chooses.
struct CapsServer {
    LoopbackServer srv;
    std::string doc;
    std::atomic<int> capabilityRequests{0};
    CapsServer() {
        srv.on("/wms", [this](const httplib::Request&, httplib::Response& res) {
            ++capabilityRequests;
            res.set_content(doc, "text/xml");
        });
    }
    VxRef<VxOgcWmsLayer> layer(const std::string& document, VxOgcWmsLayerParams p = VxOgcWmsLayerParams()) {
        doc = document;
        p.url = VxString(srv.url("/wms"));
        VxRef<VxOgcWmsLayer> l(new VxOgcWmsLayer(p));
        l->initialize(false);
        return l;
    }
};

VxString request(VxOgcWmsLayer& l, const VxRect& bounds, const char* crs = "EPSG:4326", double scale = 1000) {
    return l.buildRequest(256, 256, scale, bounds, VxCrs::fromUrn(crs));
}

}  // namespace

TEST(WmsLayerRequest, ExactGetMapQueryForBothVersions) {
    CapsServer s;
    auto l130 = s.layer(caps130(kPng, kRoads));
    EXPECT_EQ(request(*l130, VxRect(10, 55, 20, 60)),
              "VERSION=1.3.0&REQUEST=GetMap&CRS=EPSG:4326&BBOX=55.000000,10.000000,60.000000,20.000000"
              "&width=256&height=256&LAYERS=roads&STYLES=&FORMAT=image/png&TRANSPARENT=TRUE");
    // Web Mercator keeps x, y order; CRS:84 is named by its own authority.
    EXPECT_EQ(request(*l130, VxRect(0, 0, 1000000, 1000000), "EPSG:3857").str().substr(0, 102),
              "VERSION=1.3.0&REQUEST=GetMap&CRS=EPSG:3857&BBOX=0.000000,0.000000,1000000.000000,1000000.000000&width=");
    EXPECT_NE(request(*l130, VxRect(10, 55, 20, 60), "CRS:84").str().find("&CRS=CRS:84&BBOX=10.000000,55.0"),
              std::string::npos);

    auto l111 = s.layer(caps111(kPng, "<Layer><SRS>EPSG:4326</SRS><Layer><Name>roads</Name></Layer></Layer>"));
    EXPECT_EQ(request(*l111, VxRect(10, 55, 20, 60)),
              "VERSION=1.1.1&REQUEST=GetMap&SRS=EPSG:4326&BBOX=10.000000,55.000000,20.000000,60.000000"
              "&width=256&height=256&LAYERS=roads&STYLES=&FORMAT=image/png&TRANSPARENT=TRUE");
}

TEST(WmsLayerRequest, LayerAndStyleListsMergeGroupsOnlyWhenSound) {
    CapsServer s;
    auto l = s.layer(caps130(kPng,
        "<Layer><CRS>EPSG:4326</CRS><Layer><Name>a</Name></Layer><Layer><Name>b</Name>"
        "<Style><Name>s</Name></Style></Layer></Layer>"));
    l->findLayerByUniqueName("b")->style("s");
    EXPECT_NE(request(*l, VxRect(0, 0, 1, 1)).str().find("&LAYERS=a,b&STYLES=,s&"), std::string::npos);

    // A named group whose leaves all use the default style goes out once, by its name.
    auto g = s.layer(caps130(kPng,
        "<Layer><CRS>EPSG:4326</CRS><Layer><Name>group</Name><Style><Name>gs</Name></Style>"
        "<Layer><Name>x</Name></Layer><Layer><Name>y</Name></Layer></Layer><Layer><Name>z</Name></Layer></Layer>"));
    EXPECT_NE(request(*g, VxRect(0, 0, 1, 1)).str().find("&LAYERS=group,z&STYLES=&"), std::string::npos);
    // The same style, offered by the group, on every leaf: still merged, with that style.
    g->findLayerByUniqueName("x")->style("gs");
    g->findLayerByUniqueName("y")->style("gs");
    EXPECT_NE(request(*g, VxRect(0, 0, 1, 1)).str().find("&LAYERS=group,z&STYLES=gs,&"), std::string::npos);
    // Mixed styles, or a disabled leaf, list the leaves one by one.
    g->findLayerByUniqueName("y")->style("");
    EXPECT_NE(request(*g, VxRect(0, 0, 1, 1)).str().find("&LAYERS=x,y,z&STYLES=gs,,&"), std::string::npos);
    g->findLayerByUniqueName("x")->style("");
    g->findLayerByUniqueName("x")->enabled(false);
    EXPECT_NE(request(*g, VxRect(0, 0, 1, 1)).str().find("&LAYERS=y,z&STYLES=&"), std::string::npos);
}

TEST(WmsLayerRequest, VisibilityByScaleAndArea) {
    CapsServer s;
    VxOgcWmsLayerParams p;
    p.time = VxString("2020-01-01");
    auto l = s.layer(caps130(kPng,
        "<Layer><CRS>EPSG:4326</CRS><EX_GeographicBoundingBox><westBoundLongitude>0</westBoundLongitude>"
        "<southBoundLatitude>0</southBoundLatitude><eastBoundLongitude>10</eastBoundLongitude>"
        "<northBoundLatitude>10</northBoundLatitude></EX_GeographicBoundingBox>"
        "<Layer><Name>near</Name><MaxScaleDenominator>5000</MaxScaleDenominator></Layer>"
        "<Layer><Name>far</Name><MinScaleDenominator>5000</MinScaleDenominator></Layer></Layer>"), p);
    EXPECT_NE(request(*l, VxRect(1, 1, 2, 2), "EPSG:4326", 1000).str().find("&LAYERS=near&"), std::string::npos);
    EXPECT_NE(request(*l, VxRect(1, 1, 2, 2), "EPSG:4326", 5000).str().find("&LAYERS=far&"), std::string::npos);
    // Outside the layers' bounds: nothing to request, TIME or not.
    EXPECT_EQ(request(*l, VxRect(50, 50, 60, 60)), "");
    // The area is compared in geographic coordinates whatever the request CRS.
    EXPECT_NE(request(*l, VxRect(100000, 100000, 200000, 200000), "EPSG:3857", 1000).str().find("&TIME=2020-01-01"),
              std::string::npos);
}

TEST(WmsLayerRequest, FormatBackgroundAndExtraParameters) {
    CapsServer s;
    VxOgcWmsLayerParams p;
    p.transparent = false;
    p.background = VxColor(255, 128, 0, 255);
    p.format = Jpeg;
    p.elevation = VxString("100");
    p.dimensionValues = VxString("DIM_RUN=a b");
    p.vendorSpecificParameters = VxString("map=x");
    auto l = s.layer(caps130("<Format>image/png</Format><Format>image/gif</Format>", kRoads), p);
    const std::string q = request(*l, VxRect(0, 0, 1, 1)).str();
    EXPECT_EQ(q.substr(q.find("&FORMAT=")), "&FORMAT=image/png&BGCOLOR=0xFF8000&ELEVATION=100&DIM_RUN=a b&map=x");

    auto gif = s.layer(caps130("<Format>image/jpeg</Format><Format>image/gif</Format>", kRoads));
    EXPECT_NE(request(*gif, VxRect(0, 0, 1, 1)).str().find("&FORMAT=image/gif&"), std::string::npos);
    VxOgcWmsLayerParams opaque;
    opaque.transparent = false;
    auto jpeg = s.layer(caps130("<Format>image/gif</Format><Format>image/jpeg</Format>", kRoads), opaque);
    EXPECT_NE(request(*jpeg, VxRect(0, 0, 1, 1)).str().find("&FORMAT=image/jpeg&"), std::string::npos);
    VxOgcWmsLayerParams png8;
    png8.format = Png8;
    auto p8 = s.layer(caps130("<Format>image/png</Format><Format>image/png; mode=8bit</Format>", kRoads), png8);
    EXPECT_NE(request(*p8, VxRect(0, 0, 1, 1)).str().find("&FORMAT=image/png; mode=8bit&"), std::string::npos);
}

TEST(WmsLayerInit, CrsSizeLimitsExplicitLayersAndErrors) {
    CapsServer s;
    auto l = s.layer(caps130(kPng, kRoads, "<MaxWidth>1000</MaxWidth><MaxHeight>500</MaxHeight>"));
    EXPECT_EQ(l->selectRequestCrs(VxCrs::fromUrn("EPSG:3857")).get(), VxCrs::fromUrn("EPSG:3857").get());
    // Not listed: the service's default CRS (the first of its list).
    EXPECT_EQ(l->selectRequestCrs(VxCrs::fromUrn("EPSG:3035")).get(), VxCrs::fromUrn("EPSG:3857").get());
    EXPECT_TRUE(l->supportedImageSize(1000, 500));
    EXPECT_FALSE(l->supportedImageSize(1001, 500));
    EXPECT_FALSE(l->supportedImageSize(1000, 501));
    EXPECT_THROW(l->getFeatures(VxCrs::wgs84LongLat(), nullptr), VxXNotSupported);

    // Explicit layers: the root's name wins over all others; unknown names are skipped with a warning.
    const std::string tree =
        "<Layer><Name>root</Name><CRS>EPSG:4326</CRS><Layer><Name>g</Name><Layer><Name>a</Name></Layer></Layer>"
        "<Layer><Name>b</Name></Layer></Layer>";
    VxOgcWmsLayerParams p;
    p.explicitLayers = std::vector<VxString>{"a", "nope", "g"};
    LogCapture log(VxLog::Warning);
    auto e = s.layer(caps130(kPng, tree), p);
    ASSERT_EQ(e->layers()->size(), 2u);
    EXPECT_EQ(e->getChildLayer(0)->name(), "a");
    EXPECT_EQ(e->getChildLayer(1)->name(), "g");
    EXPECT_EQ(e->getChildLayer(1)->layers()->size(), 0u);  // a group is taken without its children
    EXPECT_EQ(log.count("Could not find explicit layer nope in WMS service at " + s.srv.url("/wms") + "?",
                        VxLog::Warning), 1u);
    EXPECT_NE(request(*e, VxRect(0, 0, 1, 1)).str().find("&LAYERS=a,g&"), std::string::npos);
    p.explicitLayers = std::vector<VxString>{"b", "root", "a"};
    auto r = s.layer(caps130(kPng, tree), p);
    ASSERT_EQ(r->layers()->size(), 1u);
    EXPECT_EQ(r->getChildLayer(0)->name(), "root");

    p.explicitStyles = std::vector<VxString>{"s"};
    EXPECT_THROW(VxOgcWmsLayer{p}, VxXOgcWmsError);

    // No layers, no endpoint, a bad endpoint.
    auto fails = [&](const std::string& doc) -> std::string {
        s.doc = doc;
        VxOgcWmsLayer bad(VxString(s.srv.url("/wms")));
        try {
            bad.initialize(false);
        } catch (const VxException& ex) {
            return ex.asString().str();
        }
        return "ok";
    };
    EXPECT_EQ(fails(caps130(kPng, "")), "No layers provided by WMS service.");
    EXPECT_EQ(fails("<WMS_Capabilities version=\"1.3.0\" xmlns=\"http://www.opengis.net/wms\">" + std::string(kRoads) +
                    "</WMS_Capabilities>"),
              "GET or POST url is missing in GetCapabilities response.");
    EXPECT_EQ(fails("<WMS_Capabilities version=\"1.3.0\" xmlns=\"http://www.opengis.net/wms\" "
                    "xmlns:xlink=\"http://www.w3.org/1999/xlink\"><Capability><Request><GetMap><DCPType><HTTP><Get>"
                    "<OnlineResource xlink:href=\"ftp://x/\"/></Get></HTTP></DCPType></GetMap></Request>" +
                    std::string(kRoads) + "</Capability></WMS_Capabilities>"),
              "Invalid URL: ftp://x/");
    VxOgcWmsLayer nowhere(VxString("http://127.0.0.1:1/none"));
    nowhere.timeout(2);
    EXPECT_THROW(nowhere.initialize(false), VxXServiceNegotiationFailed);
}

TEST(WmsLayerState, CacheIdChangeCounterCopiesAndReset) {
    CapsServer s;
    auto l = s.layer(caps111(kPng, "<Layer><Name>r</Name><SRS>EPSG:4326</SRS><Layer><Name>a</Name></Layer>"
                                   "<Layer><Name>b</Name></Layer></Layer>"));
    const std::string url = s.srv.url("/wms");
    EXPECT_EQ(l->cacheId(), url + "(r(a(),b()))");
    const unsigned before = l->changeCounter();
    l->findLayerByUniqueName("a")->enabled(false);
    EXPECT_EQ(l->changeCounter(), before + 1);
    EXPECT_EQ(l->cacheId(), url + "(r(b()))");

    // A copy is an independent tree sharing the capabilities.
    VxRef<VxOgcWmsLayer> copy = l->cloneWithMap(nullptr).cast<VxOgcWmsLayer>();
    ASSERT_TRUE(copy);
    EXPECT_EQ(copy->cacheId(), l->cacheId());
    copy->findLayerByUniqueName("b")->enabled(false);
    EXPECT_EQ(l->cacheId(), url + "(r(b()))");
    EXPECT_EQ(copy->capabilities().get(), l->capabilities().get());
    EXPECT_EQ(s.capabilityRequests.load(), 1);

    l->reset();
    EXPECT_EQ(l->serviceUrl(), "");
    ASSERT_EQ(l->layers()->size(), 1u);  // the next use negotiates again
    EXPECT_EQ(s.capabilityRequests.load(), 2);
    EXPECT_TRUE(l->findLayerByUniqueName("a")->enabled());
}
