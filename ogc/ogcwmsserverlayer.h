#pragma once
// One layer of a WMS server's layer tree. Draws nothing itself: the WMS layer turns the
// enabled server layers into its GetMap request.
#include <map>
#include <mutex>
#include <utility>
#include <vector>

#include "ogc/ogcwmsnamedstyle.h"
#include "vx/layer.h"

class VxOgcWmsServerLayer : public VxLayerSet {
    VX_DECLARE_CLASS()
public:
    using CrsPair = std::pair<VxString, VxString>;  // (authority in upper case, code)
    using StyleVec = VxRefVec<VxOgcWmsNamedStyle>;

    VxOgcWmsServerLayer();
    VxOgcWmsServerLayer(const VxOgcWmsServerLayer& other, VxOperatorMap* map, bool shallow);
    ~VxOgcWmsServerLayer() override;

    VxRef<VxEngineObject> cloneWithMap(VxOperatorMap* map) const override;
    VxRef<VxOgcWmsServerLayer> shallowCopy() const;

    // Tree
    void addChildLayer(const VxRef<VxOgcWmsServerLayer>& child, bool refresh = true);
    void childLayersAdded() { rebuildReadOnlyLayers(); }
    void parent(VxLayerSet* p);
    VxRef<VxLayerSet> parent() const;
    VxRef<VxRefVec<VxLayer>> layers() const override { return readOnlyLayers_; }
    VxRef<VxOgcWmsServerLayer> getChildLayer(unsigned int index) const;
    void onLayerMoved() override;
    bool hasVirtualChildLayers() const override { return true; }
    VxRef<VxOgcWmsServerLayer> findLayerByUniqueName(const VxString& name) const;

    // Properties
    VxString uniqueName() const { return uniqueName_; }
    VxRef<StyleVec> namedStyles() const { return namedStyles_; }
    VxString style() const;
    void style(const VxString& name);
    VxRect getLayerBounds() const { return layerBounds; }
    VxRect getBoundsOfDataSets(const VxRef<VxCrs>& crs) const override;
    VxString cacheId() const override;
    void onEnabledChanged() override;

    // Tree operations, run once on the root after parsing.
    void inheritProperties();
    void generateUniqueNames();
    void propagateSupportedCrs();

    VxRect layerBounds;
    VxString title;
    std::vector<CrsPair> supportedCrs;

private:
    void rebuildReadOnlyLayers();
    void generateUniqueNames(std::map<VxString, int>& counts);

    mutable std::recursive_mutex lock_;
    VxWeakRef<VxLayerSet> parent_;
    VxRef<VxRefVec<VxLayer>> readOnlyLayers_;
    VxRef<StyleVec> namedStyles_;
    VxString style_;
    VxString uniqueName_;
};
