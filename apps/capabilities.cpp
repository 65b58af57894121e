// `vxogc capabilities URL`: what a WMS service offers, as text or JSON.
#include <iostream>
#include <nlohmann/json.hpp>

#include "commands.h"
#include "ogc/errors.h"
#include "ogc/wmsservice.h"

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

int cmdCapabilities(const CliOptions& o) {
    if (o.positional.size() != 1) throw std::runtime_error("usage: vxogc capabilities URL [--json]");
    const VxString url = normalizeServiceUrl(o.positional[0]);
    VxRef<VxOgcWmsCapabilities> caps = VxOgcWmsService::negotiateCapabilities(url, o.timeout, o.user, o.password);
    if (!caps) throw VxXServiceNegotiationFailed("capabilities", __LINE__, url);
    return runWmsCapabilities(caps, o.flag("json"));
}
