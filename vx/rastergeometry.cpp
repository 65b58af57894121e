#include "vx/rastergeometry.h"

VxRasterGeometry::VxRasterGeometry(VxRef<VxRaster> raster, const VxRect& bounds)
    : raster_(std::move(raster)), bounds_(bounds) {}

VxRef<VxRaster> VxRasterGeometry::asMultiBandRaster() const {
    if (!raster_) return nullptr;
    if (raster_->format() == VxRasterFormat::RGBA8 || raster_->bands() > 1) return raster_;
    return nullptr;
}
