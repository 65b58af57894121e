// `vxogc capabilities URL`: what a WMS, WCS or CSW service offers, as text or JSON.
#include <iostream>
#include <nlohmann/json.hpp>

#include "commands.h"
#include "ogc/cswservice.h"
#include "ogc/errors.h"
#include "ogc/http.h"
#include "ogc/wcsservice.h"
#include "ogc/wmsservice.h"
#include "vx/log.h"
#include "vx/stringutils.h"

namespace {

const char* formatMime(int f) {
    switch (f) {
    case Png: return "image/png";
    case Jpeg: return "image/jpeg";
    case Gif: return "image/gif";
    case Png8: return "image/png; mode=8bit";
    default: return "?";
    }
}

nlohmann::json layerJson(const VxRef<VxOgcWmsServerLayer>& l) {
    nlohmann::json j;
    j["name"] = l->name().str();
    j["uniqueName"] = l->uniqueName().str();
    j["title"] = l->title.str();
    j["enabled"] = l->enabled();
    nlohmann::json styles = nlohmann::json::array();
    auto st = l->namedStyles();
    for (size_t i = 0; i < st->size(); ++i) styles.push_back(st->get(i)->name.str());
    j["styles"] = styles;
    j["minScale"] = l->minScale();
    j["maxScale"] = l->maxScale();
    nlohmann::json crs = nlohmann::json::array();
    for (const auto& p : l->supportedCrs) crs.push_back(p.first.str() + ":" + p.second.str());
    j["crs"] = crs;
    const VxRect b = l->getLayerBounds();
    j["bounds"] = {b.minx, b.miny, b.maxx, b.maxy};
    nlohmann::json kids = nlohmann::json::array();
    auto children = l->layers();
    for (size_t i = 0; i < children->size(); ++i) kids.push_back(layerJson(l->getChildLayer(static_cast<unsigned>(i))));
    j["children"] = kids;
    return j;
}

std::string scaleText(double v) { return v > 0 ? std::to_string(static_cast<long long>(v)) : std::string("-"); }

void printLayer(const VxRef<VxOgcWmsServerLayer>& l, int depth) {
    std::string indent(depth * 2, ' ');
    std::cout << indent << (l->uniqueName().isEmpty() ? "(unnamed)" : l->uniqueName().str());
    if (!l->title.isEmpty()) std::cout << "  \"" << l->title << "\"";
    if (!l->enabled()) std::cout << "  [disabled]";
    std::cout << "  crs:" << l->supportedCrs.size();
    if (l->minScale() > 0 || l->maxScale() > 0)
        std::cout << "  scale:" << scaleText(l->minScale()) << ".." << scaleText(l->maxScale());
    auto st = l->namedStyles();
    if (st->size()) {
        std::cout << "  styles:";
        for (size_t i = 0; i < st->size(); ++i) std::cout << (i ? "," : "") << st->get(i)->name;
    }
    std::cout << "\n";
    auto children = l->layers();
    for (size_t i = 0; i < children->size(); ++i) printLayer(l->getChildLayer(static_cast<unsigned>(i)), depth + 1);
}

}  // namespace

int runWmsCapabilities(const VxRef<VxOgcWmsCapabilities>& caps, bool json) {
    if (json) {
        nlohmann::json j;
        j["service"] = "WMS";
        j["title"] = caps->title.str();
        j["name"] = caps->name.str();
        j["abstract"] = caps->abstract.str();
        j["version"] = caps->version == 1 ? "1.3.0" : "1.1.1";
        nlohmann::json formats = nlohmann::json::array();
        for (int f : caps->formats) formats.push_back(formatMime(f));
        j["formats"] = formats;
        j["getMapUrl"] = caps->getMapGetUrl.str();
        j["getMapPostUrl"] = caps->getMapPostUrl.str();
        j["maxWidth"] = caps->maxWidth;
        j["maxHeight"] = caps->maxHeight;
        j["crs"] = caps->crs ? caps->crs->id().str() : "";
        j["layers"] = layerJson(caps->layer());
        std::cout << j.dump(2) << "\n";
        return 0;
    }
    std::cout << "Service:     " << caps->title << "\n"
              << "Version:     " << (caps->version == 1 ? "1.3.0" : "1.1.1") << "\n"
              << "GetMap:      " << caps->getMapGetUrl << "\n"
              << "Formats:     ";
    for (size_t i = 0; i < caps->formats.size(); ++i) std::cout << (i ? ", " : "") << formatMime(caps->formats[i]);
    std::cout << "\nMax size:    " << caps->maxWidth << " x " << caps->maxHeight << "\n"
              << "Default CRS: " << (caps->crs ? caps->crs->id().str() : std::string("-")) << "\n"
              << "Layers:\n";
    printLayer(caps->layer(), 1);
    return 0;
}

namespace {

// The URL without the service, request and version parameters a user may have pasted,
// ready for more parameters.
VxString baseUrl(const VxString& url) {
    const std::string& u = url.str();
    const size_t q = u.find('?');
    if (q == std::string::npos) return url + "?";
    std::string kept;
    for (const VxString& p : VxStringUtils::split(u.substr(q + 1), "&")) {
        const VxString key = VxString(p.str().substr(0, p.str().find('='))).toLower();
        if (key == "service" || key == "request" || key == "version") continue;
        kept += p.str() + "&";
    }
    return VxString(u.substr(0, q + 1) + kept);
}

// The service a URL names in its own query ("service=WCS"), lower case; empty when none.
std::string namedService(const VxString& url) {
    const std::string u = url.toLower().str();
    const size_t q = u.find('?');
    if (q == std::string::npos) return std::string();
    for (const VxString& p : VxStringUtils::split(u.substr(q + 1), "&"))
        if (p.startsWith("service=")) return p.str().substr(8);
    return std::string();
}

nlohmann::json list(const VxRef<VxVec<VxString>>& v) {
    nlohmann::json j = nlohmann::json::array();
    for (const VxString& s : *v) j.push_back(s.str());
    return j;
}

std::string joined(const VxRef<VxVec<VxString>>& v) {
    std::string out;
    for (const VxString& s : *v) out += (out.empty() ? "" : ", ") + s.str();
    return out.empty() ? "-" : out;
}

// GetCapabilities, then DescribeCoverage for every coverage the service offers (a failed
// description is only a warning here: the capabilities are still worth showing).
VxRef<VxWcsCapabilities> wcsCapabilities(const VxString& base, const CliOptions& o) {
    VxHttpResponse response;
    if (!httpGet((base + "service=WCS&request=GetCapabilities&version=1.1.1").str(), response, o.timeout, o.user,
                 o.password))
        return nullptr;
    VxRef<VxWcsCapabilities> caps = VxWcsService::parseCapabilities(response.data);
    if (!caps || caps->coverageIds->empty()) return caps;
    std::string ids;
    for (const VxString& id : *caps->coverageIds) ids += (ids.empty() ? "" : ",") + id.str();
    try {
        VxWcsService::getCoverage(caps, "1.1.1", ids, o.timeout);
    } catch (const VxException& e) {
        std::cerr << "vxogc: " << e.asString() << "\n";
    }
    return caps;
}

int printWcs(const VxRef<VxWcsCapabilities>& c, bool json) {
    const VxRect& b = c->bounds;
    if (json) {
        nlohmann::json j;
        j["service"] = "WCS";
        j["version"] = "1.1.1";
        j["title"] = c->title.str();
        j["abstract"] = c->abstract.str();
        j["coverages"] = list(c->coverageIds);
        j["formats"] = list(c->formats);
        j["getCoverageUrl"] = c->getCoverageGetUrl.str();
        j["describeCoverageUrl"] = c->describeCoverageGetUrl.str();
        j["supportedCrs"] = list(c->supportedCrs);
        j["supportedFormats"] = list(c->supportedFormats);
        j["crs"] = c->crs ? c->crs->id().str() : "";
        j["bounds"] = {b.minx, b.miny, b.maxx, b.maxy};
        std::cout << j.dump(2) << "\n";
        return 0;
    }
    std::cout << "Service:          " << c->title << " (WCS 1.1.1)\n"
              << "GetCoverage:      " << c->getCoverageGetUrl << "\n"
              << "DescribeCoverage: " << c->describeCoverageGetUrl << "\n"
              << "Coverages:        " << joined(c->coverageIds) << "\n"
              << "Formats:          " << joined(c->formats) << "\n"
              << "Described CRS:    " << joined(c->supportedCrs) << "\n"
              << "Described formats: " << joined(c->supportedFormats) << "\n"
              << "Bounds:           " << (c->crs ? c->crs->id().str() : std::string("-")) << " (" << b.minx << ", "
              << b.miny << ") - (" << b.maxx << ", " << b.maxy << ")\n";
    return 0;
}

int printCsw(const VxRef<VxCswCapabilities>& c, bool json) {
    const char* version = c->version == 1 ? "2.0.1" : "2.0.2";
    if (json) {
        nlohmann::json j;
        j["service"] = "CSW";
        j["version"] = version;
        j["title"] = c->title.str();
        j["abstract"] = c->abstract.str();
        j["provider"] = c->providerName.str();
        nlohmann::json kw = nlohmann::json::array();
        for (const VxString& k : c->keywords) kw.push_back(k.str());
        j["keywords"] = kw;
        nlohmann::json ops = nlohmann::json::array();
        for (const auto& op : c->operations)
            ops.push_back({{"name", op.name.str()}, {"get", op.getUrl.str()}, {"post", op.postUrl.str()}});
        j["operations"] = ops;
        std::cout << j.dump(2) << "\n";
        return 0;
    }
    std::cout << "Service:    " << c->title << " (CSW " << version << ")\n"
              << "Provider:   " << c->providerName << "\n"
              << "Keywords:   ";
    bool first = true;
    for (const VxString& k : c->keywords) {
        std::cout << (first ? "" : ", ") << k;
        first = false;
    }
    std::cout << "\nOperations:\n";
    for (const auto& op : c->operations) {
        std::cout << "  " << (op.name.isEmpty() ? "(unnamed)" : op.name.str());
        if (!op.getUrl.isEmpty()) std::cout << "  GET " << op.getUrl;
        if (!op.postUrl.isEmpty()) std::cout << "  POST " << op.postUrl;
        std::cout << "\n";
    }
    return 0;
}

}  // namespace

int cmdCapabilities(const CliOptions& o) {
    if (o.positional.size() != 1)
        throw std::runtime_error("usage: vxogc capabilities URL [--json] [--service wms|wcs|csw]");
    const VxString url = o.positional[0];
    std::string service = VxString(o.value("service")).toLower().str();
    if (service.empty()) service = namedService(url);
    if (!service.empty() && service != "wms" && service != "wcs" && service != "csw")
        throw std::runtime_error("--service must be wms, wcs or csw");
    const bool json = o.flag("json");

    if (service.empty() || service == "wms") {
        const VxString wmsUrl = normalizeServiceUrl(url);
        VxRef<VxOgcWmsCapabilities> caps =
            VxOgcWmsService::negotiateCapabilities(wmsUrl, o.timeout, o.user, o.password);
        if (caps) return runWmsCapabilities(caps, json);
        if (service == "wms") throw VxXServiceNegotiationFailed("capabilities", __LINE__, wmsUrl);
    }
    const VxString base = baseUrl(url);
    if (service.empty() || service == "wcs") {
        try {
            if (VxRef<VxWcsCapabilities> caps = wcsCapabilities(base, o)) return printWcs(caps, json);
        } catch (const VxException&) {
            if (service == "wcs") throw;
        }
        if (service == "wcs") throw VxXServiceNegotiationFailed("capabilities", __LINE__, base);
    }
    VxRef<VxCswCapabilities> caps =
        VxCswService::getCapabilities(base + "service=CSW&request=GetCapabilities&version=2.0.2", o.timeout);
    if (caps) return printCsw(caps, json);
    throw VxXServiceNegotiationFailed("capabilities", __LINE__, url);
}
