#pragma once
// Scene-graph nodes: what a visualizer hands back for a view to draw.
#include "vx/canvas.h"
#include "vx/feature.h"
#include "vx/transform2.h"

class VxKeyValueTable;

// What a 2D node needs to draw itself.
struct VxSGRenderState2 {
    VxTransform2 transform;
    VxRect drawArea;
    VxRect clip;       // (0,0,0,0): no clip
    double value = 0;  // opacity reduction; 0 draws fully opaque
    VxSGRenderState2() = default;
    VxSGRenderState2(const VxTransform2& t, const VxRect& area, const VxRect& c, double v)
        : transform(t), drawArea(area), clip(c), value(v) {}
};

class VxSGNode2 : public VxRefCnt {
public:
    ~VxSGNode2() override;
    virtual void draw(VxCanvas& canvas, const VxSGRenderState2& state) const = 0;
};

// Draws a raster feature: multi-band rasters as RGB(A), palette and single-band rasters
// through a colour table (index → colour; missing keys transparent).
class VxSGRasterNode2 : public VxSGNode2 {
public:
    VxSGRasterNode2(const VxRef<VxFeature>& feature, const VxRef<VxKeyValueTable>& colors, int filter);
    ~VxSGRasterNode2() override;
    void draw(VxCanvas& canvas, const VxSGRenderState2& state) const override;
    const VxRef<VxFeature>& feature() const { return feature_; }

private:
    VxRef<VxFeature> feature_;
    VxRef<VxKeyValueTable> colors_;
    int filter_;
};

// 3D nodes only hold what they are given.
class VxSGNode3 : public VxRefCnt {
public:
    ~VxSGNode3() override;
};

class VxSGFeatureNode3 : public VxSGNode3 {
public:
    explicit VxSGFeatureNode3(const VxRef<VxFeature>& f) : feature(f) {}
    VxRef<VxFeature> feature;
};

// Places its child relative to a centre point (large world coordinates stay precise).
class VxSGCenterPointOffset3 : public VxSGNode3 {
public:
    VxSGCenterPointOffset3(double x, double y, double z, const VxRef<VxSGNode3>& child)
        : x(x), y(y), z(z), child(child) {}
    double x, y, z;
    VxRef<VxSGNode3> child;
};
