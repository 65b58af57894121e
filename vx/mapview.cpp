#include "vx/mapview.h"

#include "vx/sgnode.h"

VxMapView::VxMapView(const VxRef<VxCrs>& crs, const VxRect& area, int width, int height) {
    VxView& v = info_.view;
    v.crs = crs;
    v.crs2 = crs;
    v.area = area;
    v.drawArea = area;
    v.pixelSizeX = width > 0 ? area.width() / width : 0;
    v.pixelSizeY = height > 0 ? area.height() / height : 0;
    v.transform = VxTransform2::fromView(area, width, height);
    const double metresPerUnit = crs ? crs->lengthUnit() : 1.0;
    v.scale = v.pixelSizeX * metresPerUnit / kScreenPixelSize;
    info_.drawableWidth = width;
    info_.drawableHeight = height;
}

void VxMapView::drawImmediate(const std::vector<VxRef<VxLayer>>& layers, VxCanvas& canvas) {
    info_.drawTarget = &canvas;
    for (const auto& l : layers)
        if (l && l->enabled() && l->visibleAtScale(info_.view.scale)) l->doPrepare(info_);
    for (const auto& l : layers)
        if (l && l->enabled() && l->visibleAtScale(info_.view.scale)) l->doUpdate(info_);
    for (const auto& l : layers)
        if (l && l->enabled()) l->doUpdateCompleted(info_);
    info_.drawTarget = nullptr;
}

size_t VxMapView::drawWithNodes(const std::vector<VxRef<VxLayer>>& layers, VxCanvas& canvas) {
    std::vector<VxRef<VxSGNode2>> nodes;
    for (const auto& l : layers)
        if (l && l->enabled() && l->visibleAtScale(info_.view.scale)) l->doPrepare(info_);
    for (const auto& l : layers)
        if (l && l->enabled() && l->visibleAtScale(info_.view.scale)) l->doCreatePresentation2(info_, nodes);
    const VxSGRenderState2 state(info_.view.transform, info_.view.drawArea, VxRect(), 0.0);
    for (const auto& n : nodes)
        if (n) n->draw(canvas, state);
    for (const auto& l : layers)
        if (l && l->enabled()) l->doUpdateCompleted(info_);
    return nodes.size();
}
