#pragma once
// Base of a layer that draws one server-rendered image per view (two when the view falls
// into two pieces in the server's coordinate system): lazy initialization, reuse of the
// last image while the view is unchanged, fetch, decoding, reprojection, presentation.
#include <atomic>
#include <mutex>

#include "ogc/http.h"
#include "vx/feature.h"
#include "vx/imagehandler.h"
#include "vx/layer.h"
#include "vx/rastervis.h"
#include "vx/updateinfo.h"

class VxHttpClientLayer : public VxLayerSet {
    VX_DECLARE_CLASS()
public:
    VxHttpClientLayer(const VxLayerSetParams& params, bool buffered);
    VxHttpClientLayer(const VxHttpClientLayer& other, VxOperatorMap* map);
    ~VxHttpClientLayer() override;

    // suppressErrors: report a failure through the error event instead of throwing,
    // unless canThrow() says otherwise.
    void initialize(bool suppressErrors);
    bool initializationFailed() const;
    void buffered(bool on);
    bool buffered() const { return buffered_.load() == 1; }

    virtual void flushCache(bool deep) override;

    PrepareResult doPrepare(const UpdateInfo& info) override;
    void doUpdate(UpdateInfo& info) override;
    void doCreatePresentation2(UpdateInfo& info, std::vector<VxRef<VxSGNode2>>& nodes) override;
    void doCreatePresentation3(UpdateInfo& info, std::vector<VxRef<VxSGNode3>>& nodes) override;
    void doUpdateCompleted(UpdateInfo& info) override;

    bool isLockable() const override { return true; }
    void lock() const override { lock_.lock(); }
    void unlock() const override { lock_.unlock(); }

protected:
    // Hooks for the service-specific subclass, called with this layer's lock held.
    virtual void doInitialize() = 0;
    virtual bool canThrow() const = 0;
    virtual bool supportedImageSize(int width, int height) const = 0;
    virtual VxString buildRequest(int width, int height, double scale, VxRect bounds, VxRef<VxCrs> crs) = 0;
    virtual VxRef<VxCrs> selectRequestCrs(VxRef<VxCrs> viewCrs) = 0;
    virtual void initializeHttpRequest(VxHttpRequest& request) const = 0;

    void reset();
    std::recursive_mutex& layerLock() const { return lock_; }

private:
    void internalUpdate(UpdateInfo& info, std::vector<VxRef<VxSGNode2>>* nodes2,
                        std::vector<VxRef<VxSGNode3>>* nodes3);
    void getOneOrTwoImages(const UpdateInfo& info, VxRef<VxFeature>& image1, double& px1, double& py1,
                           VxRef<VxFeature>& image2, double& px2, double& py2);
    void getOneImage(const UpdateInfo& info, int width, int height, const VxRef<VxCrs>& crs, const VxRect& bounds,
                     VxRef<VxFeature>& image, double& pixelSizeX, double& pixelSizeY);
    VxRef<VxImageHandler> getImageHandler(const std::string& contentType);
    void doInternalUpdate(VxRef<VxFeature>& image, UpdateInfo& info, std::vector<VxRef<VxSGNode2>>* nodes2,
                          std::vector<VxRef<VxSGNode3>>* nodes3);
    void fireErrorEvent(const VxString& message);
    // Throws VxXOgcError or reports through the event and the log, as canThrow() says.
    void report(const VxString& message);

    std::atomic<uint8_t> initialized_{0};
    mutable std::recursive_mutex lock_;
    std::atomic<uint8_t> initializationFailed_{0};
    std::atomic<uint8_t> buffered_{0};
    VxRef<VxImageHandler> cachedImageHandler_;
    VxString cachedImageType_;
    VxRef<VxRasterVis> rgbVisualizer_;
    VxRef<VxFeature> image1_;
    double pixelSizeX1_ = 0, pixelSizeY1_ = 0;
    VxRef<VxFeature> image2_;
    double pixelSizeX2_ = 0, pixelSizeY2_ = 0;
};
