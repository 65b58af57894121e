#pragma once
// Scene-graph nodes: what a visualizer hands back for a view to draw.
#include <mutex>

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
// through a colour table (a value takes the colour of the greatest key not above it, so a
// run of equal colours needs one entry; values below the first key are transparent).
class VxSGRasterNode2 : public VxSGNode2 {
public:
    VxSGRasterNode2(const VxRef<VxFeature>& feature, const VxRef<VxKeyValueTable>& colors, int filter);
    ~VxSGRasterNode2() override;
    void draw(VxCanvas& canvas, const VxSGRenderState2& state) const override;
    const VxRef<VxFeature>& feature() const { return feature_; }

    // 255 draws opaque, 0 not at all.
    void opacity(int value) { opacity_ = value; }
    int opacity() const { return opacity_; }
    // The colour of values the table has no colour for; transparent unless set.
    void defaultColor(const VxColor& c) { defaultColor_ = c; }

    // The colours the table gives the raster, made on first use and kept; null without a
    // table or raster.
    VxRef<VxRaster> coloredRaster() const;

private:
    VxRef<VxFeature> feature_;
    VxRef<VxKeyValueTable> colors_;
    int filter_;
    int opacity_ = 255;
    VxColor defaultColor_;
    mutable std::mutex cacheMutex_;
    mutable VxRef<VxRaster> colored_;
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
