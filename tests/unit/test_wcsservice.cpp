#include <gtest/gtest.h>

#include <dirent.h>

#include <fstream>
#include <nlohmann/json.hpp>
#include <sstream>

#include "ogc/errors.h"
#include "support/files.h"
#include "ogc/wcsservice.h"
#include "support/logcapture.h"
#include "support/loopback_server.h"

namespace {

// A capabilities document in the WCS 1.1.1 and unversioned OWS namespaces; DC and GC are
// the DescribeCoverage and GetCoverage endpoints.
std::string capabilities(const std::string& dc, const std::string& gc, const std::string& version = "1.1.1") {
    return "<?xml version=\"1.0\"?><Capabilities xmlns=\"http://www.opengis.net/wcs/1.1.1\" "
           "xmlns:ows=\"http://www.opengis.net/ows\" xmlns:xlink=\"http://www.w3.org/1999/xlink\" version=\"" +
           version +
           "\"><ows:ServiceIdentification><ows:Title>Heights</ows:Title><ows:Abstract>About</ows:Abstract>"
           "</ows:ServiceIdentification><ows:OperationsMetadata>"
           "<ows:Operation name=\"DESCRIBECOVERAGE\"><ows:DCP><ows:HTTP><ows:Get xlink:href=\"" +
           dc +
           "\"/><ows:Post xlink:href=\"http://post/dc\"/></ows:HTTP></ows:DCP>"
           "<ows:Parameter name=\"identifiers\"><ows:Value>not-read</ows:Value></ows:Parameter></ows:Operation>"
           "<ows:Operation name=\"getcoverage\"><ows:DCP><ows:HTTP><ows:Get xlink:href=\"" +
           gc +
           "\"/><ows:Get xlink:href=\"http://ignored/\"/></ows:HTTP></ows:DCP>"
           "<ows:Parameter name=\"Identifier\"><ows:Value>dem</ows:Value><ows:Value></ows:Value>"
           "<ows:Value>dem</ows:Value></ows:Parameter>"
           "<ows:Parameter name=\"Format\"><ows:AllowedValues><ows:Value>image/png</ows:Value>"
           "<ows:Value>image/tiff</ows:Value></ows:AllowedValues><ows:Value>outside</ows:Value></ows:Parameter>"
           "<ows:Parameter name=\"store\"><ows:Value>false</ows:Value></ows:Parameter>"
           "</ows:Operation></ows:OperationsMetadata><Contents><CoverageSummary><Identifier>contents-not-read"
           "</Identifier></CoverageSummary></Contents></Capabilities>";
}

// A coverage description in the WCS 1.1 and OWS 1.1 namespaces.
std::string description(const std::string& body) {
    return "<CoverageDescriptions xmlns=\"http://www.opengis.net/wcs/1.1\" xmlns:ows=\"http://www.opengis.net/ows/1.1\">" +
           body + "</CoverageDescriptions>";
}

std::string box(const std::string& crs, const std::string& lower, const std::string& upper) {
    return "<ows:BoundingBox crs=\"" + crs + "\"><ows:LowerCorner>" + lower + "</ows:LowerCorner><ows:UpperCorner>" +
           upper + "</ows:UpperCorner></ows:BoundingBox>";
}

std::string coverage(const std::string& crsList, const std::string& boxes) {
    return "<CoverageDescription><Domain><SpatialDomain>" + boxes + "</SpatialDomain></Domain>" + crsList +
           "</CoverageDescription>";
}

VxRef<VxWcsCapabilities> describe(const std::string& body) {
    VxRef<VxWcsCapabilities> caps(new VxWcsCapabilities());
    VxWcsService::parseCoverageDescriptions(*caps, description(body), "http://x/dc");
    return caps;
}

std::vector<std::string> strings(const VxRef<VxVec<VxString>>& v) {
    std::vector<std::string> out;
    for (const auto& s : *v) out.push_back(s.str());
    return out;
}

}  // namespace

TEST(WcsCapabilities, WalkReadsOperationsInAnyCaseAndBothValueForms) {
    VxRef<VxWcsCapabilities> caps = VxWcsService::parseCapabilities(capabilities("http://h/dc?", "http://h/gc?a=1"));
    ASSERT_TRUE(caps);
    EXPECT_EQ(caps->version, 0);
    EXPECT_EQ(caps->title, "Heights");
    EXPECT_EQ(caps->abstract, "About");
    EXPECT_EQ(caps->describeCoverageGetUrl, "http://h/dc?");
    EXPECT_EQ(caps->describeCoveragePostUrl, "http://post/dc");
    EXPECT_EQ(caps->getCoverageGetUrl, "http://h/gc?a=1");  // the first Get only
    EXPECT_TRUE(caps->getCoveragePostUrl.isEmpty());
    // Direct values without AllowedValues, empty ones skipped, duplicates kept.
    EXPECT_EQ(strings(caps->coverageIds), (std::vector<std::string>{"dem", "dem"}));
    // With AllowedValues only its values count.
    EXPECT_EQ(strings(caps->formats), (std::vector<std::string>{"image/png", "image/tiff"}));
    EXPECT_TRUE(caps->supportedCrs->empty());
}

TEST(WcsCapabilities, RefusesOtherVersionsAndOtherRoots) {
    for (const char* v : {"1.1.0", "1.1.1 ", "", "1.1.2"}) {
        SCOPED_TRACE(v);
        try {
            VxWcsService::parseCapabilities(capabilities("a", "b", v));
            ADD_FAILURE() << "accepted";
        } catch (const VxXWcsVersionNotSupported& e) {
            EXPECT_EQ(e.arg(0), v);
        }
    }
    EXPECT_FALSE(VxWcsService::parseCapabilities("not xml"));
    EXPECT_FALSE(VxWcsService::parseCapabilities("<WCS_Capabilities version=\"1.1.1\"/>"));
    // Same local name in the WCS 2.0 namespace.
    EXPECT_FALSE(VxWcsService::parseCapabilities(
        "<Capabilities xmlns=\"http://www.opengis.net/wcs/2.0\" version=\"1.1.1\"/>"));
}

TEST(WcsCoverageDescription, UrnSplitCornersAndSwap) {
    // Lat/lon order on the wire for EPSG 4326.
    auto caps = describe(coverage("<SupportedCRS>urn:ogc:def:crs:EPSG::4326</SupportedCRS>",
                                  box("urn:ogc:def:crs:OGC::imageCRS", "0 0", "99 99") +
                                      box("urn:ogc:def:crs:EPSG::4326", "10 20", "30 40")));
    EXPECT_EQ(strings(caps->supportedCrs), (std::vector<std::string>{"urn:ogc:def:crs:EPSG::4326"}));
    EXPECT_EQ(caps->crsAuthority, "EPSG");
    EXPECT_EQ(caps->crsCode, "4326");
    ASSERT_TRUE(caps->crs);
    EXPECT_EQ(caps->crs.get(), VxCrs::fromAuthorityAndCode("EPSG", "4326").get());
    EXPECT_EQ(caps->bounds, VxRect(20, 10, 40, 30));

    // East/north systems keep the order; the authority is upper-cased.
    caps = describe(coverage("<SupportedCRS>urn:ogc:def:crs:epsg:6.3:3857</SupportedCRS>",
                             box("urn:ogc:def:crs:epsg:6.3:3857", "-100 -200", "100 200")));
    EXPECT_EQ(caps->crsAuthority, "EPSG");
    EXPECT_EQ(caps->crsCode, "3857");
    EXPECT_EQ(caps->bounds, VxRect(-100, -200, 100, 200));
}

TEST(WcsCoverageDescription, BoxesOutsideTheSupportedListOrMalformedCornersChangeNothing) {
    // Two fields: bounds set, no system; a missing system counts as swapped.
    auto caps = describe(coverage("<SupportedCRS>EPSG:4326</SupportedCRS>", box("EPSG:4326", "10 20", "30 40")));
    EXPECT_FALSE(caps->crs);
    EXPECT_TRUE(caps->crsAuthority.isEmpty());
    EXPECT_EQ(caps->bounds, VxRect(20, 10, 40, 30));

    caps = describe(coverage("<SupportedCRS>urn:ogc:def:crs:EPSG::4326</SupportedCRS>",
                             box("urn:ogc:def:crs:EPSG::3857", "1 2", "3 4")));
    EXPECT_FALSE(caps->crs);
    EXPECT_TRUE(caps->bounds.isNull());

    // Three numbers or one: that corner is left alone.
    caps = describe(coverage("<SupportedCRS>urn:ogc:def:crs:EPSG::3857</SupportedCRS>",
                             box("urn:ogc:def:crs:EPSG::3857", "1 2 3", "5") +
                                 box("urn:ogc:def:crs:EPSG::3857", "7 8 9", "9 10")));
    EXPECT_EQ(caps->bounds, VxRect(0, 0, 9, 10));

    // A system PROJ does not know leaves the record without one.
    caps = describe(coverage("<SupportedCRS>urn:ogc:def:crs:EPSG::999999</SupportedCRS>",
                             box("urn:ogc:def:crs:EPSG::999999", "1 2", "3 4")));
    EXPECT_FALSE(caps->crs);
    EXPECT_EQ(caps->bounds, VxRect(2, 1, 4, 3));
}

TEST(WcsCoverageDescription, SeveralDescriptionsAddUpAndTheLastMatchWins) {
    auto caps = describe(
        coverage("<SupportedCRS>urn:ogc:def:crs:EPSG::3857</SupportedCRS><SupportedFormat>image/tiff</SupportedFormat>",
                 box("urn:ogc:def:crs:EPSG::3857", "1 2", "3 4")) +
        coverage("<SupportedCRS>urn:ogc:def:crs:EPSG::4326</SupportedCRS>",
                 box("urn:ogc:def:crs:EPSG::4326", "50 10", "51 11")));
    EXPECT_EQ(strings(caps->supportedCrs),
              (std::vector<std::string>{"urn:ogc:def:crs:EPSG::3857", "urn:ogc:def:crs:EPSG::4326"}));
    EXPECT_EQ(strings(caps->supportedFormats), (std::vector<std::string>{"image/tiff"}));
    EXPECT_EQ(caps->crsCode, "4326");
    EXPECT_EQ(caps->bounds, VxRect(10, 50, 11, 51));

    try {
        VxRef<VxWcsCapabilities> c(new VxWcsCapabilities());
        VxWcsService::parseCoverageDescriptions(*c, "<CoverageDescription/>", "http://x/dc");
        ADD_FAILURE();
    } catch (const VxXDescribeCoverageResponseUnrecognized& e) {
        EXPECT_EQ(e.arg(0), "http://x/dc");
    }
    VxRef<VxWcsCapabilities> c(new VxWcsCapabilities());
    EXPECT_THROW(VxWcsService::parseCoverageDescriptions(*c, "<<", "u"), VxXDescribeCoverageFailed);
}

// The exchange: exact URLs, log lines, credentials only on the capabilities request.
TEST(WcsNegotiation, UrlsLogLinesAndCredentials) {
    LoopbackServer srv;
    const std::string caps = capabilities(srv.url("/dc?map=a"), srv.url("/gc?"));
    srv.serve("/wcs", caps, "text/xml");
    srv.serve("/dc", description(coverage("<SupportedCRS>urn:ogc:def:crs:EPSG::4326</SupportedCRS>",
                                          box("urn:ogc:def:crs:EPSG::4326", "45 5", "55 15"))),
              "text/xml");

    struct Case {
        std::string base, target;
    } cases[] = {
        {"/wcs", "/wcs?service=WCS&request=GetCapabilities&version=1.1.1"},
        {"/wcs?", "/wcs?service=WCS&request=GetCapabilities&version=1.1.1"},
        {"/wcs?map=x&", "/wcs?map=x&service=WCS&request=GetCapabilities&version=1.1.1"},
        {"/wcs?map=x", "/wcs?map=x&service=WCS&request=GetCapabilities&version=1.1.1"},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.base);
        srv.clearRequests();
        LogCapture log(VxLog::Info);
        VxRef<VxWcsCapabilities> r = VxWcsService::negotiateCapabilities(srv.url(c.base), "dem,x", 5, "u", "p");
        ASSERT_TRUE(r);
        EXPECT_EQ(r->bounds, VxRect(5, 45, 15, 55));
        auto seen = srv.requests();
        ASSERT_EQ(seen.size(), 2u);
        EXPECT_EQ(seen[0].target, c.target);
        EXPECT_TRUE(seen[0].hasHeader("Authorization"));
        EXPECT_EQ(seen[1].target, "/dc?map=a&service=WCS&version=1.1.1&request=DescribeCoverage&identifiers=dem,x");
        EXPECT_FALSE(seen[1].hasHeader("Authorization"));
        EXPECT_EQ(log.count("Negotiating capabilities with WCS service instance: " + srv.url(c.base), VxLog::Info), 1u);
        EXPECT_EQ(log.count("Trying with get capabilities with URL: " + srv.url(c.target), VxLog::Info), 1u);
        EXPECT_EQ(log.count("Requesting WCS coverage with timeout 5 seconds, URL: " + srv.url(seen[1].target),
                            VxLog::Info),
                  1u);
    }
}

TEST(WcsNegotiation, DescribeCoverageUrlForms) {
    LoopbackServer srv;
    srv.serve("/dc", description(""), "text/xml");
    for (auto [from, expected] : std::vector<std::pair<std::string, std::string>>{
             {"/dc", "/dc?service=WCS"}, {"/dc?", "/dc?service=WCS"}, {"/dc?a=1&", "/dc?a=1&service=WCS"},
             {"/dc?a=1", "/dc?a=1&service=WCS"}}) {
        srv.clearRequests();
        VxRef<VxWcsCapabilities> caps(new VxWcsCapabilities());
        caps->describeCoverageGetUrl = srv.url(from);
        VxWcsService::getCoverage(caps, "1.1.1", "c", 5);
        ASSERT_EQ(srv.requests().size(), 1u);
        EXPECT_EQ(srv.requests()[0].target, expected + "&version=1.1.1&request=DescribeCoverage&identifiers=c");
    }
}

TEST(WcsNegotiation, FailuresGiveNullWithTheirLogLines) {
    LoopbackServer srv;
    srv.serve("/old", capabilities(srv.url("/dc"), "x", "1.1.0"), "text/xml");
    srv.serve("/nodc", capabilities(srv.url("/missing"), "x"), "text/xml");
    srv.serve("/baddc", capabilities(srv.url("/baddc-doc"), "x"), "text/xml");
    srv.serve("/baddc-doc", "<ows:ExceptionReport xmlns:ows=\"http://www.opengis.net/ows/1.1\"/>", "text/xml");
    srv.serve("/other", "<WMT_MS_Capabilities version=\"1.1.1\"/>", "text/xml");

    LogCapture log(VxLog::Info);
    EXPECT_FALSE(VxWcsService::negotiateCapabilities(srv.url("/old"), "c", 5, "", ""));
    EXPECT_EQ(log.countContaining("GetCapabilities version=1.1.1 failed: "), 1u);
    EXPECT_EQ(log.count("Failed to negotiate capabilities", VxLog::Info), 1u);

    EXPECT_FALSE(VxWcsService::negotiateCapabilities(srv.url("/nodc"), "c", 5, "", ""));
    EXPECT_FALSE(VxWcsService::negotiateCapabilities(srv.url("/baddc"), "c", 5, "", ""));
    EXPECT_FALSE(VxWcsService::negotiateCapabilities(srv.url("/other"), "c", 5, "", ""));
    EXPECT_FALSE(VxWcsService::negotiateCapabilities(srv.url("/absent"), "c", 5, "", ""));
    EXPECT_EQ(log.count("Failed to negotiate capabilities", VxLog::Info), 5u);
    EXPECT_EQ(log.countContaining("GetCapabilities version=1.1.1 failed: "), 3u);

    EXPECT_THROW(VxWcsService::getCapabilities(srv.url("/nodc"), "c", 5, "", ""), VxXDescribeCoverageFailed);
    EXPECT_THROW(VxWcsService::getCapabilities(srv.url("/baddc"), "c", 5, "", ""),
                 VxXDescribeCoverageResponseUnrecognized);
    EXPECT_FALSE(VxWcsService::getCapabilities(srv.url("/other"), "c", 5, "", ""));
}

// Every WCS document of the corpus is read or refused; identifiers agree with OWSLib
// where it parsed the document as WCS 1.1.1 and found any.
TEST(WcsCorpus, CapabilitiesAndDescriptions) {
    const std::string dir = std::string(VX_CORPUS_DIR) + "/wcs";
    nlohmann::json ref = nlohmann::json::parse(readFile(std::string(VX_CORPUS_DIR) + "/owslib-reference.json"));
    std::vector<std::string> files;
    if (DIR* d = opendir(dir.c_str())) {
        while (dirent* e = readdir(d))
            if (std::string(e->d_name).find(".xml") != std::string::npos) files.push_back(e->d_name);
        closedir(d);
    }
    ASSERT_EQ(files.size(), 30u);
    int read = 0, refused = 0, compared = 0, described = 0;
    for (const std::string& f : files) {
        SCOPED_TRACE(f);
        const auto& r = ref["files"]["wcs/" + f];
        const std::string body = readFile(dir + "/" + f);
        const std::string version = r.value("root_version", nlohmann::json()).is_string()
                                        ? r["root_version"].get<std::string>()
                                        : std::string();
        if (f.find("describecoverage") != std::string::npos) {
            VxRef<VxWcsCapabilities> caps(new VxWcsCapabilities());
            if (r["root_namespace"].get<std::string>().find("/wcs/1.1") == std::string::npos) {
                EXPECT_THROW(VxWcsService::parseCoverageDescriptions(*caps, body, "u"),
                             VxXDescribeCoverageResponseUnrecognized);
                continue;
            }
            VxWcsService::parseCoverageDescriptions(*caps, body, "u");
            EXPECT_FALSE(caps->supportedCrs->empty());
            if (caps->crs) {
                EXPECT_TRUE(caps->bounds.isValid());
                ++described;
            }
            continue;
        }
        VxRef<VxWcsCapabilities> caps;
        try {
            caps = VxWcsService::parseCapabilities(body);
        } catch (const VxXWcsVersionNotSupported& e) {
            EXPECT_NE(version, "1.1.1");
            EXPECT_EQ(e.arg(0), version);
            ++refused;
            continue;
        }
        if (!caps) {
            EXPECT_EQ(r["kind"], "other");  // WCS 1.0 and 2.0 roots
            ++refused;
            continue;
        }
        ++read;
        EXPECT_EQ(version, "1.1.1");
        if (r.value("parsed", false) && r["service_title"].is_string()) {
            EXPECT_EQ(caps->title.str(), r["service_title"].get<std::string>());
        }
        // Identifiers come from GetCoverage's Identifier parameter; services that list
        // their coverages only under Contents (GeoServer) leave it empty.
        const auto ids = r.value("coverage_identifiers", std::vector<std::string>());
        if (r.value("parsed", false) && !ids.empty() && !caps->coverageIds->empty()) {
            EXPECT_EQ(strings(caps->coverageIds), ids);
            ++compared;
        }
    }
    EXPECT_EQ(read + refused, 19);
    EXPECT_GE(read, 6);
    EXPECT_GE(compared, 1);
    EXPECT_GE(described, 5);
}
