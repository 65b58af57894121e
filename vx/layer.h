#pragma once
// Engine layers: name, enabled state, scale range, children and the update cycle.
#include <atomic>
#include <cstdint>
#include <mutex>
#include <vector>

#include "vx/crs.h"
#include "vx/engineobject.h"
#include "vx/rect.h"
#include "vx/refvec.h"

class VxLayer;
class VxSGNode2;
class VxSGNode3;
class VxFeature;

// Common layer properties a configuration or a caller hands to a layer's constructor.
struct VxLayerSetParams {
    VxString name;
    bool enabled = true;
    double minScale = 0.0;  // 0: no lower limit
    double maxScale = 0.0;  // 0: no upper limit
    double opacity = 1.0;
    std::vector<VxRef<VxLayer>> children;
};

class VxLayer : public VxEngineObject {
    VX_DECLARE_CLASS()
public:
    // What a view's update hands to each layer (defined in vx/updateinfo.h).
    struct UpdateInfo;
    enum PrepareResult { PrepareNothing = 0, PrepareUpdate = 1 };

    VxLayer();
    explicit VxLayer(const VxLayerSetParams& params);
    VxLayer(const VxLayer& other, VxOperatorMap* map);
    ~VxLayer() override;

    VxString name() const;
    void name(const VxString& n);
    VxString engineName() const override { return name(); }

    bool enabled() const { return enabled_.load(); }
    // Reports a change through onEnabledChanged.
    void enabled(bool on);
    virtual void onEnabledChanged() {}

    double minScale() const { return minScale_; }
    double maxScale() const { return maxScale_; }
    void minScale(double s) { minScale_ = s; }
    void maxScale(double s) { maxScale_ = s; }
    bool visibleAtScale(double scale) const;
    double opacity() const { return opacity_; }
    void opacity(double o) { opacity_ = o; }

    // Children as the application sees them; plain layers have none.
    virtual VxRef<VxRefVec<VxLayer>> layers() const { return nullptr; }
    virtual bool hasVirtualChildLayers() const { return false; }
    virtual bool dontSaveLayers() const { return false; }
    virtual VxString cacheId() const { return name(); }
    virtual uint64_t changeCounter() const { return 0; }
    // Bounds of the layer's data in crs; (0,0,0,0) when unknown.
    virtual VxRect getBoundsOfDataSets(const VxRef<VxCrs>& crs) const;

    // Update cycle.
    virtual PrepareResult doPrepare(const UpdateInfo& info);
    virtual void doUpdate(UpdateInfo& info);
    virtual void doCreatePresentation2(UpdateInfo& info, std::vector<VxRef<VxSGNode2>>& nodes);
    virtual void doCreatePresentation3(UpdateInfo& info, std::vector<VxRef<VxSGNode3>>& nodes);
    virtual void doUpdateCompleted(UpdateInfo& info);
    virtual void doFlushCache() {}
    virtual void flushCache(bool deep);

private:
    mutable std::mutex nameMutex_;
    VxString name_;
    std::atomic<bool> enabled_{true};
    double minScale_ = 0.0;
    double maxScale_ = 0.0;
    double opacity_ = 1.0;
};

class VxLayerSet : public VxLayer {
    VX_DECLARE_CLASS()
public:
    VxLayerSet();
    explicit VxLayerSet(const VxLayerSetParams& params);
    // Copies the base; the children are deep-copied only when copyChildren is set.
    VxLayerSet(const VxLayerSet& other, VxOperatorMap* map, bool copyChildren);
    ~VxLayerSet() override;

    // The core child collection, in order.
    const VxRef<VxRefVec<VxLayer>>& childLayers() const { return children_; }
    void addLayer(const VxRef<VxLayer>& layer);
    void clearLayers();
    size_t layerCount() const { return children_->size(); }

    VxRef<VxRefVec<VxLayer>> layers() const override { return children_; }
    virtual void onLayerMoved() {}
    void getMyChildObjects(std::vector<VxRef<VxEngineObject>>& out) const override;
    VxRect getBoundsOfDataSets(const VxRef<VxCrs>& crs) const override;

    PrepareResult doPrepare(const UpdateInfo& info) override;
    void flushCache(bool deep) override;

private:
    VxRef<VxRefVec<VxLayer>> children_;
};
