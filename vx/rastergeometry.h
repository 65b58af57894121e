#pragma once
// A raster placed on the ground: the raster plus the rectangle it covers.
#include "vx/raster.h"
#include "vx/rect.h"
#include "vx/refcnt.h"

class VxRasterGeometry : public VxRefCnt {
public:
    explicit VxRasterGeometry(VxRef<VxRaster> raster, const VxRect& bounds = VxRect());

    const VxRef<VxRaster>& raster() const { return raster_; }
    void raster(const VxRef<VxRaster>& r) { raster_ = r; }

    const VxRect& bounds() const { return bounds_; }
    void bounds(const VxRect& b) { bounds_ = b; }

    // The raster when it carries several bands per pixel (RGBA8, or data with more than one
    // band); null for palette and single-band rasters, which are shown through a colour table.
    VxRef<VxRaster> asMultiBandRaster() const;

    // Georeferencing the image file declared for itself, when it had any (GeoTIFF tie point and
    // pixel scale; EPSG code from its key directory, 0 when absent). Informational only.
    const VxRect& sourceBounds() const { return sourceBounds_; }
    void sourceBounds(const VxRect& b) { sourceBounds_ = b; }
    int sourceEpsg() const { return sourceEpsg_; }
    void sourceEpsg(int code) { sourceEpsg_ = code; }

private:
    VxRef<VxRaster> raster_;
    VxRect bounds_;
    VxRect sourceBounds_;
    int sourceEpsg_ = 0;
};
