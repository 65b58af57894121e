#pragma once
// A geographic feature: here a raster placed on the ground, in a coordinate system.
#include <cstdint>
#include <vector>

#include "vx/crs.h"
#include "vx/rastergeometry.h"

// Feature identity; a default id is 0, next() gives a fresh process-unique one.
struct VxId {
    uint64_t value = 0;
    static VxId next();
    friend bool operator==(const VxId& a, const VxId& b) { return a.value == b.value; }
};

// Options for projecting a feature.
struct VxProjectParams {
    // When set, a result that lies a whole world away from this area (in the target's
    // periodic x: 360 degrees, or the Web Mercator world width) is moved next to it, so a
    // piece fetched across the antimeridian lands where the view shows it.
    VxRect targetArea;
    // Resampling: true bilinear, false nearest.
    bool bilinear = true;
};

class VxFeature : public VxRefCnt {
public:
    VxFeature(const VxRef<VxRasterGeometry>& geometry, const VxRef<VxCrs>& crs, VxId id = VxId(),
              bool flag = false);
    ~VxFeature() override;

    const VxRef<VxRasterGeometry>& rasterGeometry() const { return geometry_; }
    const VxRef<VxCrs>& crs() const { return crs_; }
    VxId id() const { return id_; }

    // Warps the raster into target (inverse mapping through PROJ, bilinear) and appends the
    // result to out: one feature, or two when the result straddles the antimeridian of a
    // geographic target. Same CRS: appends a feature sharing this raster. Appends nothing on
    // failure. Returns whether anything was appended.
    // The result keeps the raster's pixel count (two pieces share its width) and layout.
    // RGBA8 is resampled bilinear (or nearest, see params); every other layout takes the
    // nearest sample so that indices and data values stay what they were. Pixels outside the
    // source are transparent: alpha 0, a transparent palette entry (an existing one, or one
    // appended to a copy of the palette; a full palette without one turns the result into
    // RGBA8), NaN for floating-point data, 0 for other data. In a Web Mercator target an
    // area across the world's edge stays one piece reaching past +-half world. The flag has
    // no effect on rasters; the results keep this feature's id.
    bool projectTo(const VxRef<VxCrs>& target, std::vector<VxRef<VxFeature>>& out,
                   const VxProjectParams* params, bool flag) const;

    // Moves the feature's bounds in place.
    void move(double dx, double dy, double dz = 0);

    // A feature holding only the part of the raster inside r (whole pixels); null when
    // nothing is inside.
    VxRef<VxFeature> clipByRect(const VxRect& r) const;

private:
    VxRef<VxRasterGeometry> geometry_;
    VxRef<VxCrs> crs_;
    VxId id_;
    bool flag_;
};
