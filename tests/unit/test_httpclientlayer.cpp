#include <gtest/gtest.h>

#include <atomic>
#include <thread>

#include "ogc/errors.h"
#include "ogc/ogcwmslayer.h"
#include "support/logcapture.h"
#include "support/loopback_server.h"
#include "vx/gifhandler.h"
#include "vx/mapview.h"
#include "vx/pnghandler.h"
#include "vx/runtime.h"

namespace {

// A WMS on loopback: capabilities in the CRS the test picks, GetMap answered by a handler.
struct MapServer {
    LoopbackServer srv;
    std::string crsList = "<CRS>EPSG:4326</CRS><CRS>EPSG:3857</CRS>";
    std::function<void(const httplib::Request&, httplib::Response&)> getMap;
    std::atomic<int> mapRequests{0};
    std::vector<std::string> mapQueries;
    std::mutex m;

    MapServer() {
        srv.on("/wms", [this](const httplib::Request& req, httplib::Response& res) {
            const std::string r = req.has_param("request") ? req.get_param_value("request") : req.get_param_value("REQUEST");
            if (r == "GetCapabilities") {
                res.set_content(capabilities(), "text/xml");
                return;
            }
            ++mapRequests;
            {
                std::lock_guard<std::mutex> g(m);
                mapQueries.push_back(req.target);
            }
            getMap(req, res);
        });
    }
    std::string capabilities() const {
        return "<WMS_Capabilities version=\"1.3.0\" xmlns=\"http://www.opengis.net/wms\" "
               "xmlns:xlink=\"http://www.w3.org/1999/xlink\"><Service><Name>WMS</Name><MaxWidth>2000</MaxWidth>"
               "</Service><Capability><Request><GetMap><Format>image/png</Format><DCPType><HTTP><Get>"
               "<OnlineResource xlink:href=\"" + srv.url("/wms?") + "\"/></Get></HTTP></DCPType></GetMap>"
               "</Request><Layer><Name>top</Name>" + crsList + "</Layer></Capability></WMS_Capabilities>";
    }
    VxRef<VxOgcWmsLayer> layer(bool buffered, bool throws) {
        VxOgcWmsLayerParams p;
        p.url = VxString(srv.url("/wms"));
        p.buffered = buffered;
        p.throwExceptions = throws;
        return VxRef<VxOgcWmsLayer>(new VxOgcWmsLayer(p));
    }
};

// PNG of the requested size: red in the top-left quadrant, blue elsewhere.
void answerQuadrants(const httplib::Request& req, httplib::Response& res) {
    const int w = std::stoi(req.get_param_value("width")), h = std::stoi(req.get_param_value("height"));
    VxRaster r(w, h, VxRasterFormat::RGBA8);
    for (int y = 0; y < h; ++y)
        for (int x = 0; x < w; ++x)
            r.setColor(x, y, (x < w / 2 && y < h / 2) ? VxColor(255, 0, 0, 255) : VxColor(0, 0, 255, 255));
    std::vector<uint8_t> png;
    VxPngHandler::encode(r, png);
    res.set_content(std::string(png.begin(), png.end()), "image/png");
}

struct ErrorEvents {
    std::vector<std::string> messages;
    std::mutex m;
    ErrorEvents() {
        VxRuntime::errorEvent().setHandler(0, [this](VxEngineObject*, const VxErrorEventArgs& a) {
            std::lock_guard<std::mutex> g(m);
            messages.push_back(a.message.str());
        });
    }
    ~ErrorEvents() { VxRuntime::errorEvent().setHandler(0, nullptr); }
};

size_t drawOnce(VxOgcWmsLayer& l, const char* crs, const VxRect& area, int w, int h, VxCanvas* canvas = nullptr) {
    VxMapView view(VxCrs::fromUrn(crs), area, w, h);
    VxRef<VxCanvas> own(new VxCanvas(w, h));
    return view.drawWithNodes({VxRef<VxLayer>(&l)}, canvas ? *canvas : *own);
}

}  // namespace

TEST(HttpClientLayer, DrawsTheImageAtTheRequestedPlace) {
    MapServer s;
    s.getMap = answerQuadrants;
    auto l = s.layer(false, true);
    VxRef<VxCanvas> canvas(new VxCanvas(200, 100));
    EXPECT_EQ(drawOnce(*l, "EPSG:4326", VxRect(0, 40, 20, 50), 200, 100, canvas.get()), 1u);
    EXPECT_EQ(canvas->pixel(10, 10), VxColor(255, 0, 0, 255));
    EXPECT_EQ(canvas->pixel(190, 90), VxColor(0, 0, 255, 255));
    ASSERT_EQ(s.mapQueries.size(), 1u);
    EXPECT_NE(s.mapQueries[0].find("CRS=EPSG:4326&BBOX=40.000000,0.000000,50.000000,20.000000&width=200&height=100"),
              std::string::npos);
}

TEST(HttpClientLayer, BufferingReusesAnUnchangedViewOnly) {
    MapServer s;
    s.getMap = answerQuadrants;
    auto buffered = s.layer(true, true);
    drawOnce(*buffered, "EPSG:3857", VxRect(0, 0, 1000, 500), 100, 50);
    drawOnce(*buffered, "EPSG:3857", VxRect(0, 0, 1000, 500), 100, 50);
    EXPECT_EQ(s.mapRequests.load(), 1);
    drawOnce(*buffered, "EPSG:3857", VxRect(10, 0, 1010, 500), 100, 50);  // pan
    drawOnce(*buffered, "EPSG:3857", VxRect(0, 0, 2000, 1000), 100, 50);  // zoom
    EXPECT_EQ(s.mapRequests.load(), 3);

    auto plain = s.layer(false, true);
    drawOnce(*plain, "EPSG:3857", VxRect(0, 0, 1000, 500), 100, 50);
    drawOnce(*plain, "EPSG:3857", VxRect(0, 0, 1000, 500), 100, 50);
    EXPECT_EQ(s.mapRequests.load(), 5);

    // Zero-width view: no request, no error.
    ErrorEvents events;
    drawOnce(*plain, "EPSG:3857", VxRect(5, 0, 5, 500), 100, 50);
    EXPECT_EQ(s.mapRequests.load(), 5);
    EXPECT_TRUE(events.messages.empty());
}

TEST(HttpClientLayer, EveryFailureIsReportedAsSpecifiedInBothModes) {
    MapServer s;
    struct Case {
        std::function<void(httplib::Response&)> answer;
        std::string message;       // event text when not throwing
        std::string thrownId;      // exception identifier when throwing
    };
    std::vector<uint8_t> png;
    VxRaster tiny(2, 2, VxRasterFormat::RGBA8);
    VxPngHandler::encode(tiny, png);
    const std::string corrupt = std::string(png.begin(), png.begin() + 20);
    const std::vector<Case> cases = {
        {[](httplib::Response& r) { r.set_content("", "image/png"); }, "Service exception: Unknown error.", "OgcError"},
        {[](httplib::Response& r) { r.set_content("<Err>bad</Err>", "text/xml"); }, "Service exception: <Err>bad</Err>", "OgcError"},
        {[](httplib::Response& r) { r.set_content("<x/>", "application/vnd.ogc.wms_xml"); }, "Service exception: Unknown error.", "OgcError"},
        {[](httplib::Response& r) { r.set_content("<ServiceExceptionReport/>", "application/vnd.ogc.se_xml"); },
         "Failed to get map image from WMS service.", "RequestError"},
        {[](httplib::Response& r) { r.set_content("II*\0", "image/tiff"); }, "Unknown image format received: image/tiff", "OgcError"},
        {[](httplib::Response& r) { r.set_content("abc", "image/jpg"); }, "Unknown image format received: image/jpg", "OgcError"},
        {[corrupt](httplib::Response& r) { r.set_content(corrupt, "image/png"); },
         "ImageHandler failed to read image of format: image/png", "OgcError"},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.message);
        s.getMap = [&](const httplib::Request&, httplib::Response& res) { c.answer(res); };
        {
            ErrorEvents events;
            LogCapture log(VxLog::Error);
            auto quiet = s.layer(false, false);
            drawOnce(*quiet, "EPSG:4326", VxRect(0, 0, 10, 10), 50, 50);
            ASSERT_EQ(events.messages.size(), 1u);
            EXPECT_EQ(events.messages[0], c.message);
            if (c.thrownId == "OgcError") {
                EXPECT_EQ(log.count("OgcWmsLayer: " + c.message, VxLog::Error), 1u);
            }
        }
        auto loud = s.layer(false, true);
        try {
            drawOnce(*loud, "EPSG:4326", VxRect(0, 0, 10, 10), 50, 50);
            ADD_FAILURE() << "no exception";
        } catch (const VxException& e) {
            EXPECT_EQ(e.errorId(), c.thrownId);
            if (c.thrownId == "OgcError") {
                EXPECT_EQ(e.asString(), c.message);
            } else {
                EXPECT_EQ(e.asString().str(),
                          "Request '" + s.mapQueries.back().substr(5) + "' to server '127.0.0.1' failed.");
            }
        }
    }
    // Too large for the service's MaxWidth.
    s.getMap = answerQuadrants;
    ErrorEvents events;
    auto quiet = s.layer(false, false);
    drawOnce(*quiet, "EPSG:4326", VxRect(0, 0, 10, 10), 2001, 10);
    ASSERT_EQ(events.messages.size(), 1u);
    EXPECT_EQ(events.messages[0], "Requested image size is too large. Consider putting the OgcWmsLayer into a TileLayer.");
}

TEST(HttpClientLayer, SuppressedInitializationFailureLeavesTheLayerEmptyUntilReset) {
    MapServer s;
    s.getMap = answerQuadrants;
    std::atomic<int> capsRequests{0};
    LoopbackServer broken;
    broken.on("/wms", [&](const httplib::Request&, httplib::Response& res) {
        ++capsRequests;
        res.set_content("<html>down</html>", "text/xml");
    });
    VxOgcWmsLayerParams p;
    p.url = VxString(broken.url("/wms"));
    p.name = "roads";
    VxRef<VxOgcWmsLayer> l(new VxOgcWmsLayer(p));
    ErrorEvents events;
    LogCapture log(VxLog::Warning);
    EXPECT_EQ(drawOnce(*l, "EPSG:4326", VxRect(0, 0, 1, 1), 10, 10), 0u);
    EXPECT_TRUE(l->initializationFailed());
    ASSERT_EQ(events.messages.size(), 1u);
    EXPECT_EQ(events.messages[0], "Initialization of OgcWmsLayer 'roads' failed: Failed to negotiate capabilities with "
                                  "service at: " + broken.url("/wms?"));
    EXPECT_EQ(log.count("Error occurred during initialization of OgcWmsLayer roads. The error was suppressed and the "
                        "layer will work as if empty.", VxLog::Warning), 1u);
    const int after = capsRequests.load();
    EXPECT_EQ(after, 3);
    drawOnce(*l, "EPSG:4326", VxRect(0, 0, 1, 1), 10, 10);
    EXPECT_EQ(capsRequests.load(), after);  // not retried
    l->reset();
    EXPECT_FALSE(l->initializationFailed());
    drawOnce(*l, "EPSG:4326", VxRect(0, 0, 1, 1), 10, 10);
    EXPECT_EQ(capsRequests.load(), after + 3);
    // An explicit initialize without suppression throws once the layer is reset.
    l->reset();
    EXPECT_THROW(l->initialize(false), VxXServiceNegotiationFailed);
}

TEST(HttpClientLayer, ReprojectsWhenTheServiceLacksTheViewCrs) {
    MapServer s;
    s.crsList = "<CRS>EPSG:4326</CRS>";
    s.getMap = answerQuadrants;
    auto l = s.layer(false, true);
    VxRef<VxCanvas> canvas(new VxCanvas(100, 100));
    // Web Mercator view of lon 0..20 with latitudes around 40..50.
    EXPECT_EQ(drawOnce(*l, "EPSG:3857", VxRect(0, 4865942.28, 2226389.82, 6446275.84), 100, 100, canvas.get()), 1u);
    ASSERT_EQ(s.mapQueries.size(), 1u);
    EXPECT_NE(s.mapQueries[0].find("CRS=EPSG:4326"), std::string::npos);
    EXPECT_EQ(canvas->pixel(5, 5), VxColor(255, 0, 0, 255));
    EXPECT_EQ(canvas->pixel(95, 95), VxColor(0, 0, 255, 255));
}

TEST(HttpClientLayer, ViewAcrossTheAntimeridianTakesTwoRequestsSecondPieceFirst) {
    MapServer s;
    s.crsList = "<CRS>EPSG:4326</CRS>";
    s.getMap = answerQuadrants;
    auto l = s.layer(false, true);
    // Web Mercator x from 170 E to 170 W (190 E).
    const double x170 = 18924313.434856508, x190 = 21150703.250722975;
    VxRef<VxCanvas> canvas(new VxCanvas(200, 100));
    EXPECT_EQ(drawOnce(*l, "EPSG:3857", VxRect(x170, -1118889.97, x190, 1118889.97), 200, 100, canvas.get()), 2u);
    ASSERT_EQ(s.mapQueries.size(), 2u);
    EXPECT_NE(s.mapQueries[0].find(",-180.000000,"), std::string::npos) << s.mapQueries[0];
    EXPECT_NE(s.mapQueries[1].find(",170.000000,"), std::string::npos) << s.mapQueries[1];
    // Each half shows its own image: red top-left quadrant at the left of each half.
    EXPECT_EQ(canvas->pixel(10, 10), VxColor(255, 0, 0, 255));
    EXPECT_EQ(canvas->pixel(110, 10), VxColor(255, 0, 0, 255));
    EXPECT_EQ(canvas->pixel(90, 90), VxColor(0, 0, 255, 255));
}

TEST(HttpClientLayer, PaletteImagesKeepEveryColour) {
    MapServer s;
    s.getMap = [](const httplib::Request&, httplib::Response& res) {
        VxRef<VxPalette> pal(new VxPalette());
        pal->addColor(VxColor(10, 20, 30, 255));
        pal->addColor(VxColor(10, 20, 30, 255));  // repeated colour
        pal->addColor(VxColor(0, 255, 0, 255));
        VxRaster r(3, 1, VxRasterFormat::Palette8, pal);
        r.row(0)[0] = 0;
        r.row(0)[1] = 1;
        r.row(0)[2] = 2;
        std::vector<uint8_t> gif;
        VxGifHandler::encode(r, gif);
        res.set_content(std::string(gif.begin(), gif.end()), "image/gif");
    };
    auto l = s.layer(false, true);
    VxRef<VxCanvas> canvas(new VxCanvas(3, 1));
    drawOnce(*l, "EPSG:4326", VxRect(0, 0, 3, 1), 3, 1, canvas.get());
    EXPECT_EQ(canvas->pixel(0, 0), VxColor(10, 20, 30, 255));
    EXPECT_EQ(canvas->pixel(1, 0), VxColor(10, 20, 30, 255));
    EXPECT_EQ(canvas->pixel(2, 0), VxColor(0, 255, 0, 255));
}

// Updates on worker threads while the application changes the layer: no data race, and
// every drawn frame is a whole image.
TEST(HttpClientLayer, ConcurrentUpdatesAndSetters) {
    MapServer s;
    s.getMap = answerQuadrants;
    auto l = s.layer(true, true);
    ASSERT_TRUE(l->layers());
    std::atomic<bool> stop{false};
    std::atomic<int> frames{0}, whole{0};
    // One update thread per layer (a layer holds the images of the view it last drew);
    // the copy shares the capabilities with the original.
    VxRef<VxOgcWmsLayer> copy = l->cloneWithMap(nullptr).cast<VxOgcWmsLayer>();
    auto drawer = [&](VxOgcWmsLayer* layer, double shift) {
        for (int i = 0; i < 15; ++i) {
            VxRef<VxCanvas> canvas(new VxCanvas(40, 40));
            VxMapView view(VxCrs::fromUrn("EPSG:4326"), VxRect(shift, 0, shift + 10 + (i % 3), 10), 40, 40);
            view.drawWithNodes({VxRef<VxLayer>(layer)}, *canvas);
            ++frames;
            if (canvas->pixel(2, 2) == VxColor(255, 0, 0, 255) && canvas->pixel(38, 38) == VxColor(0, 0, 255, 255))
                ++whole;
        }
    };
    std::thread a(drawer, l.get(), 0.0), b(drawer, copy.get(), 1.0);
    std::thread setter([&] {
        int i = 0;
        while (!stop.load()) {
            l->getChildLayer(0)->style(i % 2 ? "x" : "");
            copy->getChildLayer(0)->enabled(true);
            l->timeout(5 + i % 3);
            l->user(i % 2 ? "u" : "");
            (void)l->cacheId();
            (void)l->changeCounter();
            l->buffered(i % 2 == 0);
            ++i;
        }
    });
    a.join();
    b.join();
    stop = true;
    setter.join();
    EXPECT_EQ(frames.load(), 30);
    EXPECT_EQ(whole.load(), 30);
}

// 3D: the node sits at the view's centre and holds the image moved by minus that centre;
// the buffered image itself keeps its place for the next cycle.
TEST(HttpClientLayer, ThreeDimensionalPresentationIsCentred) {
    MapServer s;
    s.getMap = answerQuadrants;
    auto l = s.layer(true, true);
    VxMapView view(VxCrs::fromUrn("EPSG:4326"), VxRect(10, 40, 20, 50), 100, 100);
    VxLayer::UpdateInfo& info = view.updateInfo();
    info.is3D = true;
    for (int cycle = 0; cycle < 2; ++cycle) {
        std::vector<VxRef<VxSGNode3>> nodes;
        l->doPrepare(info);
        l->doCreatePresentation3(info, nodes);
        ASSERT_EQ(nodes.size(), 1u);
        auto* offset = dynamic_cast<VxSGCenterPointOffset3*>(nodes[0].get());
        ASSERT_TRUE(offset);
        EXPECT_EQ(offset->x, 15);
        EXPECT_EQ(offset->y, 45);
        auto* leaf = dynamic_cast<VxSGFeatureNode3*>(offset->child.get());
        ASSERT_TRUE(leaf);
        EXPECT_EQ(leaf->feature->rasterGeometry()->bounds(), VxRect(-5, -5, 5, 5));
    }
    EXPECT_EQ(s.mapRequests.load(), 1);  // the second cycle reused the unmoved image
}

TEST(HttpClientLayer, InitializationErrorsAreThrownWhenTheLayerThrows) {
    LoopbackServer broken;
    broken.serve("/wms", "<html/>", "text/xml");
    VxOgcWmsLayerParams p;
    p.url = VxString(broken.url("/wms"));
    p.throwExceptions = true;
    VxRef<VxOgcWmsLayer> l(new VxOgcWmsLayer(p));
    ErrorEvents events;
    EXPECT_THROW(drawOnce(*l, "EPSG:4326", VxRect(0, 0, 1, 1), 10, 10), VxXServiceNegotiationFailed);
    EXPECT_TRUE(events.messages.empty());
    EXPECT_TRUE(l->initializationFailed());
    // Failed and not retried: later updates draw nothing and throw nothing.
    EXPECT_EQ(drawOnce(*l, "EPSG:4326", VxRect(0, 0, 1, 1), 10, 10), 0u);
}
