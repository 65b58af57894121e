#include "ogc/cswservice.h"

#include "ogc/errors.h"
#include "ogc/http.h"
#include "vx/log.h"
#include "vx/stringutils.h"
#include "vx/xmlutilities.h"

const char* const VxCswService::kPlainConstraint =
    "<ogc:Filter xmlns:ogc=\"http://www.opengis.net/ogc\" xmlns:dc=\"http://purl.org/dc/elements/1.1/\">"
    "<ogc:PropertyIsEqualTo matchCase=\"false\"><ogc:PropertyName>dc:type</ogc:PropertyName>"
    "<ogc:Literal>service</ogc:Literal></ogc:PropertyIsEqualTo></ogc:Filter>";

const char* const VxCswService::kEncodedConstraint =
    "%3Cogc:Filter%20xmlns:ogc%3D%22http%3A//www.opengis.net/ogc%22%20"
    "xmlns:dc%3D%22http%3A//purl.org/dc/elements/1.1/%22%3E"
    "%3Cogc:PropertyIsEqualTo%20matchCase%3D%22false%22%3E%3Cogc:PropertyName%3Edc:type%3C/ogc:PropertyName%3E"
    "%3Cogc:Literal%3Eservice%3C/ogc:Literal%3E%3C/ogc:PropertyIsEqualTo%20%3E%3C/ogc:Filter%3E";

namespace {

class CapabilitiesWalk {
public:
    CapabilitiesWalk(NamespaceStack& ns, VxCswCapabilities& caps) : ns_(ns), caps_(caps) {}

    void run(const TiXmlElement* root) {
        for (const TiXmlElement* c = root->FirstChildElement(); c; c = c->NextSiblingElement()) {
            const std::string n = ns_.elementName(c);
            if (n == "ows.ServiceIdentification") identification(c);
            else if (n == "ows.ServiceProvider") provider(c);
            else if (n == "ows.OperationsMetadata") operations(c);
        }
    }

private:
    void identification(const TiXmlElement* s) {
        for (const TiXmlElement* c = s->FirstChildElement(); c; c = c->NextSiblingElement()) {
            const std::string n = ns_.elementName(c);
            if (n == "ows.Title") caps_.title = vxElementText(c);
            else if (n == "ows.Abstract") caps_.abstract = vxElementText(c);
            else if (n == "ows.Keywords") {
                for (const TiXmlElement* k = c->FirstChildElement(); k; k = k->NextSiblingElement())
                    if (ns_.elementName(k) == "ows.Keyword") caps_.keywords.insert(vxElementText(k));
            }
        }
    }

    void provider(const TiXmlElement* p) {
        for (const TiXmlElement* c = p->FirstChildElement(); c; c = c->NextSiblingElement())
            if (ns_.elementName(c) == "ows.ProviderName") caps_.providerName = vxElementText(c);
    }

    void operations(const TiXmlElement* om) {
        for (const TiXmlElement* op = om->FirstChildElement(); op; op = op->NextSiblingElement()) {
            if (ns_.elementName(op) != "ows.Operation") continue;
            caps_.operations.emplace_back();
            VxCswCapabilities::Operation& o = caps_.operations.back();
            const char* name = ns_.findAttribute(op, "name");
            if (name && *name) o.name = name;
            for (const TiXmlElement* d = op->FirstChildElement(); d; d = d->NextSiblingElement()) {
                if (ns_.elementName(d) != "ows.DCP") continue;
                const TiXmlElement* http = ns_.findChild(d, "ows.HTTP");
                if (!http) continue;
                href(ns_.findChild(http, "ows.Get"), o.getUrl);
                href(ns_.findChild(http, "ows.Post"), o.postUrl);
            }
        }
    }

    void href(const TiXmlElement* e, VxString& into) {
        if (!e) return;
        const char* h = ns_.findAttribute(e, "xlink.href");
        if (h && *h) into = h;
    }

    NamespaceStack& ns_;
    VxCswCapabilities& caps_;
};

}  // namespace

VxRef<VxCswCapabilities> VxCswService::getCapabilities(const VxString& url, int timeout) {
    VxHttpResponse response;
    if (!httpGet(url.toActiveCP(), response, timeout, std::string(), std::string())) return nullptr;
    return parseCapabilities(response.data);
}

VxRef<VxCswCapabilities> VxCswService::parseCapabilities(const std::string& body) {
    TiXmlDocument doc;
    VxString error;
    if (!VxXmlUtilities::loadXmlFromString(VxString::fromUtf8(body).str(), doc, error)) {
        // ErrorRow is already one-based (the stored row plus one).
        const int row = doc.Error() ? doc.ErrorRow() : 0;
        const char* desc = doc.Error() ? doc.ErrorDesc() : nullptr;
        throw VxXGetCapabilitiesXmlError("cswservice", __LINE__, VxStringUtils::itoa(row),
                                         desc ? VxString(desc) : error);
    }
    VxRef<VxCswCapabilities> caps(new VxCswCapabilities());
    NamespaceStack ns;
    ns.registerPrefix("http://www.opengis.net/cat/csw/2.0.2", "csw");
    ns.registerPrefix("http://www.opengis.net/cat/csw", "csw");
    ns.registerPrefix("http://www.opengis.net/ows", "ows");
    ns.registerPrefix("http://www.w3.org/1999/xlink", "xlink");
    const TiXmlElement* root = doc.FirstChildElement();
    if (!root || ns.elementName(root) != "csw.Capabilities") return nullptr;
    NamespaceStackEntry entry(ns, root);
    const char* v = root->Attribute("version");
    const VxString version = v ? v : "";
    if (version == "2.0.2") caps->version = 2;
    else if (version == "2.0.1") caps->version = 1;
    else throw VxXCswVersionNotSupported("cswservice", __LINE__, version);
    CapabilitiesWalk(ns, *caps).run(root);
    return caps;
}

std::string VxCswService::recordsParameters(int startPosition, bool encoded) {
    std::string p;
    p += "service=CSW&";
    p += "request=GetRecords&";
    p += "resultType=results&";
    p += "outputSchema=http://www.isotc211.org/2005/gmd&";
    p += "outputFormat=application/xml&";
    p += "constraintLanguage=FILTER&";
    p += "typeNames=gmd:MD_Metadata&";
    p += "CONSTRAINT_LANGUAGE_VERSION=1.1.0&";
    p += "CONSTRAINT=";
    p += encoded ? kEncodedConstraint : kPlainConstraint;
    p += "&";
    p += "maxRecords=25&";
    p += "startPosition=" + VxStringUtils::itoa(startPosition).str() + "&";
    return p;
}

bool VxCswService::getRecords(const VxString& url, TiXmlDocument& document, int startPosition, bool post,
                              int timeout) {
    VxLog::logf(VxLog::Info, "Requesting CS/W records starting with position %1% and with timeout %2% seconds, URL: %3%",
                startPosition, timeout, url);
    VxHttpResponse response;
    bool ok;
    if (post) {
        ok = httpPost(url.toActiveCP(), VxString(recordsParameters(startPosition, false)).toActiveCP(), response,
                      timeout, std::string(), std::string());
    } else {
        ok = httpGet((url + recordsParameters(startPosition, true)).toActiveCP(), response, timeout, std::string(),
                     std::string());
    }
    if (!ok) return false;
    // No DTD is ever read: a DOCTYPE turns into blanks of the same length. One without an
    // end is left for the parser to refuse.
    std::string body = response.data;
    VxXmlUtilities::blankDoctype(body);
    document.Parse(body.c_str(), nullptr, TIXML_ENCODING_UTF8);
    // A body the parser swallows whole (an unfinished declaration) holds no page.
    return !document.Error() && document.RootElement() != nullptr;
}
