#pragma once
// Coordinate reference systems on PROJ. Inside the engine coordinates are always
// x = east, y = north; the wire order is decided elsewhere (VxOgcService::switchXY).
// Objects are interned by authority and code: equal systems are the very same object.
#include <cstddef>

#include "vx/rect.h"
#include "vx/refcnt.h"
#include "vx/string.h"

enum VxCrsAxisDirection {
    VxCrsAxisUnknown = 0,
    VxCrsAxisNorth = 1,
    VxCrsAxisSouth = 2,
    VxCrsAxisEast = 3,
    VxCrsAxisWest = 4,
    VxCrsAxisUp = 5,
    VxCrsAxisDown = 6,
    VxCrsAxisOther = 7
};

class VxCrs : public VxRefCnt {
public:
    ~VxCrs() override;

    // "EPSG","4326"; "CRS","84"; "OGC","CRS84" (the same object as "CRS","84")...
    // The authority is case-insensitive. Unknown codes raise a VxException.
    static VxRef<VxCrs> fromAuthorityAndCode(const VxString& authority, const VxString& code);
    // "urn:ogc:def:crs:EPSG:6.3:3857", "urn:ogc:def:crs:EPSG::4326", "urn:ogc:def:crs:OGC:1.3:CRS84";
    // also accepts "EPSG:4326" and "CRS:84". Unknown or malformed raise a VxException.
    static VxRef<VxCrs> fromUrn(const VxString& urn);
    // EPSG 4326, longitude/latitude inside the engine.
    static VxRef<VxCrs> wgs84LongLat();
    // Direction of axis 0 or 1 as the authority defines it; VxCrsAxisUnknown when unknown.
    static VxCrsAxisDirection authoritativeAxisDirection(int axis, const VxString& authority,
                                                         const VxString& code);

    const VxString& authority() const { return authority_; }
    const VxString& code() const { return code_; }
    // "AUTHORITY:CODE" as made, e.g. "EPSG:4326", "CRS:84".
    VxString id() const;
    // The registry's name, e.g. "WGS 84 / Pseudo-Mercator".
    VxString name() const;
    bool isGeographic() const;
    // Metres per unit of the first axis (degree: 2*pi*6378137/360).
    double lengthUnit() const;
    // True when coordinates need no transformation between the two (same definition).
    bool compatibleWith(const VxRef<VxCrs>& other) const;

    // Maps rect in place into target (edges densified). Returns true when the result
    // falls into two pieces across the antimeridian of a geographic target; the second
    // piece is written to `second`: rect then runs from its west edge to +180 and
    // `second` from -180 to its east edge. Samples that fail to project are skipped;
    // Web Mercator results are clamped to the projection's square world.
    // On failure rect becomes (0,0,0,0) and false is returned.
    bool projectTo(const VxRef<VxCrs>& target, VxRect& rect, VxRect& second) const;

    // Transforms n points in place (x east, y north). Points that fail become HUGE_VAL.
    // Returns false when no transformation could be set up.
    bool transform(const VxRef<VxCrs>& target, double* x, double* y, size_t n) const;

    friend bool operator==(const VxCrs& a, const VxCrs& b) { return &a == &b || a.sameAs(b); }
    friend bool operator!=(const VxCrs& a, const VxCrs& b) { return !(a == b); }

    struct Impl;
    const Impl* impl() const { return impl_; }

private:
    VxCrs(const VxString& authority, const VxString& code, Impl* impl);
    bool sameAs(const VxCrs& other) const;
    VxString authority_, code_;
    Impl* impl_;
};
