#include "ogc/httpclientlayer.h"

#include <cmath>
#include <istream>

#include "ogc/MemInput.h"
#include "ogc/errors.h"
#include "vx/log.h"
#include "vx/runtime.h"

VX_IMPLEMENT_CLASS(VxHttpClientLayer, VxLayerSet, 11)

namespace {
bool casByte(std::atomic<uint8_t>& flag, uint8_t from, uint8_t to) { return flag.compare_exchange_strong(from, to); }

// Pixels across an extent, rounded half to even.
int pixelsAcross(double extent, double pixelSize) {
    if (pixelSize == 0) return 0;
    const double n = std::nearbyint(extent / pixelSize);
    return n > 1e9 ? 1000000000 : n < -1e9 ? -1000000000 : static_cast<int>(n);
}
}  // namespace

VxHttpClientLayer::VxHttpClientLayer(const VxLayerSetParams& params, bool buffered)
    : VxLayerSet(params), buffered_(buffered ? 1 : 0), rgbVisualizer_(VxRasterVis::createRGBVis(nullptr, 255, 1)) {}

VxHttpClientLayer::VxHttpClientLayer(const VxHttpClientLayer& other, VxOperatorMap* map)
    : VxLayerSet(other, map, other.initialized_.load() == 1),
      buffered_(other.buffered_.load()),
      rgbVisualizer_(other.rgbVisualizer_) {
    // A copy of a working layer keeps the copied tree: initializing it again would negotiate
    // anew and drop the user's choices of layers and styles made on the original.
    if (other.initialized_.load() == 1 && other.initializationFailed_.load() == 0) initialized_.store(1);
}

VxHttpClientLayer::~VxHttpClientLayer() = default;

void VxHttpClientLayer::initialize(bool suppressErrors) {
    std::lock_guard<std::recursive_mutex> g(lock_);
    if (initialized_.load() == 1) return;
    try {
        doInitialize();
        casByte(initialized_, 0, 1);
    } catch (const VxException& e) {
        // Not retried until reset().
        casByte(initialized_, 0, 1);
        casByte(initializationFailed_, 0, 1);
        if (!suppressErrors || canThrow()) throw;
        fireErrorEvent("Initialization of OgcWmsLayer '" + name() + "' failed: " + e.asString());
        VxLog::logf(VxLog::Warning,
                    "Error occurred during initialization of OgcWmsLayer %1%. The error was suppressed and the "
                    "layer will work as if empty.",
                    name());
    }
}

bool VxHttpClientLayer::initializationFailed() const {
    std::lock_guard<std::recursive_mutex> g(lock_);
    return initialized_.load() == 1 && initializationFailed_.load() == 1;
}

void VxHttpClientLayer::buffered(bool on) { casByte(buffered_, on ? 0 : 1, on ? 1 : 0); }

void VxHttpClientLayer::reset() {
    std::lock_guard<std::recursive_mutex> g(lock_);
    image1_ = nullptr;
    cachedImageHandler_ = nullptr;
    casByte(initializationFailed_, 1, 0);
    casByte(initialized_, 1, 0);
}

void VxHttpClientLayer::flushCache(bool deep) {
    std::lock_guard<std::recursive_mutex> g(lock_);
    image1_ = nullptr;
    cachedImageHandler_ = nullptr;
    VxLayer::flushCache(deep);
}

VxLayer::PrepareResult VxHttpClientLayer::doPrepare(const UpdateInfo& info) {
    initialize(true);
    const PrepareResult result = VxLayer::doPrepare(info);
    std::lock_guard<std::recursive_mutex> g(lock_);
    if (image1_) {
        const VxRef<VxRasterGeometry>& geo = image1_->rasterGeometry();
        const bool keep = buffered_.load() == 1 && pixelSizeX1_ == info.view.pixelSizeX &&
                          pixelSizeY1_ == info.view.pixelSizeY && geo && geo->bounds() == info.view.drawArea &&
                          geo->raster() && geo->raster()->width() == info.drawableWidth &&
                          geo->raster()->height() == info.drawableHeight;
        if (!keep) {
            image1_ = nullptr;
            image2_ = nullptr;
        }
    }
    return result;
}

void VxHttpClientLayer::doUpdate(UpdateInfo& info) {
    initialize(true);
    if (initializationFailed()) return;
    internalUpdate(info, nullptr, nullptr);
}

void VxHttpClientLayer::doCreatePresentation2(UpdateInfo& info, std::vector<VxRef<VxSGNode2>>& nodes) {
    initialize(true);
    if (initializationFailed()) return;
    internalUpdate(info, &nodes, nullptr);
}

void VxHttpClientLayer::doCreatePresentation3(UpdateInfo& info, std::vector<VxRef<VxSGNode3>>& nodes) {
    initialize(true);
    if (initializationFailed()) return;
    internalUpdate(info, nullptr, &nodes);
}

void VxHttpClientLayer::doUpdateCompleted(UpdateInfo&) {}

void VxHttpClientLayer::internalUpdate(UpdateInfo& info, std::vector<VxRef<VxSGNode2>>* nodes2,
                                       std::vector<VxRef<VxSGNode3>>* nodes3) {
    if (info.skip) return;
    std::lock_guard<std::recursive_mutex> g(lock_);
    VxRef<VxFeature> local1 = image1_, local2 = image2_;
    if (!local1) {
        getOneOrTwoImages(info, image1_, pixelSizeX1_, pixelSizeY1_, image2_, pixelSizeX2_, pixelSizeY2_);
        local1 = image1_;
        local2 = image2_;
    }
    doInternalUpdate(local1, info, nodes2, nodes3);
    doInternalUpdate(local2, info, nodes2, nodes3);
}

void VxHttpClientLayer::getOneOrTwoImages(const UpdateInfo& info, VxRef<VxFeature>& image1, double& px1, double& py1,
                                          VxRef<VxFeature>& image2, double& px2, double& py2) {
    image1 = nullptr;
    image2 = nullptr;
    px1 = py1 = px2 = py2 = 0;
    const VxView& view = info.view;
    if (!view.crs) return;
    VxRef<VxCrs> viewCrs = view.crs;
    if (view.crs2) viewCrs = VxCrs::fromAuthorityAndCode(view.crs2->authority(), view.crs2->code());
    VxRef<VxCrs> requestCrs = selectRequestCrs(viewCrs);
    if (!requestCrs) return;

    VxRect area = buffered_.load() == 1 ? view.drawArea : view.area;
    const int width = pixelsAcross(area.width(), view.pixelSizeX);
    const int height = pixelsAcross(area.height(), view.pixelSizeY);
    if (area.width() * area.height() == 0) return;

    if (requestCrs.get() == view.crs.get()) {
        getOneImage(info, width, height, requestCrs, area, image1, px1, py1);
        return;
    }
    VxRect second;
    const bool twoPieces = view.crs->projectTo(requestCrs, area, second);
    if (!twoPieces) {
        if (area.isNull()) {
            VxLog::debug("View area cannot be expressed in the request coordinate system; nothing requested");
            return;
        }
        getOneImage(info, width, height, requestCrs, area, image1, px1, py1);
        return;
    }
    auto sizeInView = [&](const VxRect& piece, int& w, int& h) {
        VxRect copy = piece, unused;
        requestCrs->projectTo(view.crs, copy, unused);
        w = pixelsAcross(copy.width(), view.pixelSizeX);
        h = pixelsAcross(copy.height(), view.pixelSizeY);
    };
    int w2, h2, w1, h1;
    sizeInView(second, w2, h2);
    sizeInView(area, w1, h1);
    getOneImage(info, w2, h2, requestCrs, second, image2, px2, py2);
    getOneImage(info, w1, h1, requestCrs, area, image1, px1, py1);
}

void VxHttpClientLayer::report(const VxString& message) {
    if (canThrow()) throw VxXOgcError("httpclientlayer", __LINE__, message);
    fireErrorEvent(message);
    VxLog::logf(VxLog::Error, "OgcWmsLayer: %1%", message);
}

void VxHttpClientLayer::getOneImage(const UpdateInfo& info, int width, int height, const VxRef<VxCrs>& crs,
                                    const VxRect& bounds, VxRef<VxFeature>& image, double& pixelSizeX,
                                    double& pixelSizeY) {
    image = nullptr;
    pixelSizeX = pixelSizeY = 0.0;
    if (!supportedImageSize(width, height)) {
        report("Requested image size is too large. Consider putting the OgcWmsLayer into a TileLayer.");
        return;
    }
    // A degenerate piece (a sliver narrower than a pixel) has nothing to show.
    if (width <= 0 || height <= 0) return;

    VxHttpRequest request;
    initializeHttpRequest(request);
    request.parameters = buildRequest(width, height, info.view.scale, bounds, crs).toLatin1();
    if (request.parameters.empty()) return;
    VxLog::logf(VxLog::Info, "OgcWmsLayer getting map: %1%", request.parameters);

    VxHttpResponse response;
    if (!request.execute(response)) {
        if (canThrow()) throw VxXRequestError("httpclientlayer", __LINE__, VxString(request.parameters), VxString(request.host));
        fireErrorEvent("Failed to get map image from WMS service.");
        return;
    }
    const VxString contentType(response.contentType);
    if (contentType.startsWith("image", true) && !response.data.empty()) {
        VxRef<VxImageHandler> handler = getImageHandler(response.contentType);
        if (!handler) {
            report("Unknown image format received: " + contentType);
            return;
        }
        MemInput buffer(response.data.data(), response.data.data() + response.data.size());
        std::istream in(&buffer);
        VxRef<VxRasterGeometry> geometry = handler->read(in);
        if (!geometry) {
            report("ImageHandler failed to read image of format: " + contentType);
            return;
        }
        geometry->bounds(bounds);
        VxRef<VxFeature> feature(new VxFeature(geometry, crs, VxId::next(), false));
        std::vector<VxRef<VxFeature>> projected;
        // Our addition to the call: the view's area, so a piece fetched across the
        // antimeridian lands in the world copy the view shows.
        VxProjectParams params;
        params.targetArea = info.view.area;
        feature->projectTo(info.view.crs, projected, &params, true);
        if (projected.empty()) {
            report("Failed to reproject raster feature to coordinate reference system: " + info.view.crs->name());
            return;
        }
        image = projected.front();
        const VxRef<VxRasterGeometry>& g = image->rasterGeometry();
        pixelSizeX = g->bounds().width() / g->raster()->width();
        pixelSizeY = g->bounds().height() / g->raster()->height();
        return;
    }
    const bool xmlText = contentType.startsWith("text/xml", true) || contentType.startsWith("application/xml", true);
    if (xmlText && !response.data.empty()) report("Service exception: " + VxString(response.data));
    else report(VxString("Service exception: ") + "Unknown error.");
}

VxRef<VxImageHandler> VxHttpClientLayer::getImageHandler(const std::string& contentType) {
    if (contentType.size() < 9) {
        cachedImageHandler_ = nullptr;
        return nullptr;
    }
    const VxString key = VxString(contentType.substr(0, 9)).toLower();
    if (cachedImageHandler_ && cachedImageType_ == key) return cachedImageHandler_;
    const char* handlerKey = key == "image/png" ? "png" : key == "image/jpe" ? "jpg" : key == "image/gif" ? "gif" : nullptr;
    if (!handlerKey) {
        cachedImageHandler_ = nullptr;
        return nullptr;
    }
    cachedImageHandler_ = VxImageHandler::getHandler(handlerKey);
    cachedImageType_ = key;
    return cachedImageHandler_;
}

void VxHttpClientLayer::doInternalUpdate(VxRef<VxFeature>& image, UpdateInfo& info,
                                         std::vector<VxRef<VxSGNode2>>* nodes2,
                                         std::vector<VxRef<VxSGNode3>>* nodes3) {
    if (!image) return;
    VxRef<VxFeature> feature = image;
    if (info.is3D) {
        // Move a copy: the buffered image must keep its place for the next cycle.
        const VxRef<VxRasterGeometry>& g = image->rasterGeometry();
        feature = new VxFeature(VxRef<VxRasterGeometry>(new VxRasterGeometry(g->raster(), g->bounds())), image->crs(),
                                image->id(), false);
        feature->move(-info.view.centreX(), -info.view.centreY(), 0);
    }

    VxRef<VxRasterVis> vis;
    const VxRef<VxRaster>& raster = feature->rasterGeometry()->raster();
    if (feature->rasterGeometry()->asMultiBandRaster() || !raster || !raster->palette()) {
        vis = rgbVisualizer_;
    } else {
        VxRef<VxKeyValueTable> table(new VxKeyValueTable());
        const VxRef<VxPalette>& palette = raster->palette();
        bool any = false;
        VxColor last;
        for (int i = 0; i < palette->size(); ++i) {
            const VxColor c = palette->getColor(i);
            if (any && c == last) continue;
            table->add(static_cast<int64_t>(i), c);
            last = c;
            any = true;
        }
        vis = VxRasterVis::createFromColorTable(VxRef<VxKeyedAttributeVariable>(new VxKeyedAttributeVariable(0, table, nullptr)));
    }

    VxCreatePresParams params;
    if (info.is3D) {
        VxRef<VxSGNode3> node = vis->createPresentation3(feature, params);
        if (node && nodes3)
            nodes3->push_back(VxRef<VxSGNode3>(new VxSGCenterPointOffset3(info.view.centreX(), info.view.centreY(), 0, node)));
    } else {
        VxRef<VxSGNode2> node = vis->createPresentation2(feature, params);
        if (node) {
            if (nodes2) nodes2->push_back(node);
            else if (info.drawTarget)
                node->draw(*info.drawTarget, VxSGRenderState2(info.view.transform, info.view.drawArea, VxRect(), 0.0));
        }
    }
    if (buffered_.load() != 1) image = nullptr;
}

void VxHttpClientLayer::fireErrorEvent(const VxString& message) {
    VxErrorEventArgs args;
    args.message = message;
    VxRuntime::errorEvent().raise(this, args);
}
