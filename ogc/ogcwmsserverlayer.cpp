#include "ogc/ogcwmsserverlayer.h"

#include <algorithm>
#include <map>

#include "ogc/errors.h"
#include "vx/stringutils.h"

VX_IMPLEMENT_CLASS(VxOgcWmsServerLayer, VxLayerSet, 11)

VxOgcWmsServerLayer::VxOgcWmsServerLayer() : namedStyles_(new StyleVec()) {
    rebuildReadOnlyLayers();
    if (!namedStyles_->takeOwnership()) throw VxXSharingViolation("ogcwmsserverlayer", __LINE__, "namedStyles");
}

VxOgcWmsServerLayer::VxOgcWmsServerLayer(const VxOgcWmsServerLayer& other, VxOperatorMap* map, bool shallow)
    : VxLayerSet(other, map, true),
      layerBounds(other.layerBounds),
      title(other.title),
      supportedCrs(other.supportedCrs),
      style_(other.style()),
      uniqueName_(other.uniqueName_) {
    namedStyles_ = other.namedStyles_->cloneVec();
    if (!namedStyles_->takeOwnership()) throw VxXSharingViolation("ogcwmsserverlayer", __LINE__, "namedStyles");
    if (shallow) clearLayers();
    rebuildReadOnlyLayers();
    if (!shallow) {
        const auto& kids = childLayers();
        for (size_t i = 0; i < kids->size(); ++i)
            if (auto* c = dynamic_cast<VxOgcWmsServerLayer*>(kids->get(i).get())) c->parent(this);
    }
}

VxOgcWmsServerLayer::~VxOgcWmsServerLayer() {
    if (namedStyles_) namedStyles_->releaseOwnership();
}

VxRef<VxEngineObject> VxOgcWmsServerLayer::cloneWithMap(VxOperatorMap*) const {
    return VxRef<VxEngineObject>(new VxOgcWmsServerLayer(*this, nullptr, false));
}

VxRef<VxOgcWmsServerLayer> VxOgcWmsServerLayer::shallowCopy() const {
    return VxRef<VxOgcWmsServerLayer>(new VxOgcWmsServerLayer(*this, nullptr, true));
}

void VxOgcWmsServerLayer::addChildLayer(const VxRef<VxOgcWmsServerLayer>& child, bool refresh) {
    addLayer(VxRef<VxLayer>(child.get()));
    child->parent(this);
    if (refresh) rebuildReadOnlyLayers();
}

void VxOgcWmsServerLayer::parent(VxLayerSet* p) { parent_ = p; }

VxRef<VxLayerSet> VxOgcWmsServerLayer::parent() const { return parent_.lock(); }

VxRef<VxOgcWmsServerLayer> VxOgcWmsServerLayer::getChildLayer(unsigned int index) const {
    return VxRef<VxOgcWmsServerLayer>(dynamic_cast<VxOgcWmsServerLayer*>(readOnlyLayers_->get(index).get()));
}

void VxOgcWmsServerLayer::onLayerMoved() { rebuildReadOnlyLayers(); }

void VxOgcWmsServerLayer::rebuildReadOnlyLayers() {
    VxRef<VxRefVec<VxLayer>> ro = childLayers()->shallowCopy();
    ro->markReadOnly();
    readOnlyLayers_ = ro;
}

VxRef<VxOgcWmsServerLayer> VxOgcWmsServerLayer::findLayerByUniqueName(const VxString& name) const {
    const auto& kids = childLayers();
    for (size_t i = 0; i < kids->size(); ++i) {
        auto* c = dynamic_cast<VxOgcWmsServerLayer*>(kids->get(i).get());
        if (!c) continue;
        if (c->uniqueName_ == name) return VxRef<VxOgcWmsServerLayer>(c);
        if (auto found = c->findLayerByUniqueName(name)) return found;
    }
    return nullptr;
}

VxString VxOgcWmsServerLayer::style() const {
    std::lock_guard<std::recursive_mutex> g(lock_);
    return style_;
}

void VxOgcWmsServerLayer::style(const VxString& name) {
    std::lock_guard<std::recursive_mutex> g(lock_);
    style_ = name;
}

VxRect VxOgcWmsServerLayer::getBoundsOfDataSets(const VxRef<VxCrs>& crs) const {
    VxRect r = layerBounds;
    if (r.isNull() || !crs) return r;
    VxRect second;
    if (VxCrs::wgs84LongLat()->projectTo(crs, r, second)) r.unite(second);
    return r;
}

VxString VxOgcWmsServerLayer::cacheId() const {
    if (!enabled()) return VxString();
    VxString id = name() + "(";
    bool first = true;
    const auto& kids = childLayers();
    for (size_t i = 0; i < kids->size(); ++i) {
        const VxRef<VxLayer>& c = kids->get(i);
        if (!c || !c->enabled()) continue;
        if (!first) id += ",";
        id += c->cacheId();
        first = false;
    }
    id += ")";
    return id;
}

void VxOgcWmsServerLayer::onEnabledChanged() {
    if (VxRef<VxLayerSet> p = parent()) p->onEnabledChanged();
}

void VxOgcWmsServerLayer::inheritProperties() {
    if (VxRef<VxLayerSet> p = parent()) {
        if (auto* sp = dynamic_cast<VxOgcWmsServerLayer*>(p.get())) {
            namedStyles_->addRange(*sp->namedStyles_);
            if (layerBounds.isNull()) layerBounds = sp->layerBounds;
        }
    }
    const auto& kids = childLayers();
    for (size_t i = 0; i < kids->size(); ++i)
        if (auto* c = dynamic_cast<VxOgcWmsServerLayer*>(kids->get(i).get())) c->inheritProperties();
    namedStyles_->markReadOnly();
}

void VxOgcWmsServerLayer::generateUniqueNames() {
    std::map<VxString, int> counts;
    counts[VxString()] = 0;
    generateUniqueNames(counts);
}

void VxOgcWmsServerLayer::generateUniqueNames(std::map<VxString, int>& counts) {
    const VxString n = name();
    auto it = counts.find(n);
    if (it != counts.end()) {
        int count = ++it->second;
        VxString unique = (n.isEmpty() ? VxString("layer") : n) + "." + VxStringUtils::itoa(count);
        counts[unique] = 0;
        uniqueName_ = unique;
    } else {
        counts[n] = 0;
        uniqueName_ = n;
    }
    const auto& kids = childLayers();
    for (size_t i = 0; i < kids->size(); ++i)
        if (auto* c = dynamic_cast<VxOgcWmsServerLayer*>(kids->get(i).get())) c->generateUniqueNames(counts);
}

void VxOgcWmsServerLayer::propagateSupportedCrs() {
    const auto& kids = childLayers();
    if (kids->size() == 0) return;
    std::map<CrsPair, size_t> occurrences;
    size_t childCount = 0;
    for (size_t i = 0; i < kids->size(); ++i) {
        auto* c = dynamic_cast<VxOgcWmsServerLayer*>(kids->get(i).get());
        ++childCount;
        if (!c) continue;
        c->propagateSupportedCrs();
        // A pair listed twice by one child still counts once for it: only pairs that
        // every child supports may be requested for the parent.
        std::vector<CrsPair> own = c->supportedCrs;
        std::sort(own.begin(), own.end());
        own.erase(std::unique(own.begin(), own.end()), own.end());
        for (const CrsPair& p : own) ++occurrences[p];
    }
    std::vector<CrsPair> merged = supportedCrs;
    for (const auto& [pair, count] : occurrences)
        if (count == childCount) merged.push_back(pair);
    std::sort(merged.begin(), merged.end());
    merged.erase(std::unique(merged.begin(), merged.end()), merged.end());
    supportedCrs = std::move(merged);
}
