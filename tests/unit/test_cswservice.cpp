#include <gtest/gtest.h>

#include <fstream>
#include <nlohmann/json.hpp>
#include <sstream>

#include "ogc/cswservice.h"
#include "ogc/errors.h"
#include "support/files.h"
#include "support/loopback_server.h"

namespace {

std::string corpus(const std::string& name) { return readFile(std::string(VX_CORPUS_DIR) + "/csw/" + name); }

std::string caps(const std::string& version, const std::string& inner) {
    return "<csw:Capabilities xmlns:csw=\"http://www.opengis.net/cat/csw/2.0.2\" xmlns:ows=\"http://www.opengis.net/ows\" "
           "xmlns:xlink=\"http://www.w3.org/1999/xlink\" version=\"" +
           version + "\">" + inner + "</csw:Capabilities>";
}

// Written out by hand from the wire form the catalogue expects.
const std::string kGetParameters =
    "service=CSW&request=GetRecords&resultType=results&outputSchema=http://www.isotc211.org/2005/gmd&"
    "outputFormat=application/xml&constraintLanguage=FILTER&typeNames=gmd:MD_Metadata&"
    "CONSTRAINT_LANGUAGE_VERSION=1.1.0&CONSTRAINT="
    "%3Cogc:Filter%20xmlns:ogc%3D%22http%3A//www.opengis.net/ogc%22%20xmlns:dc%3D%22http%3A//purl.org/dc/elements/"
    "1.1/%22%3E%3Cogc:PropertyIsEqualTo%20matchCase%3D%22false%22%3E%3Cogc:PropertyName%3Edc:type%3C/"
    "ogc:PropertyName%3E%3Cogc:Literal%3Eservice%3C/ogc:Literal%3E%3C/ogc:PropertyIsEqualTo%20%3E%3C/"
    "ogc:Filter%3E&maxRecords=25&startPosition=";

const std::string kPostBody =
    "service=CSW&request=GetRecords&resultType=results&outputSchema=http://www.isotc211.org/2005/gmd&"
    "outputFormat=application/xml&constraintLanguage=FILTER&typeNames=gmd:MD_Metadata&"
    "CONSTRAINT_LANGUAGE_VERSION=1.1.0&CONSTRAINT="
    "<ogc:Filter+xmlns:ogc=\"http://www.opengis.net/ogc\"+xmlns:dc=\"http://purl.org/dc/elements/1.1/\">"
    "<ogc:PropertyIsEqualTo+matchCase=\"false\"><ogc:PropertyName>dc:type</ogc:PropertyName>"
    "<ogc:Literal>service</ogc:Literal></ogc:PropertyIsEqualTo></ogc:Filter>&maxRecords=25&startPosition=";

}  // namespace

TEST(CswCapabilities, WalkAndVersions) {
    auto c = VxCswService::parseCapabilities(caps(
        "2.0.1",
        "<ows:ServiceIdentification><ows:Title>Cat</ows:Title><ows:Abstract>a</ows:Abstract><ows:Keywords>"
        "<ows:Keyword>b</ows:Keyword><ows:Keyword>a</ows:Keyword><ows:Keyword>b</ows:Keyword></ows:Keywords>"
        "</ows:ServiceIdentification><ows:ServiceProvider><ows:ProviderName>P</ows:ProviderName></ows:ServiceProvider>"
        "<ows:OperationsMetadata><ows:Operation><ows:DCP><ows:HTTP><ows:Get xlink:href=\"g1\"/></ows:HTTP></ows:DCP>"
        "<ows:DCP><ows:HTTP><ows:Get xlink:href=\"g2\"/><ows:Post xlink:href=\"p\"/></ows:HTTP></ows:DCP>"
        "</ows:Operation><ows:Operation name=\"GetRecords\"/></ows:OperationsMetadata>"));
    ASSERT_TRUE(c);
    EXPECT_EQ(c->version, 1);
    EXPECT_EQ(c->title, "Cat");
    EXPECT_EQ(c->providerName, "P");
    EXPECT_EQ(c->keywords, (std::set<VxString>{"a", "b"}));
    ASSERT_EQ(c->operations.size(), 2u);
    EXPECT_TRUE(c->operations[0].name.isEmpty());
    EXPECT_EQ(c->operations[0].getUrl, "g2");
    EXPECT_EQ(c->operations[0].postUrl, "p");
    EXPECT_EQ(c->operations[1].name, "GetRecords");
    EXPECT_EQ(c->bounds, VxRect(-180, -90, 180, 90));
    EXPECT_EQ(c->crs.get(), VxCrs::wgs84LongLat().get());

    EXPECT_EQ(VxCswService::parseCapabilities(caps("2.0.2", ""))->version, 2);
    try {
        VxCswService::parseCapabilities(caps("2.0.0", ""));
        ADD_FAILURE();
    } catch (const VxXCswVersionNotSupported& e) {
        EXPECT_EQ(e.arg(0), "2.0.0");
    }
    try {
        VxCswService::parseCapabilities("<a>\n<b></a>");
        ADD_FAILURE();
    } catch (const VxXGetCapabilitiesXmlError& e) {
        EXPECT_EQ(e.arg(0), "2");
        EXPECT_FALSE(e.arg(1).isEmpty());
    }
    EXPECT_FALSE(VxCswService::parseCapabilities(corpus("csw202-capabilities-pycsw-soap.xml")));
    EXPECT_FALSE(VxCswService::parseCapabilities(corpus("csw300-capabilities-pycsw.xml")));
}

TEST(CswCapabilities, CorpusAgreesWithOwslib) {
    nlohmann::json ref = nlohmann::json::parse(readFile(std::string(VX_CORPUS_DIR) + "/owslib-reference.json"));
    int compared = 0;
    for (const char* f : {"csw202-capabilities-pycsw.xml", "csw202-capabilities-pycsw-apiso.xml",
                          "csw202-capabilities-pycsw-transactions.xml", "csw202-capabilities-conterra-terracatalog.xml"}) {
        SCOPED_TRACE(f);
        const auto& r = ref["files"][std::string("csw/") + f];
        auto c = VxCswService::parseCapabilities(corpus(f));
        ASSERT_TRUE(c);
        EXPECT_EQ(c->version, 2);
        std::vector<std::string> names;
        for (const auto& op : c->operations) names.push_back(op.name.str());
        EXPECT_EQ(names, r["operation_names"].get<std::vector<std::string>>());
        EXPECT_EQ(c->title.str(), r["service_title"].get<std::string>());
        ++compared;
    }
    EXPECT_EQ(compared, 4);
}

TEST(CswService, CapabilitiesExchange) {
    LoopbackServer srv;
    srv.serve("/csw", corpus("csw202-capabilities-pycsw.xml"), "application/xml");
    auto c = VxCswService::getCapabilities(srv.url("/csw?service=CSW&request=GetCapabilities"), 5);
    ASSERT_TRUE(c);
    EXPECT_EQ(srv.requests().at(0).target, "/csw?service=CSW&request=GetCapabilities");
    EXPECT_FALSE(srv.requests().at(0).hasHeader("Authorization"));
    EXPECT_FALSE(VxCswService::getCapabilities(srv.url("/none"), 5));
}

// The exact GET query and POST body the catalogue receives, and the page parsed.
TEST(CswService, GetRecordsGetAndPost) {
    LoopbackServer srv;
    srv.serve("/csw", corpus("csw202-getrecords-pycsw-iso.xml"), "application/xml");

    TiXmlDocument doc;
    ASSERT_TRUE(VxCswService::getRecords(srv.url("/csw?"), doc, 1, false, 5));
    ASSERT_EQ(srv.requests().size(), 1u);
    EXPECT_EQ(srv.requests()[0].method, "GET");
    EXPECT_EQ(srv.requests()[0].target, "/csw?" + kGetParameters + "1&");
    ASSERT_TRUE(doc.RootElement());
    EXPECT_STREQ(doc.RootElement()->Value(), "csw:GetRecordsResponse");

    srv.clearRequests();
    TiXmlDocument doc2;
    ASSERT_TRUE(VxCswService::getRecords(srv.url("/csw?map=1&"), doc2, 26, false, 5));
    EXPECT_EQ(srv.requests()[0].target, "/csw?map=1&" + kGetParameters + "26&");

    srv.clearRequests();
    TiXmlDocument doc3;
    ASSERT_TRUE(VxCswService::getRecords(srv.url("/csw"), doc3, 51, true, 5));
    ASSERT_EQ(srv.requests().size(), 1u);
    EXPECT_EQ(srv.requests()[0].method, "POST");
    EXPECT_EQ(srv.requests()[0].target, "/csw");
    EXPECT_EQ(srv.requests()[0].body, kPostBody + "51&");

    TiXmlDocument doc4;
    EXPECT_FALSE(VxCswService::getRecords(srv.url("/none?"), doc4, 1, false, 5));
}

TEST(CswService, DoctypesAreBlankedOrRefused) {
    LoopbackServer srv;
    TiXmlDocument doc;
    // An internal subset spread over lines.
    srv.serve("/a", "<?xml version=\"1.0\"?>\n<!DOCTYPE r [\n<!ENTITY x \"y\">\n]>\n<r><n>1</n></r>", "text/xml");
    ASSERT_TRUE(VxCswService::getRecords(srv.url("/a?"), doc, 1, false, 5));
    EXPECT_STREQ(doc.RootElement()->Value(), "r");

    // No internal subset, and a CDATA end later: the records must survive.
    TiXmlDocument doc2;
    srv.serve("/b", "<!DOCTYPE r SYSTEM \"r.dtd\"><r><![CDATA[a]]></r>", "text/xml");
    ASSERT_TRUE(VxCswService::getRecords(srv.url("/b?"), doc2, 1, false, 5));
    ASSERT_TRUE(doc2.RootElement());
    EXPECT_STREQ(doc2.RootElement()->Value(), "r");

    // A declaration that never ends: refused, nothing read beyond the body.
    TiXmlDocument doc3;
    srv.serve("/c", "<?xml version=\"1.0\"?><!DOCTYPE r [ <!ENTITY x \"y\"", "text/xml");
    EXPECT_FALSE(VxCswService::getRecords(srv.url("/c?"), doc3, 1, false, 5));

    TiXmlDocument doc4;
    srv.serve("/d", "<r><unclosed></r>", "text/xml");
    EXPECT_FALSE(VxCswService::getRecords(srv.url("/d?"), doc4, 1, false, 5));
}
