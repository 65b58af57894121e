#include "vx/rastervis.h"

VxRef<VxRasterVis> VxRasterVis::createRGBVis(const void* /*condition: every feature qualifies*/,
                                             int value, int filter) {
    VxRef<VxRasterVis> vis(new VxRasterVis);
    vis->value_ = value;
    vis->filter_ = filter;
    return vis;
}

VxRef<VxRasterVis> VxRasterVis::createFromColorTable(const VxRef<VxKeyedAttributeVariable>& colors) {
    if (!colors || !colors->table) return nullptr;
    VxRef<VxRasterVis> vis(new VxRasterVis);
    vis->colors_ = colors;
    // Class colours must not blend into colours no class has.
    vis->filter_ = 0;
    return vis;
}

VxRef<VxSGNode2> VxRasterVis::createPresentation2(const VxRef<VxFeature>& f,
                                                  const VxCreatePresParams& /*p*/) const {
    if (!f || !f->rasterGeometry() || !f->rasterGeometry()->raster()) return nullptr;
    auto node = vxMake<VxSGRasterNode2>(f, colors_ ? colors_->table : nullptr, filter_);
    node->opacity(value_);
    if (colors_ && colors_->hasDefault) node->defaultColor(colors_->defaultColor);
    return node;
}

VxRef<VxSGNode3> VxRasterVis::createPresentation3(const VxRef<VxFeature>& f,
                                                  const VxCreatePresParams& /*p*/) const {
    if (!f || !f->rasterGeometry()) return nullptr;
    return vxMake<VxSGFeatureNode3>(f);
}
