#include <gtest/gtest.h>

#include "ogc/errors.h"
#include "ogc/wmsservice.h"
#include "support/logcapture.h"
#include "support/loopback_server.h"

namespace {

const char* kCaps111 =
    "<?xml version=\"1.0\"?><WMT_MS_Capabilities version=\"1.1.1\"><Service><Name>OGC:WMS</Name><Title>Old"
    "</Title></Service><Capability><Request><GetMap><Format>image/png</Format><DCPType><HTTP><Get>"
    "<OnlineResource xmlns:xlink=\"http://www.w3.org/1999/xlink\" xlink:href=\"http://h/map?\"/></Get></HTTP>"
    "</DCPType></GetMap></Request><Layer><Name>top</Name><SRS>EPSG:4326</SRS></Layer></Capability>"
    "</WMT_MS_Capabilities>";
const char* kCaps130 =
    "<?xml version=\"1.0\"?><WMS_Capabilities version=\"1.3.0\" xmlns=\"http://www.opengis.net/wms\">"
    "<Service><Name>WMS</Name><Title>New</Title></Service><Capability><Layer><Name>top</Name>"
    "<CRS>EPSG:3857</CRS></Layer></Capability></WMS_Capabilities>";
const char* kException =
    "<?xml version=\"1.0\"?><ServiceExceptionReport version=\"1.3.0\" xmlns=\"http://www.opengis.net/ogc\">"
    "<ServiceException>Missing VERSION</ServiceException></ServiceExceptionReport>";

// Answers each of the three negotiation requests with what the test gives it.
struct Service {
    LoopbackServer srv;
    std::map<std::string, std::pair<std::string, std::string>> byVersion;  // version → (type, body)
    Service() {
        srv.on("/wms", [this](const httplib::Request& req, httplib::Response& res) {
            const std::string v = req.has_param("version") ? req.get_param_value("version") : "";
            auto it = byVersion.find(v);
            if (it == byVersion.end()) {
                res.status = 404;
                return;
            }
            res.set_content(it->second.second, it->second.first.c_str());
        });
    }
    std::vector<std::string> targets() {
        std::vector<std::string> out;
        for (const auto& r : srv.requests()) out.push_back(r.target);
        return out;
    }
};

}  // namespace

TEST(WmsNegotiation, AttemptsInOrderWithExactUrlsAndLogLines) {
    Service s;
    s.byVersion[""] = {"application/vnd.ogc.se_xml", kException};  // refused by the exchange
    s.byVersion["1.3.0"] = {"text/xml", kException};                // read, then raised
    s.byVersion["1.1.1"] = {"application/vnd.ogc.wms_xml", kCaps111};
    LogCapture log(VxLog::Info);
    auto caps = VxOgcWmsService::negotiateCapabilities(s.srv.url("/wms"), 5, "", "");
    ASSERT_TRUE(caps);
    EXPECT_EQ(caps->version, 0);
    EXPECT_EQ(caps->title, "Old");
    EXPECT_EQ(s.targets(), (std::vector<std::string>{
                               "/wms?service=WMS&request=GetCapabilities",
                               "/wms?service=WMS&request=GetCapabilities&version=1.3.0",
                               "/wms?service=WMS&request=GetCapabilities&version=1.1.1"}));
    EXPECT_EQ(log.count("Negotiating capabilities with WMS service instance: " + s.srv.url("/wms"), VxLog::Info), 1u);
    EXPECT_EQ(log.count("GetCapabilities version=1.3.0 failed: \"Missing VERSION\" from " +
                            s.srv.url("/wms?service=WMS&request=GetCapabilities&version=1.3.0"),
                        VxLog::Info),
              1u);
    // A refused exchange goes on silently (the exchange logged its own line).
    EXPECT_EQ(log.countContaining("without version failed"), 0u);
}

TEST(WmsNegotiation, UnversionedAnswerIsUsedAsIs) {
    Service s;
    s.byVersion[""] = {"application/vnd.ogc.wms_xml", kCaps111};
    auto caps = VxOgcWmsService::negotiateCapabilities(s.srv.url("/wms?map=x&"), 5, "", "");
    ASSERT_TRUE(caps);
    EXPECT_EQ(caps->version, 0);
    EXPECT_EQ(s.targets(), (std::vector<std::string>{"/wms?map=x&service=WMS&request=GetCapabilities"}));
}

TEST(WmsNegotiation, ExceptionReportThenProxyPageThenWrongVersion) {
    Service s;
    s.byVersion[""] = {"text/xml", kException};
    s.byVersion["1.3.0"] = {"application/xml", "<html><body>Proxy error</body></html>"};
    s.byVersion["1.1.1"] = {"text/xml", "<WMS_Capabilities version=\"1.1.1\" xmlns=\"http://www.opengis.net/wms\"/>"};
    LogCapture log(VxLog::Info);
    auto caps = VxOgcWmsService::negotiateCapabilities(s.srv.url("/wms?"), 5, "", "");
    EXPECT_FALSE(caps);
    EXPECT_EQ(s.targets(), (std::vector<std::string>{
                               "/wms?&service=WMS&request=GetCapabilities",
                               "/wms?&service=WMS&request=GetCapabilities&version=1.3.0",
                               "/wms?&service=WMS&request=GetCapabilities&version=1.1.1"}));
    EXPECT_EQ(log.countContaining("GetCapabilities without version failed: \"Missing VERSION\" from "), 1u);
    EXPECT_EQ(log.countContaining("version=1.3.0 failed"), 0u);  // the proxy page is not an error
    EXPECT_EQ(log.count("GetCapabilities version=1.1.1 failed: WMS service version 1.1.1 is not supported"), 1u);
    EXPECT_EQ(log.count("Failed to negotiate capabilities", VxLog::Info), 1u);
}

TEST(WmsNegotiation, OneExchangeRaisesOrReturnsNull) {
    Service s;
    s.byVersion[""] = {"text/xml", kCaps130};
    s.byVersion["1.3.0"] = {"text/xml", "<WMS_Capabilities version=\"1.3.0\"><Service>"};
    auto caps = VxOgcWmsService::getCapabilities(s.srv.url("/wms?"), 5, "", "");
    ASSERT_TRUE(caps);
    EXPECT_EQ(caps->version, 1);
    EXPECT_EQ(caps->crs->id(), "EPSG:3857");
    EXPECT_THROW(VxOgcWmsService::getCapabilities(s.srv.url("/wms?version=1.3.0"), 5, "", ""),
                 VxXWmsGetCapabilitiesXmlError);
    EXPECT_FALSE(VxOgcWmsService::getCapabilities(s.srv.url("/wms?version=9"), 5, "", ""));  // 404
    EXPECT_FALSE(VxOgcWmsService::getCapabilities("ftp://example.invalid/", 5, "", ""));
}

TEST(WmsNegotiation, ServiceUrlNormalisation) {
    EXPECT_EQ(normalizeServiceUrl("http://h/wms"), "http://h/wms?");
    EXPECT_EQ(normalizeServiceUrl("http://h/wms?SERVICE=WMS&Request=GetCapabilities"), "http://h/wms?");
    EXPECT_EQ(normalizeServiceUrl("http://h/wms?request=GetCapabilities&map=a"), "http://h/wms?map=a&");
    EXPECT_EQ(normalizeServiceUrl("http://h/wms?map=a&request=getcapabilities&service=wms&"), "http://h/wms?map=a&");
    EXPECT_EQ(normalizeServiceUrl("http://h/wms?map=a"), "http://h/wms?map=a&");
    EXPECT_EQ(normalizeServiceUrl("http://h/wms?"), "http://h/wms?");
}
