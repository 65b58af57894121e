#include <gtest/gtest.h>

#include <dirent.h>

#include <fstream>
#include <nlohmann/json.hpp>
#include <set>
#include <sstream>

#include "ogc/errors.h"
#include "support/files.h"
#include "ogc/wmsservice.h"
#include "support/logcapture.h"

namespace {

VxRef<VxOgcWmsCapabilities> parse(const std::string& doc) {
    return VxOgcWmsService::parseCapabilities(doc, "http://test/wms");
}

std::string wms130(const std::string& service, const std::string& capability) {
    return "<?xml version=\"1.0\"?><WMS_Capabilities version=\"1.3.0\" xmlns=\"http://www.opengis.net/wms\" "
           "xmlns:xlink=\"http://www.w3.org/1999/xlink\"><Service><Name>WMS</Name>" +
           service + "</Service><Capability>" + capability + "</Capability></WMS_Capabilities>";
}

std::string wms111(const std::string& capability) {
    return "<?xml version=\"1.0\"?><!DOCTYPE WMT_MS_Capabilities SYSTEM \"http://x/capabilities_1_1_1.dtd\" "
           "[<!ELEMENT VendorSpecificCapabilities EMPTY>]><WMT_MS_Capabilities version=\"1.1.1\"><Service>"
           "<Name>OGC:WMS</Name><Title>t</Title></Service><Capability>" +
           capability + "</Capability></WMT_MS_Capabilities>";
}

std::vector<std::string> namedLayers(const VxRef<VxOgcWmsServerLayer>& l) {
    std::vector<std::string> out;
    if (!l->name().isEmpty()) out.push_back(l->name().str());
    auto kids = l->layers();
    for (size_t i = 0; i < kids->size(); ++i) {
        auto sub = namedLayers(l->getChildLayer(static_cast<unsigned>(i)));
        out.insert(out.end(), sub.begin(), sub.end());
    }
    return out;
}

}  // namespace

TEST(WmsCapabilitiesParse, ServiceLimitsAreValidatedAndClamped) {
    LogCapture log;
    auto caps = parse(wms130("<MaxWidth>2048</MaxWidth><MaxHeight>8192</MaxHeight>", ""));
    ASSERT_TRUE(caps);
    EXPECT_EQ(caps->version, 1);
    EXPECT_EQ(caps->maxWidth, 2048);
    EXPECT_EQ(caps->maxHeight, 4096);
    EXPECT_EQ(log.count("Clamping MaxHeight from 8192 to 4096", VxLog::Info), 1u);
    EXPECT_EQ(log.countContaining("Clamping"), 1u);

    auto message = [](const std::string& service) {
        try {
            parse(wms130(service, ""));
        } catch (const VxXWmsServiceException& e) {
            return e.asString().str();
        }
        return std::string("no exception");
    };
    EXPECT_EQ(message("<MaxWidth>0</MaxWidth>"), "Invalid MaxWidth: 0");
    EXPECT_EQ(message("<MaxWidth>-5</MaxWidth>"), "Invalid MaxWidth: -5");
    EXPECT_EQ(message("<MaxHeight>lots</MaxHeight>"), "Invalid MaxHeight: 0");
    // An absurd number is clamped, not wrapped around.
    caps = parse(wms130("<MaxWidth>99999999999</MaxWidth>", ""));
    EXPECT_EQ(caps->maxWidth, 4096);
}

TEST(WmsCapabilitiesParse, FormatsEndpointsAndServiceTexts) {
    auto caps = parse(wms130(
        "<Title>My title</Title><Abstract>abs</Abstract><KeywordList><Keyword>a</Keyword><Keyword>b</Keyword>"
        "<Keyword>a</Keyword></KeywordList><ContactInformation><ContactPersonPrimary><ContactPerson>Ann</ContactPerson>"
        "<ContactOrganization>Org</ContactOrganization></ContactPersonPrimary>"
        "<ContactElectronicMailAddress>a@b.c</ContactElectronicMailAddress></ContactInformation>",
        "<Request><GetCapabilities/><GetMap><Format>image/png</Format><Format>image/png; mode=8bit</Format>"
        "<Format>image/tiff</Format><Format>image/jpeg</Format><Format>IMAGE/GIF</Format>"
        "<DCPType><HTTP><Get><OnlineResource xlink:href=\"http://h/get?\"/></Get>"
        "<Post><OnlineResource xlink:href=\"http://h/post\"/></Post></HTTP></DCPType></GetMap></Request>"));
    ASSERT_TRUE(caps);
    EXPECT_EQ(caps->formats, (std::vector<OgcImageFormat>{Png, Png8, Jpeg}));
    EXPECT_EQ(caps->getMapGetUrl, "http://h/get?");
    EXPECT_EQ(caps->getMapPostUrl, "http://h/post");
    EXPECT_EQ(caps->title, "My title");
    EXPECT_EQ(caps->abstract, "abs");
    EXPECT_EQ(caps->keywords, (std::set<VxString>{"a", "b"}));
    EXPECT_EQ(caps->contactPerson, "Ann");
    EXPECT_EQ(caps->contactOrganization, "Org");
    EXPECT_EQ(caps->contactElectronicMailAddress, "a@b.c");
    EXPECT_EQ(caps->maxWidth, 4096);
}

TEST(WmsCapabilitiesParse, LayerTreeCrsScalesStylesAndKeywords) {
    auto caps = parse(wms111(
        "<Layer><Title>root</Title><SRS>EPSG:4326 epsg:3857</SRS><SRS>urn:ogc:def:crs:EPSG::1</SRS>"
        "<LatLonBoundingBox minx=\"-10\" miny=\"-20\" maxx=\"30\" maxy=\"40\"/>"
        "<Style><Name>default</Name><Title>Default</Title></Style>"
        "<Layer><Name>roads</Name><Title>Roads</Title><ScaleHint min=\"1\" max=\"50\"/>"
        "<Style><Name>thin</Name></Style></Layer>"
        "<Layer><Name>rivers</Name><ScaleHint min=\"7\"/><MinScaleDenominator>100</MinScaleDenominator>"
        "<KeywordList><Keyword>org.vxogc.initially.off</Keyword></KeywordList></Layer>"
        "<Layer><Name>lakes</Name><KeywordList><Keyword>x.org.vxogc.initially.off</Keyword></KeywordList></Layer>"
        "</Layer>"));
    ASSERT_TRUE(caps);
    EXPECT_EQ(caps->version, 0);
    auto root = caps->layer();
    EXPECT_EQ(root->title, "root");
    EXPECT_EQ(root->getLayerBounds(), VxRect(-10, -20, 30, 40));
    EXPECT_EQ(root->supportedCrs, (std::vector<VxOgcWmsServerLayer::CrsPair>{{"EPSG", "3857"}, {"EPSG", "4326"}}));
    ASSERT_EQ(root->layers()->size(), 3u);
    auto roads = root->getChildLayer(0), rivers = root->getChildLayer(1), lakes = root->getChildLayer(2);
    // ScaleHint is a pixel diagonal in metres: 50 m is about 1:126,000.
    EXPECT_NEAR(roads->minScale(), 2525.38, 0.01);
    EXPECT_NEAR(roads->maxScale(), 126269.07, 0.01);
    EXPECT_EQ(rivers->minScale(), 100);  // ScaleHint without max is ignored
    EXPECT_EQ(rivers->maxScale(), 0);
    ASSERT_EQ(roads->namedStyles()->size(), 2u);
    EXPECT_EQ(roads->namedStyles()->get(0)->name, "thin");
    EXPECT_EQ(roads->namedStyles()->get(1)->name, "default");
    EXPECT_TRUE(roads->enabled());
    EXPECT_FALSE(rivers->enabled());
    EXPECT_TRUE(lakes->enabled());
    EXPECT_EQ(roads->getLayerBounds(), VxRect(-10, -20, 30, 40));
    EXPECT_EQ(caps->crs->id(), "EPSG:3857");  // first usable pair after sorting
    EXPECT_TRUE(caps->isCrsSupported(VxCrs::fromAuthorityAndCode("epsg", "4326")));
    EXPECT_FALSE(caps->isCrsSupported(VxCrs::fromAuthorityAndCode("EPSG", "3035")));
}

TEST(WmsCapabilitiesParse, BoundingBoxRulesAndDefaultCrs) {
    // Only a projected BoundingBox: it names the default CRS; bounds fall back to the world.
    auto caps = parse(wms130("", "<Layer><CRS>epsg:3035</CRS><BoundingBox CRS=\"EPSG:3035\" minx=\"1\" miny=\"2\" "
                                 "maxx=\"3\" maxy=\"4\"/><Layer><Name>a</Name></Layer></Layer>"));
    ASSERT_TRUE(caps);
    EXPECT_EQ(caps->crs->id(), "EPSG:3035");
    EXPECT_EQ(caps->layer()->getLayerBounds(), VxRect(-180, -90, 180, 90));
    EXPECT_EQ(caps->layer()->supportedCrs.front().first, "EPSG");

    // The geographic box comes first and wins over a later CRS:84 box.
    caps = parse(wms130("", "<Layer><EX_GeographicBoundingBox><westBoundLongitude>-5</westBoundLongitude>"
                            "<southBoundLatitude>40</southBoundLatitude><eastBoundLongitude>10</eastBoundLongitude>"
                            "</EX_GeographicBoundingBox><BoundingBox CRS=\"CRS:84\" minx=\"-1\" miny=\"-1\" "
                            "maxx=\"1\" maxy=\"1\"/></Layer>"));
    EXPECT_EQ(caps->layer()->getLayerBounds(), VxRect(-5, 40, 10, 0));
    EXPECT_EQ(caps->crs->id(), "CRS:84");

    // Only the image CRS listed: WGS 84.
    caps = parse(wms130("", "<Layer><CRS>CRS:1</CRS></Layer>"));
    EXPECT_EQ(caps->crs.get(), VxCrs::wgs84LongLat().get());

    // A layer directly under the root reads like a top layer.
    caps = parse("<WMS_Capabilities version=\"1.3.0\" xmlns=\"http://www.opengis.net/wms\"><Layer><Title>T</Title>"
                 "</Layer></WMS_Capabilities>");
    EXPECT_EQ(caps->layer()->title, "T");
}

TEST(WmsCapabilitiesParse, VersionsExceptionsAndForeignRoots) {
    auto message = [](const std::string& doc) -> std::string {
        try {
            auto c = parse(doc);
            return c ? "record" : "null";
        } catch (const VxException& e) {
            return std::string(e.errorId()) + ": " + e.asString().str();
        }
    };
    EXPECT_EQ(message("<WMS_Capabilities version=\"1.3\" xmlns=\"http://www.opengis.net/wms\"/>"),
              "WmsVersionNotSupported: WMS service version 1.3 is not supported");
    EXPECT_EQ(message("<WMT_MS_Capabilities version=\"1.0.0\"/>"),
              "WmsVersionNotSupported: WMS service version 1.0.0 is not supported");
    EXPECT_EQ(message("<ServiceExceptionReport version=\"1.1.1\"><ServiceException code=\"x\">Bad thing"
                      "</ServiceException></ServiceExceptionReport>"),
              "WmsServiceException: \"Bad thing\" from http://test/wms");
    EXPECT_EQ(message("<ows:ExceptionReport xmlns:ows=\"http://www.opengis.net/ows\"><ows:Exception/>"
                      "</ows:ExceptionReport>"),
              "WmsServiceException: Unknown exception from http://test/wms");
    EXPECT_EQ(message("<html><body>proxy error</body></html>"), "null");
    EXPECT_EQ(message("not xml at all").rfind("GetCapabilitiesXmlError: Error parsing WMS GetCapabilites response: ", 0), 0u);
    EXPECT_EQ(message("<WMS_Capabilities version=\"1.3.0\"><Service>").rfind("GetCapabilitiesXmlError", 0), 0u);
}

TEST(WmsCapabilitiesParse, HostileDocumentsFailCleanly) {
    std::string deep = "<WMT_MS_Capabilities version=\"1.1.1\"><Capability>";
    for (int i = 0; i < 20000; ++i) deep += "<Layer><Name>n</Name>";
    for (int i = 0; i < 20000; ++i) deep += "</Layer>";
    deep += "</Capability></WMT_MS_Capabilities>";
    EXPECT_THROW(parse(deep), VxXWmsGetCapabilitiesXmlError);

    // Moderately deep trees still parse, with unique names throughout.
    std::string ok = "<WMT_MS_Capabilities version=\"1.1.1\"><Capability>";
    for (int i = 0; i < 500; ++i) ok += "<Layer><Name>n</Name>";
    for (int i = 0; i < 500; ++i) ok += "</Layer>";
    ok += "</Capability></WMT_MS_Capabilities>";
    auto caps = parse(ok);
    ASSERT_TRUE(caps);
    EXPECT_TRUE(caps->layer()->findLayerByUniqueName("n.499"));

    // A NUL byte ends the text; what follows is never read.
    std::string withNul = wms130("<Title>a</Title>", "");
    withNul += std::string(1, '\0') + "garbage";
    EXPECT_TRUE(parse(withNul));
    EXPECT_THROW(parse(std::string("<WMS_Capabilities", 17) + std::string(1, '\0') + "/>"),
                 VxXWmsGetCapabilitiesXmlError);
}

TEST(WmsCapabilitiesParse, CloneIsIndependent) {
    auto caps = parse(wms111("<Layer><Name>r</Name><Layer><Name>a</Name></Layer></Layer>"));
    VxRef<VxOgcWmsCapabilities> copy(caps->clone());
    copy->layer()->getChildLayer(0)->enabled(false);
    copy->title = "changed";
    EXPECT_TRUE(caps->layer()->getChildLayer(0)->enabled());
    EXPECT_EQ(caps->title, "t");
    EXPECT_EQ(copy->crs.get(), caps->crs.get());
    EXPECT_NE(copy->layer().get(), caps->layer().get());
}

// Every WMS document of the corpus parses or fails with a catalogued exception; where
// OWSLib parsed it, the named layers, GetMap URL and formats agree.
TEST(WmsCapabilitiesCorpus, AgreesWithOwslib) {
    const std::string dir = std::string(VX_CORPUS_DIR) + "/wms";
    nlohmann::json ref = nlohmann::json::parse(readFile(std::string(VX_CORPUS_DIR) + "/owslib-reference.json"));
    std::vector<std::string> files;
    if (DIR* d = opendir(dir.c_str())) {
        while (dirent* e = readdir(d))
            if (std::string(e->d_name).size() > 4 && std::string(e->d_name).find(".xml") != std::string::npos)
                files.push_back(e->d_name);
        closedir(d);
    }
    ASSERT_GE(files.size(), 40u);
    int compared = 0;
    for (const std::string& f : files) {
        SCOPED_TRACE(f);
        const auto& r = ref["files"]["wms/" + f];
        VxRef<VxOgcWmsCapabilities> caps;
        try {
            caps = parse(readFile(dir + "/" + f));
        } catch (const VxXWmsVersionNotSupported&) {
            EXPECT_EQ(r.value("kind", ""), "other");
            continue;
        }
        ASSERT_TRUE(caps) << "no record";
        if (!r.value("parsed", false)) continue;

        // OWSLib keeps the first of repeated names.
        std::vector<std::string> ours, seen;
        for (const auto& n : namedLayers(caps->layer()))
            if (std::find(seen.begin(), seen.end(), n) == seen.end()) {
                seen.push_back(n);
                ours.push_back(n);
            }
        EXPECT_EQ(ours, r["layer_names"].get<std::vector<std::string>>());
        if (r.contains("service_title") && r["service_title"].is_string()) {
            EXPECT_EQ(caps->title.str(), r["service_title"].get<std::string>());
        }
        if (r.contains("getmap_url") && r["getmap_url"].is_string()) {
            EXPECT_EQ(caps->getMapGetUrl.str(), r["getmap_url"].get<std::string>());
        }
        std::vector<OgcImageFormat> expected;
        std::vector<std::string> owsFormats;
        if (r.contains("getmap_formats") && r["getmap_formats"].is_array())
            owsFormats = r["getmap_formats"].get<std::vector<std::string>>();
        for (const auto& fmt : owsFormats) {
            if (fmt == "image/png") expected.push_back(Png);
            else if (fmt == "image/jpeg") expected.push_back(Jpeg);
            else if (fmt == "image/gif") expected.push_back(Gif);
            else if (fmt.rfind("image/png;", 0) == 0) {
                expected.push_back(fmt.find("mode=8bit") != std::string::npos ? Png8 : Png);
            }
        }
        EXPECT_EQ(caps->formats, expected);
        ++compared;
    }
    EXPECT_GE(compared, 40);
}
