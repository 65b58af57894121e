#include "ogc/wcsservice.h"

#include "ogc/errors.h"
#include "ogc/http.h"
#include "ogc/ogcservice.h"
#include "vx/log.h"
#include "vx/stringutils.h"
#include "vx/xmlutilities.h"

namespace {

// Both WCS 1.1 namespaces and both OWS namespaces read alike.
void registerNamespaces(NamespaceStack& ns) {
    ns.registerPrefix("http://www.opengis.net/wcs/1.1.1", "wcs");
    ns.registerPrefix("http://www.opengis.net/wcs/1.1", "wcs");
    ns.registerPrefix("http://www.opengis.net/ows/1.1", "ows");
    ns.registerPrefix("http://www.opengis.net/ows", "ows");
    ns.registerPrefix("http://www.w3.org/1999/xlink", "xlink");
}

class CapabilitiesWalk {
public:
    CapabilitiesWalk(NamespaceStack& ns, VxWcsCapabilities& caps) : ns_(ns), caps_(caps) {}

    void run(const TiXmlElement* root) {
        for (const TiXmlElement* c = root->FirstChildElement(); c; c = c->NextSiblingElement()) {
            const std::string n = ns_.elementName(c);
            if (n == "ows.ServiceIdentification") serviceIdentification(c);
            else if (n == "ows.OperationsMetadata") operations(c);
        }
    }

private:
    void serviceIdentification(const TiXmlElement* s) {
        for (const TiXmlElement* c = s->FirstChildElement(); c; c = c->NextSiblingElement()) {
            const std::string n = ns_.elementName(c);
            if (n == "ows.Title") caps_.title = vxElementText(c);
            else if (n == "ows.Abstract") caps_.abstract = vxElementText(c);
        }
    }

    void operations(const TiXmlElement* om) {
        for (const TiXmlElement* op = om->FirstChildElement(); op; op = op->NextSiblingElement()) {
            if (ns_.elementName(op) != "ows.Operation") continue;
            const char* nameAttr = op->Attribute("name");
            const VxString name = VxString(nameAttr ? nameAttr : "").toLower();
            const bool describe = VxStringUtils::isEqualIgnoreCase(name, "describecoverage");
            const bool get = VxStringUtils::isEqualIgnoreCase(name, "getcoverage");
            if (!describe && !get) continue;
            for (const TiXmlElement* c = op->FirstChildElement(); c; c = c->NextSiblingElement()) {
                const std::string n = ns_.elementName(c);
                if (n == "ows.DCP") {
                    dcp(c, get ? caps_.getCoverageGetUrl : caps_.describeCoverageGetUrl,
                        get ? caps_.getCoveragePostUrl : caps_.describeCoveragePostUrl);
                } else if (n == "ows.Parameter" && get) {
                    parameter(c);
                }
            }
        }
    }

    void dcp(const TiXmlElement* d, VxString& getUrl, VxString& postUrl) {
        const TiXmlElement* http = ns_.findChild(d, "ows.HTTP");
        if (!http) return;
        href(ns_.findChild(http, "ows.Get"), getUrl);
        href(ns_.findChild(http, "ows.Post"), postUrl);
    }

    void href(const TiXmlElement* e, VxString& into) {
        if (!e) return;
        const char* h = ns_.findAttribute(e, "xlink.href");
        if (h && *h) into = h;
    }

    void parameter(const TiXmlElement* p) {
        const char* nameAttr = ns_.findAttribute(p, "name");
        const VxString name = VxString(nameAttr ? nameAttr : "").toLower();
        VxVec<VxString>* into = nullptr;
        if (name == "identifier") into = caps_.coverageIds.get();
        else if (name == "format") into = caps_.formats.get();
        else return;
        const TiXmlElement* values = ns_.findChild(p, "ows.AllowedValues");
        if (!values) values = p;
        for (const TiXmlElement* v = values->FirstChildElement(); v; v = v->NextSiblingElement()) {
            if (ns_.elementName(v) != "ows.Value") continue;
            const VxString t = vxElementText(v);
            if (!t.isEmpty()) into->push_back(t);
        }
    }

    NamespaceStack& ns_;
    VxWcsCapabilities& caps_;
};

class DescriptionWalk {
public:
    DescriptionWalk(NamespaceStack& ns, VxWcsCapabilities& caps) : ns_(ns), caps_(caps) {}

    void run(const TiXmlElement* description) {
        for (const TiXmlElement* c = description->FirstChildElement(); c; c = c->NextSiblingElement()) {
            const std::string n = ns_.elementName(c);
            if (n == "wcs.SupportedCRS") caps_.supportedCrs->push_back(vxElementText(c));
            else if (n == "wcs.SupportedFormat" && !vxElementText(c).isEmpty())
                caps_.supportedFormats->push_back(vxElementText(c));
        }
        for (const TiXmlElement* d = description->FirstChildElement(); d; d = d->NextSiblingElement()) {
            if (ns_.elementName(d) != "wcs.Domain") continue;
            for (const TiXmlElement* s = d->FirstChildElement(); s; s = s->NextSiblingElement()) {
                if (ns_.elementName(s) != "wcs.SpatialDomain") continue;
                for (const TiXmlElement* b = s->FirstChildElement(); b; b = b->NextSiblingElement())
                    if (ns_.elementName(b) == "ows.BoundingBox") boundingBox(b);
            }
        }
    }

private:
    void boundingBox(const TiXmlElement* b) {
        const char* crsAttr = ns_.findAttribute(b, "crs");
        const VxString crs = crsAttr ? crsAttr : "";
        // Walk a copy: the list is not changed here, but stay safe against it.
        const std::vector<VxString> supported(caps_.supportedCrs->begin(), caps_.supportedCrs->end());
        for (const VxString& s : supported) {
            if (s != crs) continue;
            const std::vector<VxString> fields = VxStringUtils::split(crs, ":", false);
            if (fields.size() == 7) {
                // A system PROJ does not know leaves the record without one (the dataset then
                // reports it) instead of failing the whole negotiation.
                const VxString authority = fields[4].toUpper();
                try {
                    VxRef<VxCrs> c = VxCrs::fromAuthorityAndCode(authority, fields[6]);
                    caps_.crsAuthority = authority;
                    caps_.crsCode = fields[6];
                    caps_.crs = c;
                } catch (const VxException&) {
                    VxLog::logf(VxLog::Warning, "Unknown coordinate reference system: %1%", crs);
                }
            }
            corners(b);
        }
    }

    void corners(const TiXmlElement* b) {
        const bool swap = VxOgcService::switchXY(caps_.crs);
        VxRect r = caps_.bounds;
        for (const TiXmlElement* c = b->FirstChildElement(); c; c = c->NextSiblingElement()) {
            const std::string n = ns_.elementName(c);
            const bool lower = n == "ows.LowerCorner";
            if (!lower && n != "ows.UpperCorner") continue;
            const std::vector<VxString> parts = VxStringUtils::split(vxElementText(c), " ", false);
            if (parts.size() != 2) continue;
            const double a = VxStringUtils::atof(parts[0]);
            const double bb = VxStringUtils::atof(parts[1]);
            const double x = swap ? bb : a;
            const double y = swap ? a : bb;
            if (lower) {
                r.minx = x;
                r.miny = y;
            } else {
                r.maxx = x;
                r.maxy = y;
            }
        }
        caps_.bounds = r;
    }

    NamespaceStack& ns_;
    VxWcsCapabilities& caps_;
};

}  // namespace

VxRef<VxWcsCapabilities> VxWcsService::negotiateCapabilities(const VxString& url, const VxString& identifiers,
                                                             int timeout, const VxString& user,
                                                             const VxString& password) {
    VxLog::logf(VxLog::Info, "Negotiating capabilities with WCS service instance: %1%", url);
    const VxString full = VxOgcService::readyForParameters(url) + "service=WCS&request=GetCapabilities&version=1.1.1";
    VxLog::logf(VxLog::Info, "Trying with get capabilities with URL: %1%", full);
    VxRef<VxWcsCapabilities> caps;
    try {
        caps = getCapabilities(full, identifiers, timeout, user, password);
    } catch (const VxException& e) {
        VxLog::logf(VxLog::Info, "GetCapabilities version=1.1.1 failed: %1%", e.asString());
        caps = nullptr;
    }
    if (!caps || caps->version != 0) {
        VxLog::info("Failed to negotiate capabilities");
        return nullptr;
    }
    return caps;
}

VxRef<VxWcsCapabilities> VxWcsService::getCapabilities(const VxString& url, const VxString& identifiers, int timeout,
                                                       const VxString& user, const VxString& password) {
    VxHttpResponse response;
    if (!httpGet(url.toActiveCP(), response, timeout, user.str(), password.str())) return nullptr;
    VxRef<VxWcsCapabilities> caps = parseCapabilities(response.data);
    if (!caps) return nullptr;
    getCoverage(caps, "1.1.1", identifiers, timeout);
    return caps;
}

VxRef<VxWcsCapabilities> VxWcsService::parseCapabilities(const std::string& body) {
    TiXmlDocument doc;
    VxString error;
    if (!VxXmlUtilities::loadXmlFromString(VxString::fromUtf8(body).str(), doc, error)) return nullptr;
    NamespaceStack ns;
    registerNamespaces(ns);
    const TiXmlElement* root = doc.FirstChildElement();
    if (!root) return nullptr;
    NamespaceStackEntry entry(ns, root);
    if (ns.elementName(root) != "wcs.Capabilities") return nullptr;
    const char* v = root->Attribute("version");
    const VxString version = v ? v : "";
    if (version.str() != "1.1.1") throw VxXWcsVersionNotSupported("wcsservice", __LINE__, version);
    VxRef<VxWcsCapabilities> caps(new VxWcsCapabilities());
    caps->version = 0;
    CapabilitiesWalk(ns, *caps).run(root);
    return caps;
}

void VxWcsService::getCoverage(const VxRef<VxWcsCapabilities>& capabilities, const VxString& version,
                               const VxString& identifiers, int timeout) {
    const VxString url = VxOgcService::readyForParameters(capabilities->describeCoverageGetUrl) + "service=WCS" + "&version=" +
                         version + "&request=DescribeCoverage" + "&identifiers=" + identifiers;
    VxLog::logf(VxLog::Info, "Requesting WCS coverage with timeout %1% seconds, URL: %2%", timeout, url);
    VxHttpResponse response;
    if (!httpGet(url.toActiveCP(), response, timeout, std::string(), std::string()))
        throw VxXDescribeCoverageFailed("wcsservice", __LINE__, url);
    parseCoverageDescriptions(*capabilities, response.data, url);
}

void VxWcsService::parseCoverageDescriptions(VxWcsCapabilities& capabilities, const std::string& body,
                                             const VxString& url) {
    TiXmlDocument doc;
    VxString error;
    if (!VxXmlUtilities::loadXmlFromString(VxString::fromUtf8(body).str(), doc, error))
        throw VxXDescribeCoverageFailed("wcsservice", __LINE__, url);
    NamespaceStack ns;
    registerNamespaces(ns);
    const TiXmlElement* root = doc.FirstChildElement();
    if (!root || ns.elementName(root) != "wcs.CoverageDescriptions")
        throw VxXDescribeCoverageResponseUnrecognized("wcsservice", __LINE__, url);
    NamespaceStackEntry entry(ns, root);
    DescriptionWalk walk(ns, capabilities);
    for (const TiXmlElement* c = root->FirstChildElement(); c; c = c->NextSiblingElement())
        if (ns.elementName(c) == "wcs.CoverageDescription") walk.run(c);
}
