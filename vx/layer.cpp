#include "vx/layer.h"

VX_IMPLEMENT_CLASS(VxLayer, VxEngineObject, 0)
VX_IMPLEMENT_CLASS(VxLayerSet, VxLayer, 0)

VxLayer::VxLayer() = default;

VxLayer::VxLayer(const VxLayerSetParams& p)
    : name_(p.name), enabled_(p.enabled), minScale_(p.minScale), maxScale_(p.maxScale),
      opacity_(p.opacity) {}

VxLayer::VxLayer(const VxLayer& other, VxOperatorMap* map)
    : VxEngineObject(other), name_(other.name()), enabled_(other.enabled()),
      minScale_(other.minScale_), maxScale_(other.maxScale_), opacity_(other.opacity_) {
    if (map) map->put(&other, this);
}

VxLayer::~VxLayer() = default;

VxString VxLayer::name() const {
    std::lock_guard<std::mutex> g(nameMutex_);
    return name_;
}

void VxLayer::name(const VxString& n) {
    std::lock_guard<std::mutex> g(nameMutex_);
    name_ = n;
}

void VxLayer::enabled(bool on) {
    if (enabled_.exchange(on) != on) onEnabledChanged();
}

bool VxLayer::visibleAtScale(double scale) const {
    if (minScale_ > 0 && scale < minScale_) return false;
    if (maxScale_ > 0 && scale > maxScale_) return false;
    return true;
}

VxRect VxLayer::getBoundsOfDataSets(const VxRef<VxCrs>&) const { return VxRect(); }

VxLayer::PrepareResult VxLayer::doPrepare(const UpdateInfo&) { return PrepareUpdate; }
void VxLayer::doUpdate(UpdateInfo&) {}
void VxLayer::doCreatePresentation2(UpdateInfo&, std::vector<VxRef<VxSGNode2>>&) {}
void VxLayer::doCreatePresentation3(UpdateInfo&, std::vector<VxRef<VxSGNode3>>&) {}
void VxLayer::doUpdateCompleted(UpdateInfo&) {}
void VxLayer::flushCache(bool) { doFlushCache(); }

VxLayerSet::VxLayerSet() : children_(new VxRefVec<VxLayer>()) {}

VxLayerSet::VxLayerSet(const VxLayerSetParams& p) : VxLayer(p), children_(new VxRefVec<VxLayer>()) {
    for (auto& c : p.children) children_->add(c);
}

VxLayerSet::VxLayerSet(const VxLayerSet& other, VxOperatorMap* map, bool copyChildren)
    : VxLayer(other, map), children_(new VxRefVec<VxLayer>()) {
    if (!copyChildren) return;
    for (size_t i = 0; i < other.children_->size(); ++i) {
        const VxRef<VxLayer>& c = other.children_->get(i);
        if (!c) continue;
        VxRef<VxEngineObject> copy = c->cloneWithMap(map);
        if (VxLayer* l = dynamic_cast<VxLayer*>(copy.get())) children_->add(VxRef<VxLayer>(l));
    }
}

VxLayerSet::~VxLayerSet() = default;

void VxLayerSet::addLayer(const VxRef<VxLayer>& layer) { children_->add(layer); }
void VxLayerSet::clearLayers() { children_->clear(); }

void VxLayerSet::getMyChildObjects(std::vector<VxRef<VxEngineObject>>& out) const {
    for (size_t i = 0; i < children_->size(); ++i) out.push_back(VxRef<VxEngineObject>(children_->get(i).get()));
}

VxRect VxLayerSet::getBoundsOfDataSets(const VxRef<VxCrs>& crs) const {
    VxRect r;
    for (size_t i = 0; i < children_->size(); ++i)
        if (const VxRef<VxLayer>& c = children_->get(i)) r.unite(c->getBoundsOfDataSets(crs));
    return r;
}

VxLayer::PrepareResult VxLayerSet::doPrepare(const UpdateInfo& info) {
    for (size_t i = 0; i < children_->size(); ++i)
        if (const VxRef<VxLayer>& c = children_->get(i)) c->doPrepare(info);
    return PrepareUpdate;
}

void VxLayerSet::flushCache(bool deep) {
    VxLayer::flushCache(deep);
    if (!deep) return;
    for (size_t i = 0; i < children_->size(); ++i)
        if (const VxRef<VxLayer>& c = children_->get(i)) c->flushCache(deep);
}
