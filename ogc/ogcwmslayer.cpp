#include "ogc/ogcwmslayer.h"

#include <algorithm>
#include <cstdio>

#include "ogc/errors.h"
#include "ogc/ogcservice.h"
#include "ogc/wmsservice.h"
#include "vx/log.h"
#include "vx/stringutils.h"

VX_IMPLEMENT_CLASS(VxOgcWmsLayer, VxHttpClientLayer, 11)

namespace {

using Guard = std::lock_guard<std::recursive_mutex>;

VxRef<VxVec<VxString>> makeVec(const std::optional<std::vector<VxString>>& v) {
    VxRef<VxVec<VxString>> out(new VxVec<VxString>());
    if (v) out->assign(v->begin(), v->end());
    return out;
}

VxRef<VxRefVec<VxLayer>> emptyReadOnly() {
    VxRef<VxRefVec<VxLayer>> v(new VxRefVec<VxLayer>());
    v->markReadOnly();
    return v;
}

// Collects the styles of the listed layers below a group, to learn whether the group can
// be requested by its own name with one style.
struct StyleCollector {
    const VxOgcWmsServerLayer* layer;
    bool valid;
    bool hasFirst = false;
    VxString first;

    explicit StyleCollector(const VxOgcWmsServerLayer* l) : layer(l), valid(l && !l->name().isEmpty()) {}

    void receive(const VxString& style) {
        if (!hasFirst) {
            hasFirst = true;
            first = style;
            if (!style.isEmpty() && !offers(style)) valid = false;
        } else if (style != first) {
            valid = false;
        }
    }

    bool offers(const VxString& style) const {
        if (!layer) return false;
        auto styles = layer->namedStyles();
        for (size_t i = 0; i < styles->size(); ++i)
            if (styles->get(i) && styles->get(i)->name == style) return true;
        return false;
    }
};

struct RequestWalk {
    double scale;
    std::vector<VxRect> area;  // geographic pieces of the request
    std::vector<VxString> layers, styles;
    bool sendStyles = false;

    bool visible(const VxOgcWmsServerLayer& l) const {
        if (l.minScale() > 0 && scale < l.minScale()) return false;
        if (l.maxScale() > 0 && scale >= l.maxScale()) return false;
        const VxRect b = l.getLayerBounds();
        // Unknown bounds (a tree without a geographic box) cannot rule a layer out.
        if (b.isNull()) return true;
        for (const VxRect& a : area)
            if (a.minx <= b.maxx && b.minx <= a.maxx && a.miny <= b.maxy && b.miny <= a.maxy) return true;
        return false;
    }

    void walk(const VxOgcWmsServerLayer& l, StyleCollector& outer, std::vector<VxString>& ls,
              std::vector<VxString>& ss) {
        if (!l.enabled()) {
            outer.valid = false;
            return;
        }
        if (!visible(l)) return;
        const auto& kids = l.childLayers();
        if (kids->size() == 0) {
            const VxString style = l.style();
            ls.push_back(l.name());
            ss.push_back(style);
            outer.receive(style);
            if (!style.isEmpty()) sendStyles = true;
            return;
        }
        StyleCollector mine(&l);
        std::vector<VxString> childLayers, childStyles;
        for (size_t i = 0; i < kids->size(); ++i)
            if (auto* c = dynamic_cast<const VxOgcWmsServerLayer*>(kids->get(i).get()))
                walk(*c, mine, childLayers, childStyles);
        if (childLayers.empty()) return;
        if (mine.valid) {
            ls.push_back(l.name());
            ss.push_back(mine.first);
            outer.receive(mine.first);
        } else {
            ls.insert(ls.end(), childLayers.begin(), childLayers.end());
            ss.insert(ss.end(), childStyles.begin(), childStyles.end());
            outer.valid = false;
        }
    }
};

VxString joined(const std::vector<VxString>& v) {
    VxString out;
    for (size_t i = 0; i < v.size(); ++i) {
        if (i) out += ",";
        out += v[i];
    }
    return out;
}

const char* formatMime(OgcImageFormat f) {
    switch (f) {
    case Jpeg: return "image/jpeg";
    case Gif: return "image/gif";
    case Png8: return "image/png; mode=8bit";
    default: return "image/png";
    }
}

}  // namespace

VxOgcWmsLayer::VxOgcWmsLayer(const VxOgcWmsLayerParams& p)
    : VxHttpClientLayer(p, p.buffered.value_or(false)),
      url_(p.url.value_or(VxString())),
      explicitLayers_(makeVec(p.explicitLayers)),
      explicitStyles_(makeVec(p.explicitStyles)),
      background_(p.background.value_or(VxColor(255, 255, 255, 255))),
      dimensionValues_(p.dimensionValues.value_or(VxString())),
      elevation_(p.elevation.value_or(VxString())),
      format_(p.format.value_or(Auto)),
      time_(p.time.value_or(VxString())),
      transparent_(p.transparent.value_or(true)),
      vendorSpecificParameters_(p.vendorSpecificParameters.value_or(VxString())),
      throwExceptions_(p.throwExceptions.value_or(false) ? 1 : 0),
      topLayers_(emptyReadOnly()) {
    requestTemplate_.timeout = p.timeout.value_or(10);
    requestTemplate_.user = p.user.value_or(VxString()).toLatin1();
    requestTemplate_.password = p.password.value_or(VxString()).toLatin1();
    checkExplicitStyles();
}

VxOgcWmsLayer::VxOgcWmsLayer(const VxString& url)
    : VxHttpClientLayer(VxLayerSetParams(), false),
      url_(url),
      explicitLayers_(new VxVec<VxString>()),
      explicitStyles_(new VxVec<VxString>()),
      topLayers_(emptyReadOnly()) {}

VxOgcWmsLayer::VxOgcWmsLayer(const VxOgcWmsLayer& other, VxOperatorMap* map)
    : VxHttpClientLayer(other, map),
      url_(other.url_),
      explicitLayers_(other.explicitLayers_->clone()),
      explicitStyles_(other.explicitStyles_->clone()),
      background_(other.background_),
      dimensionValues_(other.dimensionValues_),
      elevation_(other.elevation_),
      format_(other.format_),
      time_(other.time_),
      transparent_(other.transparent_),
      vendorSpecificParameters_(other.vendorSpecificParameters_),
      serviceUrl_(other.serviceUrl_),
      throwExceptions_(other.throwExceptions_.load()),
      capabilities_(other.capabilities_),
      requestTemplate_(other.requestTemplate_) {
    checkExplicitStyles();
    VxRef<VxRefVec<VxLayer>> top(new VxRefVec<VxLayer>());
    // The base copied the children exactly when the source had been initialized.
    const auto& kids = childLayers();
    for (size_t i = 0; i < kids->size(); ++i) {
        top->add(kids->get(i));
        if (auto* s = dynamic_cast<VxOgcWmsServerLayer*>(kids->get(i).get())) s->parent(this);
    }
    top->markReadOnly();
    topLayers_ = top;
}

VxOgcWmsLayer::~VxOgcWmsLayer() = default;

VxRef<VxEngineObject> VxOgcWmsLayer::cloneWithMap(VxOperatorMap* map) const {
    Guard g(lock_);
    return VxRef<VxEngineObject>(new VxOgcWmsLayer(*this, map));
}

void VxOgcWmsLayer::checkExplicitStyles() const {
    if (!explicitStyles_->empty() && explicitStyles_->size() != explicitLayers_->size())
        throw VxXOgcWmsError("ogcwmslayer", __LINE__,
                             "The list of explicit styles must be empty or contain the same number elements as "
                             "explicit layers");
}

int VxOgcWmsLayer::timeout() const {
    Guard g(lock_);
    return requestTemplate_.timeout;
}
void VxOgcWmsLayer::timeout(int seconds) {
    Guard g(lock_);
    requestTemplate_.timeout = seconds;
}
VxString VxOgcWmsLayer::user() const {
    Guard g(lock_);
    return VxString::fromLatin1(requestTemplate_.user);
}
void VxOgcWmsLayer::user(const VxString& u) {
    Guard g(lock_);
    requestTemplate_.user = u.toLatin1();
}
VxString VxOgcWmsLayer::password() const {
    Guard g(lock_);
    return VxString::fromLatin1(requestTemplate_.password);
}
void VxOgcWmsLayer::password(const VxString& p) {
    Guard g(lock_);
    requestTemplate_.password = p.toLatin1();
}

VxString VxOgcWmsLayer::serviceUrl() const {
    Guard g(lock_);
    return serviceUrl_;
}

VxRef<VxOgcWmsCapabilities> VxOgcWmsLayer::capabilities() const {
    Guard g(lock_);
    return capabilities_;
}

VxRef<VxRefVec<VxLayer>> VxOgcWmsLayer::layers() const {
    const_cast<VxOgcWmsLayer*>(this)->initialize(true);
    Guard g(lock_);
    return topLayers_;
}

VxRef<VxOgcWmsServerLayer> VxOgcWmsLayer::getChildLayer(unsigned int index) const {
    const_cast<VxOgcWmsLayer*>(this)->initialize(true);
    if (initializationFailed()) return nullptr;
    VxRef<VxRefVec<VxLayer>> top;
    {
        Guard g(lock_);
        top = topLayers_;
    }
    if (index >= top->size()) return nullptr;
    return VxRef<VxOgcWmsServerLayer>(dynamic_cast<VxOgcWmsServerLayer*>(top->get(index).get()));
}

VxRef<VxOgcWmsServerLayer> VxOgcWmsLayer::findLayerByUniqueName(const VxString& name) const {
    const_cast<VxOgcWmsLayer*>(this)->initialize(true);
    if (initializationFailed()) return nullptr;
    Guard g(lock_);
    for (size_t i = 0; i < topLayers_->size(); ++i) {
        auto* top = dynamic_cast<VxOgcWmsServerLayer*>(topLayers_->get(i).get());
        if (!top) continue;
        if (top->uniqueName() == name) return VxRef<VxOgcWmsServerLayer>(top);
        if (auto found = top->findLayerByUniqueName(name)) return found;
    }
    return nullptr;
}

VxRect VxOgcWmsLayer::getBoundsOfDataSets(const VxRef<VxCrs>& crs) const {
    const_cast<VxOgcWmsLayer*>(this)->initialize(true);
    if (initializationFailed()) return VxRect();
    Guard g(lock_);
    return VxLayerSet::getBoundsOfDataSets(crs);
}

void VxOgcWmsLayer::getFeatures(const VxRef<VxCrs>&, const void*) const {
    throw VxXNotSupported("ogcwmslayer", __LINE__, "OgcWmsLayer::getFeatures");
}

VxString VxOgcWmsLayer::cacheId() const {
    Guard g(lock_);
    if (!enabled()) return VxString();
    VxString id = url_ + "(";
    bool first = true;
    for (size_t i = 0; i < topLayers_->size(); ++i) {
        const VxRef<VxLayer>& l = topLayers_->get(i);
        if (!l || !l->enabled()) continue;
        if (!first) id += ",";
        id += l->cacheId();
        first = false;
    }
    return id + ")";
}

void VxOgcWmsLayer::onEnabledChanged() { changeCounter_.fetch_add(1); }

void VxOgcWmsLayer::onLayerMoved() {
    Guard g(lock_);
    rebuildTopLayers();
}

void VxOgcWmsLayer::rebuildTopLayers() {
    VxRef<VxRefVec<VxLayer>> top = childLayers()->shallowCopy();
    top->markReadOnly();
    topLayers_ = top;
}

void VxOgcWmsLayer::reset() {
    {
        Guard g(lock_);
        for (size_t i = 0; i < topLayers_->size(); ++i)
            if (auto* s = dynamic_cast<VxOgcWmsServerLayer*>(topLayers_->get(i).get())) s->parent(nullptr);
        clearLayers();
        topLayers_ = emptyReadOnly();
        serviceUrl_ = VxString();
        capabilities_ = nullptr;
    }
    VxHttpClientLayer::reset();
}

void VxOgcWmsLayer::doInitialize() {
    Guard g(lock_);
    serviceUrl_ = normalizeServiceUrl(url_);
    capabilities_ = VxOgcWmsService::negotiateCapabilities(serviceUrl_, requestTemplate_.timeout,
                                                           VxString::fromLatin1(requestTemplate_.user),
                                                           VxString::fromLatin1(requestTemplate_.password));
    if (!capabilities_) {
        topLayers_->markReadOnly();
        throw VxXServiceNegotiationFailed("ogcwmslayer", __LINE__, serviceUrl_);
    }
    VxRef<VxOgcWmsServerLayer> root = capabilities_->layer();
    if (!root || (root->name().isEmpty() && root->childLayers()->size() == 0)) {
        topLayers_->markReadOnly();
        throw VxXOgcWmsError("ogcwmslayer", __LINE__, "No layers provided by WMS service.");
    }
    VxLog::info(capabilities_->version == 0   ? "Using WMS 1.1.1 protocol"
                : capabilities_->version == 1 ? "Using WMS 1.3.0 protocol"
                                              : "Using WMS 1.3.0+ protocol");
    initializeRootLayers();

    VxHttpRequest fresh;
    fresh.timeout = requestTemplate_.timeout;
    fresh.user = requestTemplate_.user;
    fresh.password = requestTemplate_.password;
    requestTemplate_ = fresh;
    const VxString endpoint =
        !capabilities_->getMapGetUrl.isEmpty() ? capabilities_->getMapGetUrl : capabilities_->getMapPostUrl;
    if (endpoint.isEmpty())
        throw VxXOgcWmsError("ogcwmslayer", __LINE__, "GET or POST url is missing in GetCapabilities response.");
    if (!splitHttpUrl(endpoint.toLatin1(), requestTemplate_.secure, requestTemplate_.port, requestTemplate_.host,
                      requestTemplate_.path))
        throw VxXInvalidUrl("ogcwmslayer", __LINE__, endpoint);
    requestTemplate_.post = capabilities_->getMapGetUrl.isEmpty() ? 1 : 0;
}

void VxOgcWmsLayer::initializeRootLayers() {
    VxRef<VxOgcWmsServerLayer> root = capabilities_->layer();
    std::vector<VxRef<VxOgcWmsServerLayer>> chosen;
    if (explicitLayers_->empty()) {
        chosen.push_back(root->clone().cast<VxOgcWmsServerLayer>());
    } else {
        for (const VxString& name : *explicitLayers_) {
            if (name == root->name()) {
                chosen.clear();
                chosen.push_back(root->clone().cast<VxOgcWmsServerLayer>());
                break;
            }
            VxRef<VxEngineObject> found = root->findChildObject(name, 1);
            if (auto* s = dynamic_cast<VxOgcWmsServerLayer*>(found.get())) {
                chosen.push_back(s->shallowCopy());
            } else {
                VxLog::logf(VxLog::Warning, "Could not find explicit layer %1% in WMS service at %2%", name,
                            serviceUrl_);
            }
        }
    }
    clearLayers();
    for (auto& l : chosen) {
        l->parent(this);
        addLayer(VxRef<VxLayer>(l.get()));
    }
    rebuildTopLayers();
}

bool VxOgcWmsLayer::canThrow() const {
    Guard g(lock_);
    return throwExceptions();
}

bool VxOgcWmsLayer::supportedImageSize(int width, int height) const {
    // Copying the reference is guarded: doInitialize may replace it on another thread.
    VxRef<VxOgcWmsCapabilities> caps = capabilities();
    if (!caps) return true;
    return width <= caps->maxWidth && height <= caps->maxHeight;
}

VxRef<VxCrs> VxOgcWmsLayer::selectRequestCrs(VxRef<VxCrs> viewCrs) {
    Guard g(lock_);
    if (!capabilities_) return VxCrs::wgs84LongLat();
    if (viewCrs && capabilities_->isCrsSupported(viewCrs)) return viewCrs;
    if (capabilities_->crs) return capabilities_->crs;
    return VxCrs::wgs84LongLat();
}

void VxOgcWmsLayer::initializeHttpRequest(VxHttpRequest& request) const {
    Guard g(lock_);
    request = requestTemplate_;
}

OgcImageFormat VxOgcWmsLayer::chooseFormat() const {
    const std::vector<OgcImageFormat>& offered = capabilities_->formats;
    auto has = [&](OgcImageFormat f) { return std::find(offered.begin(), offered.end(), f) != offered.end(); };
    const OgcImageFormat wanted = static_cast<OgcImageFormat>(format_);
    if (wanted != Auto && has(wanted)) return wanted;
    if (has(Png)) return Png;
    if (transparent_) {
        if (has(Gif)) return Gif;
        if (has(Png8)) return Png8;
    }
    if (has(Jpeg)) return Jpeg;
    if (has(Gif)) return Gif;
    if (has(Png8)) return Png8;
    if (!offered.empty()) return offered.front();
    return Png;
}

VxString VxOgcWmsLayer::buildRequest(int width, int height, double scale, VxRect bounds, VxRef<VxCrs> crs) {
    Guard g(lock_);
    if (!capabilities_ || !crs) return VxString();
    const bool v130 = capabilities_->version != 0;

    RequestWalk walk;
    walk.scale = scale;
    VxRect geo = bounds, second;
    if (crs->projectTo(VxCrs::wgs84LongLat(), geo, second)) walk.area.push_back(second);
    if (!geo.isNull()) walk.area.push_back(geo);
    for (size_t i = 0; i < topLayers_->size(); ++i) {
        auto* top = dynamic_cast<VxOgcWmsServerLayer*>(topLayers_->get(i).get());
        if (!top) continue;
        StyleCollector dropped(nullptr);
        walk.walk(*top, dropped, walk.layers, walk.styles);
    }
    if (walk.layers.empty()) return VxString();

    VxString q = v130 ? "VERSION=1.3.0&REQUEST=GetMap" : "VERSION=1.1.1&REQUEST=GetMap";
    const bool crsAuthority = VxStringUtils::isEqualIgnoreCase(crs->authority(), "crs");
    q += v130 ? (crsAuthority ? "&CRS=CRS:" : "&CRS=EPSG:") : (crsAuthority ? "&SRS=CRS:" : "&SRS=EPSG:");
    q += crs->code();
    auto num = [](double v) { return VxStringBuilder::fixed(v, 6); };
    q += "&BBOX=";
    if (v130 && VxOgcService::switchXY(crs))
        q += num(bounds.miny) + "," + num(bounds.minx) + "," + num(bounds.maxy) + "," + num(bounds.maxx);
    else
        q += num(bounds.minx) + "," + num(bounds.miny) + "," + num(bounds.maxx) + "," + num(bounds.maxy);
    q += "&width=" + VxStringUtils::itoa(width) + "&height=" + VxStringUtils::itoa(height);
    q += "&LAYERS=" + joined(walk.layers) + "&STYLES=";
    if (walk.sendStyles) q += joined(walk.styles);
    q += VxString("&FORMAT=") + formatMime(chooseFormat());
    if (transparent_) {
        q += "&TRANSPARENT=TRUE";
    } else {
        char hex[8];
        std::snprintf(hex, sizeof hex, "%02X%02X%02X", background_.r, background_.g, background_.b);
        q += VxString("&BGCOLOR=0x") + hex;
    }
    if (!time_.isEmpty()) q += "&TIME=" + time_;
    if (!elevation_.isEmpty()) q += "&ELEVATION=" + elevation_;
    if (!dimensionValues_.isEmpty()) q += "&" + dimensionValues_;
    if (!vendorSpecificParameters_.isEmpty()) q += "&" + vendorSpecificParameters_;
    return q;
}
