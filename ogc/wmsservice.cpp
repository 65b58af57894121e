#include "ogc/wmsservice.h"

#include <cmath>
#include <cstring>

#include "ogc/errors.h"
#include "ogc/http.h"
#include "vx/log.h"
#include "vx/stringutils.h"

const char* const kVxOgcInitiallyOffKeyword = "org.vxogc.initially.off";

namespace {

const char* const kWmsNs = "http://www.opengis.net/wms";
const char* const kSldNs = "http://www.opengis.net/sld";
const char* const kXlinkNs = "http://www.w3.org/1999/xlink";

// Scale denominator for a ScaleHint value, with the standard 0.28 mm pixel.
double scaleHintToDenominator(double diagonalMetres) {
    return diagonalMetres / std::sqrt(2.0) / 0.00028;
}

// The document walk; one instance per document.
class CapabilitiesWalk {
public:
    CapabilitiesWalk(NamespaceStack& ns, VxOgcWmsCapabilities& caps) : ns_(ns), caps_(caps) {}

    void run(const TiXmlElement* root) {
        for (const TiXmlElement* c = root->FirstChildElement(); c; c = c->NextSiblingElement()) {
            const std::string n = ns_.elementName(c);
            if (n == "wms.Service") service(c);
            else if (n == "wms.Capability") capability(c);
            else if (n == "wms.Layer") topLayer(c);
        }
        finish();
    }

private:
    static VxString text(const TiXmlElement* e) { return vxElementText(e); }

    void service(const TiXmlElement* s) {
        for (const TiXmlElement* c = s->FirstChildElement(); c; c = c->NextSiblingElement()) {
            const std::string n = ns_.elementName(c);
            if (n == "wms.Name") caps_.name = text(c);
            else if (n == "wms.Title") caps_.title = text(c);
            else if (n == "wms.Abstract") caps_.abstract = text(c);
            else if (n == "wms.ContactInformation") contact(c);
            else if (n == "wms.KeywordList") {
                for (const TiXmlElement* k = c->FirstChildElement(); k; k = k->NextSiblingElement())
                    if (ns_.elementName(k) == "wms.Keyword") caps_.keywords.insert(text(k));
            } else if (n == "wms.MaxWidth") caps_.maxWidth = sizeLimit(c, "MaxWidth");
            else if (n == "wms.MaxHeight") caps_.maxHeight = sizeLimit(c, "MaxHeight");
        }
    }

    int sizeLimit(const TiXmlElement* e, const char* what) {
        const int64_t v = VxStringUtils::atoi64(text(e));
        if (v < 1)
            throw VxXWmsServiceException("wmsservice", __LINE__,
                                         VxString("Invalid ") + what + ": " + VxStringUtils::itoa(v));
        if (v > 4096) {
            VxLog::logf(VxLog::Info, (std::string("Clamping ") + what + " from %1% to %2%").c_str(), v, 4096);
            return 4096;
        }
        return static_cast<int>(v);
    }

    void contact(const TiXmlElement* ci) {
        for (const TiXmlElement* c = ci->FirstChildElement(); c; c = c->NextSiblingElement()) {
            const std::string n = ns_.elementName(c);
            if (n == "wms.ContactElectronicMailAddress") caps_.contactElectronicMailAddress = text(c);
            else if (n == "wms.ContactPersonPrimary") {
                if (const TiXmlElement* p = ns_.findChild(c, "wms.ContactPerson")) caps_.contactPerson = text(p);
                if (const TiXmlElement* o = ns_.findChild(c, "wms.ContactOrganization"))
                    caps_.contactOrganization = text(o);
            }
        }
    }

    void capability(const TiXmlElement* cap) {
        for (const TiXmlElement* c = cap->FirstChildElement(); c; c = c->NextSiblingElement()) {
            const std::string n = ns_.elementName(c);
            if (n == "wms.Request") {
                if (const TiXmlElement* gm = ns_.findChild(c, "wms.GetMap")) getMap(gm);
            } else if (n == "wms.Layer") {
                topLayer(c);
            }
        }
    }

    void getMap(const TiXmlElement* gm) {
        for (const TiXmlElement* c = gm->FirstChildElement(); c; c = c->NextSiblingElement()) {
            const std::string n = ns_.elementName(c);
            if (n == "wms.Format") {
                const VxString f = text(c);
                if (f == "image/png") caps_.formats.push_back(Png);
                else if (f == "image/jpeg") caps_.formats.push_back(Jpeg);
                else if (f == "image/gif") caps_.formats.push_back(Gif);
                else if (f.startsWith("image/png;")) caps_.formats.push_back(f.contains("mode=8bit") ? Png8 : Png);
            } else if (n == "wms.DCPType") {
                const TiXmlElement* http = ns_.findChild(c, "wms.HTTP");
                if (!http) continue;
                endpoint(ns_.findChild(http, "wms.Get"), caps_.getMapGetUrl);
                endpoint(ns_.findChild(http, "wms.Post"), caps_.getMapPostUrl);
            }
        }
    }

    void endpoint(const TiXmlElement* method, VxString& into) {
        if (!method) return;
        const TiXmlElement* res = ns_.findChild(method, "wms.OnlineResource");
        if (!res) return;
        const char* href = ns_.findAttribute(res, "xlink.href");
        if (href && *href) into = href;
    }

    void topLayer(const TiXmlElement* e) {
        sawTopLayer_ = true;
        layer(e, caps_.rootLayer.get(), true);
    }

    void layer(const TiXmlElement* e, VxOgcWmsServerLayer* l, bool top) {
        bool added = false;
        for (const TiXmlElement* c = e->FirstChildElement(); c; c = c->NextSiblingElement()) {
            const std::string n = ns_.elementName(c);
            if (n == "wms.Title") l->title = text(c);
            else if (n == "wms.Name") l->name(text(c));
            else if (n == "wms.Layer") {
                VxRef<VxOgcWmsServerLayer> child(new VxOgcWmsServerLayer());
                l->addChildLayer(child, false);
                added = true;
                layer(c, child.get(), false);
            } else if (n == "wms.Style") style(c, l);
            else if (n == "wms.SRS") {
                const VxString t = text(c);
                if (t.str().find_first_of(" \t\r\n") == std::string::npos) crsText(t, l);
                else for (const VxString& piece : VxStringUtils::split(t, " \t\r\n")) crsText(piece, l);
            } else if (n == "wms.CRS") crsText(text(c), l);
            else if (n == "wms.KeywordList") keywords(c, l);
            else if (top) topLayerBounds(n, c);
            else scaleRange(n, c, l);
        }
        if (added) l->childLayersAdded();
    }

    void style(const TiXmlElement* e, VxOgcWmsServerLayer* l) {
        VxRef<VxOgcWmsNamedStyle> s(new VxOgcWmsNamedStyle());
        for (const TiXmlElement* c = e->FirstChildElement(); c; c = c->NextSiblingElement()) {
            const std::string n = ns_.elementName(c);
            if (n == "wms.Title") s->title = text(c);
            else if (n == "wms.Name") s->name = text(c);
            else if (n == "wms.Abstract") s->abstract = text(c);
        }
        l->namedStyles()->push_back(s);
    }

    static void crsText(const VxString& t, VxOgcWmsServerLayer* l) {
        std::vector<VxString> parts = VxStringUtils::split(t, ":", false);
        if (parts.size() == 2) l->supportedCrs.emplace_back(parts[0].toUpper(), parts[1]);
    }

    void keywords(const TiXmlElement* e, VxOgcWmsServerLayer* l) {
        for (const TiXmlElement* k = e->FirstChildElement(); k; k = k->NextSiblingElement())
            if (ns_.elementName(k) == "wms.Keyword" && text(k) == kVxOgcInitiallyOffKeyword) l->enabled(false);
    }

    void scaleRange(const std::string& n, const TiXmlElement* c, VxOgcWmsServerLayer* l) {
        if (n == "wms.MinScaleDenominator") l->minScale(VxStringUtils::atof(text(c)));
        else if (n == "wms.MaxScaleDenominator") l->maxScale(VxStringUtils::atof(text(c)));
        else if (n == "wms.ScaleHint") {
            const char* mn = ns_.findAttribute(c, "min");
            const char* mx = ns_.findAttribute(c, "max");
            if (mn && *mn && mx && *mx) {
                // ScaleHint gives the ground size of a pixel's diagonal in metres, not a
                // scale denominator; taken as is it would hide layers at ordinary scales.
                l->minScale(scaleHintToDenominator(VxStringUtils::atof(mn)));
                l->maxScale(scaleHintToDenominator(VxStringUtils::atof(mx)));
            }
        }
    }

    double attr(const TiXmlElement* e, const char* name) {
        const char* v = ns_.findAttribute(e, name);
        return v ? VxStringUtils::atof(v) : 0.0;
    }

    double childNumber(const TiXmlElement* e, const char* name) {
        const TiXmlElement* c = ns_.findChild(e, name);
        return c ? VxStringUtils::atof(text(c)) : 0.0;
    }

    void topLayerBounds(const std::string& n, const TiXmlElement* c) {
        VxOgcWmsServerLayer* root = caps_.rootLayer.get();
        if (n == "wms.LatLonBoundingBox" && caps_.version == 0 && !boundsFound_) {
            try {
                root->layerBounds = VxRect(attr(c, "minx"), attr(c, "miny"), attr(c, "maxx"), attr(c, "maxy"));
                boundsFound_ = true;
            } catch (const VxException&) {
                VxLog::warning("Unable to parse geographic bounding box for WMS service");
                boundsFound_ = false;
            }
        } else if (n == "wms.EX_GeographicBoundingBox" && caps_.version == 1) {
            try {
                root->layerBounds = VxRect(childNumber(c, "wms.westBoundLongitude"), childNumber(c, "wms.southBoundLatitude"),
                                           childNumber(c, "wms.eastBoundLongitude"), childNumber(c, "wms.northBoundLatitude"));
                boundsFound_ = true;
            } catch (const VxException&) {
                VxLog::warning("Unable to parse geographic bounding box for WMS service");
            }
        } else if (n == "wms.BoundingBox" && caps_.version == 1) {
            try {
                const char* crsAttr = ns_.findAttribute(c, "CRS");
                const VxString crsText = crsAttr ? crsAttr : "";
                VxRef<VxCrs> crs;
                if (crsText == "EPSG:4326") {
                    crs = VxCrs::wgs84LongLat();
                } else if (crsText.startsWith("EPSG:") || crsText.startsWith("CRS:")) {
                    std::vector<VxString> parts = VxStringUtils::split(crsText, ":", false);
                    if (parts.size() == 2) crs = VxCrs::fromAuthorityAndCode(parts[0], parts[1]);
                }
                if (crs && !caps_.crs) caps_.crs = crs;
                if (crs && !boundsFound_ && VxStringUtils::isEqualIgnoreCase(crs->authority(), "crs") &&
                    VxStringUtils::isEqualIgnoreCase(crs->code(), "84")) {
                    root->layerBounds = VxRect(attr(c, "minx"), attr(c, "miny"), attr(c, "maxx"), attr(c, "maxy"));
                    boundsFound_ = true;
                }
            } catch (const VxException&) {
                VxLog::warning("Unable to parse bounding box and crs for WMS service.");
            }
        }
    }

    void finish() {
        VxOgcWmsServerLayer* root = caps_.rootLayer.get();
        if (sawTopLayer_) {
            root->inheritProperties();
            root->generateUniqueNames();
            root->propagateSupportedCrs();
        }
        if (!boundsFound_) root->layerBounds = VxRect(-180, -90, 180, 90);
        if (!caps_.crs) {
            for (const auto& p : root->supportedCrs) {
                if (p.first == "CRS" && p.second == "1") continue;
                try {
                    caps_.crs = VxCrs::fromAuthorityAndCode(p.first, p.second);
                    break;
                } catch (const VxException&) {
                }
            }
        }
        if (!caps_.crs) caps_.crs = VxCrs::wgs84LongLat();
    }

    NamespaceStack& ns_;
    VxOgcWmsCapabilities& caps_;
    bool boundsFound_ = false;
    bool sawTopLayer_ = false;
};

// Removes the first occurrence of a lower-case parameter, found without regard to case.
VxString removeParameter(const VxString& text, const std::string& param) {
    const size_t at = text.toLower().str().find(param);
    if (at == std::string::npos) return text;
    const std::string front = text.str().substr(0, at);
    const std::string behind = text.str().substr(at + param.size());
    if (behind.empty() || behind == "&") return VxString(front);
    return VxString(front + behind.substr(1));
}

}  // namespace

VxString normalizeServiceUrl(const VxString& url) {
    VxString r = removeParameter(removeParameter(url, "request=getcapabilities"), "service=wms");
    if (r.endsWith("?") || r.endsWith("&")) return r;
    return r + (r.contains("?") ? "&" : "?");
}

VxRef<VxOgcWmsCapabilities> VxOgcWmsService::negotiateCapabilities(const VxString& url, int timeout,
                                                                   const VxString& user, const VxString& password) {
    VxLog::logf(VxLog::Info, "Negotiating capabilities with WMS service instance: %1%", url);
    VxString base = url;
    if (!base.contains("?")) base += "?";
    else if (!base.endsWith("&")) base += "&";

    struct Attempt {
        const char* query;
        const char* failure;
    };
    static const Attempt attempts[] = {
        {"service=WMS&request=GetCapabilities", "GetCapabilities without version failed: %1%"},
        {"service=WMS&request=GetCapabilities&version=1.3.0", "GetCapabilities version=1.3.0 failed: %1%"},
        {"service=WMS&request=GetCapabilities&version=1.1.1", "GetCapabilities version=1.1.1 failed: %1%"},
    };
    for (int i = 0; i < 3; ++i) {
        try {
            VxRef<VxOgcWmsCapabilities> caps = getCapabilities(base + attempts[i].query, timeout, user, password);
            if (caps && (i > 0 || caps->version == 0 || caps->version == 1)) return caps;
        } catch (const VxException& e) {
            VxLog::logf(VxLog::Info, attempts[i].failure, e.asString());
        }
    }
    VxLog::logf(VxLog::Info, "Failed to negotiate capabilities");
    return nullptr;
}

VxRef<VxOgcWmsCapabilities> VxOgcWmsService::getCapabilities(const VxString& url, int timeout, const VxString& user,
                                                             const VxString& password) {
    VxHttpResponse response;
    if (!httpGet(url.toActiveCP(), response, timeout, user.toLatin1(), password.toLatin1())) return nullptr;
    return parseCapabilities(response.data, url);
}

VxRef<VxOgcWmsCapabilities> VxOgcWmsService::parseCapabilities(const std::string& body, const VxString& url) {
    VxRef<VxOgcWmsCapabilities> caps(new VxOgcWmsCapabilities());
    // The text ends at the first NUL byte, as a C string would.
    const std::string text(body.c_str());
    TiXmlDocument doc;
    VxString error;
    if (!VxXmlUtilities::loadXmlFromString(text, doc, error))
        throw VxXWmsGetCapabilitiesXmlError("wmsservice", __LINE__, error);

    NamespaceStack ns;
    ns.registerPrefix(kWmsNs, "wms");
    ns.registerPrefix(kSldNs, "sld");
    ns.registerPrefix(kXlinkNs, "xlink");
    const TiXmlElement* root = doc.RootElement();
    NamespaceStackEntry entry(ns, root);

    const std::string rootName = ns.elementName(root);
    if (rootName == "wms.WMS_Capabilities") {
        const char* v = root->Attribute("version");
        const VxString version = v ? v : "";
        if (version != "1.3.0") throw VxXWmsVersionNotSupported("wmsservice", __LINE__, version);
        caps->version = 1;
        parseDocument(ns, root, *caps);
    } else if (rootName == "wms.WMT_MS_Capabilities" || rootName == "WMT_MS_Capabilities") {
        ns.setDefaultPrefix("wms");
        const char* v = root->Attribute("version");
        const VxString version = v ? v : "";
        if (version != "1.1.1") throw VxXWmsVersionNotSupported("wmsservice", __LINE__, version);
        caps->version = 0;
        parseDocument(ns, root, *caps);
    } else if (rootName.find("ExceptionReport") != std::string::npos) {
        const TiXmlNode* n = root;
        while (n && !n->ToText()) n = n->FirstChild();
        if (n)
            throw VxXWmsServiceException("wmsservice", __LINE__,
                                         VxString("\"") + n->Value() + "\" from " + url);
        throw VxXWmsServiceException("wmsservice", __LINE__, "Unknown exception from " + url);
    } else {
        return nullptr;
    }
    return caps;
}

void VxOgcWmsService::parseDocument(NamespaceStack& ns, const TiXmlElement* root, VxOgcWmsCapabilities& caps) {
    CapabilitiesWalk(ns, caps).run(root);
}
