#include <gtest/gtest.h>

#include <atomic>

#include "ogc/errors.h"
#include "ogc/ogcwcsdataset.h"
#include "support/logcapture.h"
#include "support/loopback_server.h"
#include "vx/runtime.h"
#include "vx/tiffhandler.h"

namespace {

struct Service {
    std::string formats = "<ows:Value>image/png</ows:Value><ows:Value>IMAGE/TIFF;subtype=geotiff</ows:Value>";
    std::string supportedCrs = "urn:ogc:def:crs:EPSG::4326";
    std::string boxCrs = "urn:ogc:def:crs:EPSG::4326";
    std::string describedFormats;
    std::string getCoveragePath = "/gc?map=x";

    std::string capabilities(const LoopbackServer& srv) const {
        return "<Capabilities xmlns=\"http://www.opengis.net/wcs/1.1\" xmlns:ows=\"http://www.opengis.net/ows/1.1\" "
               "xmlns:xlink=\"http://www.w3.org/1999/xlink\" version=\"1.1.1\"><ows:OperationsMetadata>"
               "<ows:Operation name=\"DescribeCoverage\"><ows:DCP><ows:HTTP><ows:Get xlink:href=\"" +
               srv.url("/dc?") +
               "\"/></ows:HTTP></ows:DCP></ows:Operation><ows:Operation name=\"GetCoverage\"><ows:DCP><ows:HTTP>"
               "<ows:Get xlink:href=\"" +
               srv.url(getCoveragePath) +
               "\"/></ows:HTTP></ows:DCP><ows:Parameter name=\"Identifier\"><ows:AllowedValues><ows:Value>dem"
               "</ows:Value></ows:AllowedValues></ows:Parameter><ows:Parameter name=\"format\"><ows:AllowedValues>" +
               formats + "</ows:AllowedValues></ows:Parameter></ows:Operation></ows:OperationsMetadata></Capabilities>";
    }
    std::string description() const {
        return "<CoverageDescriptions xmlns=\"http://www.opengis.net/wcs/1.1\" "
               "xmlns:ows=\"http://www.opengis.net/ows/1.1\"><CoverageDescription><Domain><SpatialDomain>"
               "<ows:BoundingBox crs=\"" +
               boxCrs +
               "\"><ows:LowerCorner>45 5</ows:LowerCorner><ows:UpperCorner>55 15</ows:UpperCorner></ows:BoundingBox>"
               "</SpatialDomain></Domain><SupportedCRS>" +
               supportedCrs + "</SupportedCRS>" + describedFormats + "</CoverageDescription></CoverageDescriptions>";
    }
    void install(LoopbackServer& srv) const {
        srv.serve("/wcs", capabilities(srv), "text/xml");
        srv.serve("/dc", description(), "text/xml");
    }
};

// A 3 x 2 Float32 grid, value = 10 * row + col + 0.5.
std::string floatTiff() {
    VxRaster r(3, 2, VxSampleType::Float32, 1);
    for (int y = 0; y < 2; ++y)
        for (int x = 0; x < 3; ++x) r.setSample(x, y, 0, 10 * y + x + 0.5);
    std::vector<uint8_t> out;
    EXPECT_TRUE(VxTiffHandler::encode(r, out));
    return std::string(out.begin(), out.end());
}

std::string multipart(const std::string& tiff) {
    return "--wcs\r\nContent-Type: text/xml\r\n\r\n<Coverages><Coverage/></Coverages>\r\n--wcs\r\n"
           "Content-Type: image/tiff\r\nContent-Transfer-Encoding: binary\r\n\r\n" +
           tiff + "\r\n--wcs--\r\n";
}

VxRef<VxOgcWcsDataSet> dataset(const LoopbackServer& srv, bool throwExceptions = false) {
    VxOgcWcsDataSetParams p;
    p.name = "heights";
    p.url = srv.url("/wcs");
    p.coverageId = "dem";
    p.timeout = 5;
    p.throwExceptions = throwExceptions;
    return VxRef<VxOgcWcsDataSet>(new VxOgcWcsDataSet(p));
}

// Counts error events for the lifetime of the guard.
struct ErrorEvents {
    std::atomic<int> count{0};
    std::string last;
    ErrorEvents() {
        VxRuntime::errorEvent().setHandler(0, [this](VxEngineObject*, const VxErrorEventArgs& a) {
            ++count;
            last = a.message.str();
        });
    }
    ~ErrorEvents() { VxRuntime::errorEvent().setHandler(0, nullptr); }
};

}  // namespace

TEST(WcsDataSet, ConstructionDefaultsAndFrozenProperties) {
    VxRef<VxOgcWcsDataSet> d(new VxOgcWcsDataSet("http://h/wcs", "dem"));
    EXPECT_EQ(d->version(), "1.1.1");
    EXPECT_EQ(d->timeout(), 10);
    EXPECT_FALSE(d->throwExceptions());
    EXPECT_EQ(d->crs().get(), VxCrs::wgs84LongLat().get());
    EXPECT_EQ(d->myRuntimeClassName(), "OgcWcsDataSet");
    EXPECT_TRUE(d->isKindOf(VxDataSet::runtimeClass()));
    EXPECT_FALSE(d->returnsFeaturesWithAttributes());
    d->url("http://h/other");  // not yet initialized
    EXPECT_EQ(d->url(), "http://h/other");
    try {
        d->bounds(VxRect(0, 0, 1, 1));
        ADD_FAILURE();
    } catch (const VxXPropertyReadOnly& e) {
        EXPECT_EQ(e.arg(0), "\"OgcWcsDataSet.Bounds\"");
    }

    VxOgcWcsDataSetParams p;
    p.url = "u";
    p.coverageId = "c";
    p.user = "me";
    p.version = "1.1.0";
    VxRef<VxOgcWcsDataSet> q(new VxOgcWcsDataSet(p));
    EXPECT_EQ(q->user(), "me");
    EXPECT_EQ(q->version(), "1.1.0");
    EXPECT_EQ(q->timeout(), 10);
}

TEST(WcsDataSet, InitializesQueriesAndDecodesAMultipartAnswer) {
    LoopbackServer srv;
    Service svc;
    svc.install(srv);
    const std::string tiff = floatTiff();
    srv.serve("/gc", multipart(tiff), "multipart/mixed; boundary=wcs");
    VxRef<VxOgcWcsDataSet> d = dataset(srv);

    LogCapture log(VxLog::Debug);
    ASSERT_TRUE(d->initialize());
    EXPECT_EQ(log.count("Requesting WCS capabilities with timeout 5 seconds, URL: " + srv.url("/wcs")), 1u);
    EXPECT_EQ(log.count("Coverage id (0): dem", VxLog::Debug), 1u);
    EXPECT_EQ(log.count("Format (1): IMAGE/TIFF;subtype=geotiff", VxLog::Debug), 1u);
    EXPECT_EQ(log.count("Version: WCS 1.1.1", VxLog::Debug), 1u);
    EXPECT_EQ(log.count("Reversed axis order: True", VxLog::Debug), 1u);
    EXPECT_EQ(log.count("Bounds (5, 45) (15, 55)", VxLog::Debug), 1u);
    EXPECT_EQ(d->imageFormat(), "IMAGE/TIFF;subtype=geotiff");
    EXPECT_EQ(d->crsString(), "urn:ogc:def:crs:EPSG::4326");
    EXPECT_EQ(d->bounds(), VxRect(5, 45, 15, 55));
    EXPECT_THROW(d->url("x"), VxXPropertyFrozen);
    EXPECT_THROW(d->coverageId("x"), VxXPropertyFrozen);
    EXPECT_THROW(d->version("x"), VxXPropertyFrozen);

    srv.clearRequests();
    VxRef<VxQueryResult> r = d->query(VxRect(10, 50, 11, 51));
    ASSERT_EQ(srv.requests().size(), 1u);
    const std::string target =
        "/gc?map=x&service=WCS&version=1.1.1&request=GetCoverage&identifier=dem&format=IMAGE/TIFF;subtype=geotiff"
        "&boundingbox=50.000000,10.000000,51.000000,11.000000,urn:ogc:def:crs:EPSG::4326";
    EXPECT_EQ(srv.requests()[0].target, target);
    EXPECT_EQ(log.count("OgcWcsDataSet heights: query = '" + srv.url(target) + "'", VxLog::Debug), 1u);

    ASSERT_TRUE(r);
    ASSERT_EQ(r->featureCount(), 1u);
    VxRef<VxFeature> f = r->feature(0);
    ASSERT_TRUE(f);
    EXPECT_EQ(f->crs().get(), VxCrs::wgs84LongLat().get());
    const VxRef<VxRaster>& raster = f->rasterGeometry()->raster();
    EXPECT_EQ(f->rasterGeometry()->bounds(), VxRect(10, 50, 11, 51));
    EXPECT_EQ(raster->sampleType(), VxSampleType::Float32);
    ASSERT_EQ(raster->width(), 3);
    EXPECT_FLOAT_EQ(raster->sample(2, 1), 12.5f);
    EXPECT_FALSE(static_cast<VxSingleResult*>(r.get())->visualizer());

    // reset: initialized again on next use, properties no longer frozen.
    d->reset();
    EXPECT_FALSE(d->isInitialized());
    EXPECT_TRUE(d->getCoverageUrl().isEmpty());
    d->version("1.1.1");

    VxRef<VxOgcWcsDataSet> copy = d->clone().cast<VxOgcWcsDataSet>();
    ASSERT_TRUE(copy);
    EXPECT_EQ(copy->imageFormat(), d->imageFormat());
    EXPECT_EQ(copy->crsString(), d->crsString());
}

TEST(WcsDataSet, BoundingBoxOrderFollowsTheAxisOrderAndUrlForms) {
    LoopbackServer srv;
    Service svc;
    svc.supportedCrs = svc.boxCrs = "urn:ogc:def:crs:EPSG::3857";
    svc.getCoveragePath = "/gc";
    svc.install(srv);
    srv.serve("/gc", floatTiff(), "image/tiff");
    VxRef<VxOgcWcsDataSet> d = dataset(srv);
    ASSERT_TRUE(d->query(VxRect(10, 50, 11, 51.25)));
    EXPECT_EQ(srv.requests("/gc").at(0).target,
              "/gc?service=WCS&version=1.1.1&request=GetCoverage&identifier=dem&format=IMAGE/TIFF;subtype=geotiff"
              "&boundingbox=10.000000,50.000000,11.000000,51.250000,urn:ogc:def:crs:EPSG::3857");
    EXPECT_EQ(d->bounds(), VxRect(45, 5, 55, 15));

    for (const char* path : {"/gc?", "/gc?a=1&"}) {
        Service v2;
        v2.getCoveragePath = path;
        v2.install(srv);
        srv.clearRequests();
        ASSERT_TRUE(dataset(srv)->query(VxRect(1, 2, 3, 4)));
        EXPECT_EQ(srv.requests("/gc").at(0).target.substr(0, std::string(path).size() + 11),
                  std::string(path) + "service=WCS");
    }
}

TEST(WcsDataSet, FormatAndCoordinateSystemChoice) {
    struct Case {
        std::string formats, described, expected;
        bool warned;
    } cases[] = {
        {"<ows:Value>image/png</ows:Value><ows:Value>image/jpeg</ows:Value>", "", "image/tiff", true},
        {"<ows:Value>application/x-geotiff</ows:Value>", "", "application/x-geotiff", false},
        {"<ows:Value>image/tiff</ows:Value><ows:Value>image/tiff;subtype=float32</ows:Value>",
         "<SupportedFormat>image/tiff;subtype=float32</SupportedFormat>", "image/tiff;subtype=float32", false},
    };
    LoopbackServer srv;
    for (const Case& c : cases) {
        SCOPED_TRACE(c.expected);
        Service svc;
        svc.formats = c.formats;
        svc.describedFormats = c.described;
        // Matched ignoring case against the built URN, then kept as written.
        svc.supportedCrs = svc.boxCrs = "urn:ogc:def:crs:epsg::4326";
        svc.install(srv);
        LogCapture log(VxLog::Warning);
        VxRef<VxOgcWcsDataSet> d = dataset(srv);
        d->initialize();
        EXPECT_EQ(d->imageFormat(), c.expected);
        EXPECT_EQ(log.count("heights: No suitable image format exists in the WCS ('" + srv.url("/wcs") + "').",
                            VxLog::Warning),
                  c.warned ? 1u : 0u);
        EXPECT_EQ(d->crsString(), "urn:ogc:def:crs:epsg::4326");
    }

    // An unknown coverage only warns.
    Service svc;
    svc.install(srv);
    VxOgcWcsDataSetParams p;
    p.name = "n";
    p.url = srv.url("/wcs");
    p.coverageId = "other";
    LogCapture log(VxLog::Warning);
    VxRef<VxOgcWcsDataSet> d(new VxOgcWcsDataSet(p));
    d->initialize();
    EXPECT_EQ(log.count("n: Coverage id 'other' does not exists in the WCS ('" + srv.url("/wcs") + "')."), 1u);
    EXPECT_EQ(d->crs().get(), VxCrs::wgs84LongLat().get());
}

TEST(WcsDataSet, InitializationFailuresAreReportedOrThrown) {
    LoopbackServer srv;
    Service svc;
    svc.boxCrs = "EPSG:4326";  // no URN: no coordinate system
    svc.supportedCrs = "EPSG:4326";
    svc.install(srv);
    {
        ErrorEvents events;
        LogCapture log(VxLog::Error);
        VxRef<VxOgcWcsDataSet> d = dataset(srv);
        d->initialize();
        const std::string msg = "Unable to get coordinate reference system from WCS ('" + srv.url("/wcs") + "').";
        EXPECT_EQ(events.count.load(), 1);
        EXPECT_EQ(events.last, msg);
        EXPECT_EQ(log.count("heights : " + msg, VxLog::Error), 1u);
    }
    try {
        dataset(srv, true)->initialize();
        ADD_FAILURE();
    } catch (const VxXOgcWcsError& e) {
        EXPECT_EQ(e.arg(0), "heights: Unable to get coordinate reference system from WCS ('" + srv.url("/wcs") + "').");
    }

    LoopbackServer none;
    ErrorEvents events;
    VxRef<VxOgcWcsDataSet> d = dataset(none);
    d->initialize();
    EXPECT_EQ(events.last, "GetCapabilities failed ('" + none.url("/wcs") + "').");
}

// Answers that are not a usable TIFF end in a null result and one error, never a crash.
TEST(WcsDataSet, BadAnswers) {
    const std::string tiff = floatTiff();
    std::string lying = tiff;
    lying[4] = '\x7f';  // first directory far beyond the end
    lying[5] = '\x7f';
    struct Case {
        const char* name;
        std::string body, type, logged;
    } cases[] = {
        {"truncated", tiff.substr(0, tiff.size() / 2), "image/tiff", ""},
        {"lying", lying, "image/tiff", ""},
        {"truncated in multipart", multipart(tiff.substr(0, 12)), "multipart/mixed; boundary=wcs", ""},
        {"png", "\x89PNG\r\n\x1a\n....", "image/png", "\x89PNG\r\n\x1a\n...."},
        {"exception text", "<ows:ExceptionReport><ows:Exception><ExceptionText>No such coverage</ExceptionText>",
         "text/xml", "No such coverage"},
        {"open only", "<r><ExceptionText>cut", "text/xml", "cut"},
        {"close first", "</ExceptionText><ExceptionText>x", "text/xml", ""},
        {"no text", "<ServiceExceptionReport/>", "application/xml", "<ServiceExceptionReport/>"},
    };
    LoopbackServer srv;
    Service svc;
    svc.install(srv);
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        srv.serve("/gc", c.body, c.type);
        ErrorEvents events;
        LogCapture log(VxLog::Warning);
        VxRef<VxOgcWcsDataSet> d = dataset(srv);
        EXPECT_FALSE(d->query(VxRect(1, 2, 3, 4)));
        EXPECT_EQ(events.count.load(), 1);
        EXPECT_EQ(events.last.rfind("Failed to get raster from WCS ('" + srv.url("/gc?map=x&service=WCS"), 0), 0u);
        EXPECT_EQ(log.count("heights: Response from server was:\n" + c.logged, VxLog::Warning),
                  c.logged.empty() ? 0u : 1u);
    }

    // A failed transfer has its own message; with throwExceptions it is thrown.
    srv.serve("/gc", "", "text/xml", 404);
    ErrorEvents events;
    EXPECT_FALSE(dataset(srv)->query(VxRect(1, 2, 3, 4)));
    EXPECT_EQ(events.last, "Failed to get map image from WCS service.");
    VxRef<VxOgcWcsDataSet> d = dataset(srv, true);
    d->initialize();
    EXPECT_THROW(d->query(VxRect(1, 2, 3, 4)), VxXOgcWcsError);
    // The lock was released on the way out.
    d->reset();
    EXPECT_FALSE(d->isInitialized());
}
