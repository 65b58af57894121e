#pragma once
// The engine layer that shows a Web Map Service: negotiates once, exposes the server's
// layer tree below itself, and builds one GetMap request per view image.
#include <atomic>
#include <mutex>

#include "ogc/httpclientlayer.h"
#include "ogc/ogcwmscapabilities.h"
#include "ogc/ogcwmslayerparams.h"
#include "vx/palette.h"
#include "vx/vec.h"

class VxOgcWmsLayer : public VxHttpClientLayer {
    VX_DECLARE_CLASS()
public:
    explicit VxOgcWmsLayer(const VxOgcWmsLayerParams& params);
    explicit VxOgcWmsLayer(const VxString& url = VxString());
    ~VxOgcWmsLayer() override;

    VxString myRuntimeClassName() const override { return "OgcWmsLayer"; }
    VxRef<VxEngineObject> cloneWithMap(VxOperatorMap* map) const override;

    // Properties that may change at any time.
    int timeout() const;
    void timeout(int seconds);
    VxString user() const;
    void user(const VxString& u);
    VxString password() const;
    void password(const VxString& p);
    virtual bool throwExceptions() const { return throwExceptions_.load() == 1; }
    void throwExceptions(bool on) { throwExceptions_.store(on ? 1 : 0); }

    // Fixed at creation.
    VxString url() const { return url_; }
    const VxRef<VxVec<VxString>>& explicitLayers() const { return explicitLayers_; }
    const VxRef<VxVec<VxString>>& explicitStyles() const { return explicitStyles_; }
    VxColor background() const { return background_; }
    VxString dimensionValues() const { return dimensionValues_; }
    VxString elevation() const { return elevation_; }
    int format() const { return format_; }
    VxString time() const { return time_; }
    bool transparent() const { return transparent_; }
    VxString vendorSpecificParameters() const { return vendorSpecificParameters_; }

    VxString serviceUrl() const;
    VxRef<VxOgcWmsCapabilities> capabilities() const;

    // Tree access; each initializes first.
    VxRef<VxRefVec<VxLayer>> layers() const override;
    VxRef<VxOgcWmsServerLayer> getChildLayer(unsigned int index) const;
    VxRef<VxOgcWmsServerLayer> findLayerByUniqueName(const VxString& name) const;
    VxRect getBoundsOfDataSets(const VxRef<VxCrs>& crs) const override;
    // Feature queries are not offered by a map image service.
    void getFeatures(const VxRef<VxCrs>& crs, const void* query) const;

    bool hasVirtualChildLayers() const override { return true; }
    bool dontSaveLayers() const override { return true; }
    uint64_t changeCounter() const override { return changeCounter_.load(); }
    VxString cacheId() const override;
    void onEnabledChanged() override;
    void onLayerMoved() override;

    // Forgets the service: the next use negotiates again.
    void reset();

    // Hooks (public so the engine and tests can drive a request without a view).
    void doInitialize() override;
    bool canThrow() const override;
    bool supportedImageSize(int width, int height) const override;
    VxString buildRequest(int width, int height, double scale, VxRect bounds, VxRef<VxCrs> crs) override;
    VxRef<VxCrs> selectRequestCrs(VxRef<VxCrs> viewCrs) override;
    void initializeHttpRequest(VxHttpRequest& request) const override;

private:
    VxOgcWmsLayer(const VxOgcWmsLayer& other, VxOperatorMap* map);
    void checkExplicitStyles() const;
    void initializeRootLayers();
    OgcImageFormat chooseFormat() const;
    void rebuildTopLayers();

    VxString url_;
    VxRef<VxVec<VxString>> explicitLayers_;
    VxRef<VxVec<VxString>> explicitStyles_;
    VxColor background_{255, 255, 255, 255};
    VxString dimensionValues_;
    VxString elevation_;
    int format_ = Auto;
    VxString time_;
    bool transparent_ = true;
    VxString vendorSpecificParameters_;

    mutable std::recursive_mutex lock_;
    VxString serviceUrl_;
    std::atomic<uint8_t> throwExceptions_{0};
    VxRef<VxOgcWmsCapabilities> capabilities_;
    VxRef<VxRefVec<VxLayer>> topLayers_;
    VxHttpRequest requestTemplate_;
    std::atomic<unsigned> changeCounter_{0};
};
